// The 7z tool missing: an export sends nothing, answers nothing and hands
// nothing out.

#include <unistd.h>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "tests/faults/fault_support.h"

TEST(ArchiverFaults, Missing7zSendsNothingAndKeepsEveryStoreFile) {
  TempDeviceRoot root;
  ASSERT_NO_FATAL_FAILURE(InstallOldStore(root));
  ASSERT_EQ(0, unlink(root.Path("/usr/orva/bin/7z").c_str()));
  const StoreState before = ReadStore(root);
  for (const char* set : {"archive", "csr_set", "signed_set"}) {
    SCOPED_TRACE(set);
    MethodAnswer answer = CallExport(set);
    EXPECT_FALSE(answer.download.has_body);
    EXPECT_TRUE(answer.response.output_enabled());
    EXPECT_EQ(ORVA::APIResponse::Outcome::kNone, answer.response.outcome());
    EXPECT_FALSE(FileExists(root.Path("/usr/orva/etc/ssl/.gen/archive.zip")));
    EXPECT_EQ(CertificateFiles(before), CertificateFiles(ReadStore(root)))
        << "a set that was not sent is not handed out";
  }
}
