#include "tests/support/certificates.h"

#include <openssl/pem.h>

#include <cstdio>
#include <cstdlib>

#include "common/raii.h"
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
                 const std::string& subject) {
  return NewKeyRequest(keyPath, csrPath, 2048, KeyType::kRsa, "-subj " + Quote(subject));
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

std::string PemText(const std::string& path) {
  BioPtr text(BIO_new(BIO_s_mem()));
  FilePtr file(std::fopen(path.c_str(), "r"));
  if (!file || !text) return "";
  X509Ptr certificate(PEM_read_X509(file.get(), nullptr, nullptr, nullptr));
  if (certificate) {
    X509_print(text.get(), certificate.get());
  } else {
    std::rewind(file.get());
    X509_REQ* request = PEM_read_X509_REQ(file.get(), nullptr, nullptr, nullptr);
    if (request != nullptr) X509_REQ_print(text.get(), request);
    X509_REQ_free(request);
  }
  char* data = nullptr;
  long size = BIO_get_mem_data(text.get(), &data);
  return std::string(data, static_cast<size_t>(size));
}
