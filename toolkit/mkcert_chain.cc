// Whether a certificate and a file of upper certificates form one issuing
// chain, judged by their distinguished names.

#include <openssl/err.h>
#include <openssl/pem.h>

#include <cerrno>
#include <cstdio>

#include "common/log.h"
#include "common/pem_password.h"
#include "platform/olib/olib_error.h"
#include "platform/olib/olib_file.h"
#include "toolkit/mkcert.h"

namespace {

bool IsPresentFile(const char* path) {
  return path != nullptr && *path != '\0' && OLIBCFileExist(path) != 0;
}

// True when `issuer` issued some other certificate of the list.
bool IssuedAnother(const std::vector<X509Ptr>& certificates, size_t issuer) {
  X509_NAME* subject = X509_get_subject_name(certificates[issuer].get());
  for (size_t j = 0; j < certificates.size(); ++j) {
    if (j == issuer) continue;
    if (X509_NAME_cmp(subject, X509_get_issuer_name(certificates[j].get())) ==
        0) {
      return true;
    }
  }
  return false;
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
  size_t issuers = 0;
  for (size_t i = 0; i < certificates.size(); ++i) {
    if (IssuedAnother(certificates, i)) ++issuers;
  }
  return issuers + 1 >= certificates.size() ? 0 : 1;
}
