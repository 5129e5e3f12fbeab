// The local certificate authority.

#include <string>

#include "common/log.h"
#include "toolkit/mkcert.h"
#include "toolkit/mkcert_internal.h"
#include "toolkit/store_file.h"

namespace {
constexpr int kCaValidityDays = 3650;
}  // namespace

int genCASetInto(StoreFileSet* set, CSR_ARGUMENT* subject, const KeyKind& kind,
                 std::string* key, std::string* certificate) {
  for (const char* path : {kCaCsrPath, kCaCrtPath, kCaKeyPath}) {
    if (genDir(OrvaPath(path).c_str()) != 0) {
      ORVA_LOG("generate directory failed");
      return -1;
    }
  }
  const std::string request = set->Add(OrvaPath(kCaCsrPath), StoreContent::kRequest);
  *certificate = set->Add(OrvaPath(kCaCrtPath), StoreContent::kCertificate);
  *key = set->Add(OrvaPath(kCaKeyPath), StoreContent::kPrivateKey);

  int result = genKeyOf(key->c_str(), kind);
  if (result != 0) {
    ORVA_LOG("genCAKey() failed");
    return result;
  }
  result = genCsr(OrvaPath(kCaCfgPath).c_str(), key->c_str(), request.c_str(),
                  subject);
  if (result != 0) {
    ORVA_LOG("genCACsr() failed");
    return result;
  }
  result = genCACrtHelper(request.c_str(), certificate->c_str(), key->c_str(),
                          kCaValidityDays);
  if (result != 0) {
    ORVA_LOG("genCACrt() failed");
    return result;
  }
  result = verifyCrtAndKeyOfAnyType(certificate->c_str(), key->c_str());
  if (result != 0) ORVA_LOG("Root certificate and key is not matching");
  return result;
}

int genCASet(CSR_ARGUMENT* subject, int bits) {
  // Made under work names and installed only as a proven set: a CA key
  // beside the certificate of another key could sign nothing.
  StoreFileSet set;
  std::string key, certificate;
  int result = genCASetInto(&set, subject, {KeyAlgorithm::kRsa, bits}, &key, &certificate);
  if (result != 0) return result;
  if (set.Install() != 0) {
    ORVA_LOG("Install CA set failed");
    return -1;
  }
  return 0;
}
