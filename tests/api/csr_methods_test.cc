#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "tests/support/certificates.h"
#include "tests/support/inspect.h"
#include "tests/support/test_support.h"

namespace {

const char kGenKey[] = "/usr/orva/etc/ssl/.gen/server.key";
const char kGenCsr[] = "/usr/orva/etc/ssl/.gen/server.csr";
const char kGenCrt[] = "/usr/orva/etc/ssl/.gen/server.crt";
const char kServerCrt[] = "/usr/orva/etc/ssl/ssl.crt/server.crt";
const char kCaCrt[] = "/usr/orva/etc/ssl/ssl.crt/ca.crt";
const char kCaKey[] = "/usr/orva/etc/ssl/ssl.key/ca.key";

Json::Value Subject() {
  Json::Value params(Json::objectValue);
  params["country"] = "TW";
  params["state"] = "Taipei";
  params["city"] = "Taipei";
  params["organization"] = "Org";
  params["department"] = "";
  params["common_name"] = "nas.local";
  params["email"] = "admin@nas.local";
  return params;
}

ORVA::APIResponse Call(void (*handler)(ORVA::APIRequest*, ORVA::APIResponse*),
                       const Json::Value& params = Json::Value()) {
  ORVA::APIRequest request("ORVA.Core.Certificate.CSR", "method", 1, params);
  ORVA::APIResponse response;
  handler(&request, &response);
  return response;
}

// The sign method's answer for the uploaded request at `requestPath`.
ORVA::APIResponse Sign(const std::string& requestPath, const char* days, const char* aliases = "") {
  Json::Value params(Json::objectValue);
  params["csr"] = "client.csr";
  params["csr_tmp"] = requestPath;
  params["days"] = days;
  params["alias"] = aliases;
  return Call(doCertificateSign_v1, params);
}

}  // namespace

TEST(CsrCreate, LeavesAPendingPairWithTheTypedSubject) {
  TempDeviceRoot root;
  Json::Value params = Subject();
  params["key_length"] = 1024;
  ORVA::APIResponse response = Call(doCertificateCreateCSR_v1, params);
  ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess, response.outcome()) << response.error_code();
  EXPECT_EQ(Json::Value(Json::objectValue), response.data());
  EXPECT_EQ(0400, FileMode(root.Path(kGenKey)));
  EXPECT_EQ(0400, FileMode(root.Path(kGenCsr)));
  EXPECT_EQ(0700, FileMode(root.Path("/usr/orva/etc/ssl/.gen")));
  EXPECT_EQ("/C=TW/ST=Taipei/L=Taipei/O=Org/CN=nas.local/emailAddress=admin@nas.local",
            RequestSubject(root.Path(kGenCsr)))
      << "an empty department is left out";
  EXPECT_TRUE(RequestMatchesKey(root.Path(kGenCsr), root.Path(kGenKey)));
  EXPECT_EQ(1024, RequestKeyBits(root.Path(kGenCsr)));
}

TEST(CsrCreate, KeyLengthAsTextAndFailureKeepsTheEarlierPendingPairExactly) {
  TempDeviceRoot root;
  Json::Value params = Subject();
  params["key_length"] = "3072";
  ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess,
            Call(doCertificateCreateCSR_v1, params).outcome());
  EXPECT_EQ(3072, PrivateKeyBits(root.Path(kGenKey)));
  const std::string key = ReadFile(root.Path(kGenKey));
  const std::string request = ReadFile(root.Path(kGenCsr));
  const struct { const char *field, *value, *logged; } cases[] = {
      {"key_length", "0", " genKey Error path: /usr/orva/etc/ssl/.gen/server.key\n"},
      {"country", "TWN", " Coountry name length size should be 2.\n"},
      {"common_name", "a\nb", " genCsr Error path: /usr/orva/etc/ssl/.gen/server.csr\n"},
      {"tool", "fails at req", " genCsr Error path: /usr/orva/etc/ssl/.gen/server.csr\n"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(std::string(c.field) + "=" + c.value);
    Json::Value params = Subject();
    if (c.field == std::string("tool")) {
      root.WriteScript("/usr/orva/bin/openssl",
                       "if [ \"$1\" = req ]; then exit 1; fi\nexec /usr/bin/openssl \"$@\"");
    } else {
      params[c.field] = c.value;
    }
    LogCapture log;
    EXPECT_EQ(5501, Call(doCertificateCreateCSR_v1, params).error_code());
    EXPECT_TRUE(log.Contains(c.logged)) << log.Text();
    EXPECT_TRUE(log.Contains(" Generate csr from csr action failed[0x")) << log.Text();
    EXPECT_EQ(key, ReadFile(root.Path(kGenKey)));
    EXPECT_EQ(request, ReadFile(root.Path(kGenCsr)));
  }
}

