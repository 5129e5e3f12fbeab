#include <string>

#include "api/certificate.h"
#include "common/api_errors.h"
#include "common/log.h"
#include "common/store_paths.h"
#include "platform/olib/orva_root.h"
#include "toolkit/generation_area.h"
#include "toolkit/mkcert.h"
#include "upload/sslca_form_handler.h"

void handleSignCSRAction(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  std::string request_path = request->GetParam("csr_tmp", Json::Value()).asString();
  std::string aliases = request->GetParam("alias", "").asString();
  Json::Value result(Json::objectValue);
  int days = request->GetParam("days", "3650").asInt();
  SSLCAFormHandler handler;

  if (days <= 0) {
    ORVA_LOG_LASTERR("0 >= days");
    response->SetError(kErrBadParameter, Json::Value());
    return;
  }
  int checked = handler.checkCSRHeader(request_path.c_str());
  if (checked != kErrNone) {
    ORVA_LOG("Check CSR file failed");
    response->SetError(checked, Json::Value());
    return;
  }
  // The tool would make the area with the default mode; it holds what is
  // handed out once, so it stays private.
  if (!MakeGenerationArea() ||
      genServerCrt(request_path.c_str(), OrvaPath(kGenCrtPath).c_str(), days,
                   aliases.c_str()) == -1) {
    ORVA_LOG("Generate crt failed");
    response->SetError(kErrFailed, Json::Value());
    return;
  }
  response->SetSuccess(result);
}
