// Store folders that cannot be written. The tests run as root in CI, where
// modes do not stop anyone, so a folder is made read-only by a read-only
// bind mount of its own (as another user, by its mode).

#include <sys/stat.h>
#include <unistd.h>

#include <string>

#include <gtest/gtest.h>

#include "tests/faults/fault_support.h"

namespace {

// Makes the store folder `folder` ("" for the store itself) unwritable for
// the life of `mounts`. False when that is impossible here; `why` says why.
bool MakeUnwritable(const TempDeviceRoot& root, const std::string& folder,
                    TestMounts* mounts, std::string* why) {
  const std::string path = root.Path(kStore) + (folder.empty() ? "" : "/" + folder);
  if (geteuid() != 0) return chmod(path.c_str(), 0555) == 0;
  if (!TestMounts::Available(why)) return false;
  if (!mounts->ReadOnly(path)) {
    *why = "read-only bind mount of " + path + " failed";
    return false;
  }
  return true;
}

void MakeWritableAgain(const TempDeviceRoot& root, const std::string& folder) {
  if (geteuid() == 0) return;  // The mount goes with its TestMounts.
  chmod((root.Path(kStore) + (folder.empty() ? "" : "/" + folder)).c_str(), 0755);
}

}  // namespace

TEST(UnwritableStore, ReadOnlyStoreFailsEveryWriterAndChangesNothing) {
  TempDeviceRoot root;
  ASSERT_NO_FATAL_FAILURE(InstallOldStore(root));
  const StoreState before = ReadStore(root);
  {
    TestMounts mounts;
    std::string why;
    if (!MakeUnwritable(root, "", &mounts, &why)) GTEST_SKIP() << "cannot make the store read-only: " << why;
    for (const StoreWriter& writer : StoreWritersAndImport()) {
      SCOPED_TRACE(writer.name);
      ORVA::APIResponse response = writer.call(root);
      EXPECT_EQ(writer.write_error, response.error_code());
      EXPECT_TRUE(response.data().isNull());
    }
    // Within the read-only store nothing at all may have changed.
    const StoreState after = ReadStore(root);
    EXPECT_EQ(before.size(), after.size());
    for (const auto& [name, file] : before) {
      SCOPED_TRACE(name);
      ASSERT_EQ(1u, after.count(name));
      EXPECT_EQ(file.content, after.at(name).content);
    }
    EXPECT_EQ(ORVA::APIResponse::Outcome::kSuccess, CallList().outcome());
  }
  MakeWritableAgain(root, "");
}

TEST(UnwritableStore, CrtCreateWithOneReadOnlyFolderLeavesWholeMatchingPairs) {
  const char* folders[] = {"ssl.key", "ssl.crt", "ssl.csr", "cfg.d", ".gen", "ssl.intercrt"};
  TempDeviceRoot root;
  ASSERT_NO_FATAL_FAILURE(InstallOldStore(root));
  const StoreState before = ReadStore(root);
  for (const char* folder : folders) {
    SCOPED_TRACE(folder);
    {
      TestMounts mounts;
      std::string why;
      if (!MakeUnwritable(root, folder, &mounts, &why)) GTEST_SKIP() << "cannot make " << folder << " read-only: " << why;
      ORVA::APIResponse response = CallCreateCrt();
      EXPECT_EQ(5501, response.error_code());
      ExpectStoreWhole(root, before);
      const StoreState after = ReadStore(root);
      if (std::string(folder) != "ssl.intercrt") {
        // The server pair is installed last, as a pair.
        for (const char* live : {"ssl.key/server.key", "ssl.crt/server.crt"}) {
          EXPECT_EQ(before.at(live).content, after.at(live).content) << live;
        }
      }
    }
    MakeWritableAgain(root, folder);
    RestoreStore(root, before);
  }
}

TEST(UnwritableStore, FileInPlaceOfAFolderFailsItsWriters) {
  struct Case {
    const char* folder;
    const char* writer;
  } cases[] = {
      {".gen", "CSR create"}, {".gen", "CSR renew"}, {".gen", "CSR sign"},
      {"ssl.key", "CRT create"}, {"ssl.crt", "CRT create"}, {"cfg.d", "CSR create"},
      {"ssl.intercrt", "import"},  // after the certificate and key are staged
  };
  TempDeviceRoot root;
  ASSERT_NO_FATAL_FAILURE(InstallOldStore(root));
  const StoreState installed = ReadStore(root);
  for (const Case& c : cases) {
    SCOPED_TRACE(std::string(c.writer) + " with a file at " + c.folder);
    // The folder's files go; a plain file takes its place.
    StoreState state;
    for (const auto& [name, file] : installed) {
      if (name.rfind(std::string(c.folder) + "/", 0) != 0) state[name] = file;
    }
    state[c.folder] = {"not a folder\n", 0644};
    RestoreStore(root, state);
    const StoreState before = ReadStore(root);
    for (const StoreWriter& writer : StoreWritersAndImport()) {
      if (writer.name != std::string(c.writer)) continue;
      EXPECT_EQ(writer.write_error, writer.call(root).error_code());
    }
    ExpectStoreWhole(root, before);
    EXPECT_EQ(CertificateFiles(before), CertificateFiles(ReadStore(root)));
    EXPECT_EQ("not a folder\n", ReadFile(root.Path(std::string(kStore) + "/" + c.folder)));
  }
}
