#ifndef ORVA_TESTS_FAULTS_FAULT_SUPPORT_H_
#define ORVA_TESTS_FAULTS_FAULT_SUPPORT_H_

#include <sys/types.h>

#include <functional>
#include <map>
#include <string>
#include <vector>

#include "platform/webapi/api_response.h"
#include "tests/support/method_calls.h"
#include "tests/support/store_state.h"
#include "tests/support/test_support.h"

// Fault injection around the certificate store: a failing openssl, a full
// disk, folders that cannot be written, and the checks that prove what the
// store holds afterwards.

// Replaces the device's openssl with a script that counts its runs in a file
// of the device root and passes everything else to the machine's tool.
struct ToolFault {
  int fail_run = 0;       // this run (from 1) exits with 1 instead
  int fill_disk_run = 0;  // before this run the store's disk is filled up
};
void InstallFaultyOpenssl(const TempDeviceRoot& root, const ToolFault& fault);
// Runs counted since the script was installed.
int ToolRuns(const TempDeviceRoot& root);
// Fills the store's disk up (at most 16 MiB, so a store that is not on a
// small disk never fills the machine's), then gives `room` bytes back;
// FreeDisk removes the filler.
void FillDisk(const TempDeviceRoot& root, off_t room = 0);
void FreeDisk(const TempDeviceRoot& root);

// Mounts made for one test, undone by the destructor in reverse order. They
// live in a mount namespace of the test process, made on first use, so
// nothing outside the process sees them and a crash leaves none behind.
class TestMounts {
 public:
  TestMounts() = default;
  ~TestMounts();
  TestMounts(const TestMounts&) = delete;
  TestMounts& operator=(const TestMounts&) = delete;

  // True when this process may mount; otherwise `why` says why not.
  static bool Available(std::string* why);
  // A tmpfs of `bytes` on the folder `path`. False (with errno) on failure.
  bool Tmpfs(const std::string& path, size_t bytes);
  // `path` bound onto itself, read-only. False on failure.
  bool ReadOnly(const std::string& path);

 private:
  std::vector<std::string> mounted_;
};

// A method that writes the store, by name, for tables of cases.
struct StoreWriter {
  const char* name;
  std::function<ORVA::APIResponse(const TempDeviceRoot&)> call;
  int write_error = 5501;  // its answer when the store cannot be written
};
// CSR create, renew, sign (of a request kept outside the store) and CRT
// create: the writers that make their files with openssl.
std::vector<StoreWriter> StoreWriters();
// The import of the server set InstallOldStore made outside the store. It copies
// files into the store and runs openssl only to compare the pair.
StoreWriter ImportWriter();
// StoreWriters() and ImportWriter().
std::vector<StoreWriter> StoreWritersAndImport();

#endif  // ORVA_TESTS_FAULTS_FAULT_SUPPORT_H_
