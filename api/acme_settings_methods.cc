#include <json/json.h>

#include "api/acme_methods.h"
#include "api/acme_request.h"
#include "api/installed_server.h"
#include "common/api_errors.h"
#include "toolkit/acme_settings.h"
#include "toolkit/lego_tool.h"

namespace {

// The kept settings with the names of the credentials, never their values.
Json::Value SettingsJson(const AcmeSettings& settings, const AcmeSecrets& secrets) {
  Json::Value shown = AcmeSettingsJson(settings);
  shown["dns_credentials"] = Json::Value(Json::arrayValue);
  for (const auto& credential : secrets.dns_credentials) {
    shown["dns_credentials"].append(credential.first);
  }
  return shown;
}

}  // namespace

void SetAcme(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  AcmeSettings settings;
  AcmeSecrets secrets;
  int code = ReadAcmeRequest(request, &settings, &secrets);
  if (code == kErrNone && SaveAcmeSettings(settings, secrets) != 0) code = kErrFailed;
  if (code != kErrNone) {
    response->SetError(code, Json::Value());
    return;
  }
  response->SetSuccess(Json::Value());
}

void GetAcme(ORVA::APIRequest*, ORVA::APIResponse* response) {
  AcmeSettings settings;
  AcmeSecrets secrets;
  const bool set_up = LoadAcmeSettings(&settings, &secrets) == 0;
  const AcmeStatus status = LoadAcmeStatus();
  InstalledServer server;
  const bool acme_installed = ReadInstalledServer(&server) && !status.certificate.empty() &&
                              server.fingerprint == status.certificate;

  Json::Value data(Json::objectValue);
  data["settings"] = set_up ? SettingsJson(settings, secrets) : Json::Value();
  data["account"] = Json::Value();
  if (set_up) {
    data["account"]["email"] = settings.email;
    data["account"]["registered"] = LegoAccountRegistered(settings);
  }
  data["status"]["time"] = status.time > 0 ? Json::Value(IsoTime(status.time)) : Json::Value();
  data["status"]["result"] = status.result;
  data["status"]["error"] = status.error;
  data["certificate"] = Json::Value();
  data["next_renewal"] = Json::Value();
  if (acme_installed) {
    data["certificate"]["issuer"] = server.issuer;
    data["certificate"]["valid_till"] = IsoTime(server.not_after);
    data["certificate"]["days_left"] = DaysUntil(server.not_after);
    if (set_up) data["next_renewal"] = IsoTime(server.not_after - settings.renew_days * 86400L);
  }
  response->SetSuccess(data);
}

void DeleteAcme(ORVA::APIRequest*, ORVA::APIResponse* response) {
  if (ForgetAcme() != 0) {
    response->SetError(kErrFailed, Json::Value());
    return;
  }
  response->SetSuccess(Json::Value());
}
