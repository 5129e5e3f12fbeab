#include <sys/wait.h>

#include <cstdio>
#include <memory>
#include <string>

#include <gtest/gtest.h>

#include "tests/support/certificates.h"
#include "tests/support/test_support.h"

namespace {

struct ProcessResult {
  int exit_code;
  std::string output;
};

// Runs orva-webapi with `arguments` (already quoted for the shell).
ProcessResult RunHost(const std::string& arguments) {
  std::string command = std::string(ORVA_WEBAPI_PATH) + " " + arguments + " 2>/dev/null";
  ProcessResult result{-1, ""};
  FILE* pipe = popen(command.c_str(), "r");
  if (pipe == nullptr) return result;
  char buffer[4096];
  size_t got;
  while ((got = fread(buffer, 1, sizeof(buffer), pipe)) > 0) result.output.append(buffer, got);
  int status = pclose(pipe);
  result.exit_code = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
  return result;
}

}  // namespace

TEST(OrvaWebapiCall, InitThenListAnswersFromTheDeviceRoot) {
  TempDeviceRoot scratch;
  std::string root = scratch.Path("/device");
  ASSERT_EQ(0, RunHost("init --root '" + root + "'").exit_code);
  EXPECT_EQ(0600, FileMode(root + "/usr/orva/etc/webapi.token"));
  EXPECT_NE(std::string::npos,
            ReadFile(root + "/usr/orva/etc/orva.conf").find("runHTTPS=\"no\""));
  std::string token = ReadFile(root + "/usr/orva/etc/webapi.token");
  ASSERT_EQ(0, RunHost("init --root '" + root + "'").exit_code);
  EXPECT_EQ(token, ReadFile(root + "/usr/orva/etc/webapi.token")) << "init never overwrites";

  ProcessResult empty = RunHost("call --root '" + root + "' ORVA.Core.Certificate list");
  EXPECT_EQ(1, empty.exit_code);
  EXPECT_EQ("{\"error\":{\"code\":5504},\"success\":false}\n", empty.output);

  const std::string ssl = root + "/usr/orva/etc/ssl";
  ASSERT_TRUE(MakeSelfSignedCa(ssl + "/ssl.key/ca.key", ssl + "/ssl.crt/ca.crt", "/CN=Root"));
  ASSERT_TRUE(MakeSignedCertificate(ssl + "/ssl.key/ca.key", ssl + "/ssl.crt/ca.crt",
                                    ssl + "/ssl.key/server.key", ssl + "/ssl.crt/server.crt",
                                    "/CN=nas.local"));
  ProcessResult listed = RunHost("call --root '" + root +
                                 "' ORVA.Core.Certificate list 'additional=[\"valid_from\"]'");
  EXPECT_EQ(0, listed.exit_code) << listed.output;
  EXPECT_NE(std::string::npos, listed.output.find("\"success\":true"));
  EXPECT_NE(std::string::npos, listed.output.find("\"valid_from\""));
  EXPECT_NE(std::string::npos, listed.output.find("\"type\":\"root_cert\""));
}

TEST(OrvaWebapiCall, HostRefusesClientNamedFilesAndUnknownMethods) {
  TempDeviceRoot scratch;
  std::string root = scratch.Path("/device");
  ASSERT_EQ(0, RunHost("init --root '" + root + "'").exit_code);

  ProcessResult named = RunHost("call --root '" + root +
                                "' ORVA.Core.Certificate import cert_tmp=/etc/passwd key_tmp=/x");
  EXPECT_EQ(1, named.exit_code);
  EXPECT_EQ("{\"error\":{\"code\":400},\"success\":false}\n", named.output);

  ProcessResult unknown = RunHost("call --root '" + root + "' ORVA.Core.Certificate delete");
  EXPECT_EQ("{\"error\":{\"code\":404},\"success\":false}\n", unknown.output);

  EXPECT_EQ(1, RunHost("call --root '" + scratch.Path("/nowhere") +
                       "' ORVA.Core.Certificate list").exit_code);
}
