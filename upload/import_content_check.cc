#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509.h>

#include <cstdio>
#include <memory>
#include <vector>

#include "common/api_errors.h"
#include "common/log.h"
#include "common/pem_password.h"
#include "common/raii.h"
#include "platform/olib/olib_file.h"
#include "toolkit/key_strength.h"
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
  FilePtr keyFile(std::fopen(keyPath, "r"));
  EvpPkeyPtr key(keyFile ? PEM_read_PrivateKey(keyFile.get(), nullptr, RefusePemPassword, nullptr)
                         : nullptr);
  ERR_clear_error();
  if (key && EVP_PKEY_get_base_id(key.get()) == EVP_PKEY_DSA) {
    ORVA_LOG("Not Support DSA certificate anymore");
    return kErrDsaKey;
  }
  return proveCrtAndKey(certPath, keyPath) == 0 ? kErrNone : kErrKeyMismatch;
}

// True when the private key of `keyPath` is sound: its private part agrees
// with itself and with its public part. A key whose public part matches a
// certificate can still hold a private part no handshake can use.
bool HoldsSoundKey(const char* keyPath) {
  FilePtr file(std::fopen(keyPath, "r"));
  if (!file) return false;
  EvpPkeyPtr key(PEM_read_PrivateKey(file.get(), nullptr, RefusePemPassword, nullptr));
  std::unique_ptr<EVP_PKEY_CTX, decltype(&EVP_PKEY_CTX_free)> context(
      key ? EVP_PKEY_CTX_new_from_pkey(nullptr, key.get(), nullptr) : nullptr,
      EVP_PKEY_CTX_free);
  bool sound = context && EVP_PKEY_private_check(context.get()) == 1 &&
               EVP_PKEY_pairwise_check(context.get()) == 1;
  ERR_clear_error();
  return sound;
}

// True when the private key of `keyPath` is one the device's own HTTPS can
// use (IsStrongKey); logged when not.
bool HoldsStrongKey(const char* keyPath) {
  FilePtr file(std::fopen(keyPath, "r"));
  EvpPkeyPtr key(file ? PEM_read_PrivateKey(file.get(), nullptr, RefusePemPassword, nullptr)
                      : nullptr);
  ERR_clear_error();
  if (IsStrongKey(key.get())) return true;
  ORVA_LOG("The key has %d bits: the device's HTTPS needs RSA keys of at least %d bits and EC "
           "keys of at least %d", key ? EVP_PKEY_get_bits(key.get()) : 0, kMinRsaKeyBits,
           kMinEcKeyBits);
  return false;
}

// 5502 when the key belongs to the certificate and is sound and strong,
// else 5514 or 5518 (a DSA key). Where the tool can compare (RSA) its answer stands: a
// match, or a mismatch of two RSA moduli; otherwise, and when the tool
// cannot tell, only a pair the library proves is accepted. Only failures
// are logged.
int ProvePair(const char* cert, const char* key, __tag_CYPHER keyType) {
  int result = kErrNone;
  if (HasRsaCertificate(cert)) {
    int match = verifyCrtAndKey(cert, key, keyType);
    if (match == 1 && keyType == CYPHER_RSA) return kErrKeyMismatch;
    if (match != 0 && match != 1) ORVA_LOG("Verify crt and key failed");
    if (match != 0) result = ProvePairWithLibrary(cert, key);
  } else {
    result = ProvePairWithLibrary(cert, key);
  }
  if (result == kErrNone && !HoldsSoundKey(key)) {
    ORVA_LOG("The private key %s fails its consistency check", key);
    result = kErrKeyMismatch;
  }
  if (result == kErrNone && !HoldsStrongKey(key)) result = kErrKeyMismatch;
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

  // The files are installed as they are read here: without the mark.
  if (OLIBCFileUTF8BomStrip(cert) != 0 || OLIBCFileUTF8BomStrip(key) != 0) {
    ORVA_LOG("Failed to strip utf8 BOM");
    return kErrKeyMismatch;
  }
  return ProvePair(cert, key, keyType);
}
