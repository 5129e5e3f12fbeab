#include <string>

#include <gtest/gtest.h>

#include "common/file_util.h"
#include "tests/support/test_support.h"

// The machine's MAC address when the device has no MAC address file: the
// first interface by name that is no loopback and has a whole, non-zero
// address, as 12 upper-case hex digits.
TEST(FirstInterfaceMacAddress, TakesTheFirstNamedInterfaceWithARealAddress) {
  TempDeviceRoot root;
  const struct { const char *name, *flags, *address; } interfaces[] = {
      {"a-loopback", "0x9", "02:00:00:00:00:01"}, {"b-zero", "0x1003", "00:00:00:00:00:00"},
      {"c-short", "0x1003", "02:fc:00"},          {"d-eth", "0x1003", "02:fc:00:00:00:0a"},
      {"e-later", "0x1003", "02:fc:00:00:00:0b"},
  };
  EXPECT_EQ("", FirstInterfaceMacAddress(root.Path("/net")));
  for (const auto& interface : interfaces) {
    root.WriteFile(std::string("/net/") + interface.name + "/flags", interface.flags);
    root.WriteFile(std::string("/net/") + interface.name + "/address", interface.address);
  }
  EXPECT_EQ("02FC0000000A", FirstInterfaceMacAddress(root.Path("/net")));
}
