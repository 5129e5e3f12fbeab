#include "tests/support/certificates.h"

#include <cstdio>
#include <cstdlib>
#include <initializer_list>

#include "tests/support/test_support.h"

namespace {

// `text` as one shell word.
std::string Quote(const std::string& text) {
  std::string quoted = "'";
  for (char c : text) quoted += c == '\'' ? std::string("'\\''") : std::string(1, c);
  return quoted + "'";
}

// Makes the folders of each path's parent.
void MakeParents(std::initializer_list<std::string> paths) {
  for (const std::string& path : paths) MakeDirs(path.substr(0, path.rfind('/')));
}

}  // namespace

bool RunForTest(const std::string& commandLine) {
  return std::system((commandLine + " </dev/null >/dev/null 2>&1").c_str()) == 0;
}

bool MakeSelfSignedCa(const std::string& keyPath, const std::string& certPath,
                      const std::string& subject, int bits) {
  MakeParents({keyPath, certPath});
  return RunForTest("openssl req -x509 -newkey rsa:" + std::to_string(bits) + " -nodes -keyout " +
                    Quote(keyPath) + " -out " + Quote(certPath) + " -days 365 -subj " +
                    Quote(subject));
}

bool MakeRequest(const std::string& keyPath, const std::string& csrPath,
                 const std::string& subject, int bits) {
  MakeParents({keyPath, csrPath});
  return RunForTest("openssl req -newkey rsa:" + std::to_string(bits) + " -nodes -keyout " +
                    Quote(keyPath) + " -out " + Quote(csrPath) + " -subj " + Quote(subject));
}

bool MakeSignedCertificate(const std::string& caKeyPath, const std::string& caCertPath,
                           const std::string& keyPath, const std::string& certPath,
                           const std::string& subject, int bits) {
  std::string csr = certPath + ".csr";
  bool made = MakeRequest(keyPath, csr, subject, bits) &&
              RunForTest("openssl x509 -req -in " + Quote(csr) + " -CA " + Quote(caCertPath) +
                         " -CAkey " + Quote(caKeyPath) + " -set_serial 7 -days 200 -out " +
                         Quote(certPath));
  std::remove(csr.c_str());
  return made;
}
