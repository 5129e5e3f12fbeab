#include "host/server_credentials.h"

#include <openssl/err.h>
#include <openssl/pem.h>
#include <unistd.h>

#include "common/pem_password.h"
#include "common/store_paths.h"
#include "platform/olib/orva_root.h"

namespace {

FilePtr OpenStoreFile(const char* devicePath) {
  return FilePtr(std::fopen(OrvaPath(devicePath).c_str(), "r"));
}

bool StoreFileExists(const char* devicePath) {
  return access(OrvaPath(devicePath).c_str(), F_OK) == 0;
}

}  // namespace

std::unique_ptr<ServerCredentials> ServerCredentials::LoadFromStore(
    std::string* problem) {
  std::unique_ptr<ServerCredentials> credentials(new ServerCredentials);
  // The readers leave their failures (and the end of the intermediate
  // file) in the thread's OpenSSL error queue; nobody reads them.
  struct ErrorQueueCleaner {
    ~ErrorQueueCleaner() { ERR_clear_error(); }
  } cleaner;

  if (FilePtr file = OpenStoreFile(kServerCrtPath)) {
    credentials->certificate_.reset(
        PEM_read_X509(file.get(), nullptr, RefusePemPassword, nullptr));
  }
  if (!credentials->certificate_) {
    *problem = std::string(kServerCrtPath) + " does not load";
    return nullptr;
  }
  if (FilePtr file = OpenStoreFile(kServerKeyPath)) {
    credentials->key_.reset(
        PEM_read_PrivateKey(file.get(), nullptr, RefusePemPassword, nullptr));
  }
  if (!credentials->key_) {
    *problem = std::string(kServerKeyPath) + " does not load";
    return nullptr;
  }
  if (X509_check_private_key(credentials->certificate_.get(),
                             credentials->key_.get()) != 1) {
    *problem = std::string(kServerKeyPath) + " does not belong to " + kServerCrtPath;
    return nullptr;
  }

  credentials->chain_.reset(sk_X509_new_null());
  if (!credentials->chain_) {
    *problem = "out of memory";
    return nullptr;
  }
  if (!StoreFileExists(kInterCrtPath)) return credentials;
  if (FilePtr file = OpenStoreFile(kInterCrtPath)) {
    while (X509* intermediate =
               PEM_read_X509(file.get(), nullptr, RefusePemPassword, nullptr)) {
      if (sk_X509_push(credentials->chain_.get(), intermediate) == 0) {
        X509_free(intermediate);
        *problem = "out of memory";
        return nullptr;
      }
    }
  }
  if (sk_X509_num(credentials->chain_.get()) == 0) {
    *problem = std::string(kInterCrtPath) + " holds no certificate that loads";
    return nullptr;
  }
  return credentials;
}
