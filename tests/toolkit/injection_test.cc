// Paths and subject values reach the tool whole: quotes, blanks, command
// substitutions, separators and backslashes run nothing and change nothing.

#include <string>

#include <gtest/gtest.h>

#include "tests/support/certificates.h"
#include "tests/support/test_support.h"
#include "toolkit/mkcert.h"

TEST(ToolkitInjection, HostilePathsAndSubjectValuesArriveWhole) {
  TempDeviceRoot root;
  const std::string folder = root.Path("/it's a $(touch pwned1); `touch pwned2`; touch pwned3 #");
  const std::string key = folder + "/k.key", request = folder + "/r.csr";
  const std::string certificate = folder + "/c.crt";
  // Empty values are left out; UTF-8 arrives as it stands.
  CSR_ARGUMENT subject{"TW", "", "Z\xC3\xBCrich", "O'Reilly \\ $HOME #1 \"x\"", "ends with \\",
                       "'", ""};

  ASSERT_EQ(0, genKey(key.c_str(), 2048));
  ASSERT_EQ(0, genCsr((folder + "/r.cfg").c_str(), key.c_str(), request.c_str(), &subject));
  ASSERT_EQ(0, genCrt((folder + "/x.cfg").c_str(), request.c_str(), certificate.c_str(), nullptr,
                      nullptr, key.c_str(), TRUE, 1, nullptr));
  EXPECT_NE(std::string::npos,
            PemText(request).find("Subject: C=TW, L=Z\\xC3\\xBCrich, O=O'Reilly \\ $HOME #1 "
                                  "\"x\", OU=ends with \\, CN='\n"))
      << PemText(request);
  EXPECT_EQ(0, verifyCrtAndKey(certificate.c_str(), key.c_str(), CYPHER_RSA));
  EXPECT_EQ(0, verifyCrtChain(certificate.c_str(), certificate.c_str()));
  for (const char* marker : {"pwned1", "pwned2", "pwned3"}) {
    EXPECT_FALSE(FileExists(marker) || FileExists(root.Path("/") + marker)) << marker;
  }
}
