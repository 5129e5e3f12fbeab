#include <grp.h>
#include <sys/wait.h>
#include <unistd.h>

#include <string>

#include <gtest/gtest.h>

#include "tests/support/certificates.h"
#include "tests/toolkit/toolkit_test_util.h"
#include "toolkit/mkcert.h"

namespace {

const std::string kKey = "/usr/orva/etc/ssl/ssl.key/server.key";
const std::string kKeyFolder = "/usr/orva/etc/ssl/ssl.key";

// Replaces the device's openssl with a script that runs `first`, writes the
// file named after "-out" with `write` (a command on "$arg", where "@"
// stands for a whole key made here) and exits with `status`.
void InstallStandIn(const TempDeviceRoot& root, std::string write, int status,
                    const std::string& first = "") {
  const std::string fixture = root.Path("/fixture.key");
  ASSERT_TRUE(RunForTest("openssl genrsa -out '" + fixture + "' 1024"));
  if (write.find('@') != std::string::npos) write.replace(write.find('@'), 1, fixture);
  root.WriteScript("/usr/orva/bin/openssl",
                   first + "for arg; do\n"
                           "  if [ \"$previous\" = -out ]; then " + write + " || exit 1; fi\n"
                           "  previous=$arg\n"
                           "done\n"
                           "exit " + std::to_string(status));
}

}  // namespace

TEST(GenDir, MakesParentsAndRefusesEmptyPaths) {
  TempDeviceRoot root;
  EXPECT_EQ(0, genDir(root.Path("/a/b/c/file").c_str()));
  EXPECT_TRUE(FileExists(root.Path("/a/b/c")));
  EXPECT_EQ(0, genDir("file-in-current-directory"));
  LogCapture log;
  EXPECT_EQ(-1, genDir(""));
  EXPECT_EQ(-1, genDir(nullptr));
  EXPECT_TRUE(log.Contains(" genDir sanity check failed\n")) << log.Text();
}

TEST(GenKey, RefusesSizesOfZeroAndAboveTheLimitBeforeAnythingRuns) {
  for (unsigned int bits : {0u, 16385u, 0xFFFFFFFFu}) {
    SCOPED_TRACE(bits);
    TempDeviceRoot root;
    LogCapture log;
    EXPECT_EQ(-1, genKey(root.Path(kKey).c_str(), bits));
    EXPECT_TRUE(log.Contains(" genKey sanity failed\n")) << log.Text();
    EXPECT_FALSE(FileExists(root.Path(kKeyFolder)));
  }
}

// A failing tool, and one that ends with 0 but leaves an empty file, as on
// a full disk.
TEST(GenKey, FailedOrIncompleteToolOutputLeavesTheOldKey) {
  for (int status : {1, 0}) {
    SCOPED_TRACE(status);
    TempDeviceRoot root;
    root.WriteFile(kKey, "old key\n", 0400);
    InstallStandIn(root, status == 0 ? ": > \"$arg\"" : "cat @ > \"$arg\"", status);
    LogCapture log;
    EXPECT_EQ(-1, genKey(root.Path(kKey).c_str(), 2048));
    EXPECT_TRUE(log.Contains(status == 0 ? " is incomplete\n"
                                         : " Error when execute \"'" +
                                               root.Path("/usr/orva/bin/openssl") + "' genrsa "))
        << log.Text();
    EXPECT_EQ("old key\n", ReadFile(root.Path(kKey)));
    EXPECT_EQ("", TemporaryFilesIn(root.Path(kKeyFolder)));
  }
}

TEST(GenKey, HandsOnlyExistingSeedFilesToTheTool) {
  TempDeviceRoot root;
  InstallStandIn(root, "cat @ > \"$arg\"", 0, "echo \"$@\" > '" + root.Path("/args") + "'\n");
  ASSERT_EQ(0, genKey(root.Path(kKey).c_str(), 2048));
  std::string existing;
  for (const char* file : {"/var/log/messages", "/var/run/dmesg.boot", "/var/log/system.log",
                           "/etc/hosts", "/etc/group", "/etc/resolv.conf", "/bin/ls"}) {
    if (access(file, F_OK) == 0) existing += (existing.empty() ? "" : ":") + std::string(file);
  }
  std::string args = ReadFile(root.Path("/args"));
  EXPECT_EQ(0u, args.find(existing.empty() ? "genrsa -out "
                                           : "genrsa -rand " + existing + " -out "))
      << args;
}

// The machine's openssl may be reserved to root; what is proved here is
// that a read-only key is replaced, which a stand-in shows as well. The
// calls run in a child process; under root it owns the device root and
// gives up root's rights first.
TEST(GenKey, UserWithoutRootRightsReplacesAReadOnlyKeyTwice) {
  constexpr uid_t kNobody = 65534;
  TempDeviceRoot root;
  root.WriteFile(kKey, "old key\n", 0400);
  InstallStandIn(root, "cat @ > \"$arg\"", 0);
  ASSERT_TRUE(geteuid() != 0 || RunForTest("chown -R 65534:65534 '" + root.root() + "'"));
  const std::string key = root.Path(kKey);
  pid_t child = fork();
  if (child == 0) {
    bool unprivileged = geteuid() != 0 || (setgroups(0, nullptr) == 0 && setgid(kNobody) == 0 &&
                                           setuid(kNobody) == 0 && geteuid() == kNobody);
    _exit(unprivileged && genKey(key.c_str(), 1024) == 0 && genKey(key.c_str(), 1024) == 0 ? 0 : 1);
  }
  int status = 0;
  ASSERT_EQ(child, waitpid(child, &status, 0));
  EXPECT_EQ(0, status) << "both keys made as that user";
  EXPECT_EQ(0400, FileMode(key));
  EXPECT_EQ(ReadFile(root.Path("/fixture.key")), ReadFile(key));
  EXPECT_EQ("", TemporaryFilesIn(root.Path(kKeyFolder)));
}
