// The list method: which store files it lists, what each entry holds, and
// its answers for files that are missing or unreadable.

#include <unistd.h>

#include <fstream>
#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "common/store_paths.h"
#include "tests/support/certificates.h"
#include "tests/support/method_calls.h"
#include "tests/support/test_support.h"

namespace {

Json::Value Parse(const std::string& text) {
  Json::Value value;
  Json::Reader().parse(text, value);
  return value;
}

// The certificates listed for `params` (JSON text), or the error code.
Json::Value List(const std::string& params = "{}") {
  const ORVA::APIResponse response = CallMethod(doCertificateList_v1, Parse(params)).response;
  return response.error_code() == 0 ? response.data()["certificates"]
                                    : Json::Value(response.error_code());
}

}  // namespace

// Without a chain file the server and CA certificates are listed; a chain
// file's certificates follow in file order up to the first block that does
// not decode. "type" selects one file, which then must exist; dates come
// when asked for.
TEST(CertificateList, ListsTheStoreFilesAsTheyAreNowAndAnswersForMissingOnes) {
  TempDeviceRoot root;
  EXPECT_EQ(5504, List().asInt()) << "no server certificate";
  ASSERT_TRUE(MakeSelfSignedCa(root.Path(kCaKeyPath), root.Path(kCaCrtPath),
                               "/C=TW/O=Test CA/CN=Test Root"));
  ASSERT_TRUE(MakeSignedCertificate(
      root.Path(kCaKeyPath), root.Path(kCaCrtPath), root.Path(kServerKeyPath),
      root.Path(kServerCrtPath),
      "/C=TW/ST=Taiwan/L=Taipei/O=Org/OU=IT/CN=nas.local/emailAddress=admin@nas.local"));
  const Json::Value listed = List();
  ASSERT_EQ(2u, listed.size()) << listed;
  EXPECT_EQ(Parse(R"({"type":"server_cert","signature_algorithm":"sha256WithRSAEncryption",
      "issuer":{"country":"TW","organization":"Test CA","common_name":"Test Root"},
      "subject":{"country":"TW","state":"Taiwan","city":"Taipei","organization":"Org",
                 "department":"IT","common_name":"nas.local","email":"admin@nas.local"}})"),
            listed[0]);
  EXPECT_EQ("root_cert", listed[1]["type"].asString());
  const Json::Value dated = List(R"({"type":"root_cert","additional":"[\"valid_till\",7]"})");
  ASSERT_EQ(1u, dated.size()) << dated;
  EXPECT_NE(std::string::npos, dated[0]["valid_till"].asString().find(" GMT")) << dated;
  EXPECT_EQ(5504, List(R"({"type":"inter_cert"})").asInt());

  root.WriteFile(kInterCrtPath, ReadFile(root.Path(kCaCrtPath)) +
                                    ReadFile(root.Path(kServerCrtPath)) +
                                    "-----BEGIN CERTIFICATE-----\nnot base64\n"
                                    "-----END CERTIFICATE-----\n" +
                                    ReadFile(root.Path(kCaCrtPath)));
  const Json::Value all = List();
  ASSERT_EQ(4u, all.size()) << all;
  EXPECT_EQ("inter_cert", all[2]["type"].asString());
  EXPECT_EQ("Test Root", all[2]["subject"]["common_name"].asString());
  EXPECT_EQ("nas.local", all[3]["subject"]["common_name"].asString());

  // Names of every string type arrive as UTF-8; a file lists at most 64
  // certificates.
  ASSERT_TRUE(RunForTest("cd '" + root.root() + "' && printf '[req]\\ndistinguished_name=dn\\n"
                         "string_mask=default\\n[dn]\\n' >bmp.cfg && openssl req -x509 -newkey "
                         "rsa:1024 -nodes -keyout bmp.key -out bmp.crt -config bmp.cfg -utf8 "
                         "-subj '/CN=\xE6\x97\xA5\xE6\x9C\xAC/O=Z\xC3\xBCrich'"));
  std::string many;
  for (int i = 0; i < 66; ++i) many += ReadFile(root.Path("/bmp.crt"));
  root.WriteFile(kInterCrtPath, many);
  const Json::Value named = List(R"({"type":"inter_cert"})");
  ASSERT_EQ(64u, named.size());
  EXPECT_EQ(Parse(R"({"common_name":"\u65e5\u672c","organization":"Z\u00fcrich"})"),
            named[63]["subject"]);

  // Decoded certificates are reused only while their file holds the same
  // bytes: a file rewritten in place (same inode, nearly the same time) is
  // listed with its new content at once.
  std::ofstream(root.Path(kServerCrtPath), std::ios::trunc) << ReadFile(root.Path(kCaCrtPath));
  EXPECT_EQ("Test Root", List()[0]["subject"]["common_name"].asString());

  unlink(root.Path(kCaCrtPath).c_str());
  EXPECT_EQ(5504, List().asInt()) << "no CA certificate";
  unlink(root.Path(kServerCrtPath).c_str());
  ASSERT_EQ(0, symlink(root.Path("/nowhere").c_str(), root.Path(kServerCrtPath).c_str()));
  EXPECT_EQ(5501, List().asInt()) << "a server certificate that cannot be read";
}
