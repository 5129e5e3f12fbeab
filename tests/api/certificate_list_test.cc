#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "tests/support/certificates.h"
#include "tests/support/test_support.h"

namespace {

const char kServerCrt[] = "/usr/orva/etc/ssl/ssl.crt/server.crt";
const char kCaCrt[] = "/usr/orva/etc/ssl/ssl.crt/ca.crt";
const char kCaKey[] = "/usr/orva/etc/ssl/ssl.key/ca.key";

// A store with a local CA and a server certificate it signed.
void InstallCaAndServer(const TempDeviceRoot& root) {
  ASSERT_TRUE(
      MakeSelfSignedCa(root.Path(kCaKey), root.Path(kCaCrt), "/C=TW/O=Test CA/CN=Test Root"));
  ASSERT_TRUE(MakeSignedCertificate(
      root.Path(kCaKey), root.Path(kCaCrt), root.Path("/usr/orva/etc/ssl/ssl.key/server.key"),
      root.Path(kServerCrt),
      "/C=TW/ST=Taiwan/L=Taipei/O=Org/OU=IT/CN=nas.local/emailAddress=admin@nas.local"));
}

Json::Value Parse(const std::string& text) {
  Json::Value value;
  Json::Reader().parse(text, value);
  return value;
}

// The list method's answer; `params` is JSON text.
ORVA::APIResponse List(const std::string& params = "{}") {
  ORVA::APIRequest request("ORVA.Core.Certificate", "list", 1, Parse(params));
  ORVA::APIResponse response;
  doCertificateList_v1(&request, &response);
  return response;
}

}  // namespace

TEST(CertificateList, MissingFilesAnswer5504AndAnUnreadableServer5501) {
  TempDeviceRoot root;
  auto expect = [](int code, const std::string& logged) {
    SCOPED_TRACE(logged);
    LogCapture log;
    ORVA::APIResponse response = List();
    EXPECT_EQ(code, response.error_code());
    EXPECT_TRUE(response.data().isNull());
    EXPECT_TRUE(log.Contains(logged)) << log.Text();
  };
  expect(5504, " File /usr/orva/etc/ssl/ssl.crt/server.crt not existed.\n");
  InstallCaAndServer(root);
  std::remove(root.Path(kCaCrt).c_str());
  expect(5504, " File /usr/orva/etc/ssl/ssl.crt/ca.crt not existed.\n");
  std::remove(root.Path(kServerCrt).c_str());
  ASSERT_EQ(0, symlink(root.Path("/nowhere").c_str(), root.Path(kServerCrt).c_str()));
  expect(5501, " Get certificate info failed./usr/orva/etc/ssl/ssl.crt/server.crt\n");
}

TEST(CertificateList, ListsServerThenCaWithDatesOnRequestAndTypeSelectsFiles) {
  TempDeviceRoot root;
  InstallCaAndServer(root);
  ORVA::APIResponse response = List();
  ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess, response.outcome());
  const Json::Value& certificates = response.data()["certificates"];
  ASSERT_EQ(2u, certificates.size());
  EXPECT_EQ(Parse(R"({"type":"server_cert","signature_algorithm":"sha256WithRSAEncryption",
      "issuer":{"country":"TW","organization":"Test CA","common_name":"Test Root"},
      "subject":{"country":"TW","state":"Taiwan","city":"Taipei","organization":"Org",
                 "department":"IT","common_name":"nas.local","email":"admin@nas.local"}})"),
            certificates[0]);
  EXPECT_EQ("root_cert", certificates[1]["type"].asString());
  EXPECT_EQ(certificates[0]["issuer"], certificates[1]["subject"]);

  response = List(R"({"additional":"[\"valid_till\",\"valid_from\",\"valid_till\",7]"})");
  const Json::Value& dated = response.data()["certificates"][1];
  EXPECT_NE(std::string::npos, dated["valid_till"].asString().find(" GMT")) << dated;
  EXPECT_NE(std::string::npos, dated["valid_from"].asString().find(" GMT")) << dated;

  EXPECT_EQ(5504, List(R"({"type":"inter_cert"})").error_code());
  const Json::Value ca_only = List(R"({"type":"root_cert"})").data()["certificates"];
  ASSERT_EQ(1u, ca_only.size());
  EXPECT_EQ("root_cert", ca_only[0]["type"].asString());
  EXPECT_EQ(Parse(R"({"certificates":[]})"), List(R"({"type":"ALL"})").data());

  // A chain file: its certificates are listed in file order up to the first
  // block that does not decode; it is optional only when all are listed.
  root.WriteFile("/usr/orva/etc/ssl/ssl.intercrt/server-ca.crt",
                 ReadFile(root.Path(kCaCrt)) + ReadFile(root.Path(kServerCrt)) +
                     "-----BEGIN CERTIFICATE-----\nnot base64\n-----END CERTIFICATE-----\n" +
                     ReadFile(root.Path(kCaCrt)));
  const Json::Value all = List().data()["certificates"];
  ASSERT_EQ(4u, all.size());
  EXPECT_EQ("inter_cert", all[2]["type"].asString());
  EXPECT_EQ("Test Root", all[2]["subject"]["common_name"].asString());
  EXPECT_EQ("nas.local", all[3]["subject"]["common_name"].asString());
}

// Decoded certificates are reused only while their file holds the same
// bytes: a file rewritten in place (same inode, same path, nearly the same
// time) is listed with its new content at once, and again with its old one.
TEST(CertificateList, ShowsACertificateFileRewrittenInPlaceAtOnce) {
  TempDeviceRoot root;
  InstallCaAndServer(root);
  ASSERT_TRUE(MakeSignedCertificate(root.Path(kCaKey), root.Path(kCaCrt), root.Path("/other.key"),
                                    root.Path("/other.crt"), "/C=TW/CN=nas.other"));
  const std::string first = ReadFile(root.Path(kServerCrt));
  const std::string second = ReadFile(root.Path("/other.crt"));
  const std::pair<std::string, const char*> steps[] = {
      {first, "nas.local"}, {second, "nas.other"}, {first, "nas.local"}};
  for (const auto& [content, common_name] : steps) {
    SCOPED_TRACE(common_name);
    std::ofstream(root.Path(kServerCrt), std::ios::binary | std::ios::trunc) << content;
    ORVA::APIResponse response = List();
    ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess, response.outcome());
    EXPECT_EQ(common_name, response.data()["certificates"][0]["subject"]["common_name"].asString());
  }
}
