#include <cstdio>
#include <ctime>
#include <string>

#include <gtest/gtest.h>

#include "tests/support/certificates.h"
#include "tests/support/inspect.h"
#include "tests/toolkit/toolkit_test_util.h"
#include "toolkit/mkcert.h"

namespace {

const std::string kCaCrt = "/usr/orva/etc/ssl/ssl.crt/ca.crt";
const std::string kCaKey = "/usr/orva/etc/ssl/ssl.key/ca.key";
const std::string kCaCsr = "/usr/orva/etc/ssl/ssl.csr/ca.csr";
const std::string kSerial = "/usr/orva/etc/ssl/.mkcert.serial";
const std::string kServerExt = "/usr/orva/etc/ssl/cfg.d/server.crt.cfg";
const std::string kCsr = "/upload/server.csr";
const std::string kKey = "/upload/server.key";
const std::string kOut = "/usr/orva/etc/ssl/.gen/server.crt";

// A device root with a local CA made by genCASet and a request made by
// plain openssl.
class SignTest : public testing::Test {
 protected:
  void SetUp() override {
    CSR_ARGUMENT subject = FullSubject();
    ASSERT_EQ(0, genCASet(&subject, 1024));
    ASSERT_TRUE(MakeRequest(Path(kKey), Path(kCsr), "/CN=nas.local"));
  }
  std::string Path(const std::string& devicePath) const { return root_.Path(devicePath); }
  int SignServer(const char* aliases) {
    return genServerCrt(Path(kCsr).c_str(), Path(kOut).c_str(), 30, aliases);
  }

  TempDeviceRoot root_;
};

}  // namespace

TEST_F(SignTest, LocalCaIsProvenForTenYearsAndSignsVerifiableCertificatesWithAdvancingSerials) {
  for (const std::string& file : {kCaCrt, kCaKey, kCaCsr}) {
    EXPECT_EQ(0400, FileMode(Path(file))) << file;
  }
  const std::string ca = "'" + Path(kCaCrt) + "'";
  EXPECT_TRUE(RunForTest("openssl x509 -noout -checkend 315273600 -in " + ca)) << "3649 days";
  EXPECT_FALSE(RunForTest("openssl x509 -noout -checkend 315446400 -in " + ca)) << "3651 days";
  EXPECT_NE(std::string::npos, CertificateText(Path(kCaCrt)).find("CA:TRUE, pathlen:0"));

  ASSERT_EQ(0, SignServer("nas.local;;192.168.1.10"));
  EXPECT_EQ(0400, FileMode(Path(kOut)));
  EXPECT_TRUE(RunForTest("openssl verify -CAfile " + ca + " '" + Path(kOut) + "'"));
  std::string text = CertificateText(Path(kOut));
  EXPECT_NE(std::string::npos, text.find("DNS:nas.local, IP Address:192.168.1.10")) << text;
  EXPECT_EQ(std::string::npos, text.find("CA:TRUE")) << text;
  EXPECT_EQ("", TemporaryFilesIn(Path("/usr/orva/etc/ssl/.gen")));

  // The serial file is made once and advanced by each signing.
  std::string first = ReadFile(Path(kSerial));
  ASSERT_EQ(0, SignServer(""));
  std::string second = ReadFile(Path(kSerial));
  EXPECT_NE(first, second);
  for (const std::string& serial : {first, second}) {
    std::string digits = serial.substr(0, serial.find('\n'));
    EXPECT_EQ(0u, digits.size() % 2) << serial;
    EXPECT_EQ(std::string::npos, digits.find_first_not_of("0123456789ABCDEF")) << serial;
  }
  root_.WriteFile(kSerial, "0A\n");
  ASSERT_EQ(0, SignServer(""));
  EXPECT_EQ("0B\n", ReadFile(Path(kSerial))) << "an existing serial is kept";
  EXPECT_NE(std::string::npos, CertificateText(Path(kOut)).find("Serial Number: 11 (0xb)"));
}

TEST_F(SignTest, RefusalsComeInOrderBeforeAnyFileIsWritten) {
  root_.WriteFile(kSerial, "01");
  const struct {
    std::string request, key, serial;
    BOOL flag;
    int days;
    const char *aliases, *message;
  } cases[] = {
      {kCsr, kCaKey, kSerial, TRUE, 0, "", "genCrt sanity failed"},
      {"/none", "/none", kSerial, FALSE, 1, "", "Csr is not existed"},
      {kCsr, "/none", kSerial, FALSE, 1, "", "Key is not existed"},
      {kCsr, kCaKey, "", 2, 1, "", "genCrt sanity failed"},  // flag 2 is CA-signed
      {kCsr, kCaKey, "/none", FALSE, 1, "", "Serial file is not existed"},
      {kCsr, kCaKey, kSerial, FALSE, 1, "a;b,c", "Alias 2 is neither"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.message);
    LogCapture log;
    EXPECT_EQ(-1, genCrt(Path(kServerExt).c_str(), Path(c.request).c_str(), Path(kCaCrt).c_str(),
                         c.serial.empty() ? "" : Path(c.serial).c_str(), Path(kOut).c_str(),
                         Path(c.key).c_str(), c.flag, c.days, c.aliases));
    EXPECT_TRUE(log.Contains(c.message)) << log.Text();
    EXPECT_FALSE(FileExists(Path(kServerExt)));
    EXPECT_FALSE(FileExists(Path(kOut)));
  }
}

