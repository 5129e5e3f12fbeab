// "orva-webapi init" and "orva-webapi call" as a shell runs them.

#include <string>

#include <gtest/gtest.h>

#include "tests/support/certificates.h"
#include "tests/support/test_support.h"

namespace {

// Runs orva-webapi with `arguments` (quoted for the shell) and returns its
// standard output followed by "exit N".
std::string RunHost(const TempDeviceRoot& scratch, const std::string& arguments) {
  const std::string out = scratch.Path("/host.out");
  RunForTest("(" + std::string(ORVA_WEBAPI_PATH) + " " + arguments + " >'" + out +
             "'; echo \"exit $?\" >>'" + out + "')");
  return ReadFile(out);
}

}  // namespace

TEST(OrvaWebapiCall, InitMakesAPrivateTokenOnceAndCallAnswersFromTheDeviceRoot) {
  TempDeviceRoot scratch;
  const std::string root = "--root '" + scratch.Path("/device") + "'";
  const std::string token_file = scratch.Path("/device/usr/orva/etc/webapi.token");
  ASSERT_NE(std::string::npos, RunHost(scratch, "init " + root).find("\nexit 0\n"));
  EXPECT_EQ(0600, FileMode(token_file));
  const std::string token = ReadFile(token_file);
  ASSERT_NE(std::string::npos, RunHost(scratch, "init " + root).find("\nexit 0\n"));
  EXPECT_EQ(token, ReadFile(token_file)) << "init never overwrites";

  const struct {
    const char* call;
    const char* answer;
  } cases[] = {
      {"ORVA.Core.Certificate list", "{\"error\":{\"code\":5504},\"success\":false}\nexit 1\n"},
      {"ORVA.Core.Certificate import cert_tmp=/etc/passwd key_tmp=/x",
       "{\"error\":{\"code\":400},\"success\":false}\nexit 1\n"},
      {"ORVA.Core.Certificate delete", "{\"error\":{\"code\":404},\"success\":false}\nexit 1\n"},
  };
  for (const auto& c : cases) EXPECT_EQ(c.answer, RunHost(scratch, "call " + root + " " + c.call));
  EXPECT_EQ("exit 1\n", RunHost(scratch, "call --root '" + scratch.Path("/nowhere") +
                                             "' ORVA.Core.Certificate list"));

  const std::string ssl = scratch.Path("/device/usr/orva/etc/ssl");
  ASSERT_TRUE(MakeSelfSignedCa(ssl + "/ssl.key/server.key", ssl + "/ssl.crt/server.crt",
                               "/CN=nas.local"));
  std::string listed =
      RunHost(scratch, "call " + root + " ORVA.Core.Certificate list type=server_cert");
  EXPECT_NE(std::string::npos, listed.find("\"common_name\":\"nas.local\"")) << listed;
  EXPECT_EQ(listed.size() - 8, listed.find("\nexit 0\n")) << listed;
}
