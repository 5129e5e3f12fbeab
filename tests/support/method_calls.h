#ifndef ORVA_TESTS_SUPPORT_METHOD_CALLS_H_
#define ORVA_TESTS_SUPPORT_METHOD_CALLS_H_

#include <string>

#include <json/json.h>

#include "platform/webapi/api_download.h"
#include "platform/webapi/api_request.h"
#include "platform/webapi/api_response.h"

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

// The methods with complete, valid parameters and keys of the smallest
// size the device makes (2048 bits).
ORVA::APIResponse CallCreateCsr();
ORVA::APIResponse CallRenew();
// Signs the request file at the real path `csrPath` for 30 days.
ORVA::APIResponse CallSign(const std::string& csrPath);
ORVA::APIResponse CallCreateCrt();
// Imports the uploads at the real paths given, as the host hands them over.
ORVA::APIResponse CallImport(const std::string& certPath, const std::string& keyPath,
                             const std::string& interPath);
// Exports `set` ("archive", "csr_set", "signed_set").
MethodAnswer CallExport(const std::string& set);

#endif  // ORVA_TESTS_SUPPORT_METHOD_CALLS_H_
