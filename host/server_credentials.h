#ifndef ORVA_HOST_SERVER_CREDENTIALS_H_
#define ORVA_HOST_SERVER_CREDENTIALS_H_

#include <openssl/x509.h>

#include <memory>
#include <string>

#include "common/raii.h"

// The certificate, private key and intermediate chain that the HTTPS
// listener presents, read from the certificate store. Nothing changes
// after loading, so handshakes on several threads may share one object.
class ServerCredentials {
 public:
  // Reads the store's server certificate and key and, when the file exists,
  // its intermediate certificates (device paths under the device root).
  // Returns null, with a one-line reason naming the device path in
  // *problem, when the certificate or the key is missing or does not read
  // (an encrypted key never asks for a password), when the key does not
  // belong to the certificate, or when the intermediate file exists but
  // holds no readable certificate. The caller owns the result.
  static std::unique_ptr<ServerCredentials> LoadFromStore(std::string* problem);

  // Owned by this object; valid while it lives.
  X509* certificate() const { return certificate_.get(); }
  EVP_PKEY* key() const { return key_.get(); }
  // Empty when the store has no intermediate file.
  STACK_OF(X509)* chain() const { return chain_.get(); }

 private:
  ServerCredentials() = default;

  X509Ptr certificate_;
  EvpPkeyPtr key_;
  X509StackPtr chain_;
};

#endif  // ORVA_HOST_SERVER_CREDENTIALS_H_
