// Certificate signing requests and their configuration file.

#include <openssl/err.h>
#include <openssl/objects.h>
#include <openssl/x509.h>

#include <string>

#include "common/log.h"
#include "common/raii.h"
#include "common/shell_command.h"
#include "platform/olib/olib_file.h"
#include "toolkit/mkcert.h"
#include "toolkit/mkcert_internal.h"
#include "toolkit/store_file.h"

namespace {

struct SubjectLine {
  const char* key;
  int nid;
  std::string CSR_ARGUMENT::*member;
};

// The subject lines of the configuration, in the order they are written.
const SubjectLine kSubjectLines[] = {
    {"countryName", NID_countryName, &CSR_ARGUMENT::country},
    {"stateOrProvinceName", NID_stateOrProvinceName, &CSR_ARGUMENT::state},
    {"localityName", NID_localityName, &CSR_ARGUMENT::city},
    {"0.organizationName", NID_organizationName, &CSR_ARGUMENT::organization},
    {"organizationalUnitName", NID_organizationalUnitName, &CSR_ARGUMENT::department},
    {"commonName", NID_commonName, &CSR_ARGUMENT::common_name},
    {"emailAddress", NID_pkcs9_emailAddress, &CSR_ARGUMENT::email},
};

bool HasControlCharacter(const std::string& value) {
  for (unsigned char c : value) {
    if (c < 0x20 || c == 0x7F) return true;
  }
  return false;
}

bool SubjectHasControlCharacter(const CSR_ARGUMENT& subject) {
  for (const SubjectLine& line : kSubjectLines) {
    if (HasControlCharacter(subject.*line.member)) return true;
  }
  return false;
}

// The first value the tool would refuse to put into a name (too long, or
// characters its string type cannot hold: the library applies the same
// rules as the tool), or null when it takes them all. Empty values are
// left out of the request.
const std::string* ValueRefusedInName(const CSR_ARGUMENT& subject) {
  X509NamePtr name(X509_NAME_new());
  for (const SubjectLine& line : kSubjectLines) {
    const std::string& value = subject.*line.member;
    if (value.empty()) continue;
    if (!name || X509_NAME_add_entry_by_NID(
                     name.get(), line.nid, MBSTRING_UTF8,
                     reinterpret_cast<const unsigned char*>(value.data()),
                     static_cast<int>(value.size()), -1, 0) != 1) {
      ERR_clear_error();
      return &value;
    }
  }
  return nullptr;
}

// "key<blanks>= value" with the "=" in the 33rd column.
std::string ConfigLine(const char* key, const std::string& value) {
  std::string line(key);
  if (line.size() < 32) line.resize(32, ' ');
  return line + "= " + value + "\n";
}

// The value between single quotes, where the tool's reader takes a
// backslash as an escape: "\" and "'" are escaped so the value arrives as
// it stands and cannot end the quoting.
std::string QuotedValue(const std::string& value) {
  std::string quoted = "'";
  for (char c : value) {
    if (c == '\\' || c == '\'') quoted += '\\';
    quoted += c;
  }
  return quoted + "'";
}

std::string RequestConfig(const CSR_ARGUMENT& subject) {
  std::string text = "[ req ]\n";
  text += ConfigLine("default_bits", "1024");
  text += ConfigLine("distinguished_name", "req_DN");
  text += ConfigLine("prompt", "no");
  // Values are UTF-8 text; without this the tool takes each byte for a
  // character and "Zürich" arrives double-encoded.
  text += ConfigLine("utf8", "yes");
  text += "[ req_DN ]\n";
  for (const SubjectLine& line : kSubjectLines) {
    const std::string& value = subject.*line.member;
    if (!value.empty()) text += ConfigLine(line.key, QuotedValue(value));
  }
  return text;
}

// Writes the request configuration. 0 or -1 (logged).
int modifyCsrCfg(const char* configPath, const CSR_ARGUMENT& subject) {
  if (genDir(configPath) != 0) {
    ORVA_LOG("generate directory failed");
  } else {
    int written = WriteTextFile(configPath, RequestConfig(subject));
    if (written == 0) return 0;
    if (written == -1) {
      ORVA_LOG_LASTERR("Open %s failed", configPath);
    } else {
      ORVA_LOG_LASTERR("Write %s failed", configPath);
    }
  }
  ORVA_LOG("modify csr config file failed");
  return -1;
}

}  // namespace

int checkCsrSubject(const CSR_ARGUMENT* subject) {
  if (subject == nullptr) {
    ORVA_LOG_LASTERR("CSR Argument error");
    return -2;
  }
  if (subject->country.size() != 2) {
    ORVA_LOG("Coountry name length size should be 2.");
    ORVA_LOG_LASTERR("CSR Argument error");
    return -2;
  }
  if (SubjectHasControlCharacter(*subject)) {
    ORVA_LOG_LASTERR("CSR Argument error");
    return -2;
  }
  if (const std::string* refused = ValueRefusedInName(*subject)) {
    ORVA_LOG("Subject value \"%s\" does not fit a certificate name", refused->c_str());
    ORVA_LOG_LASTERR("CSR Argument error");
    return -2;
  }
  return 0;
}

int genCsr(const char* configPath, const char* keyPath,
           const char* requestPath, CSR_ARGUMENT* subject) {
  if (configPath == nullptr || *configPath == '\0' || keyPath == nullptr ||
      *keyPath == '\0' || requestPath == nullptr || *requestPath == '\0') {
    ORVA_LOG("genCsr sanity failed");
    return -1;
  }
  if (OLIBCFileExist(keyPath) == 0) {
    ORVA_LOG("Key is not existed");
    return -1;
  }
  if (checkCsrSubject(subject) != 0) return -2;
  if (genDir(requestPath) != 0) {
    ORVA_LOG("generate directory failed");
    return -1;
  }
  if (modifyCsrCfg(configPath, *subject) != 0) return -1;

  StoreFileSet set;
  const std::string request = set.Add(requestPath, StoreContent::kRequest);
  if (request.empty()) return -1;
  ShellCommand command(RootedCommandSize(kToolkitCommandSize));
  command.Append(
      "%s req -config %s -new -sha256 -key %s -out %s >/dev/null 2>&1",
      {OpensslTool(), configPath, keyPath, request});
  if (RunShellCommand(command) != 0) {
    ORVA_LOG("Create CSR failed, command[%s]", command.line());
    return -1;
  }
  return set.Install();
}
