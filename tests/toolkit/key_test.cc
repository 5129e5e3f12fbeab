#include <unistd.h>

#include <string>

#include <gtest/gtest.h>

#include "tests/support/certificates.h"
#include "tests/support/test_support.h"
#include "tests/toolkit/toolkit_test_util.h"
#include "toolkit/mkcert.h"

namespace {
const std::string kKey = "/usr/orva/etc/ssl/ssl.key/server.key";
// Script lines that write the file named after "-out" as the tool would,
// failing when it cannot be written: a copy of the key `fixture` (a real
// path), since only a whole key is installed.
std::string WriteOutputFile(const std::string& fixture) {
  return "for arg; do\n"
         "  if [ \"$previous\" = -out ]; then cat '" + fixture + "' > \"$arg\" || exit 1; fi\n"
         "  previous=$arg\n"
         "done\n";
}

// A key for stand-in tools to hand out, at the real path returned.
std::string FixtureKey(const TempDeviceRoot& root) {
  std::string path = root.Path("/fixture.key");
  EXPECT_TRUE(RunForTest("openssl genrsa -out '" + path + "' 1024"));
  return path;
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

TEST(GenKey, MakesReadOnlyKeyReplacingTheOldOne) {
  TempDeviceRoot root;
  root.WriteFile(kKey, "old key\n", 0644);
  ASSERT_EQ(0, genKey(root.Path(kKey).c_str(), 1024));
  EXPECT_EQ(0400, FileMode(root.Path(kKey)));
  EXPECT_NE(std::string::npos, ReadFile(root.Path(kKey)).find("PRIVATE KEY"));
  EXPECT_EQ("", TemporaryFilesIn(root.Path("/usr/orva/etc/ssl/ssl.key")));
}

TEST(GenKey, RefusesSizesOfZeroAndAboveTheLimitBeforeAnythingRuns) {
  for (unsigned int bits : {0u, 16385u, 0xFFFFFFFFu}) {
    SCOPED_TRACE(bits);
    TempDeviceRoot root;
    LogCapture log;
    EXPECT_EQ(-1, genKey(root.Path(kKey).c_str(), bits));
    EXPECT_TRUE(log.Contains(" genKey sanity failed\n")) << log.Text();
    EXPECT_FALSE(FileExists(root.Path("/usr/orva/etc/ssl/ssl.key")));
  }
}

TEST(GenKey, ToolFailureLeavesTheOldKeyAndNoTemporaryFile) {
  TempDeviceRoot root;
  root.WriteFile(kKey, "old key\n", 0400);
  root.WriteScript("/usr/orva/bin/openssl", WriteOutputFile(FixtureKey(root)) + "exit 1");
  LogCapture log;
  EXPECT_EQ(-1, genKey(root.Path(kKey).c_str(), 2048));
  EXPECT_TRUE(log.Contains(" Error when execute \"'" +
                           root.Path("/usr/orva/bin/openssl") + "' genrsa "))
      << log.Text();
  EXPECT_EQ("old key\n", ReadFile(root.Path(kKey)));
  EXPECT_EQ("", TemporaryFilesIn(root.Path("/usr/orva/etc/ssl/ssl.key")));
}

TEST(GenKey, HandsOnlyExistingSeedFilesToTheTool) {
  TempDeviceRoot root;
  root.WriteScript("/usr/orva/bin/openssl",
                   "echo \"$@\" > '" + root.Path("/args") + "'\n" +
                   WriteOutputFile(FixtureKey(root)) + "exit 0");
  ASSERT_EQ(0, genKey(root.Path(kKey).c_str(), 2048));

  std::string existing;
  for (const char* file :
       {"/var/log/messages", "/var/run/dmesg.boot", "/var/log/system.log",
        "/etc/hosts", "/etc/group", "/etc/resolv.conf", "/bin/ls"}) {
    if (access(file, F_OK) != 0) continue;
    existing += (existing.empty() ? "" : ":") + std::string(file);
  }
  std::string args = ReadFile(root.Path("/args"));
  if (existing.empty()) {
    EXPECT_EQ(std::string::npos, args.find("-rand")) << args;
  } else {
    EXPECT_EQ(0u, args.find("genrsa -rand " + existing + " -out ")) << args;
  }
}

TEST(GenKey, CommandLineThatDoesNotFitIsRefused) {
  TempDeviceRoot root;
  std::string folder = root.Path("/" + std::string(250, 'a') + "/" +
                                 std::string(250, 'b') + "/" +
                                 std::string(250, 'c') + "/" +
                                 std::string(250, 'd'));
  LogCapture log;
  EXPECT_EQ(-1, genKey((folder + "/k.key").c_str(), 1024));
  EXPECT_TRUE(log.Contains("does not fit")) << log.Text();
  EXPECT_FALSE(FileExists(folder + "/k.key"));
  EXPECT_EQ("", TemporaryFilesIn(folder));
}

TEST(GenKey, UserWithoutRootRightsMakesTheSameKeyTwice) {
  TempDeviceRoot root;
  // The machine's openssl may be reserved to root; what is proved here is
  // that a read-only key is replaced, which a stand-in shows as well.
  root.WriteScript("/usr/orva/bin/openssl", WriteOutputFile(FixtureKey(root)) + "exit 0");
  std::string key = root.Path(kKey);
  EXPECT_TRUE(RunAsUnprivilegedUser(root, [&key] {
    return genKey(key.c_str(), 1024) == 0 && genKey(key.c_str(), 1024) == 0;
  }));
  EXPECT_EQ(0400, FileMode(key));
}

TEST(GenKey, ToolSuccessWithoutAWholeKeyLeavesTheOldKey) {
  // On a full disk the tool ends with 0 and leaves an empty or cut file.
  for (const char* output : {": > \"$arg\"", "head -c 300 '@' > \"$arg\""}) {
    SCOPED_TRACE(output);
    TempDeviceRoot root;
    std::string write = output;
    std::string::size_type at = write.find('@');
    if (at != std::string::npos) write.replace(at, 1, FixtureKey(root));
    root.WriteFile(kKey, "old key\n", 0400);
    root.WriteScript("/usr/orva/bin/openssl",
                     "for arg; do\n"
                     "  if [ \"$previous\" = -out ]; then " + write + "; fi\n"
                     "  previous=$arg\n"
                     "done\n"
                     "exit 0");
    LogCapture log;
    EXPECT_EQ(-1, genKey(root.Path(kKey).c_str(), 1024));
    EXPECT_TRUE(log.Contains(" is incomplete\n")) << log.Text();
    EXPECT_EQ("old key\n", ReadFile(root.Path(kKey)));
    EXPECT_EQ("", TemporaryFilesIn(root.Path("/usr/orva/etc/ssl/ssl.key")));
  }
}
