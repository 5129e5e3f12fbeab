#include <unistd.h>

#include <cstdio>
#include <fstream>
#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "api/certificate_info.h"
#include "tests/support/certificates.h"
#include "tests/support/test_support.h"

namespace {

const char kServerCrt[] = "/usr/orva/etc/ssl/ssl.crt/server.crt";
const char kServerKey[] = "/usr/orva/etc/ssl/ssl.key/server.key";
const char kCaCrt[] = "/usr/orva/etc/ssl/ssl.crt/ca.crt";
const char kCaKey[] = "/usr/orva/etc/ssl/ssl.key/ca.key";
const char kInterCrt[] = "/usr/orva/etc/ssl/ssl.intercrt/server-ca.crt";

// A store with a local CA and a server certificate it signed.
void InstallCaAndServer(const TempDeviceRoot& root) {
  ASSERT_TRUE(MakeSelfSignedCa(root.Path(kCaKey), root.Path(kCaCrt),
                               "/C=TW/O=Test CA/CN=Test Root"));
  ASSERT_TRUE(MakeSignedCertificate(
      root.Path(kCaKey), root.Path(kCaCrt), root.Path(kServerKey), root.Path(kServerCrt),
      "/C=TW/ST=Taipei/L=Taipei/O=Org/OU=IT/CN=nas.local/emailAddress=admin@nas.local"));
}

ORVA::APIResponse List(const Json::Value& params) {
  ORVA::APIRequest request("ORVA.Core.Certificate", "list", 1, params);
  ORVA::APIResponse response;
  doCertificateList_v1(&request, &response);
  return response;
}

Json::Value Params(const char* name, const Json::Value& value) {
  Json::Value params(Json::objectValue);
  params[name] = value;
  return params;
}

}  // namespace

TEST(CertificateList, EmptyStoreAnswers5504AndLogsTheMissingFile) {
  TempDeviceRoot root;
  LogCapture log;
  ORVA::APIResponse response = List(Json::Value(Json::objectValue));
  EXPECT_EQ(5504, response.error_code());
  EXPECT_TRUE(response.data().isNull());
  EXPECT_TRUE(log.Contains(" File /usr/orva/etc/ssl/ssl.crt/server.crt not existed.\n"))
      << log.Text();
}

TEST(CertificateList, ListsServerThenCaWithNamesAndTypes) {
  TempDeviceRoot root;
  InstallCaAndServer(root);
  ORVA::APIResponse response = List(Json::Value(Json::objectValue));
  ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess, response.outcome());
  const Json::Value& certificates = response.data()["certificates"];
  ASSERT_EQ(2u, certificates.size());

  const Json::Value& server = certificates[0];
  EXPECT_EQ("server_cert", server["type"].asString());
  EXPECT_EQ("nas.local", server["subject"]["common_name"].asString());
  EXPECT_EQ("TW", server["subject"]["country"].asString());
  EXPECT_EQ("Taipei", server["subject"]["city"].asString());
  EXPECT_EQ("IT", server["subject"]["department"].asString());
  EXPECT_EQ("admin@nas.local", server["subject"]["email"].asString());
  EXPECT_EQ("Test Root", server["issuer"]["common_name"].asString());
  EXPECT_EQ("sha256WithRSAEncryption", server["signature_algorithm"].asString());
  EXPECT_FALSE(server.isMember("valid_from"));

  EXPECT_EQ("root_cert", certificates[1]["type"].asString());
  EXPECT_FALSE(certificates[1]["subject"].isMember("email"));
}

TEST(CertificateList, AdditionalAddsValidityDatesOnce) {
  TempDeviceRoot root;
  InstallCaAndServer(root);
  ORVA::APIResponse response =
      List(Params("additional", "[\"valid_till\",\"valid_from\",\"valid_till\",7]"));
  ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess, response.outcome());
  for (const Json::Value& entry : response.data()["certificates"]) {
    EXPECT_NE(std::string::npos, entry["valid_till"].asString().find("GMT"));
    EXPECT_NE(std::string::npos, entry["valid_from"].asString().find("GMT"));
  }
}

