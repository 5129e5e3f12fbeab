#include "api/installed_server.h"

#include <openssl/asn1.h>
#include <openssl/pem.h>

#include <cstdio>

#include "api/certificate_details.h"
#include "common/pem_password.h"
#include "common/raii.h"
#include "common/store_paths.h"
#include "platform/olib/orva_root.h"
#include "toolkit/x509_names.h"

X509Ptr ReadFirstCertificate(const char* devicePath) {
  FilePtr file(std::fopen(OrvaPath(devicePath).c_str(), "re"));
  if (!file) return nullptr;
  return X509Ptr(PEM_read_X509(file.get(), nullptr, RefusePemPassword, nullptr));
}

bool ReadInstalledServer(InstalledServer* server) {
  X509Ptr certificate = ReadFirstCertificate(kServerCrtPath);
  if (!certificate) return false;
  struct tm expiry;
  if (ASN1_TIME_to_tm(X509_get0_notAfter(certificate.get()), &expiry) != 1) return false;
  InstalledServer read;
  read.not_after = timegm(&expiry);
  read.fingerprint = Sha256Fingerprint(certificate.get());
  read.issuer = CommonNameOf(X509_get_issuer_name(certificate.get()));
  X509Ptr ca = ReadFirstCertificate(kCaCrtPath);
  read.by_local_ca = ca && IssuedBy(certificate.get(), ca.get());
  *server = read;
  return true;
}

int DaysUntil(time_t time) {
  const double seconds = difftime(time, std::time(nullptr));
  return static_cast<int>(seconds >= 0 ? seconds / 86400 : seconds / 86400 - 1);
}

std::string IsoTime(time_t time) {
  struct tm parts;
  char text[32];
  gmtime_r(&time, &parts);
  std::strftime(text, sizeof(text), "%Y-%m-%dT%H:%M:%SZ", &parts);
  return text;
}
