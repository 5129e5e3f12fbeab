// Paths and subject values reach the tool whole: quotes, blanks, command
// substitutions, separators and backslashes run nothing and change nothing.
// Subject values that could add lines to the tool's configuration, or that
// the tool would refuse, are refused before anything is written.

#include <string>

#include <gtest/gtest.h>

#include "common/store_paths.h"
#include "tests/support/certificates.h"
#include "tests/support/inspect.h"
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

TEST(GenCsr, RefusedSubjectsWriteNothing) {
  const struct { std::string CSR_ARGUMENT::*member; const char* value; } cases[] = {
      {&CSR_ARGUMENT::country, "TWN"},
      {&CSR_ARGUMENT::country, "T"},
      {&CSR_ARGUMENT::common_name, "a\ncommonName = evil"},
      {&CSR_ARGUMENT::state, "a\tb"},
      {&CSR_ARGUMENT::organization, "a\x7f"},
  };
  TempDeviceRoot root;
  ASSERT_TRUE(MakeRequest(root.Path(kGenKeyPath), root.Path("/scratch.csr"), "/CN=x"));
  for (const auto& c : cases) {
    SCOPED_TRACE(c.value);
    CSR_ARGUMENT subject{"TW", "Taipei", "Neihu", "Works", "Lab", "nas.local", "a@nas.local"};
    subject.*c.member = c.value;
    LogCapture log;
    EXPECT_EQ(-2, genCsr(root.Path(kCaCfgPath).c_str(), root.Path(kGenKeyPath).c_str(),
                         root.Path(kGenCsrPath).c_str(), &subject));
    EXPECT_TRUE(log.Contains(" CSR Argument error[0x")) << log.Text();
    EXPECT_EQ(subject.country.size() != 2,
              log.Contains(" Coountry name length size should be 2.\n")) << log.Text();
    EXPECT_FALSE(FileExists(root.Path(kCaCfgPath)) || FileExists(root.Path(kGenCsrPath)));
  }
}
