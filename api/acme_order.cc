#include <ctime>
#include <string>

#include <json/json.h>

#include "api/acme_methods.h"
#include "api/installed_server.h"
#include "api/local_server_renewal.h"
#include "common/api_errors.h"
#include "common/log.h"
#include "toolkit/acme_settings.h"
#include "toolkit/activation.h"
#include "toolkit/lego_tool.h"
#include "upload/set_install.h"

namespace {

// Orders and installs a certificate, recording the attempt in the status.
// Returns 5502 when it is installed; 5523 with *error set when the order
// failed; the import's code when the issued set was refused.
int OrderAndInstall(const AcmeSettings& settings, const AcmeSecrets& secrets,
                    std::string* error) {
  AcmeStatus status = LoadAcmeStatus();
  status.time = std::time(nullptr);
  IssuedSet issued;
  int code = kErrAcmeOrder;
  if (RunLegoOrder(settings, secrets, &issued, error) == 0) {
    code = ProveAndInstallSet(issued.certificate, issued.key, issued.chain);
    if (code != kErrNone) *error = "the issued certificate was refused (" + std::to_string(code) + ")";
  }
  InstalledServer server;
  if (code == kErrNone && ReadInstalledServer(&server)) status.certificate = server.fingerprint;
  status.result = code == kErrNone ? "success" : "failed";
  status.error = code == kErrNone ? "" : *error;
  SaveAcmeStatus(status);  // Ignoring a failure (logged): the answer tells the result.
  return code;
}

// Loads the settings: 5502, 5522 when none are kept, 5501 when they cannot
// be read (logged).
int LoadSettings(AcmeSettings* settings, AcmeSecrets* secrets) {
  const int loaded = LoadAcmeSettings(settings, secrets);
  if (loaded == 1) ORVA_LOG("ACME is not set up");
  return loaded == 0 ? kErrNone : loaded == 1 ? kErrAcmeNotSet : kErrFailed;
}

// The ACME certificate is due when no order has installed one yet, or when
// the one installed last is still in service with renew_days or fewer
// days left.
bool AcmeRenewalDue(const AcmeSettings& settings) {
  const AcmeStatus status = LoadAcmeStatus();
  if (status.certificate.empty()) return true;
  InstalledServer server;
  return ReadInstalledServer(&server) && server.fingerprint == status.certificate &&
         DaysUntil(server.not_after) <= settings.renew_days;
}

bool LocalRenewalDue() {
  InstalledServer server;
  return ReadInstalledServer(&server) && server.by_local_ca &&
         DaysUntil(server.not_after) <= kLocalRenewDays;
}

// Answers `code`: success with `data`, activated when `renewed` is not
// empty; or the failure, with {"error": TEXT} for a failed order, after
// activating what was renewed before it.
void Answer(int code, const Json::Value& renewed, const std::string& error,
            ORVA::APIResponse* response) {
  Json::Value data(Json::objectValue);
  data["renewed"] = renewed;
  if (!renewed.empty()) {
    answerInstallRequest(kActivateAfterImport, kErrNone, response, __FILE__, __LINE__, data);
  } else {
    data["restart_httpd"] = false;
    response->SetSuccess(data);
  }
  if (code == kErrNone) return;
  Json::Value failure;
  if (code == kErrAcmeOrder) failure["error"] = error;
  response->SetError(code, failure);
}

}  // namespace

void IssueAcme(ORVA::APIRequest*, ORVA::APIResponse* response) {
  AcmeSettings settings;
  AcmeSecrets secrets;
  std::string error;
  int code = LoadSettings(&settings, &secrets);
  if (code == kErrNone) code = OrderAndInstall(settings, secrets, &error);
  Json::Value renewed(Json::arrayValue);
  if (code == kErrNone) renewed.append("acme");
  Answer(code, renewed, error, response);
}

void RenewDue(ORVA::APIRequest*, ORVA::APIResponse* response) {
  AcmeSettings settings;
  AcmeSecrets secrets;
  std::string error;
  Json::Value renewed(Json::arrayValue);
  const int loaded = LoadAcmeSettings(&settings, &secrets);
  int code = loaded < 0 ? kErrFailed : kErrNone;
  if (loaded == 0 && AcmeRenewalDue(settings)) {
    ORVA_LOG("The ACME certificate is due: ordering one");
    code = OrderAndInstall(settings, secrets, &error);
    if (code == kErrNone) renewed.append("acme");
  }
  // A failed order leaves the installed certificate, which may be due.
  if (LocalRenewalDue()) {
    ORVA_LOG("The local CA's server certificate is due: signing it anew");
    const int resigned = ResignLocalServerCertificate();
    if (resigned == kErrNone) renewed.append("local");
    if (code == kErrNone) code = resigned;
  }
  Answer(code, renewed, error, response);
}
