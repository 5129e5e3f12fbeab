// The extension files the tool reads when it signs a certificate.

#include <arpa/inet.h>

#include <cctype>
#include <string>

#include "common/log.h"
#include "toolkit/mkcert.h"
#include "toolkit/mkcert_internal.h"
#include "toolkit/store_file.h"

namespace {

const char kCaExtensions[] =
    "extensions = x509v3\n"
    "[ x509v3 ]\n"
    "subjectAltName   = email:copy\n"
    "basicConstraints = CA:true,pathlen:0\n"
    "nsComment        = \"mod_ssl generated custom CA certificate\"\n"
    "nsCertType       = sslCA\n";

const char kServerExtensions[] =
    "extensions = x509v3\n"
    "[ x509v3 ]\n"
    "subjectAltName   = email:copy\n"
    "nsComment        = \"mod_ssl generated custom server certificate\"\n"
    "nsCertType       = server\n";

bool IsAddressLiteral(const char* name) {
  unsigned char address[sizeof(struct in6_addr)];
  return inet_pton(AF_INET, name, address) == 1 ||
         inet_pton(AF_INET6, name, address) == 1;
}

// A name goes between double quotes in a list separated by commas: only
// characters that can end neither are let through.
bool IsHostName(const char* name) {
  for (const char* p = name; *p != '\0'; ++p) {
    unsigned char c = static_cast<unsigned char>(*p);
    if (!std::isalnum(c) && c != '.' && c != '-' && c != '_' && c != '*') {
      return false;
    }
  }
  return true;
}

// True when `name` may stand in the alternative names (empty names are
// skipped and count as allowed).
bool IsAllowedAlias(const char* name) {
  return *name == '\0' || IsAddressLiteral(name) || IsHostName(name);
}

// The subjectAltName entries for the names of `aliases`, empty names
// skipped. False (logged) when a name is neither an address literal nor a
// host name.
bool AliasEntries(const OLIBSZLIST* aliases, std::string* entries) {
  const std::vector<const char*> names = ListItems(aliases);
  for (size_t i = 0; i < names.size(); ++i) {
    const char* name = names[i];
    if (*name == '\0') continue;
    if (!IsAllowedAlias(name)) {
      ORVA_LOG("Alias %zu is neither a host name nor an IP address", i + 1);
      return false;
    }
    bool address = IsAddressLiteral(name);
    if (!entries->empty()) *entries += ", ";
    *entries += address ? "IP:" : "DNS:";
    *entries += name;
  }
  return true;
}

// Writes an extension file. 0 or -1 (logged).
int WriteExtensionFile(const char* path, const std::string& text) {
  if (genDir(path) != 0) {
    ORVA_LOG("generate directory failed");
    return -1;
  }
  int written = WriteTextFile(path, text);
  if (written == -1) {
    ORVA_LOG_LASTERR("fopen %s failed", path);
    return -1;
  }
  if (written != 0) {
    ORVA_LOG_LASTERR("Write %s failed", path);
    return -1;
  }
  return 0;
}

}  // namespace

int generateCACNF(const char* path) {
  if (path == nullptr || *path == '\0') {
    ORVA_LOG_LASTERR("CA CNF name is null or empty.");
    return -1;
  }
  return WriteExtensionFile(path, kCaExtensions);
}

int generateServerCNF(const char* path, OLIBSZLIST* aliases) {
  if (path == nullptr || *path == '\0') {
    ORVA_LOG_LASTERR("Server CNF name is null or empty.");
    return -1;
  }
  if (aliases == nullptr) {
    ORVA_LOG("alias list is null");
    return -1;
  }
  std::string entries;
  if (!AliasEntries(aliases, &entries)) return -1;
  std::string text = kServerExtensions;
  if (!entries.empty()) text += "subjectAltName = \"" + entries + "\"\n";
  return WriteExtensionFile(path, text);
}

int checkAliasText(const char* aliases) {
  if (aliases == nullptr) return 0;
  OLIBSzListPtr names = SplitAliases(aliases);
  if (!names) return -1;
  const std::vector<const char*> items = ListItems(names.get());
  for (size_t i = 0; i < items.size(); ++i) {
    if (!IsAllowedAlias(items[i])) {
      ORVA_LOG("Alias %zu is neither a host name nor an IP address", i + 1);
      return -1;
    }
  }
  return 0;
}
