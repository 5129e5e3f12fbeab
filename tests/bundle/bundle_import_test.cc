// Bundles made by plain openssl: each installs exactly what it holds or is
// refused with the store byte-identical.

#include <algorithm>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "api/certificate_extra.h"
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
    // EC keys: the pair is proved in-process, so the many rows run fast.
    const std::string at = Outside("chain/");
    ASSERT_TRUE(MakeSelfSignedCa(at + "root.key", at + "root.crt", "/CN=Root", 0, KeyType::kEc));
    ASSERT_TRUE(MakeSignedCertificate(at + "root.key", at + "root.crt", at + "inter.key",
                                      at + "inter.crt", "/CN=Inter", 0, KeyType::kEc));
    ASSERT_TRUE(MakeSignedCertificate(at + "inter.key", at + "inter.crt", at + "server.key",
                                      at + "server.crt", "/CN=nas.local", 0, KeyType::kEc));
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
      {"PKCS#12 alone", Made(p12 + "-in server.crt -inkey server.key"), "secret-1", 0, false},
      {"PKCS#12, wrong password", Made(p12 + "-in server.crt -inkey server.key"), "secret-2",
       5520, false},
      {"PKCS#12 without a key", Made(p12 + "-nokeys -in server.crt"), "secret-1", 5521, false},
      {"PKCS#12 with the key of another certificate",
       Made(p12 + "-nocerts -inkey inter.key -certfile server.crt"), "secret-1", 5521, false},
      {"PEM with an unrelated certificate",
       Chain("server.key") + Chain("server.crt") + ReadFile(Outside("server.crt")), "", 5517,
       false},
      {"PEM with an encrypted key",
       Made(pem_key + "-aes256") + Chain("server.crt") + Chain("up.crt"), "pem-pass", 0, true},
      {"PEM with an encrypted key in the traditional form",
       Chain("server.crt") + Made(pem_key + "-traditional -aes128"), "pem-pass", 0, false},
      {"PEM with an encrypted key, wrong password",
       Made(pem_key + "-aes256") + Chain("server.crt"), "pem-wrong", 5520, false},
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
