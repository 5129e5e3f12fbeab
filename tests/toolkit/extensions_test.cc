#include <string>

#include <gtest/gtest.h>

#include "tests/support/test_support.h"
#include "toolkit/mkcert.h"

namespace {

OLIBSzListPtr Split(const std::string& aliases) {
  OLIBSZLIST* list = OLIBCSzListAlloc(512);
  OLIBCStrSep(aliases.c_str(), ";", &list);
  return OLIBSzListPtr(list);
}

}  // namespace

TEST(GenerateCACNF, WritesTheCaExtensions) {
  TempDeviceRoot root;
  std::string path = root.Path("/usr/orva/etc/ssl/cfg.d/ca.crt.cfg");
  ASSERT_EQ(0, generateCACNF(path.c_str()));
  EXPECT_EQ(
      "extensions = x509v3\n"
      "[ x509v3 ]\n"
      "subjectAltName   = email:copy\n"
      "basicConstraints = CA:true,pathlen:0\n"
      "nsComment        = \"mod_ssl generated custom CA certificate\"\n"
      "nsCertType       = sslCA\n",
      ReadFile(path));
  LogCapture log;
  EXPECT_EQ(-1, generateCACNF(""));
  EXPECT_TRUE(log.Contains(" CA CNF name is null or empty.[0x")) << log.Text();
}

// A name that could inject extensions is refused before the file changes.
TEST(GenerateServerCNF, NamesEveryAliasAsDnsOrIpEntryAndRefusesAnythingElse) {
  const struct { const char *aliases, *names_line; } cases[] = {
      {";;", ""},
      {";nas.local;;b", "subjectAltName = \"DNS:nas.local, DNS:b\"\n"},
      {"*.example.com;192.168.1.10;fe80::1;my_host-2",
       "subjectAltName = \"DNS:*.example.com, IP:192.168.1.10, IP:fe80::1, DNS:my_host-2\"\n"},
  };
  TempDeviceRoot root;
  std::string path = root.Path("/usr/orva/etc/ssl/cfg.d/server.crt.cfg");
  for (const auto& c : cases) {
    SCOPED_TRACE(c.aliases);
    ASSERT_EQ(0, generateServerCNF(path.c_str(), Split(c.aliases).get()));
    EXPECT_EQ(std::string("extensions = x509v3\n"
                          "[ x509v3 ]\n"
                          "subjectAltName   = email:copy\n"
                          "nsComment        = \"mod_ssl generated custom server certificate\"\n"
                          "nsCertType       = server\n") + c.names_line,
              ReadFile(path));
  }
  const std::string written = ReadFile(path);
  for (const char* alias : {"a,b", "a\"b", "a\nbasicConstraints=CA:true", "a b", "host:1",
                            "a\\b", "a'b", "fe80::1%eth0", "a=b"}) {
    SCOPED_TRACE(alias);
    LogCapture log;
    EXPECT_EQ(-1, generateServerCNF(path.c_str(), Split(std::string("ok;") + alias).get()));
    EXPECT_TRUE(log.Contains(" Alias 2 is neither a host name nor an IP address")) << log.Text();
    EXPECT_EQ(written, ReadFile(path));
  }
}
