#include "api/certificate.h"
#include "api/csr_generate.h"
#include "api/request_values.h"
#include "api/subject_reader.h"
#include "common/api_errors.h"
#include "common/log.h"

void handleCSRAction(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  CSR_ARGUMENT record;
  if (fillCSRInfo(request, &record, false) == -1) {
    ORVA_LOG("fill argument from json failed");
    response->SetError(kErrFailed, Json::Value());
    return;
  }
  KeyKind kind;
  if (!ReadKeyKind(request, "key_type", "key_length", &kind)) {
    response->SetError(kErrBadParameter, Json::Value());
    return;
  }
  if (generateCSR(kind, record) == 0) {
    ORVA_LOG_LASTERR("Generate csr from csr action failed");
    response->SetError(kErrFailed, Json::Value());
    return;
  }
  response->SetSuccess(Json::Value(Json::objectValue));
}
