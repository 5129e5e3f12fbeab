#ifndef ORVA_PLATFORM_WEBAPI_PARAMETER_CHECKER_H_
#define ORVA_PLATFORM_WEBAPI_PARAMETER_CHECKER_H_

#include <json/json.h>

#include "platform/webapi/api_request.h"

// The type codes of a rule. Any other code fails the check.
enum ParameterType {
  // The value must be a JSON string.
  kParameterText = 4,
  // An array, or a string holding one, which is parsed and stored in the
  // request in its place.
  kParameterJsonArray = 8,
  // A whole number fitting a 32-bit signed integer: a JSON integer, or a
  // string of decimal digits with an optional leading minus sign, which is
  // converted and stored in its place.
  kParameterWholeNumber = 14,
};

// Checks a request's parameters against a rule set
// {"field": {NAME: {"type": CODE, "necessary": BOOL}}}.
class ParameterChecker {
 public:
  // True when every rule holds: each necessary parameter is present and
  // each present parameter that has a rule is of its kind. A malformed rule
  // set fails. Conversions are made in `request` as the check goes; a
  // failing check may leave earlier parameters converted. Never throws,
  // whatever the values hold (an array text nested deeper than 64 levels
  // fails its rule).
  static bool check(ORVA::APIRequest* request, const Json::Value& rules);
};

#endif  // ORVA_PLATFORM_WEBAPI_PARAMETER_CHECKER_H_
