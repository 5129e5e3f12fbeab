#include "api/acme_request.h"

#include <algorithm>

#include <json/json.h>

#include "common/api_errors.h"
#include "common/log.h"
#include "toolkit/acme_values.h"
#include "toolkit/lego_tool.h"

namespace {

constexpr char kDefaultDirectory[] = "https://acme-v02.api.letsencrypt.org/directory";
constexpr size_t kMaxDomains = 100;
constexpr int kMaxRenewDays = 3650;

int Refuse(const char* field) {
  ORVA_LOG("ACME setting refused: %s", field);
  return kErrBadParameter;
}

// The text of a parameter; `fallback` when it is absent or empty, as a
// form sends a field left as it was.
std::string Text(ORVA::APIRequest* request, const char* name, const char* fallback) {
  const Json::Value value = request->GetParam(name, fallback);
  const std::string text = value.isString() ? value.asString() : "";
  return text.empty() ? fallback : text;
}

// A parameter that is absent or empty ("", [] or {}).
bool IsEmpty(ORVA::APIRequest* request, const char* name) {
  const Json::Value value = request->GetParam(name, Json::Value());
  return value.isNull() || (value.isString() && value.asString().empty()) ||
         ((value.isArray() || value.isObject()) && value.empty());
}

bool ReadTexts(const Json::Value& array, std::vector<std::string>* texts) {
  for (const Json::Value& item : array) {
    if (!item.isString()) return false;
    texts->push_back(item.asString());
  }
  return true;
}

int ReadDnsSettings(ORVA::APIRequest* request, AcmeSettings* settings, AcmeSecrets* secrets) {
  settings->dns_provider = Text(request, "dns_provider", "");
  if (settings->dns_provider == "exec" || settings->dns_provider == "manual") {
    return Refuse("dns_provider");
  }
  std::vector<std::string> variables;
  const int known = LegoProviderVariables(settings->dns_provider, &variables);
  if (known < 0) return kErrFailed;
  if (known > 0) return Refuse("dns_provider");

  Json::Value credentials;
  if (!ParseJsonObject(Text(request, "dns_credentials", "{}"), &credentials)) {
    return Refuse("dns_credentials");
  }
  for (const std::string& name : credentials.getMemberNames()) {
    const Json::Value& value = credentials[name];
    if (!IsVariableName(name) ||
        std::find(variables.begin(), variables.end(), name) == variables.end() ||
        !value.isString() || !IsPlainValue(value.asString())) {
      return Refuse("dns_credentials");
    }
    secrets->dns_credentials[name] = value.asString();
  }
  const std::string check = Text(request, "dns_propagation_check", "yes");
  if (check != "yes" && check != "no") return Refuse("dns_propagation_check");
  settings->dns_propagation_check = check == "yes";
  if (!ReadTexts(request->GetParam("dns_resolvers", Json::Value(Json::arrayValue)),
                 &settings->dns_resolvers) ||
      !std::all_of(settings->dns_resolvers.begin(), settings->dns_resolvers.end(), IsResolver)) {
    return Refuse("dns_resolvers");
  }
  return kErrNone;
}

}  // namespace

int ReadAcmeRequest(ORVA::APIRequest* request, AcmeSettings* settings, AcmeSecrets* secrets) {
  AcmeSettings read;
  AcmeSecrets hidden;
  read.challenge = Text(request, "challenge", "http-01");
  const bool dns = read.challenge == "dns-01";
  if (!dns && read.challenge != "http-01") return Refuse("challenge");
  if (!ReadTexts(request->GetParam("domains", Json::Value()), &read.domains) ||
      read.domains.empty() || read.domains.size() > kMaxDomains ||
      !std::all_of(read.domains.begin(), read.domains.end(),
                   [dns](const std::string& domain) { return IsAcmeDomain(domain, dns); })) {
    return Refuse("domains");
  }
  read.email = Text(request, "email", "");
  if (!IsAcmeEmail(read.email)) return Refuse("email");
  if (Text(request, "agree_tos", "") != "yes") return Refuse("agree_tos");
  read.directory = Text(request, "directory", kDefaultDirectory);
  if (!IsHttpsUrl(read.directory)) return Refuse("directory");
  read.key_type = Text(request, "key_type", "ec256");
  const char* kKeyTypes[] = {"ec256", "ec384", "rsa2048", "rsa4096"};
  if (std::find(std::begin(kKeyTypes), std::end(kKeyTypes), read.key_type) == std::end(kKeyTypes)) {
    return Refuse("key_type");
  }
  read.renew_days = request->GetParam("renew_days", 30).asInt();
  if (read.renew_days < 1 || read.renew_days > kMaxRenewDays) return Refuse("renew_days");
  read.eab_kid = Text(request, "eab_kid", "");
  hidden.eab_hmac = Text(request, "eab_hmac", "");
  if (read.eab_kid.empty() != hidden.eab_hmac.empty() ||
      (!read.eab_kid.empty() && !IsPlainValue(read.eab_kid))) {
    return Refuse("eab_kid");
  }
  if (!hidden.eab_hmac.empty() && !IsPlainValue(hidden.eab_hmac)) return Refuse("eab_hmac");
  if (dns) {
    const int code = ReadDnsSettings(request, &read, &hidden);
    if (code != kErrNone) return code;
  } else {
    for (const char* name :
         {"dns_provider", "dns_credentials", "dns_resolvers", "dns_propagation_check"}) {
      if (!IsEmpty(request, name)) return Refuse(name);
    }
  }
  *settings = read;
  *secrets = hidden;
  return kErrNone;
}
