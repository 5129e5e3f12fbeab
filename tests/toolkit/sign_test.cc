#include <cstdio>
#include <string>

#include <gtest/gtest.h>

#include "tests/support/certificates.h"
#include "tests/support/test_support.h"
#include "tests/toolkit/toolkit_test_util.h"
#include "toolkit/mkcert.h"

namespace {

const std::string kCaCrt = "/usr/orva/etc/ssl/ssl.crt/ca.crt";
const std::string kCaKey = "/usr/orva/etc/ssl/ssl.key/ca.key";
const std::string kSerial = "/usr/orva/etc/ssl/.mkcert.serial";
const std::string kServerExt = "/usr/orva/etc/ssl/cfg.d/server.crt.cfg";
const std::string kCsr = "/upload/server.csr";
const std::string kKey = "/upload/server.key";
const std::string kOut = "/usr/orva/etc/ssl/.gen/server.crt";

// A device root with a local CA made by plain openssl and a request.
class SignTest : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(MakeSelfSignedCa(Path(kCaKey), Path(kCaCrt), "/CN=Local CA"));
    ASSERT_TRUE(MakeRequest(Path(kKey), Path(kCsr), "/CN=nas.local"));
  }
  std::string Path(const std::string& devicePath) const {
    return root_.Path(devicePath);
  }

  TempDeviceRoot root_;
};

}  // namespace

TEST_F(SignTest, ServerCertificateCarriesTheAliasesAndVerifies) {
  ASSERT_EQ(0, genServerCrt(Path(kCsr).c_str(), Path(kOut).c_str(), 30,
                            "nas.local;;192.168.1.10"));
  EXPECT_EQ(0400, FileMode(Path(kOut)));
  EXPECT_TRUE(RunForTest("openssl verify -CAfile '" + Path(kCaCrt) + "' '" +
                         Path(kOut) + "'"));
  std::string text = CertificateText(Path(kOut));
  EXPECT_NE(std::string::npos,
            text.find("DNS:nas.local, IP Address:192.168.1.10"))
      << text;
  EXPECT_EQ(std::string::npos, text.find("CA:TRUE")) << text;
  EXPECT_NE(std::string::npos,
            ReadFile(Path(kServerExt))
                .find("subjectAltName = \"DNS:nas.local, IP:192.168.1.10\"\n"));
  EXPECT_EQ("", TemporaryFilesIn(Path("/usr/orva/etc/ssl/.gen")));
}

TEST_F(SignTest, SerialFileIsMadeOnceAndAdvancedByEachSigning) {
  ASSERT_EQ(0, genServerCrt(Path(kCsr).c_str(), Path(kOut).c_str(), 30, ""));
  std::string first = ReadFile(Path(kSerial));
  ASSERT_EQ(0, genServerCrt(Path(kCsr).c_str(), Path(kOut).c_str(), 30, ""));
  std::string second = ReadFile(Path(kSerial));
  for (const std::string& serial : {first, second}) {
    SCOPED_TRACE(serial);
    std::string digits = serial.substr(0, serial.find('\n'));
    EXPECT_EQ(0u, digits.size() % 2);
    EXPECT_EQ(std::string::npos, digits.find_first_not_of("0123456789ABCDEF"));
  }
  EXPECT_NE(first, second);

  root_.WriteFile(kSerial, "0A\n");
  ASSERT_EQ(0, genServerCrt(Path(kCsr).c_str(), Path(kOut).c_str(), 30, ""));
  EXPECT_EQ("0B\n", ReadFile(Path(kSerial))) << "an existing serial is kept";
  EXPECT_NE(std::string::npos,
            CertificateText(Path(kOut)).find("Serial Number: 11 (0xb)"));
}

TEST_F(SignTest, SelfSignedNeedsNoSerialAndIgnoresAliases) {
  std::string out = Path("/usr/orva/etc/ssl/ssl.crt/self.crt");
  ASSERT_EQ(0, genCrt(Path("/ext.cfg").c_str(), Path(kCsr).c_str(),
                      out.c_str(), nullptr, nullptr, Path(kKey).c_str(), TRUE,
                      10, "not,a;valid\"alias"));
  EXPECT_NE(std::string::npos, CertificateText(out).find("CA:TRUE"));
  EXPECT_EQ(0400, FileMode(out));
}

