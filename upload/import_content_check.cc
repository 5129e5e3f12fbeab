#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509.h>

#include <cstdio>
#include <vector>

#include "common/api_errors.h"
#include "common/log.h"
#include "common/pem_password.h"
#include "common/raii.h"
#include "upload/sslca_form_handler.h"

namespace {

// True when the PEM file at `path` yields at least one certificate. A file
// that does not would let the chain test see the server certificate alone,
// which counts as a chain.
bool HoldsCertificate(const char* path) {
  std::vector<X509Ptr> certificates;
  return loadCrtList(path, certificates) == 0 && !certificates.empty();
}

// Proves with the library that the first certificate of `certPath` belongs
// to the key of `keyPath`, for keys the openssl tool could not compare (EC
// keys, keys without an algorithm marker). Returns 5502 for a proven pair,
// 5518 for a DSA key that its first line did not name, 5514 otherwise. An
// encrypted key is not decrypted: no password is supplied, so it fails to
// load.
int ProvePairWithLibrary(const char* certPath, const char* keyPath) {
  FilePtr certFile(std::fopen(certPath, "r"));
  FilePtr keyFile(std::fopen(keyPath, "r"));
  if (!certFile || !keyFile) return kErrKeyMismatch;
  X509Ptr certificate(
      PEM_read_X509(certFile.get(), nullptr, RefusePemPassword, nullptr));
  EvpPkeyPtr key(
      PEM_read_PrivateKey(keyFile.get(), nullptr, RefusePemPassword, nullptr));
  int result = kErrKeyMismatch;
  if (key && EVP_PKEY_get_base_id(key.get()) == EVP_PKEY_DSA) {
    ORVA_LOG("Not Support DSA certificate anymore");
    result = kErrDsaKey;
  } else if (certificate && key &&
             X509_check_private_key(certificate.get(), key.get()) == 1) {
    result = kErrNone;
  }
  ERR_clear_error();  // A refused pair leaves nothing for later callers.
  return result;
}

}  // namespace

int SSLCAFormHandler::checkCAContent(const char* cert, const char* key,
                                     const char* interCert, Json::Value& data) {
  __tag_CYPHER keyType = CYPHER_NONE;
  int result = checkHeaderType(cert, "CERTIFICATE", &keyType, data, CA_CRT);
  if (result != kErrNone) {
    ORVA_LOG("Check Crt header failed.");
    return result;
  }
  result = checkHeaderType(key, "PRIVATE KEY", &keyType, data, CA_KEY);
  if (result != kErrNone) {
    ORVA_LOG("Check Key header failed.");
    return result;
  }
  if (keyType == CYPHER_DSA) {
    ORVA_LOG("Not Support DSA certificate anymore");
    return kErrDsaKey;
  }
  if (interCert != nullptr && interCert[0] != '\0') {
    result = checkHeaderType(interCert, "CERTIFICATE", &keyType, data,
                             CA_INTERCRT);
    if (result != kErrNone) {
      ORVA_LOG("Check intercrt header failed.");
      return result;
    }
    if (!HoldsCertificate(interCert) || verifyCrtChain(cert, interCert) != 0) {
      ORVA_LOG("Intermediate certificate & certificate is not matching.");
      return kErrChain;
    }
  }

  // The tool's answer stands where it compared: a match, or a mismatch of
  // two RSA moduli. Otherwise the tool could not tell (it also answers 1
  // when it cannot read the modulus of a key not marked RSA), and only a
  // pair the library proves is accepted.
  int match = verifyCrtAndKey(cert, key, keyType);
  if (match == 0) return kErrNone;
  if (match == 1 && keyType == CYPHER_RSA) return kErrKeyMismatch;
  if (match != 1) ORVA_LOG("Verify crt and key failed");
  return ProvePairWithLibrary(cert, key);
}
