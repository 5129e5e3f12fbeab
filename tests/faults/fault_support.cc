#include "tests/faults/fault_support.h"

#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

#include <gtest/gtest.h>

#include "tests/support/certificates.h"
#include "tests/support/method_calls.h"
#include "tests/support/store_state.h"

namespace {

constexpr char kFiller[] = "/.filler";

// The shell line that fills the store's disk: at most 16 MiB, so a store
// that is not on a small disk never fills the machine's. dd fails when the
// disk is full, as it is meant to.
std::string FillCommand(const TempDeviceRoot& root) {
  return "dd if=/dev/zero of='" + root.Path(kStore) + kFiller + "' bs=4096 count=4096 2>/dev/null";
}

}  // namespace

void InstallFaultyOpenssl(const TempDeviceRoot& root, const ToolFault& fault) {
  const std::string runs = root.Path("/openssl.runs");
  unlink(runs.c_str());
  root.WriteScript("/usr/orva/bin/openssl",
                   "runs=$(($(cat '" + runs + "' 2>/dev/null || echo 0) + 1))\n"
                   "echo \"$runs\" > '" + runs + "'\n"
                   "[ \"$runs\" -eq " + std::to_string(fault.fail_run) + " ] && exit 1\n"
                   "[ \"$runs\" -eq " + std::to_string(fault.fill_disk_run) + " ] && " +
                       FillCommand(root) + "\n"
                   "exec /usr/bin/openssl \"$@\"");
}

int ToolRuns(const TempDeviceRoot& root) {
  return std::atoi(ReadFile(root.Path("/openssl.runs")).c_str());
}

void FillDisk(const TempDeviceRoot& root, off_t room) {
  RunForTest(FillCommand(root));
  const std::string filler = root.Path(kStore) + kFiller;
  struct stat info;
  ASSERT_TRUE(stat(filler.c_str(), &info) == 0 && info.st_size >= room);
  ASSERT_EQ(0, truncate(filler.c_str(), info.st_size - room));
}

void FreeDisk(const TempDeviceRoot& root) { unlink((root.Path(kStore) + kFiller).c_str()); }

TestMounts::~TestMounts() {
  for (auto path = mounted_.rbegin(); path != mounted_.rend(); ++path) {
    umount2(path->c_str(), MNT_DETACH);  // Ignoring errors: nothing else to do.
  }
}

// The process's mounts are made its own once, on the first call.
bool TestMounts::Available(std::string* why) {
  static const std::string reason = [] {
    if (geteuid() != 0) return std::string("the tests do not run as root");
    if (unshare(CLONE_NEWNS) != 0) return std::string("unshare: ") + std::strerror(errno);
    if (mount("none", "/", "none", MS_REC | MS_PRIVATE, nullptr) != 0) {
      return std::string("making mounts private: ") + std::strerror(errno);
    }
    return std::string();
  }();
  if (why != nullptr) *why = reason;
  return reason.empty();
}

bool TestMounts::Tmpfs(const std::string& path, size_t bytes) {
  const std::string options = "size=" + std::to_string(bytes) + ",mode=0755";
  if (!Available(nullptr) || mount("tmpfs", path.c_str(), "tmpfs", 0, options.c_str()) != 0) {
    return false;
  }
  mounted_.push_back(path);
  return true;
}

// The kernel ignores the source and type of bind mounts and of changes to
// mounts; "none" is given where it takes no null.
bool TestMounts::ReadOnly(const std::string& path) {
  if (!Available(nullptr) || mount(path.c_str(), path.c_str(), "none", MS_BIND, nullptr) != 0) {
    return false;
  }
  mounted_.push_back(path);
  return mount("none", path.c_str(), "none", MS_REMOUNT | MS_BIND | MS_RDONLY, nullptr) == 0;
}

std::map<std::string, StoreWriter> StoreWriters() {
  return {
      {"CSR create", {[](const TempDeviceRoot&) { return CallCreateCsr(); }, 5501, 5501}},
      {"CSR renew", {[](const TempDeviceRoot&) { return CallRenew(); }, 5501, 5501}},
      {"CSR sign",
       {[](const TempDeviceRoot& root) { return CallSign(root.Path("/outside/request.csr")); },
        5501, 5501}},
      {"CRT create", {[](const TempDeviceRoot&) { return CallCreateCrt(); }, 5501, 5501}},
      {"import",
       {[](const TempDeviceRoot& root) {
          return CallImport(root.Path("/outside/server.crt"), root.Path("/outside/server.key"),
                            root.Path("/outside/server-ca.crt"));
        },
        5515, 0}},
  };
}
