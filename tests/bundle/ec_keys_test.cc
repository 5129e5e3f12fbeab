// EC keys wherever the device makes keys: CRT create on either side, CSR
// create, renew keeping the curve, and CSR sign.

#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "common/store_paths.h"
#include "tests/support/certificates.h"
#include "tests/support/method_calls.h"
#include "tests/support/test_support.h"

namespace {

bool Succeeded(const ORVA::APIResponse& answer) {
  return answer.outcome() == ORVA::APIResponse::Outcome::kSuccess;
}

}  // namespace

TEST(EcKeys, CreateRenewAndSignKeepTheKeyAskedFor) {
  const struct { const char *type, *length, *ca_type, *server_key, *ca_key; } cases[] = {
      {"ec", "256", "rsa", "NIST CURVE: P-256", "Public-Key: (2048 bit)"},
      {"ec", "384", "ec", "NIST CURVE: P-384", "NIST CURVE: P-256"},
      {"rsa", "2048", "ec", "Public-Key: (2048 bit)", "NIST CURVE: P-256"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(std::string(c.type) + c.length + " by " + c.ca_type);
    TempDeviceRoot root;
    Json::Value params = SubjectParams(), ca = SubjectParams("ca_");
    for (const std::string& name : ca.getMemberNames()) params[name] = ca[name];
    params["key_type"] = c.type;
    params["key_length"] = c.length;
    params["ca_key_type"] = c.ca_type;
    ASSERT_TRUE(Succeeded(CallMethod(doCertificateCreateCRT_v1, params).response));
    const std::string ca_crt = root.Path(kCaCrtPath), server_crt = root.Path(kServerCrtPath);
    EXPECT_NE(std::string::npos, PemText(ca_crt).find(c.ca_key)) << PemText(ca_crt);
    EXPECT_NE(std::string::npos, PemText(server_crt).find(c.server_key));
    EXPECT_TRUE(RunForTest("openssl verify -x509_strict -CAfile '" + ca_crt + "' '" +
                           server_crt + "'"));
    ASSERT_TRUE(Succeeded(CallMethod(doCertificateRenew_v1).response));
    EXPECT_NE(std::string::npos, PemText(root.Path(kGenCsrPath)).find(c.server_key));
    Json::Value sign(Json::objectValue);
    sign["days"] = "30";
    sign["csr"] = "request.csr";
    sign["csr_tmp"] = root.Path(kGenCsrPath);
    ASSERT_TRUE(Succeeded(CallMethod(doCertificateSign_v1, sign).response));
    const std::string signed_text = PemText(root.Path(kGenCrtPath));
    EXPECT_NE(std::string::npos, signed_text.find(c.server_key));
    EXPECT_EQ(std::string(c.type) == "rsa",
              signed_text.find("Key Encipherment") != std::string::npos);
    EXPECT_TRUE(RunForTest("openssl verify -CAfile '" + ca_crt + "' '" +
                           root.Path(kGenCrtPath) + "'"));
    ASSERT_TRUE(Succeeded(CallMethod(doCertificateCreateCSR_v1, params).response));
    EXPECT_NE(std::string::npos, PemText(root.Path(kGenCsrPath)).find(c.server_key));
  }
}
