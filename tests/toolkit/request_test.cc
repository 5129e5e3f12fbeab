#include <algorithm>
#include <string>

#include <gtest/gtest.h>

#include "tests/support/certificates.h"
#include "tests/support/inspect.h"
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
    ASSERT_TRUE(MakeRequest(root_.Path(kKey), root_.Path("/scratch.csr"), "/CN=scratch", 1024));
  }
  int Run(CSR_ARGUMENT* subject, const std::string& key = kKey) {
    return genCsr(root_.Path(kConfig).c_str(), root_.Path(key).c_str(),
                  root_.Path(kRequest).c_str(), subject);
  }

  TempDeviceRoot root_;
};

}  // namespace

TEST_F(GenCsrTest, WritesTheConfigurationAndAReadOnlyRequestWithValuesIntact) {
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

  // A second request replaces both files whole, even the read-only one;
  // empty values are left out, quotes, backslashes and UTF-8 arrive intact.
  CSR_ARGUMENT quoted{"TW", "", "Z\xC3\xBCrich", "O'Reilly \\ $HOME #1 \"x\"", "ends with \\",
                      "'", ""};
  ASSERT_EQ(0, Run(&quoted));
  std::string config = ReadFile(root_.Path(kConfig));
  EXPECT_EQ(11, std::count(config.begin(), config.end(), '\n')) << config;
  EXPECT_EQ("/C=TW/L=Z\\xC3\\xBCrich/O=O'Reilly \\ $HOME #1 \"x\"/OU=ends with \\/CN='",
            RequestSubject(root_.Path(kRequest)));
  EXPECT_EQ("", TemporaryFilesIn(root_.Path("/usr/orva/etc/ssl/.gen")));
}

TEST_F(GenCsrTest, RefusedSubjectsWriteNothing) {
  const char kCountry[] = " Coountry name length size should be 2.\n";
  const char kArgument[] = " CSR Argument error[0x";
  const struct { std::string CSR_ARGUMENT::*member; std::string value; const char* message; }
  cases[] = {
      {&CSR_ARGUMENT::country, "TWN", kCountry},
      {&CSR_ARGUMENT::country, "T\n", kArgument},
      {&CSR_ARGUMENT::common_name, "a\ncommonName = evil", kArgument},
      {&CSR_ARGUMENT::state, "a\tb", kArgument},
      {&CSR_ARGUMENT::email, std::string("a\x01", 2), kArgument},
      {&CSR_ARGUMENT::organization, "a\x7f", kArgument},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.value);
    CSR_ARGUMENT subject = FullSubject();
    subject.*c.member = c.value;
    LogCapture log;
    EXPECT_EQ(-2, Run(&subject));
    EXPECT_TRUE(log.Contains(c.message) && log.Contains(kArgument)) << log.Text();
    EXPECT_FALSE(FileExists(root_.Path(kConfig)));
    EXPECT_FALSE(FileExists(root_.Path(kRequest)));
  }
  EXPECT_EQ(-2, Run(nullptr));
  LogCapture log;
  EXPECT_EQ(-1, Run(nullptr, "/absent.key")) << "the key is tested before the subject";
  EXPECT_TRUE(log.Contains(" Key is not existed\n")) << log.Text();
}

TEST_F(GenCsrTest, ToolFailureKeepsTheOldRequest) {
  root_.WriteFile(kRequest, "old request\n", 0400);
  root_.WriteScript("/usr/orva/bin/openssl", "exit 1");
  CSR_ARGUMENT subject = FullSubject();
  LogCapture log;
  EXPECT_EQ(-1, Run(&subject));
  EXPECT_TRUE(log.Contains(" Create CSR failed, command['" + root_.Path("/usr/orva/bin/openssl") +
                           "' req -config '" + root_.Path(kConfig) + "' -new"))
      << log.Text();
  EXPECT_EQ("old request\n", ReadFile(root_.Path(kRequest)));
  EXPECT_EQ("", TemporaryFilesIn(root_.Path("/usr/orva/etc/ssl/.gen")));
}
