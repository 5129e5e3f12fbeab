#include "toolkit/lego_tool.h"

#include <fcntl.h>
#include <ftw.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cctype>
#include <cstdio>

#include "common/file_util.h"
#include "common/log.h"
#include "common/shell_command.h"
#include "common/store_paths.h"
#include "platform/olib/olib_error.h"
#include "platform/olib/orva_root.h"
#include "toolkit/acme_values.h"

namespace {

// Room for the fixed words of an order's line; the values are added to it.
constexpr size_t kLegoLineSize = 1024;
// The error text kept from the client's output.
constexpr size_t kErrorTextBytes = 512;

bool IsProviderCode(const std::string& code) {
  if (code.empty() || code.size() > 64) return false;
  for (unsigned char c : code) {
    if (!std::islower(c) && !std::isdigit(c) && c != '-') return false;
  }
  return true;
}

// The last line of the client's output that holds text, without the time
// the client puts before its log lines, cut to kErrorTextBytes.
std::string LastOutputLine() {
  std::string output;
  ReadWholeFile(LegoOutputPath(), &output);  // An unreadable file leaves no text.
  size_t end = output.find_last_not_of(" \t\r\n");
  if (end == std::string::npos) return "";
  const size_t line_end = output.rfind('\n', end);
  const size_t begin = line_end == std::string::npos ? 0 : line_end + 1;
  std::string line = output.substr(begin, end + 1 - begin);
  int stamp = 0;
  if (std::sscanf(line.c_str(), "%*4d/%*2d/%*2d %*2d:%*2d:%*2d %n", &stamp) >= 0 && stamp > 0) {
    line.erase(0, static_cast<size_t>(stamp));
  }
  line.erase(0, line.find_first_not_of(" \t"));
  return line.substr(0, kErrorTextBytes);
}

// The client's output file, made empty and owner-only before the client
// writes to it.
bool PrepareOutputFile() {
  const int fd = open(LegoOutputPath().c_str(),
                      O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC | O_NOFOLLOW, 0600);
  if (fd < 0) return false;
  const bool owner_only = fchmod(fd, 0600) == 0;
  close(fd);
  return owner_only;
}

// The client names its files after the first domain, a wildcard's "*"
// written as "_".
std::string CertificateBase(const AcmeSettings& settings) {
  std::string name = settings.domains.front();
  if (name.compare(0, 1, "*") == 0) name[0] = '_';
  return LegoFolder() + "/certificates/" + name;
}

size_t LineSize(const AcmeSettings& settings, const AcmeSecrets& secrets) {
  // A quoted word takes at most four bytes per byte of its value.
  size_t values = settings.email.size() + settings.directory.size() +
                  settings.dns_provider.size() + settings.eab_kid.size() +
                  secrets.eab_hmac.size() + LegoFolder().size() + LegoOutputPath().size() +
                  OrvaPath(kAcmeWebroot).size() + OrvaPath(kLegoTool).size();
  for (const std::string& domain : settings.domains) values += domain.size() + 16;
  for (const std::string& resolver : settings.dns_resolvers) values += resolver.size() + 24;
  return kLegoLineSize + 4 * values;
}

void BuildOrderLine(const AcmeSettings& settings, const AcmeSecrets& secrets, bool withAccount,
                    ShellCommand* line) {
  line->Append("%s --accept-tos --email %s --server %s --path %s --key-type %s",
               {OrvaPath(kLegoTool), settings.email, settings.directory, LegoFolder(),
                settings.key_type});
  for (const std::string& domain : settings.domains) line->Append(" --domains %s", {domain});
  if (settings.challenge == "dns-01") {
    line->Append(" --dns %s", {settings.dns_provider});
    for (const std::string& resolver : settings.dns_resolvers) {
      line->Append(" --dns.resolvers %s", {resolver});
    }
    if (!settings.dns_propagation_check) line->Append(" --dns.disable-cp");
  } else {
    line->Append(" --http --http.webroot %s", {OrvaPath(kAcmeWebroot)});
  }
  // The client takes the binding's key only on its command line; it is
  // needed once, when the account is registered.
  if (withAccount && !settings.eab_kid.empty()) {
    line->Append(" --eab --kid %s --hmac %s", {settings.eab_kid, secrets.eab_hmac});
  }
  line->Append(" run --no-bundle >%s 2>&1", {LegoOutputPath()});
}

// The client makes some of its files (the account key) readable by
// others; everything under the ACME folder is the owner's alone.
int MakeOwnerOnly(const char* path, const struct stat* info, int type, struct FTW*) {
  if (type == FTW_F && (info->st_mode & 077) != 0 && chmod(path, 0600) != 0) {
    ORVA_LOG("chmod(%s) failed: %m", path);
  }
  return 0;
}

void RemoveIssuedFiles() {
  if (!RemoveFolderEntries(LegoFolder() + "/certificates")) {
    ORVA_LOG("Remove the ACME client's certificate files failed: %m");
  }
}

// Reads the client's copies of the issued set and removes them: the store
// keeps the only copy of an installed key.
bool TakeIssuedFiles(const AcmeSettings& settings, IssuedSet* issued) {
  const std::string base = CertificateBase(settings);
  IssuedSet read;
  const bool complete = ReadWholeFile(base + ".crt", &read.certificate) &&
                        ReadWholeFile(base + ".key", &read.key) &&
                        ReadWholeFile(base + ".issuer.crt", &read.chain);
  RemoveIssuedFiles();
  if (complete) *issued = read;
  return complete;
}

}  // namespace

