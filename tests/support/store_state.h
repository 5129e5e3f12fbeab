#ifndef ORVA_TESTS_SUPPORT_STORE_STATE_H_
#define ORVA_TESTS_SUPPORT_STORE_STATE_H_

#include <sys/types.h>

#include <map>
#include <ostream>
#include <string>

#include "tests/support/test_support.h"

// The certificate store as tests see it: a snapshot of its files, a full
// store to start from, and the proof that a store is whole after a call.

inline constexpr char kStore[] = "/usr/orva/etc/ssl";

struct StoreFile {
  std::string content;
  mode_t mode;
  bool operator==(const StoreFile& other) const {
    return content == other.content && mode == other.mode;
  }
  // Failures name a file's size and mode, not its bytes.
  friend void PrintTo(const StoreFile& file, std::ostream* out) {
    *out << file.content.size() << " bytes, mode " << std::oct << file.mode << std::dec;
  }
};
// Every file under the store by its path relative to the store (for
// example "ssl.key/server.key").
using StoreState = std::map<std::string, StoreFile>;

StoreState ReadStore(const TempDeviceRoot& root);
// Empties the store folder and writes `state` back, modes included.
void RestoreStore(const TempDeviceRoot& root, const StoreState& state);

// A full store: a local CA (key, request, certificate), a server pair it
// signed with an intermediate file, a pending request pair and a signed
// certificate in the generation area, a configuration file and the serial.
// In "/outside" of the device root: a request to sign (request.csr,
// request.key) and a server set the CA signed, to import (server.crt,
// server.key, server-ca.crt). Fails the test (fatal) when a fixture cannot
// be made.
void InstallOldStore(const TempDeviceRoot& root);

// After a call, with EXPECT: no file in progress (".tmp" in the name, or a
// hidden file but the serial) is left; every store file is as in `before`
// or a whole file of its kind (keys, certificates and requests decode
// whole, the serial is hex digits, configuration files end with a line
// end, an archive starts like a ZIP file); and the server pair, the CA's
// key with its certificate and request, and the pending pair each match.
void ExpectStoreWhole(const TempDeviceRoot& root, const StoreState& before);

// The keys, certificates and requests of `state`, content only.
std::map<std::string, std::string> CertificateFiles(const StoreState& state);

#endif  // ORVA_TESTS_SUPPORT_STORE_STATE_H_
