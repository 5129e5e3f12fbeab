// What the device refuses to make or install because no HTTPS could use
// it: keys below 2048 bits and certificates that would name no host. A
// refusal leaves every key, request and certificate of the store as it was.

#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "tests/support/certificates.h"
#include "tests/support/inspect.h"
#include "tests/support/method_calls.h"
#include "tests/support/store_state.h"
#include "tests/support/test_support.h"

namespace {

constexpr char kCaKey[] = "/usr/orva/etc/ssl/ssl.key/ca.key";
constexpr char kCaCrt[] = "/usr/orva/etc/ssl/ssl.crt/ca.crt";

// A complete subject for the server and the CA with the values of the JSON
// object `changes`, where "ROOT" stands for the device root.
Json::Value Params(const TempDeviceRoot& root, std::string changes) {
  for (size_t at; (at = changes.find("ROOT")) != std::string::npos;) changes.replace(at, 4, root.root());
  Json::Value params = SubjectParams(), ca = SubjectParams("ca_"), changed;
  Json::Reader().parse(changes, changed);
  for (const std::string& name : ca.getMemberNames()) params[name] = ca[name];
  for (const std::string& name : changed.getMemberNames()) params[name] = changed[name];
  return params;
}

}  // namespace

TEST(ServerRules, RefusalsLeaveTheStoreAsItWas) {
  const struct {
    const char* what;
    MethodHandler method;
    const char* changes;
    int code;
    const char* logged;
  } cases[] = {
      {"CRT create with a 1024-bit key", doCertificateCreateCRT_v1, R"({"key_length":"1024"})",
       5501, "Key size 1024 refused: RSA keys have 2048 to 16384 bits"},
      {"CSR create with a 1024-bit key", doCertificateCreateCSR_v1, R"({"key_length":"1024"})",
       5501, "Key size 1024 refused"},
      {"CSR create of a DSA key", doCertificateCreateCSR_v1, R"({"key_type":"dsa"})", 5503,
       "Key type \"dsa\" refused: keys are \"rsa\" or \"ec\""},
      {"CRT create with a CA key on P-521", doCertificateCreateCRT_v1,
       R"({"ca_key_type":"ec","ca_key_length":"521"})", 5501,
       "EC key size 521 refused: EC keys are made on P-256 or P-384"},
      {"CRT create for a common name that is no host name", doCertificateCreateCRT_v1,
       R"({"common_name":"My NAS"})", 5501,
       "The certificate would name no host: no alias, and the common name is no host name"},
      {"CSR sign of a request that names no host", doCertificateSign_v1,
       R"({"days":"825","csr":"l.csr","csr_tmp":"ROOT/outside/laptop.csr"})", 5501,
       "The certificate would name no host"},
      {"import of a 1024-bit pair", doCertificateImport_v1,
       R"({"cert_tmp":"ROOT/outside/small.crt","key_tmp":"ROOT/outside/small.key"})", 5514,
       "The key has 1024 bits: the device's HTTPS needs RSA keys of at least 2048 bits"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.what);
    TempDeviceRoot root;
    InstallOldStore(root);
    ASSERT_TRUE(MakeRequest(root.Path("/outside/laptop.key"), root.Path("/outside/laptop.csr"),
                            "/CN=My Laptop"));
    ASSERT_TRUE(MakeSignedCertificate(root.Path(kCaKey), root.Path(kCaCrt),
                                      root.Path("/outside/small.key"),
                                      root.Path("/outside/small.crt"), "/CN=small.local", 1024));
    const StoreState before = ReadStore(root);
    LogCapture log;
    EXPECT_EQ(c.code, CallMethod(c.method, Params(root, c.changes)).response.error_code());
    EXPECT_TRUE(log.Contains(c.logged)) << log.Text();
    EXPECT_EQ(CertificateFiles(before), CertificateFiles(ReadStore(root)));
  }
}
