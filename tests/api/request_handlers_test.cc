// The methods that make requests and certificates: what they leave in the
// store, and the requests they refuse with the store left as it was.

#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "common/store_paths.h"
#include "tests/support/certificates.h"
#include "tests/support/inspect.h"
#include "tests/support/method_calls.h"
#include "tests/support/store_state.h"

namespace {

using Outcome = ORVA::APIResponse::Outcome;

bool Shows(const std::string& path, const std::string& text) {
  return PemText(path).find(text) != std::string::npos;
}

// Both subjects of CRT create, the same but for the common names.
Json::Value BothSubjects() {
  Json::Value params = SubjectParams();
  const Json::Value ca = SubjectParams("ca_");
  for (const std::string& name : ca.getMemberNames()) params[name] = ca[name];
  params["ca_common_name"] = "Local Root";
  return params;
}

}  // namespace

// The key length comes as text; one that does not fit 32 bits is no size.
TEST(CsrCreate, LeavesAPrivatePendingPairThatAFailureKeeps) {
  TempDeviceRoot root;
  const ORVA::APIResponse response = CallCreateCsr();
  ASSERT_EQ(Outcome::kSuccess, response.outcome()) << response.error_code();
  EXPECT_EQ(Json::Value(Json::objectValue), response.data());
  EXPECT_EQ(0700, FileMode(root.Path(kGenDir)));
  EXPECT_EQ(0400, FileMode(root.Path(kGenKeyPath)));
  EXPECT_TRUE(Shows(root.Path(kGenCsrPath), "Public-Key: (2048 bit)"));
  const StoreState pending = ReadStore(root);
  ExpectStoreWhole(root, {});
  Json::Value params = SubjectParams();
  params["key_length"] = "4294968320";  // 2^32 + 1024
  EXPECT_EQ(5501, CallMethod(doCertificateCreateCSR_v1, params).response.error_code());
  EXPECT_EQ(CertificateFiles(pending), CertificateFiles(ReadStore(root)));
}

// An RSA key's size is kept, raised to the 2048 bits that HTTPS needs;
// another kind of key gives 2048 bits.
TEST(CsrRenew, RepeatsTheInstalledSubjectAndKeySize) {
  const struct { const char *subject, *shown; int bits; KeyType type; const char* renewed; }
  cases[] = {
      {"/C=DE/O=Org/CN=nas.local", "C=DE, O=Org, CN=nas.local", 2304, KeyType::kRsa, "(2304 bit)"},
      {"/C=TW/CN=small.local", "C=TW, CN=small.local", 1024, KeyType::kRsa, "(2048 bit)"},
      {"/C=TW/CN=ec.local", "C=TW, CN=ec.local", 0, KeyType::kEc, "(256 bit)"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.subject);
    TempDeviceRoot root;
    ASSERT_TRUE(MakeSelfSignedCa(root.Path(kServerKeyPath), root.Path(kServerCrtPath), c.subject,
                                 c.bits, c.type));
    ASSERT_EQ(Outcome::kSuccess, CallRenew().outcome());
    EXPECT_TRUE(Shows(root.Path(kGenCsrPath), std::string("Subject: ") + c.shown + "\n"))
        << PemText(root.Path(kGenCsrPath));
    EXPECT_TRUE(Shows(root.Path(kGenCsrPath), std::string("Public-Key: ") + c.renewed));
    ExpectStoreWhole(root, {});
  }
}