TEST(CertificateList, TypeSelectsFilesAndIntermediateIsOptionalOnlyForAll) {
  TempDeviceRoot root;
  InstallCaAndServer(root);

  EXPECT_EQ(5504, List(Params("type", "inter_cert")).error_code());
  ORVA::APIResponse ca_only = List(Params("type", "root_cert"));
  ASSERT_EQ(1u, ca_only.data()["certificates"].size());
  EXPECT_EQ("root_cert", ca_only.data()["certificates"][0]["type"].asString());
  ORVA::APIResponse unknown = List(Params("type", "ALL"));
  ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess, unknown.outcome());
  EXPECT_EQ(0u, unknown.data()["certificates"].size());

  // A chain file: every certificate it holds is listed, in file order.
  root.WriteFile(kInterCrt, ReadFile(root.Path(kCaCrt)) + ReadFile(root.Path(kServerCrt)));
  ORVA::APIResponse all = List(Json::Value(Json::objectValue));
  const Json::Value& certificates = all.data()["certificates"];
  ASSERT_EQ(4u, certificates.size());
  EXPECT_EQ("inter_cert", certificates[2]["type"].asString());
  EXPECT_EQ("Test Root", certificates[2]["subject"]["common_name"].asString());
  EXPECT_EQ("nas.local", certificates[3]["subject"]["common_name"].asString());
}

// Decoded certificates are reused only while their file holds the same
// bytes: a file rewritten in place (same inode, same path, nearly the same
// time) is listed with its new content at once, and again with its old one.
TEST(CertificateList, ShowsACertificateFileRewrittenInPlaceAtOnce) {
  TempDeviceRoot root;
  InstallCaAndServer(root);
  ASSERT_TRUE(MakeSignedCertificate(root.Path(kCaKey), root.Path(kCaCrt),
                                    root.Path("/other.key"), root.Path("/other.crt"),
                                    "/C=TW/CN=nas.other"));
  const std::string first = ReadFile(root.Path(kServerCrt));
  const std::string second = ReadFile(root.Path("/other.crt"));
  const struct {
    const std::string* content;
    const char* common_name;
  } steps[] = {{&first, "nas.local"}, {&second, "nas.other"}, {&first, "nas.local"}};
  for (const auto& step : steps) {
    SCOPED_TRACE(step.common_name);
    std::ofstream(root.Path(kServerCrt), std::ios::binary | std::ios::trunc) << *step.content;
    ORVA::APIResponse response = List(Json::Value(Json::objectValue));
    ASSERT_EQ(ORVA::APIResponse::Outcome::kSuccess, response.outcome());
    EXPECT_EQ(step.common_name,
              response.data()["certificates"][0]["subject"]["common_name"].asString());
  }
}

TEST(CertificateList, MissingCaFailsTheWholeListing) {
  TempDeviceRoot root;
  InstallCaAndServer(root);
  std::remove(root.Path(kCaCrt).c_str());
  LogCapture log;
  EXPECT_EQ(5504, List(Json::Value(Json::objectValue)).error_code());
  EXPECT_TRUE(log.Contains(" File /usr/orva/etc/ssl/ssl.crt/ca.crt not existed.\n"));
}

TEST(CertificateList, FileThatExistsButDoesNotOpenAnswers5501) {
  TempDeviceRoot root;
  InstallCaAndServer(root);
  std::remove(root.Path(kServerCrt).c_str());
  ASSERT_EQ(0, symlink(root.Path("/nowhere").c_str(), root.Path(kServerCrt).c_str()));
  LogCapture log;
  EXPECT_EQ(5501, List(Json::Value(Json::objectValue)).error_code());
  EXPECT_TRUE(log.Contains(" Get certificate info failed./usr/orva/etc/ssl/ssl.crt/server.crt\n"));
}

TEST(CertificateInfo, OtherPathsAndEmptyOrBrokenFiles) {
  TempDeviceRoot root;
  InstallCaAndServer(root);
  ORVA::APIRequest request("a", "m", 1, Json::Value());

  root.WriteFile("/copy.pem", ReadFile(root.Path(kServerCrt)) + "-----BEGIN CERTIFICATE-----\nnot base64\n-----END CERTIFICATE-----\n" + ReadFile(root.Path(kCaCrt)));
  Json::Value entries;
  ASSERT_EQ(0, getCertificateInfo(root.Path("/copy.pem"), entries, &request));
  ASSERT_EQ(1u, entries.size()) << "reading stops at the broken block";
  EXPECT_FALSE(entries[0].isMember("type"));

  root.WriteFile("/empty.pem", "");
  Json::Value none;
  EXPECT_EQ(0, getCertificateInfo(root.Path("/empty.pem"), none, &request));
  EXPECT_TRUE(none.isNull());
  EXPECT_EQ(4, getCertificateInfo(root.Path("/missing.pem"), none, &request));
}

TEST(CertificateInfo, SubjectWithOnlyCommonName) {
  TempDeviceRoot root;
  ASSERT_TRUE(MakeSelfSignedCa(root.Path("/k.pem"), root.Path("/c.pem"), "/CN=only"));
  ORVA::APIRequest request("a", "m", 1, Json::Value());
  Json::Value entries;
  ASSERT_EQ(0, getCertificateInfo(root.Path("/c.pem"), entries, &request));
  EXPECT_EQ(Json::Value::Members{"common_name"}, entries[0]["subject"].getMemberNames());
}
