#ifndef ORVA_TESTS_FAULTS_FAULT_SUPPORT_H_
#define ORVA_TESTS_FAULTS_FAULT_SUPPORT_H_

#include <sys/types.h>

#include <functional>
#include <map>
#include <string>
#include <vector>

#include "platform/webapi/api_response.h"
#include "tests/support/test_support.h"

// Faults injected around the certificate store: an openssl that fails or
// fills the disk at a chosen run, a full disk, and mounts that make store
// folders small or read-only.

// Replaces the device's openssl with a script that counts its runs in a
// file of the device root and otherwise runs the machine's tool.
struct ToolFault {
  int fail_run = 0;       // this run (from 1) exits with 1 instead
  int fill_disk_run = 0;  // before this run the store's disk is filled up
};
void InstallFaultyOpenssl(const TempDeviceRoot& root, const ToolFault& fault);
// Runs counted since the script was installed.
int ToolRuns(const TempDeviceRoot& root);

// Fills the store's disk up, then gives `room` bytes back. The filler is a
// hidden store file, at most 16 MiB so that a store not on a small disk
// never fills the machine's; FreeDisk removes it.
void FillDisk(const TempDeviceRoot& root, off_t room = 0);
void FreeDisk(const TempDeviceRoot& root);

// Mounts of one test, undone by the destructor in reverse order. They live
// in a mount namespace of the test process, made on first use, so nothing
// outside the process sees them and a crash leaves none behind.
class TestMounts {
 public:
  TestMounts() = default;
  ~TestMounts();
  TestMounts(const TestMounts&) = delete;
  TestMounts& operator=(const TestMounts&) = delete;

  // True when this process may mount (root with mount rights); otherwise
  // `why` says why not.
  static bool Available(std::string* why);
  // A tmpfs of `bytes` on the folder `path`. False on failure.
  bool Tmpfs(const std::string& path, size_t bytes);
  // `path` bound onto itself, read-only. False on failure.
  bool ReadOnly(const std::string& path);

 private:
  std::vector<std::string> mounted_;
};

// A method that writes the store, for tables of cases, working on the
// store and the files outside it that InstallOldStore made.
struct StoreWriter {
  std::function<ORVA::APIResponse(const TempDeviceRoot&)> call;
  int write_error;   // its answer when the store cannot be written
  int tool_failure;  // its answer when an openssl run fails (0: success)
};
// By name: "CSR create", "CSR renew", "CSR sign" (of the request outside the
// store), "CRT create", and "import" of the server set outside the store,
// which runs openssl only to compare the pair and lets the library decide
// when it fails.
std::map<std::string, StoreWriter> StoreWriters();

#endif  // ORVA_TESTS_FAULTS_FAULT_SUPPORT_H_