// Zero days are refused before the file is read.
TEST(CsrSign, SignsAnUploadedRequestWithTheLocalCaAndRefusesWhatItCannotSign) {
  TempDeviceRoot root;
  const std::string csr = root.Path("/up/client.csr");
  ASSERT_TRUE(MakeRequest(root.Path("/up/client.key"), csr, "/CN=client"));
  root.WriteFile("/up/certificate.pem", "-----BEGIN CERTIFICATE-----\n");
  Json::Value zero_days(Json::objectValue);
  zero_days["csr"] = "client.csr";
  zero_days["csr_tmp"] = root.Path("/missing.csr");
  zero_days["days"] = "0";
  EXPECT_EQ(5503, CallMethod(doCertificateSign_v1, zero_days).response.error_code());
  EXPECT_EQ(5519, CallSign(root.Path("/up/certificate.pem")).error_code());
  EXPECT_EQ(5501, CallSign(csr).error_code()) << "there is no local CA yet";
  EXPECT_FALSE(FileExists(root.Path(kGenCrtPath)));
  ASSERT_TRUE(MakeSelfSignedCa(root.Path(kCaKeyPath), root.Path(kCaCrtPath), "/CN=Root"));
  const ORVA::APIResponse response = CallSign(csr);
  ASSERT_EQ(Outcome::kSuccess, response.outcome()) << response.error_code();
  EXPECT_EQ(Json::Value(Json::objectValue), response.data());
  EXPECT_TRUE(RunForTest("openssl verify -CAfile '" + root.Path(kCaCrtPath) + "' '" +
                         root.Path(kGenCrtPath) + "'"));
  EXPECT_TRUE(FileExists(csr)) << "the upload is not touched";
}

// Refused subjects and names change nothing and activate nothing. The new
// CA's subject comes from the "ca_" parameters; the server key has 2048
// bits unless asked otherwise; the pending request pair stays.
TEST(CrtCreate, RefusesBadSubjectsAndNamesOrInstallsAVerifiableSetAndActivatesIt) {
  TempDeviceRoot root;
  ASSERT_NO_FATAL_FAILURE(InstallOldStore(root));
  const StoreState before = ReadStore(root);
  for (const char* service : {"ftpd-ssl", "webdav-httpd-ssl"}) {
    root.WriteScript(std::string("/usr/orva/etc/services/") + service,
                     std::string("echo ") + service + " >> \"$ORVA_ROOT/ran\"");
  }
  std::string many_names;
  for (int i = 0; i <= 100; ++i) many_names += "n" + std::to_string(i) + ".local;";
  const std::string long_name(65, 'a');
  // Everything the tool would refuse is refused first, in the steps' order:
  // the CA's key size before the CA's subject.
  const struct { const char *field, *value, *also; int code; } refused[] = {
      {"ca_country", "TWN", "", 5503},
      {"ca_key_length", "0", "ca_country", 5501},
      {"country", "T", "", 5501},
      {"common_name", long_name.c_str(), "", 5501},
      {"organization", "Evil\nextensions = x", "", 5501},
      {"alias", "nas.local,DNS:evil", "", 5501},
      {"alias", many_names.c_str(), "", 5501},
  };
  for (const auto& c : refused) {
    SCOPED_TRACE(std::string(c.field) + "=" + std::string(c.value).substr(0, 40));
    Json::Value params = BothSubjects();
    params[c.field] = c.value;
    if (*c.also != '\0') params[c.also] = "TWN";
    EXPECT_EQ(c.code, CallMethod(doCertificateCreateCRT_v1, params).response.error_code());
    EXPECT_EQ(CertificateFiles(before), CertificateFiles(ReadStore(root)));
    EXPECT_FALSE(FileExists(root.Path("/ran")));
  }
  Json::Value params = BothSubjects();
  params["ca_key_length"] = 3072;
  ASSERT_EQ(Outcome::kSuccess, CallMethod(doCertificateCreateCRT_v1, params).response.outcome());
  EXPECT_TRUE(RunForTest("openssl verify -CAfile '" + root.Path(kCaCrtPath) + "' '" +
                         root.Path(kServerCrtPath) + "'"));
  EXPECT_TRUE(Shows(root.Path(kServerCrtPath),
                    "Issuer: C=TW, ST=Taipei, L=Neihu, O=Storage Works, OU=Lab, "
                    "CN=Local Root/emailAddress=admin@new.local\n"))
      << PemText(root.Path(kServerCrtPath));
  EXPECT_TRUE(Shows(root.Path(kServerCrtPath), "Public-Key: (2048 bit)"));
  EXPECT_TRUE(Shows(root.Path(kCaCrtPath), "Public-Key: (3072 bit)"));
  EXPECT_FALSE(FileExists(root.Path(kInterCrtPath))) << "the old chain no longer fits";
  EXPECT_EQ("ftpd-ssl\nwebdav-httpd-ssl\n", ReadFile(root.Path("/ran")));
  EXPECT_EQ(before.at(".gen/server.csr").content, ReadFile(root.Path(kGenCsrPath)));
  ExpectStoreWhole(root, before);
}
