#include "tests/faults/fault_support.h"

#include <sched.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include <gtest/gtest.h>

#include "common/raii.h"

namespace {

constexpr char kFiller[] = ".filler";

// Makes the test process's mounts its own, once.
bool EnterPrivateMounts(std::string* why) {
  static int result = -1;
  static std::string reason;
  if (result == -1) {
    if (geteuid() != 0) {
      reason = "the tests do not run as root";
    } else if (unshare(CLONE_NEWNS) != 0) {
      reason = std::string("unshare(CLONE_NEWNS): ") + std::strerror(errno);
    } else if (mount("none", "/", "none", MS_REC | MS_PRIVATE, nullptr) != 0) {
      reason = std::string("making mounts private: ") + std::strerror(errno);
    }
    result = reason.empty() ? 1 : 0;
  }
  if (why != nullptr) *why = reason;
  return result == 1;
}

}  // namespace

void InstallFaultyOpenssl(const TempDeviceRoot& root, const ToolFault& fault) {
  const std::string runs = root.Path("/openssl.runs");
  unlink(runs.c_str());
  // At most 16 MiB of filler, so a store that is not on a small disk is
  // never used to fill the machine's.
  root.WriteScript(
      "/usr/orva/bin/openssl",
      "runs=$(cat '" + runs + "' 2>/dev/null || echo 0)\n"
      "runs=$((runs + 1))\n"
      "echo \"$runs\" > '" + runs + "'\n"
      "if [ \"$runs\" -eq " + std::to_string(fault.fail_run) + " ]; then exit 1; fi\n"
      "if [ \"$runs\" -eq " + std::to_string(fault.fill_disk_run) + " ]; then\n"
      "  dd if=/dev/zero of='" + root.Path(kStore) + "/" + kFiller +
      "' bs=4096 count=4096 2>/dev/null\n"
      "fi\n"
      "exec /usr/bin/openssl \"$@\"");
}

int ToolRuns(const TempDeviceRoot& root) {
  return std::atoi(ReadFile(root.Path("/openssl.runs")).c_str());
}

void FillDisk(const TempDeviceRoot& root, off_t room) {
  const std::string path = root.Path(kStore) + "/" + kFiller;
  {
    FilePtr filler(std::fopen(path.c_str(), "w"));
    ASSERT_TRUE(filler != nullptr);
    static const char kBlock[4096] = {0};
    for (int i = 0; i < 4096; ++i) {
      if (std::fwrite(kBlock, 1, sizeof(kBlock), filler.get()) != sizeof(kBlock) ||
          std::fflush(filler.get()) != 0) {
        break;
      }
    }
  }
  struct stat info;
  ASSERT_TRUE(stat(path.c_str(), &info) == 0 && info.st_size >= room);
  ASSERT_EQ(0, truncate(path.c_str(), info.st_size - room));
}

void FreeDisk(const TempDeviceRoot& root) {
  unlink((root.Path(kStore) + "/" + kFiller).c_str());
}

TestMounts::~TestMounts() {
  for (auto path = mounted_.rbegin(); path != mounted_.rend(); ++path) {
    umount2(path->c_str(), MNT_DETACH);  // Ignoring errors: nothing else to do.
  }
}

bool TestMounts::Available(std::string* why) { return EnterPrivateMounts(why); }

bool TestMounts::Tmpfs(const std::string& path, size_t bytes) {
  if (!EnterPrivateMounts(nullptr)) return false;
  std::string options = "size=" + std::to_string(bytes) + ",mode=0755";
  if (mount("tmpfs", path.c_str(), "tmpfs", 0, options.c_str()) != 0) return false;
  mounted_.push_back(path);
  return true;
}

// The kernel ignores the source and type of bind mounts and of changes to
// mounts; "none" is given where it takes no null.
bool TestMounts::ReadOnly(const std::string& path) {
  if (!EnterPrivateMounts(nullptr)) return false;
  if (mount(path.c_str(), path.c_str(), "none", MS_BIND, nullptr) != 0) return false;
  mounted_.push_back(path);
  return mount("none", path.c_str(), "none", MS_REMOUNT | MS_BIND | MS_RDONLY, nullptr) == 0;
}

std::vector<StoreWriter> StoreWriters() {
  return {
      {"CSR create", [](const TempDeviceRoot&) { return CallCreateCsr(); }},
      {"CSR renew", [](const TempDeviceRoot&) { return CallRenew(); }},
      {"CSR sign",
       [](const TempDeviceRoot& root) { return CallSign(root.Path("/outside/request.csr")); }},
      {"CRT create", [](const TempDeviceRoot&) { return CallCreateCrt(); }},
  };
}

StoreWriter ImportWriter() {
  return {"import",
          [](const TempDeviceRoot& root) {
            return CallImport(root.Path("/outside/server.crt"), root.Path("/outside/server.key"),
                              root.Path("/outside/server-ca.crt"));
          },
          5515};
}

std::vector<StoreWriter> StoreWritersAndImport() {
  std::vector<StoreWriter> writers = StoreWriters();
  writers.push_back(ImportWriter());
  return writers;
}
