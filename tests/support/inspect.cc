#include "tests/support/inspect.h"

#include <openssl/bio.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/x509.h>

#include <cstdio>
#include <memory>

namespace {

struct Closer {
  void operator()(FILE* f) const { std::fclose(f); }
};
using File = std::unique_ptr<FILE, Closer>;

template <typename T, void (*Free)(T*)>
struct Deleter {
  void operator()(T* p) const { Free(p); }
};
using Key = std::unique_ptr<EVP_PKEY, Deleter<EVP_PKEY, EVP_PKEY_free>>;
using Cert = std::unique_ptr<X509, Deleter<X509, X509_free>>;
using Req = std::unique_ptr<X509_REQ, Deleter<X509_REQ, X509_REQ_free>>;

Req ReadRequest(const std::string& path) {
  File file(std::fopen(path.c_str(), "r"));
  return Req(file ? PEM_read_X509_REQ(file.get(), nullptr, nullptr, nullptr) : nullptr);
}

Cert ReadCertificate(const std::string& path) {
  File file(std::fopen(path.c_str(), "r"));
  return Cert(file ? PEM_read_X509(file.get(), nullptr, nullptr, nullptr) : nullptr);
}

Key ReadPrivateKey(const std::string& path) {
  File file(std::fopen(path.c_str(), "r"));
  return Key(file ? PEM_read_PrivateKey(file.get(), nullptr, nullptr, nullptr) : nullptr);
}

int Bits(EVP_PKEY* key) { return key != nullptr ? EVP_PKEY_get_bits(key) : 0; }

}  // namespace

int CertificateKeyBits(const std::string& path) {
  Cert cert = ReadCertificate(path);
  return cert ? Bits(X509_get0_pubkey(cert.get())) : 0;
}

int RequestKeyBits(const std::string& path) {
  Req request = ReadRequest(path);
  return request ? Bits(X509_REQ_get0_pubkey(request.get())) : 0;
}

int PrivateKeyBits(const std::string& path) {
  Key key = ReadPrivateKey(path);
  return Bits(key.get());
}

std::string RequestSubject(const std::string& path) {
  Req request = ReadRequest(path);
  if (!request) return "";
  char line[1024];
  X509_NAME_oneline(X509_REQ_get_subject_name(request.get()), line, sizeof(line));
  return line;
}

bool RequestMatchesKey(const std::string& requestPath, const std::string& keyPath) {
  Req request = ReadRequest(requestPath);
  Key key = ReadPrivateKey(keyPath);
  return request && key && EVP_PKEY_eq(X509_REQ_get0_pubkey(request.get()), key.get()) == 1;
}

std::string CertificateText(const std::string& path) {
  Cert cert = ReadCertificate(path);
  if (!cert) return "";
  std::unique_ptr<BIO, Deleter<BIO, BIO_free_all>> bio(BIO_new(BIO_s_mem()));
  X509_print(bio.get(), cert.get());
  char* data = nullptr;
  long size = BIO_get_mem_data(bio.get(), &data);
  return std::string(data, static_cast<size_t>(size));
}