TEST_F(SignTest, FailuresOfTheToolAndTheSerialFileAreLogged) {
  root_.WriteFile(kSerial, "01");
  root_.WriteScript("/usr/orva/bin/openssl", "exit 1");
  {
    LogCapture log;
    EXPECT_EQ(-1, genCrt(Path(kServerExt).c_str(), Path(kCsr).c_str(), Path(kCaCrt).c_str(),
                         Path(kSerial).c_str(), Path(kOut).c_str(), Path(kCaKey).c_str(), FALSE,
                         10, "a"));
    EXPECT_TRUE(log.Contains(" Error when execute \"'" + Path("/usr/orva/bin/openssl") +
                             "' x509 -extfile '" + Path(kServerExt) + "' -days 10 -in '" +
                             Path(kCsr) + "' -req -sha256 -out '") &&
                log.Contains("' -CAserial '" + Path(kSerial) + "' -CA '" + Path(kCaCrt) +
                             "' -CAkey '" + Path(kCaKey) + "' >/dev/null 2>&1\"\n"))
        << log.Text();
  }
  // Without the store folder the serial file cannot be written.
  ASSERT_EQ(0, std::rename(Path("/usr/orva/etc/ssl").c_str(), Path("/elsewhere").c_str()));
  std::string out = Path("/elsewhere/server.crt");
  LogCapture log;
  EXPECT_EQ(-1, genServerCrtHelper(Path(kCsr).c_str(), Path("/elsewhere/ssl.crt/ca.crt").c_str(),
                                   out.c_str(), Path("/elsewhere/ssl.key/ca.key").c_str(), 10, ""));
  EXPECT_TRUE(log.Contains(" Open /usr/orva/etc/ssl/.mkcert.serial failed\n")) << log.Text();
  EXPECT_FALSE(FileExists(out));
}

TEST(GenSerial, TimeFollowedByTheMacAddressFromItsNinthCharacter) {
  const struct { const char *mac_file, *tail; } cases[] = {
      {"001132AABBCC\n", "BBCC"},
      {"001132AABBCC second-word\n", "BBCC"},
      {"00113200\n", ""},
      {"001132AAB\n", "B1"},
      {"0123456789ABCDEF0123456789ABCDEF0123\n", "89ABCDEF0123456789ABC1"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.mac_file);
    TempDeviceRoot root;
    root.WriteFile("/proc/sys/kernel/orva_mac_address1", c.mac_file);
    long long before = std::time(nullptr);
    ASSERT_EQ(0, genSerial());
    long long after = std::time(nullptr);
    std::string serial = ReadFile(root.Path(kSerial));
    ASSERT_GE(serial.size(), 10u);
    EXPECT_GE(std::stoll(serial.substr(0, 10)), before);
    EXPECT_LE(std::stoll(serial.substr(0, 10)), after);
    EXPECT_EQ(c.tail, serial.substr(10));
  }
}

TEST(GenSerial, MachineAddressStandsInForAMissingMacFile) {
  TempDeviceRoot root;
  std::remove(root.Path("/proc/sys/kernel/orva_mac_address1").c_str());
  if (genSerial() != 0) GTEST_SKIP() << "no network interface with an address";
  std::string serial = ReadFile(root.Path(kSerial));
  EXPECT_TRUE(serial.size() > 10 && serial.size() % 2 == 0 &&
              serial.find_first_not_of("0123456789ABCDEFabcdef") == std::string::npos)
      << serial;
}

TEST(GenCASet, FirstFailedStepEndsTheSetWithItsResult) {
  const struct { const char* country; int bits; const char* failing_subcommand; int result;
                 const char* message; } cases[] = {  // "" fails no subcommand
      {"TW", 0, "", -1, " genCAKey() failed\n"},
      {"TWN", 1024, "", -2, " genCACsr() failed\n"},
      {"TW", 1024, "x509", -1, " genCACrt() failed\n"},
      {"TW", 1024, "md5", -1, " Root certificate and key is not matching\n"},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.message);
    TempDeviceRoot root;
    root.WriteScript("/usr/orva/bin/openssl",
                     "if [ \"$1\" = '" + std::string(c.failing_subcommand) +
                         "' ]; then exit 1; fi\nexec /usr/bin/openssl \"$@\"");
    LogCapture log;
    CSR_ARGUMENT subject = FullSubject();
    subject.country = c.country;
    EXPECT_EQ(c.result, genCASet(&subject, c.bits));
    EXPECT_TRUE(log.Contains(c.message)) << log.Text();
    EXPECT_FALSE(FileExists(root.Path(kCaKey))) << "a CA set is installed only whole";
  }
}
