// A full disk while keys, requests and certificates are written: the store
// lies on a small tmpfs, which the openssl stand-in fills up right before
// one of its runs. Needs root with mount rights; skipped otherwise.

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
  for (const StoreWriter& writer : StoreWriters()) {
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
        EXPECT_EQ(5501, response.error_code());
      }
      ExpectStoreWhole(root_, before_);
      FreeDisk(root_);
      RestoreStore(root_, before_);
    }
  }
}

TEST_F(FullDisk, FullBeforeTheRequestFailsEveryWriterAndKeepsEveryCertificateFile) {
  for (const StoreWriter& writer : StoreWriters()) {
    SCOPED_TRACE(writer.name);
    InstallFaultyOpenssl(root_, ToolFault{0, 1});
    EXPECT_EQ(5501, writer.call(root_).error_code());
    ExpectStoreWhole(root_, before_);
    EXPECT_EQ(CertificateFiles(before_), CertificateFiles(ReadStore(root_)));
    FreeDisk(root_);
    RestoreStore(root_, before_);
  }
}

TEST_F(FullDisk, ExportOnAFullDiskSendsNothingAndLeavesNoArchive) {
  ASSERT_NO_FATAL_FAILURE(FillDisk(root_));
  for (const char* set : {"archive", "csr_set"}) {
    SCOPED_TRACE(set);
    ORVA::APIResponse response;
    EXPECT_FALSE(CallExport(set, &response));
    EXPECT_FALSE(FileExists(root_.Path(std::string(kStore) + "/.gen/archive.zip")))
        << "no cut archive is left";
    EXPECT_EQ(CertificateFiles(before_), CertificateFiles(ReadStore(root_)));
  }
}
