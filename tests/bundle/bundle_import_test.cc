// Bundles made by plain openssl: each installs exactly what it holds or is
// refused with the store byte-identical.

#include <openssl/pem.h>
#include <openssl/pkcs12.h>

#include <algorithm>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "api/certificate_extra.h"
#include "common/raii.h"
#include "common/store_paths.h"
#include "tests/support/certificates.h"
#include "tests/support/method_calls.h"
#include "tests/support/store_state.h"

namespace {

// A store with an old set; in "/outside" InstallOldStore's set and a chain
// root <- inter <- server unrelated to it.
class BundleImport : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_NO_FATAL_FAILURE(InstallOldStore(root_));
    ASSERT_TRUE(MakeVerifiableChain(Outside("chain"), "/CN=nas.local"));
    root_.WriteFile("/outside/chain/up.crt", Chain("inter.crt") + Chain("root.crt"));
    before_ = ReadStore(root_);
  }

  std::string Outside(const std::string& name) const { return root_.Path("/outside/" + name); }
  std::string Chain(const std::string& name) const { return ReadFile(Outside("chain/" + name)); }

  // Runs `command` in the chain's folder; it writes the bundle to "b".
  std::string Made(const std::string& command) {
    EXPECT_TRUE(RunForTest("cd '" + Outside("chain") + "' && rm -f b && " + command)) << command;
    return ReadFile(Outside("chain/b"));
  }

  ORVA::APIResponse Import(const std::string& bundle, const std::string& password) {
    root_.WriteFile("/upload/bundle", bundle, 0600);
    Json::Value params(Json::objectValue);
    params["bundle_tmp"] = root_.Path("/upload/bundle");
    if (!password.empty()) params["password"] = password;
    return CallMethod(doBundleImport_v1, params).response;
  }

  TempDeviceRoot root_;
  StoreState before_;
};

// The key of `keyPath` with the certificates of `certPaths` but none of its
// own, which the openssl tool refuses to write.
std::string Pkcs12WithoutItsCertificate(const std::string& keyPath,
                                        const std::vector<std::string>& certPaths) {
  FilePtr key_file(std::fopen(keyPath.c_str(), "r"));
  EvpPkeyPtr key(PEM_read_PrivateKey(key_file.get(), nullptr, nullptr, nullptr));
  X509StackPtr others(sk_X509_new_null());
  for (const std::string& path : certPaths) {
    FilePtr file(std::fopen(path.c_str(), "r"));
    sk_X509_push(others.get(), PEM_read_X509(file.get(), nullptr, nullptr, nullptr));
  }
  Pkcs12Ptr file(PKCS12_create("secret-1", "x", key.get(), nullptr, others.get(), 0, 0, 0, 0, 0));
  BioPtr der(BIO_new(BIO_s_mem()));
  char* data = nullptr;
  if (!file || i2d_PKCS12_bio(der.get(), file.get()) != 1) return "";
  const long size = BIO_get_mem_data(der.get(), &data);
  return std::string(data, static_cast<size_t>(size));
}

}  // namespace

TEST_F(BundleImport, InstallsWhatTheBundleHoldsOrRefusesItWithTheStoreUntouched) {
  const std::string p12 = "openssl pkcs12 -export -passout pass:secret-1 -out b ";
  const std::string pem_key = "openssl pkey -in server.key -passout pass:pem-pass -out b ";
  struct Case {
    std::string what, bundle, password;
    int code;          // 0: installed
    bool with_chain;   // installed with inter.crt and root.crt as its chain
  };
  std::vector<Case> cases = {
      {"PKCS#12 with its chain", Made(p12 + "-in server.crt -inkey server.key -certfile up.crt"),
       "secret-1", 0, true},
      {"legacy PKCS#12 with its chain",
       Made(p12 + "-legacy -in server.crt -inkey server.key -certfile up.crt"), "secret-1", 0,
       true},
      {"PKCS#12 alone", Made(p12 + "-in server.crt -inkey server.key"), "secret-1", 0, false},
      {"PKCS#12, wrong password", Made(p12 + "-in server.crt -inkey server.key"), "secret-2",
       5520, false},
      {"PKCS#12 without a key", Made(p12 + "-nokeys -in server.crt"), "secret-1", 5521, false},
      {"PKCS#12 with the key of another certificate",
       Pkcs12WithoutItsCertificate(Outside("server.key"), {Outside("chain/server.crt")}),
       "secret-1", 5521, false},
      {"PEM with an unrelated certificate",
       Chain("server.key") + Chain("server.crt") + ReadFile(Outside("server.crt")), "", 5517,
       false},
      {"PEM with an encrypted key",
       Made(pem_key + "-aes256") + Chain("server.crt") + Chain("up.crt"), "pem-pass", 0, true},
      {"PEM with an encrypted key in the traditional form",
       Chain("server.crt") + Made(pem_key + "-traditional -aes128"), "pem-pass", 0, false},
      {"PEM with an encrypted key, wrong password",
       Made(pem_key + "-aes256") + Chain("server.crt"), "pem-wrong", 5520, false},
      {"PEM with an encrypted key, no password",
       Made(pem_key + "-aes256") + Chain("server.crt"), "", 5520, false},
      {"PEM with two keys", Chain("server.key") + Chain("server.crt") + Chain("inter.key"), "",
       5521, false},
      {"neither PEM nor PKCS#12", "\x30\x03\x02\x01\x00", "", 5521, false},
  };
  // PEM bundles in every order, one certificate repeated.
  std::vector<std::string> parts = {"inter.crt", "root.crt", "server.crt", "server.key"};
  do {
    std::string bundle, order;
    for (const std::string& part : parts) bundle += Chain(part), order += part + " ";
    cases.push_back({"PEM " + order, bundle + Chain("root.crt"), "", 0, true});
  } while (std::next_permutation(parts.begin(), parts.end()));

  for (const Case& c : cases) {
    SCOPED_TRACE(c.what);
    const ORVA::APIResponse answer = Import(c.bundle, c.password);
    if (c.code != 0) {
      EXPECT_EQ(c.code, answer.error_code());
      EXPECT_EQ(CertificateFiles(before_), CertificateFiles(ReadStore(root_)));
      continue;
    }
    ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess, answer.outcome());
    EXPECT_EQ(Chain("server.crt"), ReadFile(root_.Path(kServerCrtPath)));
    EXPECT_EQ(Chain("server.key"), ReadFile(root_.Path(kServerKeyPath)));
    EXPECT_EQ(c.with_chain ? Chain("up.crt") : "", ReadFile(root_.Path(kInterCrtPath)));
    ExpectStoreWhole(root_, before_);
    RestoreStore(root_, before_);
  }
}
