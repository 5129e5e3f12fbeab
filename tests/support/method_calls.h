#ifndef ORVA_TESTS_SUPPORT_METHOD_CALLS_H_
#define ORVA_TESTS_SUPPORT_METHOD_CALLS_H_

#include <string>

#include <json/json.h>

#include "platform/webapi/api_download.h"
#include "platform/webapi/api_request.h"
#include "platform/webapi/api_response.h"
#include "tests/support/test_support.h"

// The certificate module's methods called in-process, as the host calls
// them: one request, one answer, and the download the handler handed out.

struct MethodAnswer {
  ORVA::APIResponse response;
  ORVA::DownloadResult download;
};

using MethodHandler = void (*)(ORVA::APIRequest*, ORVA::APIResponse*);

// Runs `handler` on a request carrying `params` (a JSON object).
MethodAnswer CallMethod(MethodHandler handler,
                        const Json::Value& params = Json::Value(Json::objectValue));

// A complete subject ("country" ... "email") with every name prefixed by
// `prefix` ("" or "ca_"), for the create methods.
Json::Value SubjectParams(const std::string& prefix = "");

// Both subjects of CRT create (the CA's common name "Local Root"), which
// the other methods ignore, changed by the JSON object `changes`: a null
// value removes the parameter, and "ROOT" stands for the device root.
Json::Value Params(const TempDeviceRoot& root, std::string changes = "{}");

#endif  // ORVA_TESTS_SUPPORT_METHOD_CALLS_H_
