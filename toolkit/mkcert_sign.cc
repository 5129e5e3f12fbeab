// Certificates signed from requests: self-signed CA certificates and server
// certificates signed by the local CA.

#include <cerrno>
#include <cstring>
#include <string>

#include "common/file_util.h"
#include "common/log.h"
#include "common/shell_command.h"
#include "platform/olib/olib_file.h"
#include "toolkit/mkcert.h"
#include "toolkit/mkcert_internal.h"
#include "toolkit/store_file.h"

namespace {

bool IsEmpty(const char* text) { return text == nullptr || *text == '\0'; }

// Writes the server extension file for `request` from the ";"-separated
// `aliases`. 0 or -1 (logged).
int WriteServerExtensions(const char* extFile, const RequestFacts& request,
                          const char* aliases) {
  OLIBSzListPtr names = SplitAliases(aliases);
  if (!names) return -1;
  return generateServerCNF(extFile, request, names.get());
}

}  // namespace

OLIBSzListPtr SplitAliases(const char* aliases) {
  size_t names = 0;
  for (const char* p = aliases; *p != '\0'; ++p) {
    if (*p != ';' && (p == aliases || p[-1] == ';')) ++names;
  }
  if (names > kMaxAliases) {
    ORVA_LOG("Too many alias names: %zu (at most %zu)", names, kMaxAliases);
    return nullptr;
  }
  OLIBSZLIST* list = OLIBCSzListAlloc(512);
  if (list == nullptr) {
    ORVA_LOG("Out of memory!! size=512");
    return nullptr;
  }
  // OLIBCStrSep may move the list; ownership is taken back from `list`.
  int separated = OLIBCStrSep(aliases, ";", &list);
  OLIBSzListPtr owner(list);
  if (separated == -1) {
    ORVA_LOG("String separate failed.");
    return nullptr;
  }
  return owner;
}

std::vector<const char*> ListItems(const OLIBSZLIST* list) {
  std::vector<const char*> items;
  const char* item = list->data;
  for (uint32_t i = 0; i < list->nItem; ++i) {
    items.push_back(item);
    item += std::strlen(item) + 1;
  }
  return items;
}

int genCrt(const char* extFile, const char* requestPath, const char* caOrOutput,
           const char* serialPath, const char* outputPath, const char* keyPath,
           BOOL selfSigned, int days, const char* aliases) {
  if (IsEmpty(extFile) || IsEmpty(requestPath) || IsEmpty(caOrOutput) ||
      IsEmpty(keyPath) || days <= 0) {
    ORVA_LOG("genCrt sanity failed");
    return -1;
  }
  if (OLIBCFileExist(requestPath) == 0) {
    ORVA_LOG("Csr is not existed");
    return -1;
  }
  if (OLIBCFileExist(keyPath) == 0) {
    ORVA_LOG("Key is not existed");
    return -1;
  }
  if (aliases == nullptr) aliases = "";
  RequestFacts request;
  if (!ReadRequestFacts(requestPath, &request)) return -1;

  const char* output = nullptr;
  if (selfSigned == TRUE) {
    if (generateCACNF(extFile, request.has_email) != 0) return -1;
    output = caOrOutput;
  } else {
    if (IsEmpty(serialPath) || IsEmpty(outputPath)) {
      ORVA_LOG("genCrt sanity failed");
      return -1;
    }
    if (OLIBCFileExist(serialPath) == 0) {
      ORVA_LOG("Serial file is not existed");
      return -1;
    }
    if (WriteServerExtensions(extFile, request, aliases) != 0) return -1;
    output = outputPath;
  }
  if (genDir(output) != 0) {
    ORVA_LOG("generate directory failed");
    return -1;
  }

  StoreFileSet set;
  // The tool rewrites its serial file in place, through a link if there is
  // one: it gets a copy, which replaces the serial file with the
  // certificate.
  std::string serialCopy;
  if (selfSigned != TRUE) {
    std::string serial;
    if (!ReadWholeFile(serialPath, &serial)) {
      ORVA_LOG("Read %s failed.(errno:%d/%m)", serialPath, errno);
      return -1;
    }
    serialCopy = set.Add(serialPath, StoreContent::kText);
    if (serialCopy.empty()) return -1;
    if (!OverwriteFile(serialCopy, serial)) {
      ORVA_LOG("Write %s failed.(errno:%d/%m)", serialCopy.c_str(), errno);
      return -1;
    }
  }
  const std::string certificate = set.Add(output, StoreContent::kCertificate);
  if (certificate.empty()) return -1;
  ShellCommand command(RootedCommandSize(kToolkitCommandSize));
  command.Append("%s x509 -extfile %s -days %d -in %s -req -sha256 -out %s",
                 {OpensslTool(), extFile, days, requestPath,
                  certificate});
  if (selfSigned == TRUE) {
    command.Append(" -signkey %s >/dev/null 2>&1", {keyPath});
  } else {
    command.Append(" -CAserial %s -CA %s -CAkey %s >/dev/null 2>&1",
                   {serialCopy, caOrOutput, keyPath});
  }
  if (!ToolExitedCleanly(RunShellCommand(command))) {
    ORVA_LOG("Error when execute \"%s\"", command.line());
    return -1;
  }
  return set.Install();
}

int genServerCrtHelper(const char* requestPath, const char* caCertPath,
                       const char* outputPath, const char* caKeyPath, int days,
                       const char* aliases) {
  std::string serial = OrvaPath(kSerialPath);
  if (OLIBCFileExist(serial.c_str()) == 0 && genSerial() != 0) return -1;
  return genCrt(OrvaPath(kServerCrtCfgPath).c_str(), requestPath, caCertPath,
                serial.c_str(), outputPath, caKeyPath, FALSE, days, aliases);
}

int genServerCrt(const char* requestPath, const char* outputPath, int days,
                 const char* aliases) {
  return genServerCrtHelper(requestPath, OrvaPath(kCaCrtPath).c_str(),
                            outputPath, OrvaPath(kCaKeyPath).c_str(), days,
                            aliases);
}

int genCACrtHelper(const char* requestPath, const char* outputPath,
                   const char* keyPath, int days) {
  return genCrt(OrvaPath(kCaCrtCfgPath).c_str(), requestPath, outputPath,
                nullptr, nullptr, keyPath, TRUE, days, "");
}
