// The openssl tool missing, or failing at any one of its runs: every method
// answers a failure and leaves each store file old or new and whole.

#include <unistd.h>

#include <string>

#include <gtest/gtest.h>

#include "tests/faults/fault_support.h"

namespace {

using Outcome = ORVA::APIResponse::Outcome;

// How many times `writer` runs the tool when nothing fails, from the state
// `before` (restored afterwards).
int CountToolRuns(const TempDeviceRoot& root, const StoreWriter& writer,
                  const StoreState& before) {
  InstallFaultyOpenssl(root, ToolFault{});
  ORVA::APIResponse response = writer.call(root);
  EXPECT_EQ(Outcome::kSuccess, response.outcome()) << writer.name << " " << response.error_code();
  int runs = ToolRuns(root);
  RestoreStore(root, before);
  return runs;
}

// What must not change when `writer` fails: the live server pair always;
// the pending pair unless CRT create made the CA (its trio is then new and
// checked as a pair); everything but the CA trio for CRT create.
void ExpectFailedWriterKeptItsFiles(const std::string& writer, const StoreState& before,
                                    const StoreState& after) {
  std::map<std::string, std::string> expected = CertificateFiles(before);
  std::map<std::string, std::string> actual = CertificateFiles(after);
  if (writer == "CRT create") {
    for (const char* ca : {"ssl.key/ca.key", "ssl.crt/ca.crt", "ssl.csr/ca.csr"}) {
      expected.erase(ca);
      actual.erase(ca);
    }
  }
  EXPECT_EQ(expected, actual);
}

}  // namespace

TEST(ToolFaults, MissingToolFailsEveryWriterAndChangesNoCertificateFile) {
  TempDeviceRoot root;
  ASSERT_NO_FATAL_FAILURE(InstallOldStore(root));
  ASSERT_EQ(0, unlink(root.Path("/usr/orva/bin/openssl").c_str()));
  const StoreState before = ReadStore(root);
  for (const StoreWriter& writer : StoreWriters()) {
    SCOPED_TRACE(writer.name);
    ORVA::APIResponse response = writer.call(root);
    EXPECT_EQ(5501, response.error_code());
    EXPECT_TRUE(response.data().isNull());
    ExpectStoreWhole(root, before);
    EXPECT_EQ(CertificateFiles(before), CertificateFiles(ReadStore(root)));
  }
  EXPECT_EQ(Outcome::kSuccess, CallList().outcome()) << "listing needs no tool";
}

TEST(ToolFaults, EveryWriterFailingAtAnyToolRunLeavesWholeMatchingFiles) {
  TempDeviceRoot root;
  ASSERT_NO_FATAL_FAILURE(InstallOldStore(root));
  const StoreState before = ReadStore(root);
  for (const StoreWriter& writer : StoreWriters()) {
    const int runs = CountToolRuns(root, writer, before);
    ASSERT_GT(runs, 0) << writer.name;
    for (int failing = 1; failing <= runs; ++failing) {
      SCOPED_TRACE(std::string(writer.name) + ", tool run " + std::to_string(failing) +
                   " of " + std::to_string(runs) + " fails");
      InstallFaultyOpenssl(root, ToolFault{failing, 0});
      ORVA::APIResponse response = writer.call(root);
      EXPECT_EQ(5501, response.error_code());
      EXPECT_TRUE(response.data().isNull());
      EXPECT_EQ(failing, ToolRuns(root)) << "nothing runs after the failure";
      const StoreState after = ReadStore(root);
      ExpectStoreWhole(root, before);
      ExpectFailedWriterKeptItsFiles(writer.name, before, after);
      RestoreStore(root, before);
    }
  }
}

// The import runs the tool only to compare the key with the certificate;
// when the tool fails or is missing the library decides, so a matching set
// is installed whole and a foreign key is still refused.
TEST(ToolFaults, ImportWithTheToolFailingAtAnyRunOrMissingInstallsOnlyAMatchingSet) {
  TempDeviceRoot root;
  ASSERT_NO_FATAL_FAILURE(InstallOldStore(root));
  const StoreState before = ReadStore(root);
  const int runs = CountToolRuns(root, ImportWriter(), before);
  ASSERT_GT(runs, 0);
  const std::string crt = root.Path("/outside/server.crt");
  const std::string inter = root.Path("/outside/server-ca.crt");
  for (const char* key : {"/outside/server.key", "/outside/request.key"}) {
    const bool matching = std::string(key) == "/outside/server.key";
    for (int failing = 0; failing <= runs; ++failing) {
      SCOPED_TRACE(std::string(key) + ", " +
                   (failing == 0 ? "no tool" : "tool run " + std::to_string(failing) + " of " +
                                                   std::to_string(runs) + " fails"));
      if (failing == 0) {
        ASSERT_EQ(0, unlink(root.Path("/usr/orva/bin/openssl").c_str()));
      } else {
        InstallFaultyOpenssl(root, ToolFault{failing, 0});
      }
      ORVA::APIResponse response = CallImport(crt, root.Path(key), inter);
      const StoreState after = ReadStore(root);
      ExpectStoreWhole(root, before);
      if (matching) {
        EXPECT_EQ(Outcome::kSuccess, response.outcome()) << response.error_code();
        EXPECT_EQ(ReadFile(crt), after.at("ssl.crt/server.crt").content);
        EXPECT_EQ(ReadFile(root.Path(key)), after.at("ssl.key/server.key").content);
      } else {
        EXPECT_EQ(5514, response.error_code());
        EXPECT_EQ(CertificateFiles(before), CertificateFiles(after));
      }
      RestoreStore(root, before);
    }
  }
}
