// Export as PKCS#12 and full-chain PEM: what other tools read from it, the
// round trip through import, and the refusals.

#include <string>

#include <gtest/gtest.h>

#include "api/certificate_extra.h"
#include "common/store_paths.h"
#include "tests/support/certificates.h"
#include "tests/support/method_calls.h"
#include "tests/support/store_state.h"

namespace {

MethodAnswer Export(const std::string& changes) {
  Json::Value params;
  Json::Reader().parse(changes, params);
  return CallMethod(doBundleExport_v1, params);
}

std::string Header(const ORVA::DownloadResult& download, const std::string& name) {
  for (const auto& header : download.headers) {
    if (header.first == name) return header.second;
  }
  return "";
}

}  // namespace

// The installed set: the chain's server pair with inter.crt and root.crt.
TEST(BundleExport, OtherToolsReadTheExportAndItImportsBackToTheSameSet) {
  TempDeviceRoot root;
  const std::string chain = root.Path("/outside/chain/");
  ASSERT_TRUE(MakeVerifiableChain(root.Path("/outside/chain"), "/CN=nas.local"));
  root.WriteFile(kServerCrtPath, ReadFile(chain + "server.crt"));
  root.WriteFile(kServerKeyPath, ReadFile(chain + "server.key"), 0400);
  root.WriteFile(kInterCrtPath, ReadFile(chain + "inter.crt") + ReadFile(chain + "root.crt"));
  const StoreState installed = ReadStore(root);
  const struct {
    const char *params, *file_name, *type, *reader;
    bool whole_set;
  } cases[] = {
      {R"({"format":"pkcs12","password":"12345678"})", "server.p12", "application/x-pkcs12",
       "openssl pkcs12 -info -nodes -passin pass:12345678 -in OUT | grep -c BEGIN | "
       "grep -x 4", true},
      {R"({"format":"pkcs12","password":"12345678","legacy":"yes"})", "server.p12",
       "application/x-pkcs12",
       "openssl pkcs12 -info -nodes -legacy -passin pass:12345678 -in OUT 2>&1 | "
       "grep -q 'pbeWithSHA1And3-KeyTripleDES-CBC'", true},
      {R"({"format":"pem","include_key":"yes"})", "fullchain.pem", "application/x-pem-file",
       "grep -q 'BEGIN PRIVATE KEY' OUT && openssl verify -CAfile ROOT -untrusted OUT OUT", true},
      {R"({"format":"pem"})", "fullchain.pem", "application/x-pem-file",
       "! grep -q 'PRIVATE KEY' OUT && openssl verify -CAfile ROOT -untrusted OUT OUT", false},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.params);
    const MethodAnswer answer = Export(c.params);
    EXPECT_EQ(std::string("attachment; filename=\"") + c.file_name + "\"",
              Header(answer.download, "content-disposition"));
    EXPECT_EQ(c.type, Header(answer.download, "content-type"));
    const std::string out = root.Path("/outside/export");
    root.WriteFile("/outside/export", answer.download.body);
    std::string reader = c.reader;
    if (reader.find("ROOT") != std::string::npos) {
      reader.replace(reader.find("ROOT"), 4, chain + "root.crt");
    }
    for (size_t at; (at = reader.find("OUT")) != std::string::npos;) reader.replace(at, 3, out);
    EXPECT_TRUE(RunForTest("(" + reader + ")")) << reader;
  }
  // Each form imports back to the set it came from, into an emptied store.
  for (const auto& c : cases) {
    if (!c.whole_set) continue;
    SCOPED_TRACE(c.params);
    Json::Value params;
    Json::Reader().parse(c.params, params);
    root.WriteFile("/upload/bundle", Export(c.params).download.body, 0600);
    ASSERT_TRUE(RunForTest("rm -r '" + root.Path(kStore) + "'/ssl.*"));
    params["bundle_tmp"] = root.Path("/upload/bundle");
    EXPECT_EQ(ORVA::APIResponse::Outcome::kSuccess,
              CallMethod(doBundleImport_v1, params).response.outcome());
    EXPECT_EQ(CertificateFiles(installed), CertificateFiles(ReadStore(root)));
  }
}

TEST(BundleExport, RefusesOtherFormatsShortPasswordsAndAMissingSet) {
  TempDeviceRoot root;
  const struct { const char* params; int code; } cases[] = {
      {R"({"format":"der","password":"12345678"})", 5503},
      {R"({"format":"pkcs12","password":"1234567"})", 5503},
      {R"({"format":"pkcs12"})", 5503},
      {R"({"format":"pem"})", 5504},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.params);
    const MethodAnswer answer = Export(c.params);
    EXPECT_EQ(c.code, answer.response.error_code());
    EXPECT_FALSE(answer.download.has_body);
  }
}
