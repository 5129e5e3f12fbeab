// Faults while the store is written, one table per kind across the
// writers: openssl failing at any run, the archiver failing, the disk full
// at any run or copy, and store folders that are read-only or plain files.
// Every row proves the answer and the store whole afterwards.

#include <unistd.h>

#include <map>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "tests/faults/fault_support.h"
#include "tests/support/method_calls.h"
#include "tests/support/store_state.h"

namespace {

using Outcome = ORVA::APIResponse::Outcome;

// The keys, certificates and requests a failed call keeps: all of them.
std::map<std::string, std::string> KeptFiles(const std::string&, const StoreState& state) {
  return CertificateFiles(state);
}

// What every row proves once the writer `name` gave `response` with a
// fault in place: the answer (`mayPass`: or a success, for a fault that may
// hit a run that writes nothing), the store whole, and every file kept
// after a failure.
void ExpectFaultHandled(const TempDeviceRoot& root, const StoreState& before,
                        const std::string& name, const ORVA::APIResponse& response,
                        int answer, bool mayPass = false) {
  if (!mayPass || response.outcome() != Outcome::kSuccess) {
    EXPECT_EQ(answer, response.error_code());
  }
  ExpectStoreWhole(root, before);
  if (response.outcome() != Outcome::kSuccess) {
    EXPECT_EQ(KeptFiles(name, before), KeptFiles(name, ReadStore(root)));
  }
}

}  // namespace

class StoreFaults : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_NO_FATAL_FAILURE(InstallOldStore(root_));
    before_ = ReadStore(root_);
  }

  // How many times `writer` runs openssl when nothing fails.
  int CountToolRuns(const StoreWriter& writer) {
    InstallFaultyOpenssl(root_, ToolFault{});
    writer.call(root_);
    RestoreStore(root_, before_);
    return ToolRuns(root_);
  }

  TempDeviceRoot root_;
  StoreState before_;
};

// The store on a small tmpfs of its own, for the faults that need mounts.
class MountedStoreFaults : public StoreFaults {
 protected:
  void SetUp() override {
    std::string why;
    if (!TestMounts::Available(&why)) GTEST_SKIP() << "no mounts for the store: " << why;
    ASSERT_TRUE(mounts_.Tmpfs(root_.Path(kStore), 4 << 20));
    StoreFaults::SetUp();
  }

  TestMounts mounts_;  // Declared after the device root: unmounted first.
};

TEST_F(StoreFaults, OpensslFailingAtAnyRunAnswersAndLeavesTheStoreWhole) {
  std::map<std::string, StoreWriter> writers = StoreWriters();
  writers["import of another pair's key"] = {[](const TempDeviceRoot& root) {
                                               return CallImport(root.Path("/outside/server.crt"),
                                                                 root.Path("/outside/request.key"),
                                                                 root.Path("/outside/server-ca.crt"));
                                             },
                                             5514, 5514};
  for (const auto& [name, writer] : writers) {
    const int runs = CountToolRuns(writer);
    ASSERT_GT(runs, 0) << name;
    for (int failing = 1; failing <= runs; ++failing) {
      SCOPED_TRACE(name + ", openssl run " + std::to_string(failing) + " of " +
                   std::to_string(runs) + " fails");
      InstallFaultyOpenssl(root_, ToolFault{failing, 0});
      ExpectFaultHandled(root_, before_, name, writer.call(root_), writer.tool_failure);
      if (writer.tool_failure == 5501) {
        EXPECT_EQ(failing, ToolRuns(root_)) << "a run after the failure";
      }
      RestoreStore(root_, before_);
    }
  }
}

TEST_F(StoreFaults, FailingArchiverSendsNothingAndHandsNoSetOut) {
  root_.WriteScript("/usr/orva/bin/7z", "exit 2");
  const std::string archive = std::string(kStore) + "/.gen/archive.zip";
  for (const char* set : {"archive", "csr_set", "signed_set"}) {
    SCOPED_TRACE(set);
    root_.WriteFile(archive, "PK the last export's keys", 0400);
    LogCapture log;
    const MethodAnswer answer = CallExport(set);
    EXPECT_FALSE(answer.download.has_body);
    EXPECT_TRUE(answer.response.output_enabled());
    EXPECT_EQ(Outcome::kNone, answer.response.outcome());
    EXPECT_FALSE(FileExists(root_.Path(archive))) << "the last archive stayed";
    EXPECT_EQ(CertificateFiles(before_), CertificateFiles(ReadStore(root_))) << "a set handed out";
    EXPECT_TRUE(log.Contains(" 7z file failed[0x") && log.Contains(" Create archive failed[0x"))
        << log.Text();
  }
}

