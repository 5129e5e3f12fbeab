// "orva-webapi init", "call" and "serve" as a shell runs them.

#include <string>

#include <gtest/gtest.h>

#include "tests/support/certificates.h"
#include "tests/support/test_support.h"

namespace {

// Runs orva-webapi with `arguments` (quoted for the shell) for at most 20 s
// and returns its standard output followed by "exit N".
std::string RunHost(const TempDeviceRoot& scratch, const std::string& arguments) {
  const std::string out = scratch.Path("/host.out");
  RunForTest("(timeout 20 " + std::string(ORVA_WEBAPI_PATH) + " " + arguments + " >'" + out +
             "'; echo \"exit $?\" >>'" + out + "')");
  return ReadFile(out);
}

}  // namespace

TEST(OrvaWebapiCommands, InitMakesAPrivateTokenOnceCallAnswersAndServeRefusesBadAddresses) {
  TempDeviceRoot scratch;
  const std::string root = "--root '" + scratch.Path("/device") + "'";
  const std::string token_file = scratch.Path("/device/usr/orva/etc/webapi.token");
  ASSERT_NE(std::string::npos, RunHost(scratch, "init " + root).find("\nexit 0\n"));
  EXPECT_EQ(0600, FileMode(token_file));
  const std::string token = ReadFile(token_file);
  ASSERT_NE(std::string::npos, RunHost(scratch, "init " + root).find("\nexit 0\n"));
  EXPECT_EQ(token, ReadFile(token_file)) << "init never overwrites";

  EXPECT_EQ("{\"error\":{\"code\":404},\"success\":false}\nexit 1\n",
            RunHost(scratch, "call " + root + " ORVA.Core.Certificate delete"));
  EXPECT_EQ("exit 1\n", RunHost(scratch, "call --root '" + scratch.Path("/nowhere") +
                                             "' ORVA.Core.Certificate list"));
  for (const char* address : {"localhost:65536", "localhost:80a", "localhost:", "::1:8080", "a}b:80"}) {
    EXPECT_EQ("exit 2\n", RunHost(scratch, "serve " + root + " --listen " + address)) << address;
  }
  const std::string ssl = scratch.Path("/device/usr/orva/etc/ssl");
  ASSERT_TRUE(MakeSelfSignedCa(ssl + "/ssl.key/server.key", ssl + "/ssl.crt/server.crt",
                               "/CN=nas.local"));
  const std::string listed =
      RunHost(scratch, "call " + root + " ORVA.Core.Certificate list type=server_cert");
  EXPECT_NE(std::string::npos, listed.find("\"common_name\":\"nas.local\"")) << listed;
  EXPECT_EQ(listed.size() - 8, listed.find("\nexit 0\n")) << "one line of JSON: " << listed;
}
