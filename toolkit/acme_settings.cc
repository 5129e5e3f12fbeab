#include "toolkit/acme_settings.h"

#include <sys/stat.h>

#include <json/json.h>

#include "common/file_util.h"
#include "common/log.h"
#include "common/shell_command.h"
#include "common/store_paths.h"
#include "platform/olib/orva_root.h"
#include "toolkit/acme_values.h"
#include "toolkit/store_file.h"

namespace {

std::string SettingsPath() { return AcmeFolder() + "/settings.json"; }
std::string SecretsPath() { return AcmeFolder() + "/secrets.json"; }
std::string StatusPath() { return AcmeFolder() + "/status.json"; }

Json::Value TextArray(const std::vector<std::string>& texts) {
  Json::Value array(Json::arrayValue);
  for (const std::string& text : texts) array.append(text);
  return array;
}

// A kept value as text; "" when the file holds another kind there.
std::string TextOf(const Json::Value& value) { return value.isString() ? value.asString() : ""; }

std::string JsonText(const Json::Value& value) {
  Json::StreamWriterBuilder writer;
  writer["indentation"] = "";
  return Json::writeString(writer, value) + "\n";
}

// 1 when the file is absent, -1 (logged) when it is not a JSON object.
int ReadJsonFile(const std::string& path, Json::Value* value) {
  std::string text;
  if (!ReadWholeFile(path, &text)) return 1;
  if (!ParseJsonObject(text, value)) {
    ORVA_LOG("%s does not read as a JSON object", path.c_str());
    return -1;
  }
  return 0;
}

bool WriteMember(StoreFileSet* set, const std::string& target, const Json::Value& value) {
  const std::string temporary = set->Add(target, StoreContent::kPrivateText);
  return !temporary.empty() && OverwriteFile(temporary, JsonText(value));
}

bool MakePrivateFolder(const std::string& path) {
  if (!MakeDirectories(path)) return false;
  if (chmod(path.c_str(), 0700) != 0) {
    ORVA_LOG("chmod(%s) failed: %m", path.c_str());
    return false;
  }
  return true;
}

}  // namespace

std::string AcmeFolder() { return OrvaPath(kAcmeDir); }
std::string LegoFolder() { return AcmeFolder() + "/lego"; }
std::string LegoOutputPath() { return AcmeFolder() + "/lego.log"; }

bool MakeAcmeFolder() { return MakePrivateFolder(AcmeFolder()) && MakePrivateFolder(LegoFolder()); }

Json::Value AcmeSettingsJson(const AcmeSettings& settings) {
  Json::Value kept(Json::objectValue);
  kept["domains"] = TextArray(settings.domains);
  kept["email"] = settings.email;
  kept["directory"] = settings.directory;
  kept["challenge"] = settings.challenge;
  kept["dns_provider"] = settings.dns_provider;
  kept["dns_resolvers"] = TextArray(settings.dns_resolvers);
  kept["dns_propagation_check"] = settings.dns_propagation_check ? "yes" : "no";
  kept["key_type"] = settings.key_type;
  kept["renew_days"] = settings.renew_days;
  kept["eab_kid"] = settings.eab_kid;
  return kept;
}

int SaveAcmeSettings(const AcmeSettings& settings, const AcmeSecrets& secrets) {
  Json::Value hidden(Json::objectValue);
  hidden["dns_credentials"] = Json::Value(Json::objectValue);
  for (const auto& [name, value] : secrets.dns_credentials) hidden["dns_credentials"][name] = value;
  hidden["eab_hmac"] = secrets.eab_hmac;

  if (!MakeAcmeFolder()) return -1;
  StoreFileSet set;
  if (!WriteMember(&set, SettingsPath(), AcmeSettingsJson(settings)) ||
      !WriteMember(&set, SecretsPath(), hidden) ||
      set.Install() != 0) {
    ORVA_LOG("Save the ACME settings failed");
    return -1;
  }
  return 0;
}

int LoadAcmeSettings(AcmeSettings* settings, AcmeSecrets* secrets) {
  Json::Value kept, hidden;
  const int read = ReadJsonFile(SettingsPath(), &kept);
  if (read != 0) return read;
  if (ReadJsonFile(SecretsPath(), &hidden) < 0) return -1;
  AcmeSettings loaded;
  for (const Json::Value& domain : kept["domains"]) loaded.domains.push_back(TextOf(domain));
  loaded.email = TextOf(kept["email"]);
  loaded.directory = TextOf(kept["directory"]);
  loaded.challenge = TextOf(kept["challenge"]);
  loaded.dns_provider = TextOf(kept["dns_provider"]);
  for (const Json::Value& resolver : kept["dns_resolvers"]) {
    loaded.dns_resolvers.push_back(TextOf(resolver));
  }
  loaded.dns_propagation_check = TextOf(kept["dns_propagation_check"]) != "no";
  loaded.key_type = TextOf(kept["key_type"]);
  loaded.renew_days = kept["renew_days"].isInt() ? kept["renew_days"].asInt() : 0;
  loaded.eab_kid = TextOf(kept["eab_kid"]);
  if (loaded.domains.empty()) {
    ORVA_LOG("%s names no domain", kAcmeDir);
    return -1;
  }
  AcmeSecrets loaded_secrets;
  const Json::Value& credentials = hidden["dns_credentials"];
  if (credentials.isObject()) {
    for (const std::string& name : credentials.getMemberNames()) {
      loaded_secrets.dns_credentials[name] = TextOf(credentials[name]);
    }
  }
  loaded_secrets.eab_hmac = TextOf(hidden["eab_hmac"]);
  *settings = loaded;
  *secrets = loaded_secrets;
  return 0;
}

int SaveAcmeStatus(const AcmeStatus& status) {
  Json::Value kept(Json::objectValue);
  kept["time"] = static_cast<Json::Int64>(status.time);
  kept["result"] = status.result;
  kept["error"] = status.error;
  kept["certificate"] = status.certificate;
  if (!MakeAcmeFolder()) return -1;
  StoreFileSet set;
  if (!WriteMember(&set, StatusPath(), kept) || set.Install() != 0) {
    ORVA_LOG("Save the ACME status failed");
    return -1;
  }
  return 0;
}

AcmeStatus LoadAcmeStatus() {
  Json::Value kept;
  AcmeStatus status;
  if (ReadJsonFile(StatusPath(), &kept) != 0) return status;
  status.time = kept["time"].isInt64() ? kept["time"].asInt64() : 0;
  status.result = TextOf(kept["result"]);
  status.error = TextOf(kept["error"]);
  status.certificate = TextOf(kept["certificate"]);
  return status;
}

int ForgetAcme() {
  ShellCommand command(RootedCommandSize(64));
  command.Append("/bin/rm -rf %s", {AcmeFolder()});
  if (RunShellCommand(command) != 0) {
    ORVA_LOG("%s failed", command.line());
    return -1;
  }
  return 0;
}
