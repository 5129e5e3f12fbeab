#include "tests/support/certificates.h"

#include <cstdio>
#include <cstdlib>

#include "tests/support/test_support.h"

namespace {

// `text` as one shell word.
std::string Quote(const std::string& text) {
  std::string quoted = "'";
  for (char c : text) quoted += c == '\'' ? std::string("'\\''") : std::string(1, c);
  return quoted + "'";
}

// Runs `openssl req` with a new key of `type` written to `keyPath` and
// `options` added, making the key's folder and the folder of `outPath`.
bool NewKeyRequest(const std::string& keyPath, const std::string& outPath, int bits,
                   KeyType type, const std::string& options) {
  MakeDirs(keyPath.substr(0, keyPath.rfind('/')));
  MakeDirs(outPath.substr(0, outPath.rfind('/')));
  const std::string bitsText = std::to_string(bits);
  const std::string dsaParameters = keyPath + ".dsaparam";
  std::string newKey = "rsa:" + bitsText;
  if (type == KeyType::kEc) newKey = "ec -pkeyopt ec_paramgen_curve:P-256";
  if (type == KeyType::kDsa) {
    if (!RunForTest("openssl dsaparam -out " + Quote(dsaParameters) + " " + bitsText)) {
      return false;
    }
    newKey = "dsa:" + Quote(dsaParameters);
  }
  bool made = RunForTest("openssl req -newkey " + newKey + " -nodes -keyout " + Quote(keyPath) +
                         " -out " + Quote(outPath) + " " + options);
  std::remove(dsaParameters.c_str());
  return made;
}

}  // namespace

bool RunForTest(const std::string& commandLine) {
  return std::system((commandLine + " </dev/null >/dev/null 2>&1").c_str()) == 0;
}

bool MakeSelfSignedCa(const std::string& keyPath, const std::string& certPath,
                      const std::string& subject, int bits, KeyType type) {
  return NewKeyRequest(keyPath, certPath, bits, type,
                       "-x509 -days 365 -subj " + Quote(subject));
}

bool MakeRequest(const std::string& keyPath, const std::string& csrPath,
                 const std::string& subject, int bits) {
  return NewKeyRequest(keyPath, csrPath, bits, KeyType::kRsa, "-subj " + Quote(subject));
}

bool MakeSignedCertificate(const std::string& caKeyPath, const std::string& caCertPath,
                           const std::string& keyPath, const std::string& certPath,
                           const std::string& subject, int bits, KeyType type) {
  const std::string csr = certPath + ".csr";
  bool made = NewKeyRequest(keyPath, csr, bits, type, "-subj " + Quote(subject)) &&
              RunForTest("openssl x509 -req -in " + Quote(csr) + " -CA " + Quote(caCertPath) +
                         " -CAkey " + Quote(caKeyPath) + " -set_serial 7 -days 200 -out " +
                         Quote(certPath));
  std::remove(csr.c_str());
  return made;
}

bool MakeChain(const std::string& folder, const std::string& subject, int bits) {
  const std::string at = folder + "/";
  return MakeSelfSignedCa(at + "root.key", at + "root.crt", "/CN=Root", bits) &&
         MakeSignedCertificate(at + "root.key", at + "root.crt", at + "inter.key",
                               at + "inter.crt", "/CN=Intermediate", bits) &&
         MakeSignedCertificate(at + "inter.key", at + "inter.crt", at + "server.key",
                               at + "server.crt", subject, bits);
}
