#include <unistd.h>

#include <cstdlib>
#include <string>

#include <gtest/gtest.h>

#include "tests/toolkit/toolkit_test_util.h"
#include "toolkit/mkcert.h"

namespace {

const std::string kKeyDir = "/usr/orva/etc/ssl/ssl.key";
const std::string kKey = kKeyDir + "/server.key";

// A stand-in tool that writes "new\n" to the file named after "-out", as the
// real one would, and exits with `status`.
void StandInTool(const TempDeviceRoot& root, int status) {
  root.WriteScript("/usr/orva/bin/openssl",
                   "for arg; do\n"
                   "  if [ \"$previous\" = -out ]; then echo new > \"$arg\" || exit 1; fi\n"
                   "  previous=$arg\n"
                   "done\nexit " + std::to_string(status));
}

}  // namespace

TEST(GenDir, MakesParentsAndRefusesEmptyPaths) {
  TempDeviceRoot root;
  EXPECT_EQ(0, genDir(root.Path("/a/b/c/file").c_str()));
  EXPECT_TRUE(FileExists(root.Path("/a/b/c")));
  LogCapture log;
  EXPECT_EQ(-1, genDir(""));
  EXPECT_EQ(-1, genDir(nullptr));
  EXPECT_TRUE(log.Contains(" genDir sanity check failed\n")) << log.Text();
}

// A failing "mkdir" first on PATH shows whether the directory command ran:
// not for a folder that exists, and still for one that must be made.
TEST(GenDir, RunsTheDirectoryCommandOnlyWhenThereIsSomethingToMake) {
  TempDeviceRoot root;
  root.WriteScript("/fake-bin/mkdir", "exit 1");
  MakeDirs(root.Path("/present"));
  const char* old_path = getenv("PATH");
  const std::string saved = old_path != nullptr ? old_path : "/usr/bin:/bin";
  setenv("PATH", (root.Path("/fake-bin") + ":" + saved).c_str(), 1);
  int existing = genDir(root.Path("/present/file").c_str());
  int missing = genDir(root.Path("/absent/file").c_str());
  setenv("PATH", saved.c_str(), 1);

  EXPECT_EQ(0, existing);
  EXPECT_EQ(-1, missing);
  EXPECT_FALSE(FileExists(root.Path("/absent")));
}

TEST(GenKey, RefusesSizesOfZeroAndAboveTheLimitBeforeAnythingRuns) {
  for (unsigned int bits : {0u, 16385u, 0xFFFFFFFFu}) {
    SCOPED_TRACE(bits);
    TempDeviceRoot root;
    LogCapture log;
    EXPECT_EQ(-1, genKey(root.Path(kKey).c_str(), bits));
    EXPECT_TRUE(log.Contains(" genKey sanity failed\n")) << log.Text();
    EXPECT_FALSE(FileExists(root.Path(kKeyDir)));
  }
}

// The logged command line shows the seed list the tool was given.
TEST(GenKey, ToolGetsOnlyExistingSeedFilesAndItsFailureKeepsTheOldKey) {
  TempDeviceRoot root;
  root.WriteFile(kKey, "old key\n", 0400);
  StandInTool(root, 1);
  std::string seeds;
  for (const char* file : {"/var/log/messages", "/var/run/dmesg.boot", "/var/log/system.log",
                           "/etc/hosts", "/etc/group", "/etc/resolv.conf", "/bin/ls"}) {
    if (access(file, F_OK) == 0) seeds += (seeds.empty() ? "" : ":") + std::string(file);
  }
  if (!seeds.empty()) seeds = "-rand '" + seeds + "' ";
  LogCapture log;
  EXPECT_EQ(-1, genKey(root.Path(kKey).c_str(), 2048));
  EXPECT_TRUE(log.Contains(" Error when execute \"'" + root.Path("/usr/orva/bin/openssl") +
                           "' genrsa " + seeds + "-out '"))
      << log.Text();
  EXPECT_EQ("old key\n", ReadFile(root.Path(kKey)));
  EXPECT_EQ("", TemporaryFilesIn(root.Path(kKeyDir)));
}

TEST(GenKey, UserWithoutRootRightsMakesTheSameKeyTwice) {
  TempDeviceRoot root;
  root.WriteFile(kKey, "old key\n", 0644);
  // The machine's openssl may be reserved to root; what is proved here is
  // that a read-only key is replaced, which a stand-in shows as well.
  StandInTool(root, 0);
  std::string key = root.Path(kKey);
  EXPECT_TRUE(RunAsUnprivilegedUser(root, [&key] {
    return genKey(key.c_str(), 1024) == 0 && genKey(key.c_str(), 1024) == 0;
  }));
  EXPECT_EQ(0400, FileMode(key));
  EXPECT_EQ("new\n", ReadFile(key));
  EXPECT_EQ("", TemporaryFilesIn(root.Path(kKeyDir)));
}
