#include <ctime>
#include <string>

#include <gtest/gtest.h>

#include "tests/support/test_support.h"
#include "toolkit/mkcert.h"

namespace {

const std::string kSerial = "/usr/orva/etc/ssl/.mkcert.serial";

bool IsEvenHex(const std::string& text) {
  return !text.empty() && text.size() % 2 == 0 &&
         text.find_first_not_of("0123456789ABCDEFabcdef") == std::string::npos;
}

}  // namespace

TEST(GenSerial, TimeFollowedByTheMacAddressFromItsNinthCharacter) {
  const struct {
    const char* mac_file;
    const char* tail;
  } cases[] = {
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
    long long seconds = std::stoll(serial.substr(0, 10));
    EXPECT_GE(seconds, before);
    EXPECT_LE(seconds, after);
    EXPECT_EQ(c.tail, serial.substr(10));
    EXPECT_TRUE(IsEvenHex(serial)) << serial;
  }
}

TEST(GenSerial, MachineAddressStandsInForAMissingMacFile) {
  TempDeviceRoot root;
  std::remove(root.Path("/proc/sys/kernel/orva_mac_address1").c_str());
  if (genSerial() != 0) GTEST_SKIP() << "no network interface with an address";
  std::string serial = ReadFile(root.Path(kSerial));
  EXPECT_TRUE(IsEvenHex(serial)) << serial;
  EXPECT_GT(serial.size(), 10u) << serial;
}

