// Whether a private key belongs to a certificate: by the digests of their
// RSA moduli, or for other keys by the library.

#include <openssl/err.h>
#include <openssl/pem.h>

#include <cstdio>
#include <cstring>
#include <string>

#include "common/log.h"
#include "common/pem_password.h"
#include "common/raii.h"
#include "platform/olib/olib_file.h"
#include "toolkit/mkcert.h"
#include "toolkit/mkcert_internal.h"

namespace {

constexpr size_t kDigestLineSize = 512;

// The modulus stage keeps a line only when the tool printed a hexadecimal
// modulus, and the digest stage runs only on such a line: a file without a
// modulus yields no digest line at all instead of the digest of nothing,
// which would be the same for any two unreadable files.
constexpr char kCertificateDigest[] =
    "%s x509 -noout -modulus -in %s"
    " | sed -n 's/^Modulus=\\([0-9A-F][0-9A-F]*\\)$/\\1/p'"
    " | { read -r modulus && echo \"$modulus\" | %s md5; }";
constexpr char kKeyDigest[] =
    "%s rsa -noout -modulus -in %s"
    " | sed -n 's/^Modulus=\\([0-9A-F][0-9A-F]*\\)$/\\1/p'"
    " | { read -r modulus && echo \"$modulus\" | %s md5; }";

// The first output line of the digest pipeline `format` for `path`, in
// `line`. 1 when read, 0 otherwise.
int DigestLine(const char* format, const char* path, char* line) {
  ShellCommand command(RootedCommandSize(kToolkitCommandSize));
  command.Append(format, {OpensslTool(), path, OpensslTool()});
  return getMd5(line, kDigestLineSize, command);
}

}  // namespace

int getMd5(char* output, int size, const ShellCommand& command) {
  ShellPipe pipe(command);
  if (pipe.stream() == nullptr) {
    ORVA_LOG("Command failed:%s", command.line());
    return 0;
  }
  std::string line;
  char chunk[kDigestLineSize];
  while (std::fgets(chunk, sizeof(chunk), pipe.stream()) != nullptr) {
    line += chunk;
    if (line.back() == '\n') break;
  }
  if (line.empty()) {
    ORVA_LOG("Get md5 failed");
    return 0;
  }
  if (size > 0) std::snprintf(output, static_cast<size_t>(size), "%s", line.c_str());
  return 1;
}

int verifyCrtAndKey(const char* certPath, const char* keyPath, CYPHER keyType) {
  if (OLIBCFileUTF8BomStrip(certPath) != 0 ||
      OLIBCFileUTF8BomStrip(keyPath) != 0) {
    ORVA_LOG("Failed to strip utf8 BOM");
    return -1;
  }
  char certificate_digest[kDigestLineSize] = {0};
  if (DigestLine(kCertificateDigest, certPath, certificate_digest) == 0) {
    ORVA_LOG("get md5 failed crt=%s", certPath);
    return -1;
  }
  char key_digest[kDigestLineSize] = {0};
  if (DigestLine(kKeyDigest, keyPath, key_digest) == 0) {
    if (keyType != CYPHER_RSA) return 1;
    ORVA_LOG("get md5 failed key=%s", keyPath);
    return -1;
  }
  return std::strcmp(key_digest, certificate_digest) == 0 ? 0 : 1;
}

bool HasRsaCertificate(const char* certPath) {
  FilePtr file(std::fopen(certPath, "r"));
  X509Ptr certificate(file ? PEM_read_X509(file.get(), nullptr, RefusePemPassword, nullptr)
                           : nullptr);
  ERR_clear_error();
  return certificate &&
         EVP_PKEY_get_base_id(X509_get0_pubkey(certificate.get())) == EVP_PKEY_RSA;
}

int proveCrtAndKey(const char* certPath, const char* keyPath) {
  FilePtr certificate_file(std::fopen(certPath, "r"));
  FilePtr key_file(std::fopen(keyPath, "r"));
  X509Ptr certificate(certificate_file ? PEM_read_X509(certificate_file.get(), nullptr,
                                                       RefusePemPassword, nullptr)
                                       : nullptr);
  EvpPkeyPtr key(key_file ? PEM_read_PrivateKey(key_file.get(), nullptr, RefusePemPassword,
                                                nullptr)
                          : nullptr);
  int match = -1;
  if (certificate && key) match = X509_check_private_key(certificate.get(), key.get()) == 1 ? 0 : 1;
  ERR_clear_error();  // A refused pair leaves nothing for later callers.
  return match;
}

int verifyCrtAndKeyOfAnyType(const char* certPath, const char* keyPath) {
  if (HasRsaCertificate(certPath)) {
    // Not CYPHER_RSA: a key that shows no modulus is another type's, no match.
    return verifyCrtAndKey(certPath, keyPath, CYPHER_NONE);
  }
  const int match = proveCrtAndKey(certPath, keyPath);
  if (match == -1) ORVA_LOG("Read crt %s or key %s failed", certPath, keyPath);
  return match;
}
