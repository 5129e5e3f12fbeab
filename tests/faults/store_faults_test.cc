// Faults while the store is written, one table per kind across the
// writers: openssl failing at any run, the archiver failing, the disk full
// at any run or copy, and a folder in the way of a rename. Every row
// proves the answer and the store whole afterwards.

#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <map>
#include <string>
#include <utility>

#include <gtest/gtest.h>

#include "api/certificate.h"
#include "tests/support/certificates.h"
#include "tests/support/method_calls.h"
#include "tests/support/store_state.h"

namespace {

using Outcome = ORVA::APIResponse::Outcome;

// A method that writes the store with the parameters `changes` (see
// Params), working on the store and the files outside it that
// InstallOldStore made.
struct StoreWriter {
  MethodHandler method;
  std::string changes;
  int write_error;   // its answer when the store cannot be written
  int tool_failure;  // its answer when an openssl run fails (0: success)
  int answer = 0;    // its answer when nothing fails
  ORVA::APIResponse Call(const TempDeviceRoot& root) const {
    return CallMethod(method, Params(root, changes)).response;
  }
};

// The import runs openssl only to compare the pair and lets the library
// decide when that fails.
const std::map<std::string, StoreWriter> kWriters = {
    {"CSR create", {doCertificateCreateCSR_v1, R"({"key_type":"ec"})", 5501, 5501}},
    {"CSR renew", {doCertificateRenew_v1, "{}", 5501, 5501}},
    {"CSR sign",
     {doCertificateSign_v1,
      R"({"days":"30","csr":"r.csr","csr_tmp":"ROOT/outside/request.csr","alias":"c.local"})",
      5501, 5501}},
    {"CRT create",
     {doCertificateCreateCRT_v1,
      R"({"key_length":"2048","ca_key_length":"2048","alias":"new.local;10.0.0.1"})", 5501, 5501}},
    {"import",
     {doCertificateImport_v1,
      R"({"cert_tmp":"ROOT/outside/server.crt","key_tmp":"ROOT/outside/server.key",
          "inter_cert_tmp":"ROOT/outside/server-ca.crt"})",
      5515, 0}},
};

// Fills the store's disk, at most 16 MiB so that a store not on a small
// disk never fills the machine's; dd fails when the disk is full.
std::string FillCommand(const TempDeviceRoot& root) {
  return "dd if=/dev/zero of='" + root.Path(kStore) + "/.filler' bs=4096 count=4096 2>/dev/null";
}

// Replaces the device's openssl with a script that counts its runs, fails
// run `fail_run` or fills the disk before run `fill_disk_run`, and
// otherwise runs the machine's tool.
void InstallFaultyOpenssl(const TempDeviceRoot& root, int fail_run, int fill_disk_run) {
  const std::string runs = root.Path("/openssl.runs");
  unlink(runs.c_str());
  root.WriteScript("/usr/orva/bin/openssl",
                   "runs=$(($(cat '" + runs + "' 2>/dev/null || echo 0) + 1))\n"
                   "echo \"$runs\" > '" + runs + "'\n"
                   "[ \"$runs\" -eq " + std::to_string(fail_run) + " ] && exit 1\n"
                   "[ \"$runs\" -eq " + std::to_string(fill_disk_run) + " ] && " +
                       FillCommand(root) + "\n"
                   "exec /usr/bin/openssl \"$@\"");
}

int ToolRuns(const TempDeviceRoot& root) {
  return std::atoi(ReadFile(root.Path("/openssl.runs")).c_str());
}

// What every row proves once a writer gave `response` with a fault in
// place: the answer (`mayPass`: or a success, for a fault that may hit a
// run that writes nothing), the store whole, and every key, certificate
// and request kept after a failure.
void ExpectFaultHandled(const TempDeviceRoot& root, const StoreState& before,
                        const ORVA::APIResponse& response, int answer, bool mayPass = false) {
  if (!mayPass || response.outcome() != Outcome::kSuccess) {
    EXPECT_EQ(answer, response.error_code());
  }
  ExpectStoreWhole(root, before);
  if (response.outcome() != Outcome::kSuccess) {
    EXPECT_EQ(CertificateFiles(before), CertificateFiles(ReadStore(root)));
  }
}

// Why this process may not mount ("" when it may). Its mounts are made its
// own once, so nothing outside sees them and a crash leaves none behind.
const std::string& WhyNoMounts() {
  static const std::string reason = [] {
    if (geteuid() != 0) return std::string("the tests do not run as root");
    if (unshare(CLONE_NEWNS) != 0) return std::string("unshare: ") + std::strerror(errno);
    if (mount("none", "/", "none", MS_REC | MS_PRIVATE, nullptr) != 0) {
      return std::string("making mounts private: ") + std::strerror(errno);
    }
    return std::string();
  }();
  return reason;
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
    InstallFaultyOpenssl(root_, 0, 0);
    EXPECT_EQ(writer.answer, writer.Call(root_).error_code());
    RestoreStore(root_, before_);
    return ToolRuns(root_);
  }

  TempDeviceRoot root_;
  StoreState before_;
};

