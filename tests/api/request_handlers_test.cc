#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "api/subject_reader.h"
#include "tests/support/certificates.h"
#include "tests/support/inspect.h"
#include "tests/support/test_support.h"

namespace {

using Outcome = ORVA::APIResponse::Outcome;

const char kServerCrt[] = "/usr/orva/etc/ssl/ssl.crt/server.crt";
const char kServerKey[] = "/usr/orva/etc/ssl/ssl.key/server.key";
const char kCaCrt[] = "/usr/orva/etc/ssl/ssl.crt/ca.crt";
const char kCaKey[] = "/usr/orva/etc/ssl/ssl.key/ca.key";
const char kInterCrt[] = "/usr/orva/etc/ssl/ssl.intercrt/server-ca.crt";
const char kGenKey[] = "/usr/orva/etc/ssl/.gen/server.key";
const char kGenCsr[] = "/usr/orva/etc/ssl/.gen/server.csr";
const char kGenCrt[] = "/usr/orva/etc/ssl/.gen/server.crt";

// Both subjects (the CA's differs only in its common name) and 1024-bit
// keys for both.
Json::Value Subjects() {
  Json::Value params(Json::objectValue);
  const char* fields[][2] = {{"country", "TW"},       {"state", "Taipei"},
                             {"city", "Taipei"},      {"organization", "O'Reilly \\ Sons"},
                             {"department", ""},      {"common_name", "nas.local"},
                             {"email", "admin@nas.local"}};
  for (const auto& field : fields) {
    params[field[0]] = field[1];
    params[std::string("ca_") + field[0]] = field[1];
  }
  params["ca_common_name"] = "Local Root";
  params["key_length"] = params["ca_key_length"] = 1024;
  return params;
}

ORVA::APIResponse Call(void (*handler)(ORVA::APIRequest*, ORVA::APIResponse*),
                       const Json::Value& params = Json::Value(Json::objectValue)) {
  ORVA::APIRequest request("ORVA.Core.Certificate", "method", 1, params);
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

// An installed set, and service and plug-in scripts that record, in order,
// that they ran ("httpd-user" is disabled).
void InstallOldSetAndServices(const TempDeviceRoot& root) {
  ASSERT_TRUE(MakeSelfSignedCa(root.Path(kCaKey), root.Path(kCaCrt), "/CN=Old Root", 1024));
  ASSERT_TRUE(MakeSignedCertificate(root.Path(kCaKey), root.Path(kCaCrt), root.Path(kServerKey),
                                    root.Path(kServerCrt), "/CN=old.local", 1024));
  root.WriteFile(kInterCrt, ReadFile(root.Path(kCaCrt)));
  for (const std::string service : {"ftpd-ssl", "webdav-httpd-ssl", "pagora", "httpd-user"}) {
    root.WriteFile("/usr/orva/etc/services/" + service,
                   "#!/bin/sh\necho " + service + " >> \"$ORVA_ROOT/ran.log\"\n",
                   service == "httpd-user" ? 0644 : 0755);
  }
  root.WriteScript("/usr/orva/etc/plugins/certificate/notify",
                   "echo \"plugin $1 $2\" >> \"$ORVA_ROOT/ran.log\"");
}

// The files' contents, to prove what a call left unchanged.
std::string Contents(const TempDeviceRoot& root, const std::vector<const char*>& files) {
  std::string contents;
  for (const char* file : files) contents += std::string(file) + "=" + ReadFile(root.Path(file));
  return contents;
}

std::string Fields(const CSR_ARGUMENT& subject) {
  return subject.country + "|" + subject.state + "|" + subject.city + "|" +
         subject.organization + "|" + subject.department + "|" + subject.common_name + "|" +
         subject.email;
}

}  // namespace

TEST(FillCSRInfo, ReadsTheSelectedSetAndFallsBackToDefaults) {
  Json::Value params(Json::objectValue);
  params["ca_country"] = "DE";
  params["country"] = "FR";
  params["state"] = "";
  params["organization"] = "O'Reilly \"quoted\"";
  ORVA::APIRequest request("ORVA.Core.Certificate.CRT", "create", 1, params);
  CSR_ARGUMENT server, ca;
  ASSERT_EQ(0, fillCSRInfo(&request, &server, false));
  ASSERT_EQ(0, fillCSRInfo(&request, &ca, true));
  EXPECT_EQ("FR||Taipel|O'Reilly \"quoted\"|Department|server.example.com|admin@server.example.com",
            Fields(server))
      << "an empty text stays empty";
  EXPECT_EQ("DE|Taipei|Taipel|Organization|Department|server.example.com|ca@server.example.com",
            Fields(ca));
  LogCapture log;
  EXPECT_EQ(-1, fillCSRInfo(&request, nullptr, false));
  EXPECT_TRUE(log.Contains(" sanity check failed\n")) << log.Text();
}

// The key length comes as text here and as a number in CRT create.
TEST(CsrCreate, LeavesAPendingPairWithTheTypedSubjectThatAFailureKeepsExactly) {
  TempDeviceRoot root;
  Json::Value params = Subjects();
  params["key_length"] = "1024";
  ORVA::APIResponse response = Call(doCertificateCreateCSR_v1, params);
  ASSERT_EQ(Outcome::kSuccess, response.outcome()) << response.error_code();
  EXPECT_EQ(Json::Value(Json::objectValue), response.data());
  EXPECT_EQ(0400, FileMode(root.Path(kGenKey)));
  EXPECT_EQ(0400, FileMode(root.Path(kGenCsr)));
  EXPECT_EQ(0700, FileMode(root.Path("/usr/orva/etc/ssl/.gen")));
  EXPECT_EQ("/C=TW/ST=Taipei/L=Taipei/O=O'Reilly \\ Sons/CN=nas.local/emailAddress=admin@nas.local",
            RequestSubject(root.Path(kGenCsr)))
      << "an empty department is left out";
  EXPECT_TRUE(RequestMatchesKey(root.Path(kGenCsr), root.Path(kGenKey)));
  EXPECT_EQ(1024, RequestKeyBits(root.Path(kGenCsr)));
  const std::string pending = Contents(root, {kGenKey, kGenCsr});
  const struct { const char *field, *value, *logged; } cases[] = {
      {"key_length", "0", " genKey Error path: /usr/orva/etc/ssl/.gen/server.key\n"},
      {"country", "TWN", " Coountry name length size should be 2.\n"},
      {"common_name", "a\nb", " genCsr Error path: /usr/orva/etc/ssl/.gen/server.csr\n"},
      {"tool", "fails at req", " genCsr Error path: /usr/orva/etc/ssl/.gen/server.csr\n"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(std::string(c.field) + "=" + c.value);
    Json::Value params = Subjects();
    params[c.field] = c.value;
    if (c.field == std::string("tool")) {
      root.WriteScript("/usr/orva/bin/openssl",
                       "if [ \"$1\" = req ]; then exit 1; fi\nexec /usr/bin/openssl \"$@\"");
    }
    LogCapture log;
    EXPECT_EQ(5501, Call(doCertificateCreateCSR_v1, params).error_code());
    EXPECT_TRUE(log.Contains(c.logged)) << log.Text();
    EXPECT_TRUE(log.Contains(" Generate csr from csr action failed[0x")) << log.Text();
    EXPECT_EQ(pending, Contents(root, {kGenKey, kGenCsr}));
  }
}

TEST(CsrRenew, RepeatsTheInstalledSubjectAndKeySizeAndNeedsACertificate) {
  TempDeviceRoot root;
  {
    LogCapture log;
    EXPECT_EQ(5501, Call(doCertificateRenew_v1).error_code());
    EXPECT_TRUE(log.Contains(" Get certificate info failed./usr/orva/etc/ssl/ssl.crt/server.crt\n"))
        << log.Text();
  }
  {
    root.WriteFile(kServerCrt, "no certificate here\n");
    LogCapture log;
    EXPECT_EQ(5501, Call(doCertificateRenew_v1).error_code());
    EXPECT_TRUE(log.Contains(" read x509 failed[0x") &&
                log.Contains(" Getting key length from " + std::string(kServerCrt) + " failed[0x"))
        << log.Text();
    EXPECT_FALSE(FileExists(root.Path(kGenKey)));
  }
  ASSERT_TRUE(MakeSelfSignedCa(root.Path(kCaKey), root.Path(kCaCrt), "/CN=Root"));
  ASSERT_TRUE(MakeSignedCertificate(root.Path(kCaKey), root.Path(kCaCrt), root.Path(kServerKey),
                                    root.Path(kServerCrt), "/C=DE/O=Org/CN=nas.local", 3072));
  ORVA::APIResponse response = Call(doCertificateRenew_v1);
  ASSERT_EQ(Outcome::kSuccess, response.outcome()) << response.error_code();
  EXPECT_TRUE(response.data().isNull());
  EXPECT_EQ("/C=DE/O=Org/CN=nas.local", RequestSubject(root.Path(kGenCsr)));
  EXPECT_EQ(3072, RequestKeyBits(root.Path(kGenCsr)));
  EXPECT_TRUE(RequestMatchesKey(root.Path(kGenCsr), root.Path(kGenKey)));

  // An EC certificate gives a 2048-bit RSA request.
  ASSERT_TRUE(RunForTest("openssl req -x509 -newkey ec -pkeyopt ec_paramgen_curve:P-256 -nodes "
                         "-keyout '" + root.Path("/ec.key") + "' -out '" + root.Path(kServerCrt) +
                         "' -subj /C=TW/CN=ec.local"));
  ASSERT_EQ(Outcome::kSuccess, Call(doCertificateRenew_v1, Json::Value()).outcome());
  EXPECT_EQ(2048, RequestKeyBits(root.Path(kGenCsr)));
  EXPECT_EQ("/C=TW/CN=ec.local", RequestSubject(root.Path(kGenCsr)));
}

TEST(CsrSign, SignsAnUploadedRequestWithTheLocalCaAndRefusesWhatItCannotSign) {
  TempDeviceRoot root;
  ASSERT_TRUE(MakeRequest(root.Path("/up/client.key"), root.Path("/up/client.csr"), "/CN=client"));
  for (const char* days : {"0", "-5"}) {
    SCOPED_TRACE(days);
    LogCapture log;
    EXPECT_EQ(5503, Sign(root.Path("/missing.csr"), days).error_code());
    EXPECT_TRUE(log.Contains(" 0 >= days[0x")) << log.Text();
    EXPECT_FALSE(log.Contains("Check CSR file failed")) << "the file is not opened";
  }
  EXPECT_EQ(5501, Sign(root.Path("/missing.csr"), "30").error_code());
  {
    LogCapture log;
    EXPECT_EQ(5501, Sign(root.Path("/up/client.csr"), "30").error_code()) << "no local CA";
    EXPECT_TRUE(log.Contains(" Generate crt failed\n")) << log.Text();
    EXPECT_FALSE(FileExists(root.Path(kGenCrt)));
  }
  ASSERT_TRUE(MakeSelfSignedCa(root.Path(kCaKey), root.Path(kCaCrt), "/CN=Local Root"));
  {
    LogCapture log;
    EXPECT_EQ(5519, Sign(root.Path(kCaCrt), "30").error_code()) << "a certificate is no request";
    EXPECT_TRUE(log.Contains(" Check CSR header failed.\n")) << log.Text();
  }

  ORVA::APIResponse response = Sign(root.Path("/up/client.csr"), "30", "client.lan;10.0.0.7");
  ASSERT_EQ(Outcome::kSuccess, response.outcome()) << response.error_code();
  EXPECT_EQ(Json::Value(Json::objectValue), response.data());
  EXPECT_TRUE(RunForTest("openssl verify -CAfile '" + root.Path(kCaCrt) + "' '" +
                         root.Path(kGenCrt) + "'"));
  std::string text = CertificateText(root.Path(kGenCrt));
  EXPECT_NE(std::string::npos, text.find("DNS:client.lan, IP Address:10.0.0.7")) << text;
  EXPECT_EQ(0400, FileMode(root.Path(kGenCrt)));
  EXPECT_TRUE(FileExists(root.Path("/up/client.csr"))) << "the upload is not touched";
}

TEST(CrtCreate, InstallsAVerifiableSetWithAliasesAndActivatesIt) {
  TempDeviceRoot root;
  InstallOldSetAndServices(root);
  root.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\nrunWebHTTPS=\"no\"\n");
  Json::Value params = Subjects();
  params["alias"] = "nas.local;;192.168.1.10";
  params.removeMember("key_length");

  ORVA::APIResponse response = Call(doCertificateCreateCRT_v1, params);

  ASSERT_EQ(Outcome::kSuccess, response.outcome()) << response.error_code();
  EXPECT_TRUE(response.httpd_restart()) << "the answer itself is pinned over HTTP";
  EXPECT_TRUE(RunForTest("openssl verify -CAfile '" + root.Path(kCaCrt) + "' '" +
                         root.Path(kServerCrt) + "'"));
  std::string text = CertificateText(root.Path(kServerCrt));
  EXPECT_NE(std::string::npos, text.find("DNS:nas.local, IP Address:192.168.1.10")) << text;
  EXPECT_NE(std::string::npos, text.find("O=O'Reilly \\ Sons,")) << text;
  EXPECT_EQ(2048, CertificateKeyBits(root.Path(kServerCrt))) << "the default";
  EXPECT_EQ(1024, CertificateKeyBits(root.Path(kCaCrt)));
  EXPECT_EQ(0400, FileMode(root.Path(kServerKey)));
  EXPECT_FALSE(FileExists(root.Path(kInterCrt))) << "the old chain no longer fits";
  EXPECT_EQ("ftpd-ssl\nwebdav-httpd-ssl\nplugin certificate/change 5\n",
            ReadFile(root.Path("/ran.log")));
}

TEST(CrtCreate, RefusedSubjectsAndNamesLeaveTheStoreUntouched) {
  const struct { const char *field, *value; int code; } cases[] = {
      {"ca_country", "TWN", 5503},
      {"country", "T", 5501},
      {"organization", "Evil\nextensions = x", 5501},
      {"alias", "nas.local,DNS:evil", 5501},
  };
  TempDeviceRoot root;
  InstallOldSetAndServices(root);
  const std::vector<const char*> store = {kServerCrt, kServerKey, kCaCrt, kCaKey, kInterCrt};
  const std::string before = Contents(root, store);
  for (const auto& c : cases) {
    SCOPED_TRACE(std::string(c.field) + "=" + c.value);
    Json::Value params = Subjects();
    params[c.field] = c.value;
    ORVA::APIResponse response = Call(doCertificateCreateCRT_v1, params);
    EXPECT_EQ(c.code, response.error_code());
    EXPECT_TRUE(response.data().isNull());
    EXPECT_EQ(before, Contents(root, store));
  }
  EXPECT_FALSE(FileExists(root.Path("/ran.log"))) << "nothing is activated on failure";
}

// A server key that cannot be made fails after the new authority is
// installed; the server pair and the pending request pair stay.
TEST(CrtCreate, LeavesThePendingRequestPairAloneAndTheServerPairWhenItsKeyFails) {
  TempDeviceRoot root;
  InstallOldSetAndServices(root);
  ASSERT_EQ(Outcome::kSuccess, Call(doCertificateCreateCSR_v1, Subjects()).outcome());
  const std::string pending = Contents(root, {kGenKey, kGenCsr});
  const std::string server = Contents(root, {kServerCrt, kServerKey});
  const std::string ca = ReadFile(root.Path(kCaCrt));
  Json::Value params = Subjects();
  params["key_length"] = "0";
  {
    LogCapture log;
    EXPECT_EQ(5501, Call(doCertificateCreateCRT_v1, params).error_code());
    EXPECT_TRUE(log.Contains(" Generate server key failed\n")) << log.Text();
  }
  EXPECT_NE(ca, ReadFile(root.Path(kCaCrt)));
  EXPECT_EQ(server, Contents(root, {kServerCrt, kServerKey}));
  EXPECT_EQ(pending, Contents(root, {kGenKey, kGenCsr}));

  ASSERT_EQ(Outcome::kSuccess, Call(doCertificateCreateCRT_v1, Subjects()).outcome());
  EXPECT_EQ(pending, Contents(root, {kGenKey, kGenCsr}));
  EXPECT_FALSE(FileExists(root.Path("/usr/orva/etc/ssl/.gen/.crt-server.csr")));
}
