#include <string>

#include <gtest/gtest.h>

#include "tests/toolkit/toolkit_test_util.h"
#include "toolkit/mkcert.h"

// Paths reach the tool whole: quotes, blanks, command substitutions and
// separators run nothing.
TEST(ToolkitPaths, HostileFolderNamesRunNothingElse) {
  TempDeviceRoot root;
  std::string folder = root.Path("/it's a $(touch pwned1); `touch pwned2`; touch pwned3 #");
  std::string key = folder + "/k.key";
  std::string request = folder + "/r.csr";
  std::string certificate = folder + "/c.crt";
  CSR_ARGUMENT subject = FullSubject();

  ASSERT_EQ(0, genKey(key.c_str(), 1024));
  ASSERT_EQ(0, genCsr((folder + "/r.cfg").c_str(), key.c_str(), request.c_str(), &subject));
  ASSERT_EQ(0, genCrt((folder + "/x.cfg").c_str(), request.c_str(), certificate.c_str(), nullptr,
                      nullptr, key.c_str(), TRUE, 1, nullptr));
  EXPECT_EQ(0, verifyCrtAndKey(certificate.c_str(), key.c_str(), CYPHER_RSA));
  EXPECT_EQ(0, verifyCrtChain(certificate.c_str(), certificate.c_str()));
  for (const char* marker : {"pwned1", "pwned2", "pwned3"}) {
    EXPECT_FALSE(FileExists(marker)) << marker;
    EXPECT_FALSE(FileExists(root.Path("/") + marker)) << marker;
  }
}
