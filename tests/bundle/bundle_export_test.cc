// Export as PKCS#12 and full-chain PEM: what other tools read from it, the
// round trip through import, and the refusals.

#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "api/certificate_extra.h"
#include "common/store_paths.h"
#include "tests/support/certificates.h"
#include "tests/support/method_calls.h"
#include "tests/support/store_state.h"

namespace {

MethodAnswer Call(MethodHandler method, const std::string& params) {
  Json::Value values;
  Json::Reader().parse(params, values);
  return CallMethod(method, values);
}

}  // namespace

// The installed set: CRT create's server pair, its CA as intermediate file.
TEST(BundleExport, OtherToolsReadTheExportItImportsBackAndRefusalsSendNothing) {
  TempDeviceRoot root;
  EXPECT_EQ(5504, Call(doBundleExport_v1, R"({"format":"pem"})").response.error_code());
  Json::Value create = SubjectParams(), ca = SubjectParams("ca_");
  for (const std::string& name : ca.getMemberNames()) create[name] = ca[name];
  create["key_type"] = create["ca_key_type"] = "ec";
  ASSERT_EQ(0, CallMethod(doCertificateCreateCRT_v1, create).response.error_code());
  root.WriteFile(kInterCrtPath, ReadFile(root.Path(kCaCrtPath)));
  const StoreState installed = ReadStore(root);
  const struct {
    int code;  // 0: a download that imports back when it holds the key
    const char *params, *offered, *reader;
  } cases[] = {
      {0, R"({"format":"pkcs12","password":"12345678"})", "server.p12\" application/x-pkcs12",
       "openssl pkcs12 -info -nodes -passin pass:12345678 -in OUT | grep -c BEGIN | grep -x 3"},
      {0, R"({"format":"pkcs12","password":"12345678","legacy":"yes"})",
       "server.p12\" application/x-pkcs12",
       "openssl pkcs12 -info -nodes -legacy -passin pass:12345678 -in OUT 2>&1 | "
       "grep -q 'pbeWithSHA1And3-KeyTripleDES-CBC'"},
      {0, R"({"format":"pem","include_key":"yes"})", "fullchain.pem\" application/x-pem-file",
       "grep -q 'BEGIN PRIVATE KEY' OUT && openssl verify -CAfile CA -untrusted OUT OUT"},
      {0, R"({"format":"pem"})", "fullchain.pem\" application/x-pem-file",
       "! grep -q 'PRIVATE KEY' OUT && openssl verify -CAfile CA -untrusted OUT OUT"},
      {5503, R"({"format":"der","password":"12345678"})", "", ""},
      {5503, R"({"format":"pkcs12","password":"1234567"})", "", ""},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.params);
    const MethodAnswer answer = Call(doBundleExport_v1, c.params);
    EXPECT_EQ(c.code, answer.response.error_code());
    std::string offered;
    for (const auto& [name, value] : answer.download.headers) offered += value + " ";
    EXPECT_EQ(*c.offered ? std::string("attachment; filename=\"") + c.offered + " " : "",
              offered);
    if (c.code != 0) continue;
    root.WriteFile("/outside/export", answer.download.body, 0600);
    std::string reader = std::string("(") + c.reader + ")";
    if (reader.find("CA ") != std::string::npos) {
      reader.replace(reader.find("CA "), 2, "'" + root.Path(kCaCrtPath) + "'");
    }
    for (size_t at; (at = reader.find("OUT")) != std::string::npos;) {
      reader.replace(at, 3, root.Path("/outside/export"));
    }
    EXPECT_TRUE(RunForTest(reader)) << reader;
    if (std::string(c.reader).find("! grep") == 0) continue;  // no key: nothing to import
    ASSERT_TRUE(RunForTest("rm -r '" + root.Path(kStore) + "'/ssl.intercrt"));
    Json::Value upload;
    upload["bundle_tmp"] = root.Path("/outside/export");
    upload["password"] = "12345678";
    EXPECT_EQ(0, CallMethod(doBundleImport_v1, upload).response.error_code());
    EXPECT_EQ(CertificateFiles(installed), CertificateFiles(ReadStore(root)));
  }
}