int LegoProviderVariables(const std::string& provider, std::vector<std::string>* variables) {
  if (!IsProviderCode(provider)) return 1;
  ShellCommand command(RootedCommandSize(256));
  command.Append("%s dnshelp --code %s 2>/dev/null", {OrvaPath(kLegoTool), provider});
  ShellPipe pipe(command);
  if (pipe.stream() == nullptr) {
    ORVA_LOG("%s failed", command.line());
    return -1;
  }
  // The client lists each variable as a line `  - "NAME":  what it is`.
  std::vector<std::string> names;
  char line[1024];
  while (std::fgets(line, sizeof(line), pipe.stream()) != nullptr) {
    char name[129];
    if (std::sscanf(line, " - \"%128[A-Z0-9_]\":", name) == 1) names.push_back(name);
  }
  const int status = pipe.Close();
  if (status == -1) {
    ORVA_LOG("%s failed", command.line());
    return -1;
  }
  if (!WIFEXITED(status) || WEXITSTATUS(status) != 0) return 1;
  *variables = names;
  return 0;
}

bool LegoAccountRegistered(const AcmeSettings& settings) {
  // The client keeps accounts by the directory's host, ":" written as "_".
  std::string host = UrlHost(settings.directory);
  for (char& c : host) {
    if (c == ':') c = '_';
  }
  struct stat info;
  return stat((LegoFolder() + "/accounts/" + host + "/" + settings.email + "/account.json").c_str(),
              &info) == 0;
}

int RunLegoOrder(const AcmeSettings& settings, const AcmeSecrets& secrets, IssuedSet* issued,
                 std::string* error) {
  if (!MakeAcmeFolder() || !PrepareOutputFile()) {
    *error = "the ACME folder cannot be written";
    ORVA_LOG("Prepare %s failed: %m", kAcmeDir);
    return -1;
  }
  ShellCommand line(RootedCommandSize(LineSize(settings, secrets)));
  BuildOrderLine(settings, secrets, !LegoAccountRegistered(settings), &line);
  std::vector<std::string> environment;
  for (const auto& [name, value] : secrets.dns_credentials) environment.push_back(name + "=" + value);

  const int status = RunShellCommandWith(line, environment, kLegoOrderSeconds);
  nftw(LegoFolder().c_str(), MakeOwnerOnly, 16, FTW_PHYS);  // Failures are logged per file.
  if (!RemoveFolderEntries(OrvaPath(kAcmeChallengeDir))) {
    ORVA_LOG("Empty %s failed: %m", kAcmeChallengeDir);
  }
  if (status == -1 && OLIBCErrGet() == OLIB_ERR_TIMEOUT) {
    *error = "the ACME order took longer than " + std::to_string(kLegoOrderSeconds) + " s";
  } else if (status != 0) {
    *error = LastOutputLine();
    if (error->empty()) *error = "the ACME client failed without a message";
  } else if (!TakeIssuedFiles(settings, issued)) {
    *error = "the ACME client wrote no certificate";
  } else {
    return 0;
  }
  RemoveIssuedFiles();
  ORVA_LOG("ACME order for %s failed: %s", settings.domains.front().c_str(), error->c_str());
  return -1;
}
