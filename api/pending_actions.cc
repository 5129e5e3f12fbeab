// Action functions whose methods are not available yet: each answers that
// the operation failed, so no request can mistake them for working.

#include "api/certificate.h"
#include "common/api_errors.h"

namespace {
void AnswerNotAvailable(ORVA::APIResponse* response) {
  response->SetError(kErrFailed, Json::Value());
}
}  // namespace

void handleCSRAction(ORVA::APIRequest*, ORVA::APIResponse* response) {
  AnswerNotAvailable(response);
}

void handleRenewAction(ORVA::APIRequest*, ORVA::APIResponse* response) {
  AnswerNotAvailable(response);
}

void handleSignCSRAction(ORVA::APIRequest*, ORVA::APIResponse* response) {
  AnswerNotAvailable(response);
}

void handleCRTAction(ORVA::APIRequest*, ORVA::APIResponse* response) {
  AnswerNotAvailable(response);
}
