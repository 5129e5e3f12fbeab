#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "tests/support/certificates.h"
#include "tests/support/inspect.h"
#include "tests/support/test_support.h"

namespace {

const char kServerCrt[] = "/usr/orva/etc/ssl/ssl.crt/server.crt";
const char kServerKey[] = "/usr/orva/etc/ssl/ssl.key/server.key";
const char kCaCrt[] = "/usr/orva/etc/ssl/ssl.crt/ca.crt";
const char kCaKey[] = "/usr/orva/etc/ssl/ssl.key/ca.key";
const char kInterCrt[] = "/usr/orva/etc/ssl/ssl.intercrt/server-ca.crt";

// Both subjects; the CA's differs only in its common name.
Json::Value CrtParams() {
  Json::Value params(Json::objectValue);
  const char* fields[][2] = {{"country", "TW"},       {"state", "Taipei"},
                             {"city", "Taipei"},      {"organization", "O'Reilly \\ Sons"},
                             {"department", "IT"},    {"common_name", "nas.local"},
                             {"email", "admin@nas.local"}};
  for (const auto& field : fields) {
    params[field[0]] = field[1];
    params[std::string("ca_") + field[0]] = field[1];
  }
  params["ca_common_name"] = "Local Root";
  return params;
}

ORVA::APIResponse CreateCrt(const Json::Value& params) {
  ORVA::APIRequest request("ORVA.Core.Certificate.CRT", "create", 1, params);
  ORVA::APIResponse response;
  doCertificateCreateCRT_v1(&request, &response);
  return response;
}

// An installed set, and service and plug-in scripts that record, in order,
// that they ran ("httpd-user" is disabled).
void InstallOldSetAndServices(const TempDeviceRoot& root) {
  ASSERT_TRUE(MakeSelfSignedCa(root.Path(kCaKey), root.Path(kCaCrt), "/CN=Old Root"));
  ASSERT_TRUE(MakeSignedCertificate(root.Path(kCaKey), root.Path(kCaCrt), root.Path(kServerKey),
                                    root.Path(kServerCrt), "/CN=old.local"));
  root.WriteFile(kInterCrt, ReadFile(root.Path(kCaCrt)));
  for (const std::string service : {"ftpd-ssl", "webdav-httpd-ssl", "pagora", "httpd-user"}) {
    root.WriteFile("/usr/orva/etc/services/" + service,
                   "#!/bin/sh\necho " + service + " >> \"$ORVA_ROOT/ran.log\"\n",
                   service == "httpd-user" ? 0644 : 0755);
  }
  root.WriteScript("/usr/orva/etc/plugins/certificate/notify",
                   "echo \"plugin $1 $2\" >> \"$ORVA_ROOT/ran.log\"");
}

// What the store holds, to prove a refused request changed nothing.
std::string StoreSnapshot(const TempDeviceRoot& root) {
  std::string snapshot;
  for (const char* file : {kServerCrt, kServerKey, kCaCrt, kCaKey, kInterCrt}) {
    snapshot += std::string(file) + "=" + ReadFile(root.Path(file)) + "\n";
  }
  return snapshot;
}

}  // namespace

TEST(CrtCreate, InstallsAVerifiableSetWithAliasesAndActivatesIt) {
  TempDeviceRoot root;
  InstallOldSetAndServices(root);
  root.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\nrunWebHTTPS=\"no\"\n");
  Json::Value params = CrtParams();
  params["alias"] = "nas.local;;192.168.1.10";
  params["ca_key_length"] = 1024;

  ORVA::APIResponse response = CreateCrt(params);

  ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess, response.outcome()) << response.error_code();
  EXPECT_EQ(1u, response.data().size());
  EXPECT_TRUE(response.data()["restart_httpd"].asBool());
  EXPECT_TRUE(response.httpd_restart());
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
      {"alias", "a\"b", 5501},
  };
  TempDeviceRoot root;
  InstallOldSetAndServices(root);
  const std::string before = StoreSnapshot(root);
  for (const auto& c : cases) {
    SCOPED_TRACE(std::string(c.field) + "=" + c.value);
    Json::Value params = CrtParams();
    params[c.field] = c.value;
    ORVA::APIResponse response = CreateCrt(params);
    EXPECT_EQ(c.code, response.error_code());
    EXPECT_TRUE(response.data().isNull());
    EXPECT_EQ(before, StoreSnapshot(root));
  }
  EXPECT_FALSE(FileExists(root.Path("/ran.log"))) << "nothing is activated on failure";
}

TEST(CrtCreate, ServerKeyLengthZeroFailsAfterTheNewAuthority) {
  TempDeviceRoot root;
  InstallOldSetAndServices(root);
  const std::string old_server = ReadFile(root.Path(kServerCrt));
  const std::string old_ca = ReadFile(root.Path(kCaCrt));
  Json::Value params = CrtParams();
  params["key_length"] = "0";
  LogCapture log;
  EXPECT_EQ(5501, CreateCrt(params).error_code());
  EXPECT_TRUE(log.Contains(" Generate server key failed\n")) << log.Text();
  EXPECT_NE(old_ca, ReadFile(root.Path(kCaCrt)));
  EXPECT_EQ(old_server, ReadFile(root.Path(kServerCrt)));
}

TEST(CrtCreate, LeavesAPendingRequestPairAlone) {
  TempDeviceRoot root;
  ORVA::APIRequest csr_request("ORVA.Core.Certificate.CSR", "create", 1, CrtParams());
  ORVA::APIResponse csr_response;
  doCertificateCreateCSR_v1(&csr_request, &csr_response);
  ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess, csr_response.outcome());
  const std::string pending = root.Path("/usr/orva/etc/ssl/.gen/server.");
  const std::string key = ReadFile(pending + "key");
  const std::string request = ReadFile(pending + "csr");

  ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess, CreateCrt(CrtParams()).outcome());

  EXPECT_EQ(key, ReadFile(pending + "key"));
  EXPECT_EQ(request, ReadFile(pending + "csr"));
  EXPECT_FALSE(FileExists(root.Path("/usr/orva/etc/ssl/.gen/.crt-server.csr")));
}
