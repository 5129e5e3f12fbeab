// The real certificate module over HTTP and HTTPS: a local CA set made,
// an outside set imported, listed, refused and exported, and what a TLS
// handshake presents after each change.

#include <string>

#include <gtest/gtest.h>

#include "host/device_root_init.h"
#include "tests/host/serve_process.h"
#include "tests/host/tls_probe.h"
#include "tests/support/certificates.h"
#include "tests/support/test_support.h"

namespace {

constexpr char kServerCrt[] = "/usr/orva/etc/ssl/ssl.crt/server.crt";
constexpr char kServerKey[] = "/usr/orva/etc/ssl/ssl.key/server.key";

// The first handshake within 10 s that presents `commonName`.
PresentedCertificates ProbeFor(int port, const std::string& commonName) {
  return ProbeTlsUntil(port, [&](const PresentedCertificates& seen) {
    return seen.common_name == commonName;
  });
}

}  // namespace

TEST(ServeCertificateLife, CreateImportRefuseAndExportOverHttpChangeWhatHttpsPresents) {
  TempDeviceRoot root;
  std::string error;
  ASSERT_TRUE(InitDeviceRoot(root.root(), &error)) << error;
  root.WriteFile("/usr/orva/etc/orva.conf", "runHTTPS=\"yes\"\nrunWebHTTPS=\"no\"\n");
  ASSERT_TRUE(MakeSelfSignedCa(root.Path(kServerKey), root.Path(kServerCrt), "/CN=factory.local"));
  ServeProcess server(root.root());
  ASSERT_TRUE(server.started()) << server.Log();
  ASSERT_GT(server.https_port(), 0) << server.Log();
  EXPECT_EQ("factory.local", ProbeTls(server.https_port()).common_name);
  httplib::Client client = server.AuthorizedClient();

  httplib::Params create = {{"api", "ORVA.Core.Certificate.CRT"}, {"method", "create"},
                            {"alias", "nas.local;10.1.2.3"}};
  for (const char* field : {"country", "state", "city", "organization", "department",
                            "common_name", "email"}) {
    std::string value = std::string(field) == "country" ? "TW" : "nas.local";
    create.emplace(field, value);
    create.emplace(std::string("ca_") + field, value);
  }
  auto created = client.Post("/webapi", create);
  ASSERT_TRUE(created);
  EXPECT_EQ("{\"data\":{\"restart_httpd\":true},\"success\":true}", created->body);
  EXPECT_EQ("nas.local", ProbeFor(server.https_port(), "nas.local").common_name);

  const std::string work = root.Path("/outside");
  ASSERT_TRUE(MakeSelfSignedCa(work + "/root.key", work + "/root.crt", "/CN=Outside Root"));
  ASSERT_TRUE(MakeSignedCertificate(work + "/root.key", work + "/root.crt", work + "/inter.key",
                                    work + "/inter.crt", "/CN=Outside Intermediate"));
  ASSERT_TRUE(MakeSignedCertificate(work + "/inter.key", work + "/inter.crt", work + "/srv.key",
                                    work + "/srv.crt", "/CN=imported.example"));
  auto imported = client.Post("/webapi", ImportForm(ReadFile(work + "/srv.crt"),
                                                    ReadFile(work + "/srv.key"),
                                                    ReadFile(work + "/inter.crt")));
  ASSERT_TRUE(imported);
  EXPECT_EQ("{\"data\":{\"restart_httpd\":true},\"success\":true}", imported->body);
  PresentedCertificates presented = ProbeFor(server.https_port(), "imported.example");
  EXPECT_EQ("imported.example", presented.common_name);
  EXPECT_EQ(2, presented.chain_length);
  EXPECT_EQ("Outside Intermediate", presented.chain_top_name);
  for (const char* type : {"server_cert", "inter_cert"}) {
    auto listed = client.Get(
        (std::string("/webapi?api=ORVA.Core.Certificate&method=list&type=") + type).c_str());
    ASSERT_TRUE(listed);
    Json::Value entry = ParseJson(listed->body)["data"]["certificates"][0];
    EXPECT_EQ(type, entry["type"].asString()) << listed->body;
    EXPECT_EQ(std::string(type) == "server_cert" ? "imported.example" : "Outside Intermediate",
              entry["subject"]["common_name"].asString());
  }

  auto refused = client.Post("/webapi", ImportForm(ReadFile(work + "/srv.crt"),
                                                   ReadFile(work + "/inter.key"),
                                                   ReadFile(work + "/inter.crt")));
  ASSERT_TRUE(refused);
  EXPECT_EQ("{\"error\":{\"code\":5514},\"success\":false}", refused->body);
  EXPECT_EQ(ReadFile(work + "/srv.key"), ReadFile(root.Path(kServerKey)));

  auto exported = client.Get("/webapi?api=ORVA.Core.Certificate&method=export&file=archive");
  ASSERT_TRUE(exported);
  EXPECT_EQ(200, exported->status);
  EXPECT_EQ("attachment; filename=\"archive.zip\"",
            exported->get_header_value("content-disposition"));
  EXPECT_EQ("application/zip", exported->get_header_value("Content-Type"));
  EXPECT_TRUE(ReadFile(root.Path("/usr/orva/etc/ssl/.gen/archive.zip")) == exported->body)
      << "the archive byte for byte";
  EXPECT_EQ(0u, exported->body.rfind("PK\x03\x04", 0)) << "a ZIP archive";
  EXPECT_EQ(0, CountFiles(server.UploadFolder())) << "uploads are removed after each call";
}