TEST(CsrRenew, RepeatsTheInstalledSubjectAndKeySize) {
  TempDeviceRoot root;
  ASSERT_TRUE(MakeSelfSignedCa(root.Path(kCaKey), root.Path(kCaCrt), "/CN=Root"));
  ASSERT_TRUE(MakeSignedCertificate(root.Path(kCaKey), root.Path(kCaCrt),
                                    root.Path("/usr/orva/etc/ssl/ssl.key/server.key"),
                                    root.Path(kServerCrt), "/C=DE/O=Org/CN=nas.local", 3072));
  ORVA::APIResponse response = Call(doCertificateRenew_v1, Json::Value(Json::objectValue));
  ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess, response.outcome()) << response.error_code();
  EXPECT_TRUE(response.data().isNull());
  EXPECT_EQ("/C=DE/O=Org/CN=nas.local", RequestSubject(root.Path(kGenCsr)));
  EXPECT_EQ(3072, RequestKeyBits(root.Path(kGenCsr)));
  EXPECT_TRUE(RequestMatchesKey(root.Path(kGenCsr), root.Path(kGenKey)));

  // An EC certificate gives a 2048-bit RSA request.
  ASSERT_TRUE(RunForTest("openssl req -x509 -newkey ec -pkeyopt ec_paramgen_curve:P-256 -nodes "
                         "-keyout '" + root.Path("/ec.key") + "' -out '" + root.Path("/ec.crt") +
                         "' -subj /C=TW/CN=ec.local"));
  root.WriteFile(kServerCrt, ReadFile(root.Path("/ec.crt")));
  ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess, Call(doCertificateRenew_v1).outcome());
  EXPECT_EQ(2048, RequestKeyBits(root.Path(kGenCsr)));
  EXPECT_EQ("/C=TW/CN=ec.local", RequestSubject(root.Path(kGenCsr)));
}

TEST(CsrRenew, MissingOrEmptyCertificateAnswers5501) {
  TempDeviceRoot root;
  {
    LogCapture log;
    EXPECT_EQ(5501, Call(doCertificateRenew_v1).error_code());
    EXPECT_TRUE(log.Contains(" Get certificate info failed./usr/orva/etc/ssl/ssl.crt/server.crt\n"))
        << log.Text();
  }
  root.WriteFile(kServerCrt, "no certificate here\n");
  LogCapture log;
  EXPECT_EQ(5501, Call(doCertificateRenew_v1).error_code());
  EXPECT_TRUE(log.Contains(" read x509 failed[0x")) << log.Text();
  EXPECT_TRUE(
      log.Contains(" Getting key length from /usr/orva/etc/ssl/ssl.crt/server.crt failed[0x"))
      << log.Text();
  EXPECT_FALSE(FileExists(root.Path(kGenKey)));
}

TEST(CsrSign, SignsAnUploadedRequestWithTheLocalCa) {
  TempDeviceRoot root;
  ASSERT_TRUE(MakeSelfSignedCa(root.Path(kCaKey), root.Path(kCaCrt), "/CN=Local Root"));
  ASSERT_TRUE(MakeRequest(root.Path("/up/client.key"), root.Path("/up/client.csr"), "/CN=client"));
  ORVA::APIResponse response = Sign(root.Path("/up/client.csr"), "30", "client.lan;10.0.0.7");

  ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess, response.outcome()) << response.error_code();
  EXPECT_EQ(Json::Value(Json::objectValue), response.data());
  EXPECT_TRUE(RunForTest("openssl verify -CAfile '" + root.Path(kCaCrt) + "' '" +
                         root.Path(kGenCrt) + "'"));
  std::string text = CertificateText(root.Path(kGenCrt));
  EXPECT_NE(std::string::npos, text.find("DNS:client.lan, IP Address:10.0.0.7")) << text;
  EXPECT_EQ(0400, FileMode(root.Path(kGenCrt)));
  EXPECT_TRUE(FileExists(root.Path("/up/client.csr"))) << "the upload is not touched";
}

TEST(CsrSign, RefusesBadDaysAndWhatIsNotARequestAndSignsNothingWithoutACa) {
  TempDeviceRoot root;
  for (const char* days : {"0", "-5"}) {
    SCOPED_TRACE(days);
    LogCapture log;
    EXPECT_EQ(5503, Sign(root.Path("/missing.csr"), days).error_code());
    EXPECT_TRUE(log.Contains(" 0 >= days[0x")) << log.Text();
    EXPECT_FALSE(log.Contains("Check CSR file failed")) << "the file is not opened";
  }
  ASSERT_TRUE(MakeSelfSignedCa(root.Path("/other.key"), root.Path("/other.crt"), "/CN=x"));
  EXPECT_EQ(5519, Sign(root.Path("/other.crt"), "30").error_code());
  EXPECT_EQ(5501, Sign(root.Path("/missing.csr"), "30").error_code());

  ASSERT_TRUE(MakeRequest(root.Path("/client.key"), root.Path("/client.csr"), "/CN=client"));
  LogCapture log;
  EXPECT_EQ(5501, Sign(root.Path("/client.csr"), "30").error_code());
  EXPECT_TRUE(log.Contains(" Generate crt failed\n")) << log.Text();
  EXPECT_FALSE(FileExists(root.Path(kGenCrt)));
}
