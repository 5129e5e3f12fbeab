#ifndef ORVA_TESTS_FAULTS_FAULT_SUPPORT_H_
#define ORVA_TESTS_FAULTS_FAULT_SUPPORT_H_

#include <sys/types.h>

#include <functional>
#include <map>
#include <string>
#include <vector>

#include "platform/webapi/api_response.h"
#include "tests/support/test_support.h"

// Fault injection around the certificate store: a failing openssl, a full
// disk, folders that cannot be written, and the checks that prove what the
// store holds afterwards.

inline constexpr char kStore[] = "/usr/orva/etc/ssl";

// One file of the store: its content and mode.
struct StoreFile {
  std::string content;
  mode_t mode;
};
// Every regular file under the store, by its path relative to the store
// (for example "ssl.key/server.key"). The disk filler is left out.
using StoreState = std::map<std::string, StoreFile>;

StoreState ReadStore(const TempDeviceRoot& root);
// Empties the store folder and writes `state` back, modes included.
void RestoreStore(const TempDeviceRoot& root, const StoreState& state);

// A complete store before a fault: a local CA (key, request, certificate),
// a server pair it signed with an intermediate file, a pending request pair
// and a signed certificate waiting in the generation area, and the serial
// file. Outside the store, in "/outside" of the device root: a request to
// sign (request.csr, request.key) and a server set the CA signed, to import
// (server.crt, server.key, server-ca.crt). Keys have 1024 bits to keep the tests quick. Fails the test (fatal)
// when a fixture cannot be made.
void InstallOldStore(const TempDeviceRoot& root);

// After a fault: no temporary or work file (".tmp" in the name, or a
// hidden file other than the serial file) is left, and every store file is
// either as in `before` or a complete file of its kind (keys, certificates
// and requests decode whole, the serial is hex digits, configuration files
// end with a line end). The live server pair, the CA pair and the pending
// pair each match where both files exist. Reports failures with EXPECT.
void ExpectStoreWhole(const TempDeviceRoot& root, const StoreState& before);

// The files that hold keys, certificates and requests, with their content
// only, to prove they did not change.
std::map<std::string, std::string> CertificateFiles(const StoreState& state);

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

// The store's writers and readers as the host calls them.
ORVA::APIResponse CallCreateCsr();
ORVA::APIResponse CallRenew();
// Signs the request file at the real path `csrPath`.
ORVA::APIResponse CallSign(const std::string& csrPath);
ORVA::APIResponse CallCreateCrt();
ORVA::APIResponse CallList();
// Imports the uploads at the real paths given.
ORVA::APIResponse CallImport(const std::string& certPath, const std::string& keyPath,
                             const std::string& interPath);
// Exports `set`; stores the answer in *response and returns whether a
// download body was sent.
bool CallExport(const char* set, ORVA::APIResponse* response);

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
