#ifndef ORVA_API_METHOD_RULES_H_
#define ORVA_API_METHOD_RULES_H_

#include <initializer_list>
#include <utility>

#include <json/json.h>

#include "common/api_errors.h"
#include "platform/webapi/api_request.h"
#include "platform/webapi/api_response.h"
#include "platform/webapi/parameter_checker.h"

// The rule sets the handlers of both modules check their requests against.

struct Rule {
  const char* name;
  ParameterType type;
  bool necessary;
};

// The ParameterChecker rule set holding `rules`.
Json::Value BuildRules(std::initializer_list<Rule> rules);

// Runs `action(request, response)` when the request passes `rules`;
// answers 5503 with null data otherwise.
template <typename Action>
void CheckThen(ORVA::APIRequest* request, ORVA::APIResponse* response,
               std::initializer_list<Rule> rules, Action&& action) {
  if (!ParameterChecker::check(request, BuildRules(rules))) {
    response->SetError(kErrBadParameter, Json::Value());
    return;
  }
  action(request, response);
}

#endif  // ORVA_API_METHOD_RULES_H_
