// Whether a private key belongs to a certificate, by the digests of their
// RSA moduli.

#include <cstdio>
#include <cstring>
#include <string>

#include "common/log.h"
#include "platform/olib/olib_file.h"
#include "toolkit/mkcert.h"
#include "toolkit/mkcert_internal.h"

namespace {

constexpr size_t kDigestLineSize = 512;

// The modulus stage keeps a line only when the tool printed a hexadecimal
// modulus. For a file without one the digest stage gets no input at all, and
// its line, the digest of nothing, counts as no digest line: it would be the
// same for any two unreadable files. All three stages start together, as
// the tool's own pipeline does; waiting for the modulus before starting the
// digest stage cost a subshell and a tool start per digest.
constexpr char kCertificateDigest[] =
    "%s x509 -noout -modulus -in %s"
    " | sed -n 's/^Modulus=\\([0-9A-F][0-9A-F]*\\)$/\\1/p'"
    " | %s md5";
constexpr char kKeyDigest[] =
    "%s rsa -noout -modulus -in %s"
    " | sed -n 's/^Modulus=\\([0-9A-F][0-9A-F]*\\)$/\\1/p'"
    " | %s md5";

// The MD5 digest of empty input, as the digest stage prints it in hex.
constexpr char kDigestOfNothing[] = "d41d8cd98f00b204e9800998ecf8427e";

// The first output line of the digest pipeline `format` for `path`, in
// `line`. 1 when the digest of a modulus was read; 0 otherwise (logged).
int DigestLine(const char* format, const char* path, char* line) {
  ShellCommand command(RootedCommandSize(kToolkitCommandSize));
  command.Append(format, {OpensslTool(), path, OpensslTool()});
  if (getMd5(line, kDigestLineSize, command) == 0) return 0;
  if (std::strstr(line, kDigestOfNothing) != nullptr) {
    ORVA_LOG("Get md5 failed");
    return 0;
  }
  return 1;
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
