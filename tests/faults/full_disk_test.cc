// A full disk while keys, requests and certificates are written: the store
// lies on a small tmpfs, which the openssl stand-in fills up right before
// one of its runs, or which is filled before the call with room for a given
// number of copies. Needs root with mount rights; skipped otherwise.

#include <unistd.h>

#include <string>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "tests/faults/fault_support.h"

namespace {

using Outcome = ORVA::APIResponse::Outcome;

constexpr size_t kStoreDiskBytes = 4 << 20;

}  // namespace

class FullDisk : public testing::Test {
 protected:
  void SetUp() override {
    std::string why;
    if (!TestMounts::Available(&why)) GTEST_SKIP() << "no tmpfs for the store: " << why;
    ASSERT_TRUE(mounts_.Tmpfs(root_.Path(kStore), kStoreDiskBytes));
    ASSERT_NO_FATAL_FAILURE(InstallOldStore(root_));
    before_ = ReadStore(root_);
  }

  // Declared first: the store's mount goes before the device root.
  TempDeviceRoot root_;
  TestMounts mounts_;
  StoreState before_;
};

TEST_F(FullDisk, EveryWriterFillingTheDiskAtAnyToolRunLeavesWholeFiles) {
  for (const StoreWriter& writer : StoreWritersAndImport()) {
    InstallFaultyOpenssl(root_, ToolFault{});
    ASSERT_EQ(Outcome::kSuccess, writer.call(root_).outcome()) << writer.name;
    const int runs = ToolRuns(root_);
    RestoreStore(root_, before_);
    for (int full = 1; full <= runs; ++full) {
      SCOPED_TRACE(std::string(writer.name) + ", disk full from tool run " +
                   std::to_string(full) + " of " + std::to_string(runs));
      InstallFaultyOpenssl(root_, ToolFault{0, full});
      ORVA::APIResponse response = writer.call(root_);
      // A run that writes nothing may find the disk full and still succeed.
      if (response.outcome() != Outcome::kSuccess) {
        EXPECT_EQ(writer.write_error, response.error_code());
      }
      FreeDisk(root_);
      ExpectStoreWhole(root_, before_);
      RestoreStore(root_, before_);
    }
  }
}

TEST_F(FullDisk, FullBeforeTheRequestFailsEveryWriterAndKeepsEveryCertificateFile) {
  for (const StoreWriter& writer : StoreWritersAndImport()) {
    SCOPED_TRACE(writer.name);
    InstallFaultyOpenssl(root_, ToolFault{0, 1});
    EXPECT_EQ(writer.write_error, writer.call(root_).error_code());
    FreeDisk(root_);
    ExpectStoreWhole(root_, before_);
    EXPECT_EQ(CertificateFiles(before_), CertificateFiles(ReadStore(root_)));
    RestoreStore(root_, before_);
  }
}

// The import copies its uploads with "/bin/cp" after the tool's checks. Each
// upload takes one page of the tmpfs, so leaving room for `copied` pages
// fills the disk during the next copy.
TEST_F(FullDisk, ImportRunningOutOfRoomAtAnyCopyKeepsTheOldSetAndNoCopy) {
  const char* uploads[] = {"server.crt", "server.key", "server-ca.crt"};
  const long page = sysconf(_SC_PAGESIZE);
  for (int copied = 0; copied <= 3; ++copied) {
    SCOPED_TRACE("room for " + std::to_string(copied) + " copies");
    ASSERT_NO_FATAL_FAILURE(FillDisk(root_, copied * page));
    LogCapture log;
    ORVA::APIResponse response = ImportWriter().call(root_);
    if (copied == 3) {
      EXPECT_EQ(Outcome::kSuccess, response.outcome()) << log.Text();
      EXPECT_EQ(ReadFile(root_.Path("/outside/server.crt")),
                ReadFile(root_.Path(std::string(kStore) + "/ssl.crt/server.crt")));
    } else {
      EXPECT_EQ(5515, response.error_code());
      EXPECT_TRUE(log.Contains("CA copy command failed:/bin/cp '" +
                               root_.Path("/outside/") + uploads[copied] + "'"))
          << log.Text();
      EXPECT_EQ(CertificateFiles(before_), CertificateFiles(ReadStore(root_)));
    }
    FreeDisk(root_);
    ExpectStoreWhole(root_, before_);
    RestoreStore(root_, before_);
  }
}

TEST_F(FullDisk, ExportOnAFullDiskSendsNothingAndLeavesNoArchive) {
  ASSERT_NO_FATAL_FAILURE(FillDisk(root_));
  for (const char* set : {"archive", "csr_set"}) {
    SCOPED_TRACE(set);
    EXPECT_FALSE(CallExport(set).download.has_body);
    EXPECT_FALSE(FileExists(root_.Path(std::string(kStore) + "/.gen/archive.zip")))
        << "no cut archive is left";
    EXPECT_EQ(CertificateFiles(before_), CertificateFiles(ReadStore(root_)));
  }
}
