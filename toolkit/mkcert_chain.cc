// Whether a certificate and a file of upper certificates form one issuing
// chain, judged by names and signatures.

#include <openssl/err.h>
#include <openssl/pem.h>
#include <openssl/x509v3.h>

#include <cerrno>
#include <cstdio>

#include "common/log.h"
#include "common/pem_password.h"
#include "platform/olib/olib_error.h"
#include "platform/olib/olib_file.h"
#include "toolkit/mkcert.h"
#include "toolkit/x509_names.h"

namespace {

bool IsPresentFile(const char* path) {
  return path != nullptr && *path != '\0' && OLIBCFileExist(path) != 0;
}

}  // namespace

int loadCrtList(const char* path, std::vector<X509Ptr>& certificates) {
  FilePtr file(std::fopen(path, "r"));
  if (!file) {
    OLIB_SET_ERROR(errno);
    ORVA_LOG_LASTERR("Open %s failed", path);
    return -1;
  }
  for (;;) {
    X509Ptr certificate(
        PEM_read_X509(file.get(), nullptr, RefusePemPassword, nullptr));
    if (!certificate) break;
    certificates.push_back(std::move(certificate));
  }
  // The read that ended the loop left its reason in the thread's error
  // queue; it is the normal end of the file here.
  ERR_clear_error();
  return 0;
}

int verifyCrtChain(const char* certPath, const char* upperPath) {
  if (!IsPresentFile(certPath) || !IsPresentFile(upperPath)) {
    ORVA_LOG("sanity check failed");
    return -1;
  }
  std::vector<X509Ptr> certificates;
  if (loadCrtList(certPath, certificates) != 0 ||
      loadCrtList(upperPath, certificates) != 0) {
    ORVA_LOG_LASTERR("Get X509 certificate failed.");
    return -1;
  }
  if (certificates.empty()) return 1;
  // From the first certificate upwards, each step taken by a certificate
  // that issued the one below it, in whatever order the files hold them.
  // Every other certificate must be on that path.
  std::vector<bool> used(certificates.size(), false);
  used[0] = true;
  size_t below = 0;
  for (size_t placed = 1; placed < certificates.size(); ++placed) {
    size_t next = 0;
    for (size_t i = 1; i < certificates.size() && next == 0; ++i) {
      if (!used[i] && IssuedBy(certificates[below].get(), certificates[i].get())) next = i;
    }
    if (next == 0) return 1;
    used[next] = true;
    below = next;
  }
  return 0;
}