TEST_F(SignTest, RefusalsComeInOrderBeforeAnyFileIsWritten) {
  root_.WriteFile(kSerial, "01");
  const struct {
    const char* name;
    std::string request, key, serial;
    BOOL flag;
    int days;
    const char* aliases;
    const char* message;
  } cases[] = {
      {"days", kCsr, kCaKey, kSerial, TRUE, 0, "", "genCrt sanity failed"},
      {"request before key", "/none", "/none", kSerial, FALSE, 1, "",
       "Csr is not existed"},
      {"key", kCsr, "/none", kSerial, FALSE, 1, "", "Key is not existed"},
      {"flag 2 is CA-signed", kCsr, kCaKey, "", 2, 1, "", "genCrt sanity failed"},
      {"serial", kCsr, kCaKey, "/none", FALSE, 1, "", "Serial file is not existed"},
      {"alias", kCsr, kCaKey, kSerial, FALSE, 1, "a;b,c", "Alias 2 is neither"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    LogCapture log;
    EXPECT_EQ(-1, genCrt(Path(kServerExt).c_str(), Path(c.request).c_str(),
                         Path(kCaCrt).c_str(),
                         c.serial.empty() ? "" : Path(c.serial).c_str(),
                         Path(kOut).c_str(), Path(c.key).c_str(), c.flag,
                         c.days, c.aliases));
    EXPECT_TRUE(log.Contains(c.message)) << log.Text();
    EXPECT_FALSE(FileExists(Path(kServerExt)));
    EXPECT_FALSE(FileExists(Path(kOut)));
  }
}

TEST_F(SignTest, ToolFailureKeepsTheOldCertificate) {
  root_.WriteFile(kSerial, "01");
  root_.WriteFile(kOut, "old certificate\n", 0400);
  root_.WriteScript("/usr/orva/bin/openssl", "exit 1");
  LogCapture log;
  EXPECT_EQ(-1, genCrt(Path(kServerExt).c_str(), Path(kCsr).c_str(),
                       Path(kCaCrt).c_str(), Path(kSerial).c_str(),
                       Path(kOut).c_str(), Path(kCaKey).c_str(), FALSE, 10, "a"));
  EXPECT_TRUE(log.Contains(" Error when execute \"'" +
                           Path("/usr/orva/bin/openssl") + "' x509 -extfile '" +
                           Path(kServerExt) + "' -days 10 -in '" + Path(kCsr) +
                           "' -req -sha256 -out '"))
      << log.Text();
  EXPECT_TRUE(log.Contains("' -CAserial '" + Path(kSerial) + "' -CA '" +
                           Path(kCaCrt) + "' -CAkey '" + Path(kCaKey) +
                           "' >/dev/null 2>&1\"\n"))
      << log.Text();
  EXPECT_EQ("old certificate\n", ReadFile(Path(kOut)));
  EXPECT_EQ("", TemporaryFilesIn(Path("/usr/orva/etc/ssl/.gen")));
}

TEST_F(SignTest, SerialThatCannotBeMadeStopsTheSigning) {
  // Without the store folder the serial file cannot be written.
  ASSERT_EQ(0, std::rename(Path("/usr/orva/etc/ssl").c_str(),
                           Path("/elsewhere").c_str()));
  std::string out = Path("/elsewhere/server.crt");
  LogCapture log;
  EXPECT_EQ(-1, genServerCrtHelper(Path(kCsr).c_str(),
                                   Path("/elsewhere/ssl.crt/ca.crt").c_str(),
                                   out.c_str(),
                                   Path("/elsewhere/ssl.key/ca.key").c_str(),
                                   10, ""));
  EXPECT_TRUE(log.Contains(" Open /usr/orva/etc/ssl/.mkcert.serial failed\n"))
      << log.Text();
  EXPECT_FALSE(FileExists(out));
}
