// The local CA, the certificates it signs, and its serial file.

#include <unistd.h>

#include <cstdio>
#include <string>

#include <gtest/gtest.h>

#include "common/store_paths.h"
#include "tests/support/certificates.h"
#include "tests/support/store_state.h"
#include "toolkit/mkcert.h"

namespace {

CSR_ARGUMENT Subject() {
  return {"TW", "Taipei", "Neihu", "Storage Works", "Lab", "nas.local", "admin@nas.local"};
}

}  // namespace

// Each alias becomes a DNS or an IP address entry; a name that could add
// to the extension file is refused, as are 0 days. Only RSA keys encipher.
TEST(GenServerCrt, LocalCaSignsVerifiableCertificatesNamingEachAliasAndRefusesOtherNames) {
  TempDeviceRoot root;
  CSR_ARGUMENT subject = Subject();
  ASSERT_EQ(0, genCASet(&subject, 2048));
  const std::string request = root.Path("/upload/server.csr"), out = root.Path(kGenCrtPath);
  ASSERT_TRUE(MakeRequest(root.Path("/upload/server.key"), request, "/CN=nas.local"));
  auto sign = [&](const std::string& aliases, int days = 30) {
    return genServerCrt(request.c_str(), out.c_str(), days, aliases.c_str());
  };
  const struct { const char *aliases, *names; } accepted[] = {
      {"nas.local;;*.example.com;my_host-2", "DNS:nas.local, DNS:*.example.com, DNS:my_host-2\n"},
      {"192.168.1.10;fe80::1", "IP Address:192.168.1.10, IP Address:FE80:0:0:0:0:0:0:1\n"},
  };
  // The serial file is replaced, never written through a link out of the
  // store.
  const std::string serial = root.Path(kSerialPath);
  root.WriteFile("/outside/serial", "0A\n");
  ASSERT_EQ(0, symlink(root.Path("/outside/serial").c_str(), serial.c_str()));
  for (const auto& c : accepted) {
    SCOPED_TRACE(c.aliases);
    ASSERT_EQ(0, sign(c.aliases));
    EXPECT_EQ(0400, FileMode(out));
    EXPECT_TRUE(RunForTest("openssl verify -CAfile '" + root.Path(kCaCrtPath) + "' '" + out + "'"));
    EXPECT_NE(std::string::npos, PemText(out).find(c.names)) << PemText(out);
    EXPECT_NE(std::string::npos, PemText(out).find("Digital Signature, Key Encipherment\n"));
  }
  // An EC key signs only; an RSA CA signs it.
  ASSERT_TRUE(RunForTest("openssl req -new -newkey ec -pkeyopt ec_paramgen_curve:P-384 -nodes "
                         "-keyout '" + root.Path("/upload/ec.key") + "' -subj /CN=nas.local "
                         "-out '" + request + "'"));
  ASSERT_EQ(0, sign("nas.local"));
  EXPECT_NE(std::string::npos, PemText(out).find("Digital Signature\n")) << PemText(out);
  const std::string signed_last = ReadFile(out);
  for (const char* alias : {"a,b", "a\"b", "a\nbasicConstraints=CA:true"}) {
    SCOPED_TRACE(alias);
    LogCapture log;
    EXPECT_EQ(-1, sign(std::string("ok;") + alias));
    EXPECT_TRUE(log.Contains(" Alias 2 is neither a host name nor an IP address\n")) << log.Text();
  }
  EXPECT_EQ("0A\n", ReadFile(root.Path("/outside/serial")));
  EXPECT_EQ("0D\n", ReadFile(serial)) << "advanced once per certificate";
  EXPECT_EQ(-1, sign("", 0));
  EXPECT_EQ(signed_last, ReadFile(out));
  ExpectStoreWhole(root, {});
}

// The time, then the MAC address from its ninth character, cut to 31
// characters and padded to an even length; without the MAC address file
// the machine's first network interface stands in.
TEST(GenSerial, TimeFollowedByTheMacAddressOrTheMachinesInterface) {
  const struct { const char *mac_file, *tail; } cases[] = {
      {"001132AABBCC second-word\n", "BBCC"},
      {"0123456789ABCDEF0123456789ABCDEF0123\n", "89ABCDEF0123456789ABC1"},
      {nullptr, nullptr},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(c.mac_file ? c.mac_file : "no MAC address file");
    TempDeviceRoot root;
    if (c.mac_file) root.WriteFile(kMacAddressPath, c.mac_file);
    if (!c.mac_file) std::remove(root.Path(kMacAddressPath).c_str());
    ASSERT_EQ(0, genSerial());
    const std::string serial = ReadFile(root.Path(kSerialPath));
    ASSERT_GE(serial.size(), 10u);  // the time in seconds comes first
    if (c.tail) {
      EXPECT_EQ(c.tail, serial.substr(10));
    } else {
      EXPECT_TRUE(serial.size() > 10 && serial.size() % 2 == 0 &&
                  serial.find_first_not_of("0123456789ABCDEF") == std::string::npos)
          << serial;
    }
  }
}