TEST_F(MountedStoreFaults, DiskFullAtAnyOpensslRunOrCopyLeavesTheStoreWhole) {
  for (const auto& [name, writer] : StoreWriters()) {
    const int runs = CountToolRuns(writer);
    for (int full = 1; full <= runs; ++full) {
      SCOPED_TRACE(name + ", disk full from openssl run " + std::to_string(full) + " of " +
                   std::to_string(runs));
      InstallFaultyOpenssl(root_, ToolFault{0, full});
      const ORVA::APIResponse response = writer.call(root_);
      FreeDisk(root_);
      ExpectFaultHandled(root_, before_, name, response, writer.write_error, true);
      RestoreStore(root_, before_);
    }
  }
  // The import copies its three uploads after openssl's checks, each into
  // one page, so room for `copied` pages fills the disk at the next copy.
  InstallFaultyOpenssl(root_, ToolFault{});
  for (int copied = 0; copied <= 3; ++copied) {
    SCOPED_TRACE("room for " + std::to_string(copied) + " copies");
    ASSERT_NO_FATAL_FAILURE(FillDisk(root_, copied * sysconf(_SC_PAGESIZE)));
    const ORVA::APIResponse response = StoreWriters().at("import").call(root_);
    FreeDisk(root_);
    ExpectFaultHandled(root_, before_, "import", response, copied < 3 ? 5515 : 0);
    RestoreStore(root_, before_);
  }
}

// Root writes through modes, so a read-only bind mount makes a folder
// unwritable ("" is the store itself).
TEST_F(MountedStoreFaults, ReadOnlyStoreOrFolderFailsItsWriters) {
  const std::map<std::string, StoreWriter> writers = StoreWriters();
  std::vector<std::pair<std::string, std::string>> cases;  // folder, writer
  for (const auto& [name, writer] : writers) cases.push_back({"", name});
  for (const char* folder : {"ssl.key", "ssl.crt", "ssl.csr", "cfg.d", ".gen", "ssl.intercrt"}) {
    cases.push_back({folder, "CRT create"});  // It writes in all of them.
  }
  for (const auto& [folder, name] : cases) {
    SCOPED_TRACE(name + " with " + (folder.empty() ? "the store" : folder) + " read-only");
    {
      TestMounts readOnly;
      ASSERT_TRUE(readOnly.ReadOnly(root_.Path(kStore) + "/" + folder));
      EXPECT_EQ(writers.at(name).write_error, writers.at(name).call(root_).error_code());
      // A read-only store cannot change. CRT create removes the old
      // intermediate once its new pair is in place, so that row keeps none.
      if (!folder.empty()) ExpectStoreWhole(root_, before_);
      if (!folder.empty() && folder != "ssl.intercrt") {
        EXPECT_EQ(KeptFiles(name, before_), KeptFiles(name, ReadStore(root_)));
      }
    }
    RestoreStore(root_, before_);
  }
}

TEST_F(StoreFaults, FileInPlaceOfAFolderFailsItsWriters) {
  const std::pair<const char*, const char*> cases[] = {
      {".gen", "CSR create"}, {".gen", "CSR renew"}, {".gen", "CSR sign"},
      {"ssl.key", "CRT create"}, {"ssl.crt", "CRT create"}, {"cfg.d", "CSR create"},
      {"ssl.intercrt", "import"},  // after the certificate and key are staged
  };
  for (const auto& [folder, name] : cases) {
    SCOPED_TRACE(std::string(name) + " with a file at " + folder);
    StoreState state;
    for (const auto& [path, file] : before_) {
      if (path.rfind(std::string(folder) + "/", 0) != 0) state[path] = file;
    }
    state[folder] = {"not a folder\n", 0644};
    RestoreStore(root_, state);
    const StoreWriter writer = StoreWriters().at(name);
    ExpectFaultHandled(root_, state, name, writer.call(root_), writer.write_error);
    EXPECT_EQ("not a folder\n", ReadFile(root_.Path(std::string(kStore) + "/" + folder)));
  }
}

// A rename that fails at any step of a set's install (a folder in the way
// of one target) puts back every file the set had replaced.
TEST_F(StoreFaults, RenameFailingAtAnyStepPutsTheOldSetBack) {
  const std::pair<const char*, const char*> cases[] = {
      {"ssl.csr/ca.csr", "CRT create"},     {"ssl.crt/ca.crt", "CRT create"},
      {"ssl.crt/server.crt", "CRT create"}, {"ssl.key/ca.key", "CRT create"},
      {"ssl.key/server.key", "CRT create"}, {"ssl.intercrt/server-ca.crt", "CRT create"},
      {".gen/server.csr", "CSR create"},    {".gen/server.key", "CSR create"},
      {"ssl.crt/server.crt", "import"},     {"ssl.intercrt/server-ca.crt", "import"},
  };
  for (const auto& [target, name] : cases) {
    SCOPED_TRACE(std::string(name) + " with a folder at " + target);
    StoreState state = before_;
    state.erase(target);
    state[std::string(target) + "/inside"] = {"in the way\n", 0644};
    RestoreStore(root_, state);
    const StoreWriter writer = StoreWriters().at(name);
    ExpectFaultHandled(root_, state, name, writer.call(root_), writer.write_error);
  }
}
