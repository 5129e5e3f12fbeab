#ifndef ORVA_API_INSTALLED_SERVER_H_
#define ORVA_API_INSTALLED_SERVER_H_

#include <ctime>
#include <string>

#include "common/raii.h"

// What the renewal and the ACME status need to know of the installed
// server certificate (the first certificate of the store's server.crt).
struct InstalledServer {
  std::string fingerprint;   // SHA-256, as "list" shows it
  std::string issuer;        // the issuer's common name ("" when it has none)
  time_t not_after = 0;
  bool by_local_ca = false;  // issued (name and signature) by the store's local CA
};

// The first certificate of the store file `devicePath` (a device path);
// null (not logged) when there is none or it does not decode.
X509Ptr ReadFirstCertificate(const char* devicePath);

// Reads the installed server certificate. True with *server filled; false
// (not logged) when there is none or it does not decode.
bool ReadInstalledServer(InstalledServer* server);

// Days from now until `time`, rounded down; negative once it is past.
int DaysUntil(time_t time);

// `time` as "YYYY-MM-DDTHH:MM:SSZ".
std::string IsoTime(time_t time);

#endif  // ORVA_API_INSTALLED_SERVER_H_
