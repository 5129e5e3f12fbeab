// The extension files the tool reads when it signs a certificate.

#include <arpa/inet.h>

#include <cctype>
#include <string>
#include <vector>

#include "common/log.h"
#include "toolkit/mkcert.h"
#include "toolkit/mkcert_internal.h"
#include "toolkit/store_file.h"

namespace {

const char kExtensionsHead[] =
    "extensions = x509v3\n"
    "[ x509v3 ]\n";

// Strict verifiers want a CA's basic constraints critical and its key
// usage naming certificate signing.
const char kCaExtensions[] =
    "basicConstraints = critical,CA:true,pathlen:0\n"
    "keyUsage         = critical,keyCertSign,cRLSign\n"
    "subjectKeyIdentifier = hash\n"
    "nsComment        = \"mod_ssl generated custom CA certificate\"\n"
    "nsCertType       = sslCA\n";

// Apple's clients refuse a server certificate without serverAuth usage;
// strict verifiers want the key identifiers.
const char kServerExtensions[] =
    "basicConstraints       = critical,CA:false\n"
    "extendedKeyUsage       = serverAuth\n"
    "subjectKeyIdentifier   = hash\n"
    "authorityKeyIdentifier = keyid\n"
    "nsComment              = \"mod_ssl generated custom server certificate\"\n"
    "nsCertType             = server\n";

// An EC key signs only; an RSA key also enciphers the key exchange of
// clients that still use RSA key transport.
const char kEcKeyUsage[] = "keyUsage               = critical,digitalSignature\n";
const char kRsaKeyUsage[] =
    "keyUsage               = critical,digitalSignature,keyEncipherment\n";

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

// Two names are the same when their keys are: host names compare without
// case, address literals as the addresses they write.
std::string NameKey(const char* name) {
  unsigned char address[sizeof(struct in6_addr)] = {0};
  if (inet_pton(AF_INET, name, address) == 1) return "4" + std::string(address, address + 4);
  if (inet_pton(AF_INET6, name, address) == 1) return "6" + std::string(address, address + 16);
  std::string key = "D";
  for (const char* p = name; *p != '\0'; ++p) key += static_cast<char>(std::tolower(*p));
  return key;
}

// The subjectAltName entries of a server certificate signed from `request`:
// the common name when it is a host name or an address literal, then the
// names of `aliases` or, when it names none, the request's own DNS and IP
// names (one that breaks the alias rule is left out, logged), each name
// once, and "email:copy" last when the subject holds an e-mail address.
// False (logged) when an alias breaks the rule or no host name results.
bool ServerNameEntries(const RequestFacts& request, const OLIBSZLIST* aliases,
                       std::string* entries) {
  std::vector<std::string> keys;
  auto add = [&keys, entries](const char* name) {
    const std::string key = NameKey(name);
    for (const std::string& seen : keys) {
      if (seen == key) return;
    }
    keys.push_back(key);
    if (!entries->empty()) *entries += ", ";
    *entries += IsAddressLiteral(name) ? "IP:" : "DNS:";
    *entries += name;
  };
  const char* common_name = request.common_name.c_str();
  if (*common_name != '\0' && IsAllowedAlias(common_name)) add(common_name);
  const std::vector<const char*> given = ListItems(aliases);
  bool aliased = false;
  for (size_t i = 0; i < given.size(); ++i) {
    if (*given[i] == '\0') continue;
    if (!IsAllowedAlias(given[i])) {
      ORVA_LOG("Alias %zu is neither a host name nor an IP address", i + 1);
      return false;
    }
    add(given[i]);
    aliased = true;
  }
  for (size_t i = 0; !aliased && i < request.names.size(); ++i) {
    const char* name = request.names[i].c_str();
    if (*name == '\0' || !IsAllowedAlias(name)) {
      ORVA_LOG("Request name %zu is neither a host name nor an IP address; left out", i + 1);
      continue;
    }
    add(name);
  }
  if (keys.empty()) {
    ORVA_LOG("The certificate would name no host: no alias, and the common name is no host name");
    return false;
  }
  if (request.has_email) *entries += ", email:copy";
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

int generateCACNF(const char* path, bool withEmail) {
  if (path == nullptr || *path == '\0') {
    ORVA_LOG_LASTERR("CA CNF name is null or empty.");
    return -1;
  }
  std::string text = kExtensionsHead;
  if (withEmail) text += "subjectAltName   = email:copy\n";
  return WriteExtensionFile(path, text + kCaExtensions);
}

int generateServerCNF(const char* path, const RequestFacts& request, OLIBSZLIST* aliases) {
  if (path == nullptr || *path == '\0') {
    ORVA_LOG_LASTERR("Server CNF name is null or empty.");
    return -1;
  }
  if (aliases == nullptr) {
    ORVA_LOG("alias list is null");
    return -1;
  }
  std::string entries;
  if (!ServerNameEntries(request, aliases, &entries)) return -1;
  std::string text = kExtensionsHead;
  text += request.ec_key ? kEcKeyUsage : kRsaKeyUsage;
  text += kServerExtensions;
  text += "subjectAltName         = \"" + entries + "\"\n";
  return WriteExtensionFile(path, text);
}

int checkServerNames(const char* commonName, const char* aliases) {
  OLIBSzListPtr names = SplitAliases(aliases == nullptr ? "" : aliases);
  if (!names) return -1;
  RequestFacts request;
  request.common_name = commonName == nullptr ? "" : commonName;
  std::string entries;
  return ServerNameEntries(request, names.get(), &entries) ? 0 : -1;
}
