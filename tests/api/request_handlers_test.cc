// The methods that make requests and certificates: what renew and CRT
// create leave in the store, and the requests every method refuses with the
// store left as it was. The fault tests prove that each method succeeds on a
// full store and leaves it whole.

#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "common/store_paths.h"
#include "tests/support/certificates.h"
#include "tests/support/method_calls.h"
#include "tests/support/store_state.h"

namespace {

using Outcome = ORVA::APIResponse::Outcome;

bool Shows(const std::string& path, const std::string& text) {
  return PemText(path).find(text) != std::string::npos;
}

}  // namespace

// A necessary parameter missing or not of its kind (5503), and everything a
// method would refuse half-way or that no HTTPS could use, is refused
// before the first write: the store stays as it was and nothing is
// activated. CRT create checks the CA's key size before the CA's subject.
TEST(Refusals, LeaveTheStoreAsItWasAndActivateNothing) {
  TempDeviceRoot root;
  ASSERT_NO_FATAL_FAILURE(InstallOldStore(root));
  ASSERT_TRUE(MakeRequest(root.Path("/outside/laptop.key"), root.Path("/outside/laptop.csr"),
                          "/CN=My Laptop"));
  ASSERT_TRUE(MakeSignedCertificate(root.Path(kCaKeyPath), root.Path(kCaCrtPath),
                                    root.Path("/outside/small.key"),
                                    root.Path("/outside/small.crt"), "/CN=small.local", 1024));
  root.WriteFile("/outside/certificate.pem", "-----BEGIN CERTIFICATE-----\n");
  root.WriteScript("/usr/orva/etc/plugins/certificate/notify", "touch \"$ORVA_ROOT/activated\"");
  const StoreState before = ReadStore(root);
  std::string many_names;
  for (int i = 0; i <= 100; ++i) many_names += "n" + std::to_string(i) + ".local;";
  const auto crt = doCertificateCreateCRT_v1, sign = doCertificateSign_v1;
  const auto import = doCertificateImport_v1;
  const struct { MethodHandler method; std::string changes; int code; const char* logged; }
  cases[] = {
      {crt, R"({"email":null})", 5503, ""},
      {sign, R"({"csr":"l.csr","csr_tmp":"ROOT/outside/laptop.csr"})", 5503, ""},
      {sign, R"({"days":"TW","csr":"l.csr","csr_tmp":"ROOT/outside/laptop.csr"})", 5503, ""},
      {import, R"({"cert_tmp":"ROOT/outside/server.crt"})", 5503, ""},
      {doCertificateExport_v1, "{}", 5503, ""},
      {doCertificateList_v1, R"({"type":"server_cert","additional":"TW"})", 5503, ""},
      {crt, R"({"ca_country":"TWN"})", 5503, ""},
      {crt, R"({"ca_key_length":"0","ca_country":"TWN"})", 5501, ""},
      {crt, R"({"country":""})", 5501, ""},
      {crt, R"({"common_name":")" + std::string(65, 'a') + "\"}", 5501, ""},
      {crt, R"({"organization":"Evil\nextensions = x"})", 5501, ""},
      {crt, R"({"state":"a\tb"})", 5501, ""},
      {crt, R"({"department":"a\u007f"})", 5501, ""},
      {crt, R"({"alias":"nas.local,DNS:evil"})", 5501, ""},
      {crt, R"({"alias":")" + many_names + "\"}", 5501, ""},
      {crt, R"({"key_length":"1024"})", 5501,
       "Key size 1024 refused: RSA keys have 2048 to 16384 bits"},
      {doCertificateCreateCSR_v1, R"({"key_type":"dsa"})", 5503,
       "Key type \"dsa\" refused: keys are \"rsa\" or \"ec\""},
      {crt, R"({"ca_key_type":"ec","ca_key_length":"521"})", 5501,
       "EC key size 521 refused: EC keys are made on P-256 or P-384"},
      {crt, R"({"common_name":"My NAS"})", 5501,
       "The certificate would name no host: no alias, and the common name is no host name"},
      {doCertificateCreateCSR_v1, R"({"key_length":"4294969344"})", 5501, ""},  // 2^32 + 2048
      {sign, R"({"days":"0","csr":"l.csr","csr_tmp":"ROOT/outside/laptop.csr"})", 5503, ""},
      {sign, R"({"days":"9","csr":"c.pem","csr_tmp":"ROOT/outside/certificate.pem"})", 5519, ""},
      {sign, R"({"days":"825","csr":"l.csr","csr_tmp":"ROOT/outside/laptop.csr"})", 5501,
       "The certificate would name no host"},
      {import, R"({"cert_tmp":"ROOT/outside/small.crt","key_tmp":"ROOT/outside/small.key"})", 5514,
       "The key has 1024 bits: the device's HTTPS needs RSA keys of at least 2048 bits"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.changes.substr(0, 80));
    LogCapture log;
    EXPECT_EQ(c.code, CallMethod(c.method, Params(root, c.changes)).response.error_code());
    EXPECT_TRUE(log.Contains(c.logged)) << log.Text();
    EXPECT_EQ(before, ReadStore(root));
  }
  EXPECT_FALSE(FileExists(root.Path("/activated")));
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
    ASSERT_EQ(Outcome::kSuccess, CallMethod(doCertificateRenew_v1).response.outcome());
    EXPECT_TRUE(Shows(root.Path(kGenCsrPath), std::string("Subject: ") + c.shown + "\n"))
        << PemText(root.Path(kGenCsrPath));
    EXPECT_TRUE(Shows(root.Path(kGenCsrPath), std::string("Public-Key: ") + c.renewed));
    EXPECT_EQ(0700, FileMode(root.Path(kGenDir))) << "the pending key's folder is private";
    ExpectStoreWhole(root, {});
  }
}

// The new CA's subject comes from the "ca_" parameters; the old intermediate
// no longer fits and goes; the pending request pair stays.
TEST(CrtCreate, InstallsAVerifiableSetAndActivatesIt) {
  TempDeviceRoot root;
  ASSERT_NO_FATAL_FAILURE(InstallOldStore(root));
  const StoreState before = ReadStore(root);
  root.WriteScript("/usr/orva/etc/plugins/certificate/notify", "touch \"$ORVA_ROOT/activated\"");
  ASSERT_EQ(Outcome::kSuccess,
            CallMethod(doCertificateCreateCRT_v1, Params(root)).response.outcome());
  EXPECT_TRUE(RunForTest("openssl verify -CAfile '" + root.Path(kCaCrtPath) + "' '" +
                         root.Path(kServerCrtPath) + "'"));
  EXPECT_TRUE(Shows(root.Path(kServerCrtPath),
                    "Issuer: C=TW, ST=Taipei, L=Neihu, O=Storage Works, OU=Lab, "
                    "CN=Local Root/emailAddress=admin@new.local\n"))
      << PemText(root.Path(kServerCrtPath));
  EXPECT_FALSE(FileExists(root.Path(kInterCrtPath)));
  EXPECT_TRUE(FileExists(root.Path("/activated")));
  EXPECT_EQ(before.at(".gen/server.csr").content, ReadFile(root.Path(kGenCsrPath)));
  ExpectStoreWhole(root, before);
}
