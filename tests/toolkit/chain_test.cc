#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "tests/support/certificates.h"
#include "tests/support/test_support.h"
#include "toolkit/mkcert.h"

namespace {

// A root, an intermediate it issued, a server certificate the intermediate
// issued, and an unrelated CA; all made with plain openssl.
class ChainTest : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_TRUE(MakeSelfSignedCa(Path("/root.key"), Path("/root.crt"),
                                 "/CN=Root", 1024));
    ASSERT_TRUE(MakeSelfSignedCa(Path("/other.key"), Path("/other.crt"),
                                 "/CN=Other", 1024));
    ASSERT_TRUE(MakeSignedCertificate(Path("/root.key"), Path("/root.crt"),
                                      Path("/inter.key"), Path("/inter.crt"),
                                      "/CN=Intermediate", 1024));
    ASSERT_TRUE(MakeSignedCertificate(Path("/inter.key"), Path("/inter.crt"),
                                      Path("/server.key"), Path("/server.crt"),
                                      "/CN=nas.local", 1024));
    root_.WriteFile("/inter+root.crt",
                    ReadFile(Path("/inter.crt")) + ReadFile(Path("/root.crt")));
    root_.WriteFile("/empty.crt", "");
  }
  std::string Path(const std::string& name) const { return root_.Path(name); }

  TempDeviceRoot root_;
};

}  // namespace

TEST_F(ChainTest, ResultsForSetsInEitherFileOrder) {
  const struct {
    const char* certificate;
    const char* upper;
    int result;
  } cases[] = {
      {"/server.crt", "/inter.crt", 0},
      {"/inter.crt", "/server.crt", 0},
      {"/server.crt", "/inter+root.crt", 0},
      {"/inter+root.crt", "/server.crt", 0},
      {"/server.crt", "/other.crt", 1},
      {"/server.crt", "/root.crt", 1},
      {"/server.crt", "/empty.crt", 0},
      {"/empty.crt", "/empty.crt", 1},
  };
  for (const auto& c : cases) {
    SCOPED_TRACE(std::string(c.certificate) + " " + c.upper);
    EXPECT_EQ(c.result,
              verifyCrtChain(Path(c.certificate).c_str(), Path(c.upper).c_str()));
  }
}

TEST_F(ChainTest, MissingFilesAreErrors) {
  LogCapture log;
  EXPECT_EQ(-1, verifyCrtChain(Path("/server.crt").c_str(),
                               Path("/absent.crt").c_str()));
  EXPECT_EQ(-1, verifyCrtChain("", Path("/inter.crt").c_str()));
  EXPECT_EQ(-1, verifyCrtChain(Path("/server.crt").c_str(), nullptr));
  EXPECT_TRUE(log.Contains(" sanity check failed\n")) << log.Text();
}

TEST_F(ChainTest, UnopenableFileLeavesTheListAsItWas) {
  std::vector<X509Ptr> certificates;
  ASSERT_EQ(0, loadCrtList(Path("/inter+root.crt").c_str(), certificates));
  LogCapture log;
  EXPECT_EQ(-1, loadCrtList(Path("/absent.crt").c_str(), certificates));
  EXPECT_TRUE(log.Contains(" Open " + Path("/absent.crt") + " failed[0x"))
      << log.Text();
  EXPECT_EQ(2u, certificates.size());
}
