#include <openssl/pem.h>
#include <openssl/x509.h>

#include <algorithm>
#include <cstdio>
#include <memory>
#include <string>

#include <gtest/gtest.h>

#include "common/pem_password.h"
#include "common/raii.h"
#include "tests/support/certificates.h"
#include "tests/support/test_support.h"
#include "tests/toolkit/toolkit_test_util.h"
#include "toolkit/mkcert.h"

namespace {

const std::string kConfig = "/usr/orva/etc/ssl/cfg.d/ca.cfg";
const std::string kKey = "/usr/orva/etc/ssl/.gen/server.key";
const std::string kRequest = "/usr/orva/etc/ssl/.gen/server.csr";

// A device root holding a key at kKey.
class GenCsrTest : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(MakeRequest(root_.Path(kKey), root_.Path("/scratch.csr"),
                            "/CN=scratch", 1024));
  }
  int Run(CSR_ARGUMENT* subject) {
    return genCsr(root_.Path(kConfig).c_str(), root_.Path(kKey).c_str(),
                  root_.Path(kRequest).c_str(), subject);
  }
  // The subject entry `nid` of the written request; "" when absent.
  std::string RequestSubject(int nid) {
    FilePtr file(std::fopen(root_.Path(kRequest).c_str(), "r"));
    if (!file) return "";
    std::unique_ptr<X509_REQ, decltype(&X509_REQ_free)> request(
        PEM_read_X509_REQ(file.get(), nullptr, RefusePemPassword, nullptr),
        X509_REQ_free);
    char text[256] = {0};
    if (!request || X509_NAME_get_text_by_NID(
                        X509_REQ_get_subject_name(request.get()), nid, text,
                        sizeof(text)) < 0) {
      return "";
    }
    return text;
  }

  TempDeviceRoot root_;
};

}  // namespace

TEST_F(GenCsrTest, WritesTheConfigurationAndAReadOnlyRequest) {
  CSR_ARGUMENT subject = FullSubject();
  ASSERT_EQ(0, Run(&subject));
  EXPECT_EQ(
      "[ req ]\n"
      "default_bits                    = 1024\n"
      "distinguished_name              = req_DN\n"
      "prompt                          = no\n"
      "utf8                            = yes\n"
      "[ req_DN ]\n"
      "countryName                     = 'TW'\n"
      "stateOrProvinceName             = 'Taipei'\n"
      "localityName                    = 'Neihu'\n"
      "0.organizationName              = 'Storage Works'\n"
      "organizationalUnitName          = 'Lab'\n"
      "commonName                      = 'nas.local'\n"
      "emailAddress                    = 'admin@nas.local'\n",
      ReadFile(root_.Path(kConfig)));
  EXPECT_EQ(0400, FileMode(root_.Path(kRequest)));
  EXPECT_EQ("nas.local", RequestSubject(NID_commonName));

  // A second request replaces both files whole, even the read-only one.
  CSR_ARGUMENT country_only;
  country_only.country = "DE";
  ASSERT_EQ(0, Run(&country_only));
  std::string config = ReadFile(root_.Path(kConfig));
  EXPECT_EQ(7, std::count(config.begin(), config.end(), '\n')) << config;
  EXPECT_NE(std::string::npos, config.find("\n[ req_DN ]\ncountryName"));
  EXPECT_EQ("", RequestSubject(NID_commonName));
  EXPECT_EQ("", TemporaryFilesIn(root_.Path("/usr/orva/etc/ssl/.gen")));
}

TEST_F(GenCsrTest, QuotesAndBackslashesArriveIntact) {
  CSR_ARGUMENT subject = FullSubject();
  subject.organization = "O'Reilly \\ $HOME #1 \"x\"";
  subject.department = "ends with \\";
  subject.common_name = "'";
  subject.city = "Z\xC3\xBCrich";
  ASSERT_EQ(0, Run(&subject));
  EXPECT_EQ(subject.city, RequestSubject(NID_localityName)) << "UTF-8 stays UTF-8";
  EXPECT_EQ(subject.organization, RequestSubject(NID_organizationName));
  EXPECT_EQ(subject.department, RequestSubject(NID_organizationalUnitName));
  EXPECT_EQ(subject.common_name, RequestSubject(NID_commonName));
}

TEST_F(GenCsrTest, RefusedSubjectsWriteNothing) {
  struct Case {
    const char* name;
    std::string CSR_ARGUMENT::*member;
    std::string value;
    const char* message;
  };
  const Case cases[] = {
      {"empty country", &CSR_ARGUMENT::country, "", "length size should be 2."},
      {"short country", &CSR_ARGUMENT::country, "T", "length size should be 2."},
      {"long country", &CSR_ARGUMENT::country, "TWN", "length size should be 2."},
      {"newline", &CSR_ARGUMENT::common_name, "a\ncommonName = evil",
       " CSR Argument error[0x"},
      {"tab", &CSR_ARGUMENT::state, "a\tb", " CSR Argument error[0x"},
      {"byte 1", &CSR_ARGUMENT::email, std::string("a\x01", 2),
       " CSR Argument error[0x"},
      {"delete", &CSR_ARGUMENT::organization, "a\x7f", " CSR Argument error[0x"},
      {"control in country", &CSR_ARGUMENT::country, "T\n",
       " CSR Argument error[0x"},
  };
  for (const Case& c : cases) {
    SCOPED_TRACE(c.name);
    CSR_ARGUMENT subject = FullSubject();
    subject.*c.member = c.value;
    LogCapture log;
    EXPECT_EQ(-2, Run(&subject));
    EXPECT_TRUE(log.Contains(c.message)) << log.Text();
    EXPECT_TRUE(log.Contains(" CSR Argument error[0x")) << log.Text();
    EXPECT_FALSE(FileExists(root_.Path(kConfig)));
    EXPECT_FALSE(FileExists(root_.Path(kRequest)));
  }
  LogCapture log;
  EXPECT_EQ(-2, Run(nullptr));
  EXPECT_TRUE(log.Contains(" CSR Argument error[0x")) << log.Text();
}

TEST_F(GenCsrTest, MissingKeyComesBeforeTheSubject) {
  LogCapture log;
  EXPECT_EQ(-1, genCsr(root_.Path(kConfig).c_str(),
                       root_.Path("/absent.key").c_str(),
                       root_.Path(kRequest).c_str(), nullptr));
  EXPECT_TRUE(log.Contains(" Key is not existed\n")) << log.Text();
  EXPECT_FALSE(log.Contains("CSR Argument error")) << log.Text();
}

TEST_F(GenCsrTest, ToolFailureKeepsTheOldRequest) {
  root_.WriteFile(kRequest, "old request\n", 0400);
  root_.WriteScript("/usr/orva/bin/openssl", "exit 1");
  CSR_ARGUMENT subject = FullSubject();
  LogCapture log;
  EXPECT_EQ(-1, Run(&subject));
  EXPECT_TRUE(log.Contains(" Create CSR failed, command[" +
                           std::string("'") + root_.Path("/usr/orva/bin/openssl") +
                           "' req -config '" + root_.Path(kConfig) + "' -new"))
      << log.Text();
  EXPECT_EQ("old request\n", ReadFile(root_.Path(kRequest)));
  EXPECT_EQ("", TemporaryFilesIn(root_.Path("/usr/orva/etc/ssl/.gen")));
}