// The store on a 4 MiB tmpfs of its own, unmounted before the device root
// is removed.
class MountedStoreFaults : public StoreFaults {
 protected:
  void SetUp() override {
    if (!WhyNoMounts().empty()) GTEST_SKIP() << "no mounts for the store: " << WhyNoMounts();
    ASSERT_EQ(0, mount("tmpfs", root_.Path(kStore).c_str(), "tmpfs", 0, "size=4194304,mode=0755"));
    mounted_ = true;
    StoreFaults::SetUp();
  }
  ~MountedStoreFaults() override {
    if (mounted_) umount2(root_.Path(kStore).c_str(), MNT_DETACH);
  }

  // Fills the disk up, then gives `room` bytes back.
  void FillDisk(off_t room) {
    RunForTest(FillCommand(root_));
    const std::string filler = root_.Path(kStore) + "/.filler";
    struct stat info;
    ASSERT_TRUE(stat(filler.c_str(), &info) == 0 && info.st_size >= room);
    ASSERT_EQ(0, truncate(filler.c_str(), info.st_size - room));
  }
  void FreeDisk() { unlink((root_.Path(kStore) + "/.filler").c_str()); }

  bool mounted_ = false;
};

TEST_F(StoreFaults, OpensslFailingAtAnyRunAnswersAndLeavesTheStoreWhole) {
  std::map<std::string, StoreWriter> writers = kWriters;
  writers["import of another pair's key"] = {
      doCertificateImport_v1,
      R"({"cert_tmp":"ROOT/outside/server.crt","key_tmp":"ROOT/outside/request.key",
          "inter_cert_tmp":"ROOT/outside/server-ca.crt"})",
      5514, 5514, 5514};
  for (const auto& [name, writer] : writers) {
    const int runs = CountToolRuns(writer);
    ASSERT_GT(runs, 0) << name;
    for (int failing = 1; failing <= runs; ++failing) {
      SCOPED_TRACE(name + ", openssl run " + std::to_string(failing) + " of " +
                   std::to_string(runs) + " fails");
      InstallFaultyOpenssl(root_, failing, 0);
      ExpectFaultHandled(root_, before_, writer.Call(root_), writer.tool_failure);
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
  for (const std::string set : {"archive", "csr_set", "signed_set"}) {
    SCOPED_TRACE(set);
    root_.WriteFile(archive, "PK the last export's keys", 0400);
    LogCapture log;
    const MethodAnswer answer =
        CallMethod(doCertificateExport_v1, Params(root_, R"({"file":")" + set + "\"}"));
    EXPECT_FALSE(answer.download.has_body);
    EXPECT_TRUE(answer.response.output_enabled());
    EXPECT_FALSE(FileExists(root_.Path(archive))) << "the last archive stayed";
    EXPECT_EQ(CertificateFiles(before_), CertificateFiles(ReadStore(root_))) << "a set handed out";
    EXPECT_TRUE(log.Contains(" 7z file failed[0x") && log.Contains(" Create archive failed[0x"))
        << log.Text();
  }
}

TEST_F(MountedStoreFaults, DiskFullAtAnyOpensslRunOrCopyLeavesTheStoreWhole) {
  for (const auto& [name, writer] : kWriters) {
    const int runs = CountToolRuns(writer);
    for (int full = 1; full <= runs; ++full) {
      SCOPED_TRACE(name + ", disk full from openssl run " + std::to_string(full) + " of " +
                   std::to_string(runs));
      InstallFaultyOpenssl(root_, 0, full);
      const ORVA::APIResponse response = writer.Call(root_);
      FreeDisk();
      ExpectFaultHandled(root_, before_, response, writer.write_error, true);
      RestoreStore(root_, before_);
    }
  }
  // The import copies its three uploads after openssl's checks, each into
  // one page, so room for `copied` pages fills the disk at the next copy.
  InstallFaultyOpenssl(root_, 0, 0);
  for (int copied = 0; copied <= 3; ++copied) {
    SCOPED_TRACE("room for " + std::to_string(copied) + " copies");
    ASSERT_NO_FATAL_FAILURE(FillDisk(copied * sysconf(_SC_PAGESIZE)));
    const ORVA::APIResponse response = kWriters.at("import").Call(root_);
    FreeDisk();
    ExpectFaultHandled(root_, before_, response, copied < 3 ? 5515 : 0);
    RestoreStore(root_, before_);
  }
}

// A rename that fails at any step of a set's install (a folder in the way
// of one target) puts back every file the set had replaced; one that fails
// for a configuration file leaves no temporary file.
TEST_F(StoreFaults, RenameFailingAtAnyStepPutsTheOldSetBack) {
  const std::pair<const char*, const char*> cases[] = {
      {"ssl.csr/ca.csr", "CRT create"},     {"ssl.crt/ca.crt", "CRT create"},
      {"ssl.crt/server.crt", "CRT create"}, {"ssl.key/ca.key", "CRT create"},
      {"ssl.key/server.key", "CRT create"}, {"ssl.intercrt/server-ca.crt", "CRT create"},
      {".gen/server.csr", "CSR create"},    {".gen/server.key", "CSR create"},
      {"cfg.d/ca.cfg", "CSR create"},
      {"ssl.crt/server.crt", "import"},     {"ssl.intercrt/server-ca.crt", "import"},
  };
  for (const auto& [target, name] : cases) {
    SCOPED_TRACE(std::string(name) + " with a folder at " + target);
    StoreState state = before_;
    state.erase(target);
    state[std::string(target) + "/inside"] = {"in the way\n", 0644};
    RestoreStore(root_, state);
    ExpectFaultHandled(root_, state, kWriters.at(name).Call(root_), kWriters.at(name).write_error);
  }
}
