#include "tests/support/inspect.h"

#include <openssl/pem.h>

#include "common/raii.h"

namespace {

struct RequestDeleter {
  void operator()(X509_REQ* request) const { X509_REQ_free(request); }
};
using RequestPtr = std::unique_ptr<X509_REQ, RequestDeleter>;

// The first object that `read` finds in the PEM file at `path`; null when
// there is none.
template <typename Ptr, typename T>
Ptr ReadPem(const std::string& path, T* (*read)(FILE*, T**, pem_password_cb*, void*)) {
  FilePtr file(std::fopen(path.c_str(), "r"));
  return Ptr(file ? read(file.get(), nullptr, nullptr, nullptr) : nullptr);
}

RequestPtr ReadRequest(const std::string& path) {
  return ReadPem<RequestPtr>(path, PEM_read_X509_REQ);
}
X509Ptr ReadCertificate(const std::string& path) { return ReadPem<X509Ptr>(path, PEM_read_X509); }
EvpPkeyPtr ReadPrivateKey(const std::string& path) {
  return ReadPem<EvpPkeyPtr>(path, PEM_read_PrivateKey);
}

int Bits(const EVP_PKEY* key) { return key != nullptr ? EVP_PKEY_get_bits(key) : 0; }

}  // namespace

int CertificateKeyBits(const std::string& path) {
  X509Ptr certificate = ReadCertificate(path);
  return certificate ? Bits(X509_get0_pubkey(certificate.get())) : 0;
}

int RequestKeyBits(const std::string& path) {
  RequestPtr request = ReadRequest(path);
  return request ? Bits(X509_REQ_get0_pubkey(request.get())) : 0;
}

int PrivateKeyBits(const std::string& path) { return Bits(ReadPrivateKey(path).get()); }

std::string RequestSubject(const std::string& path) {
  RequestPtr request = ReadRequest(path);
  char line[1024] = "";
  if (request) X509_NAME_oneline(X509_REQ_get_subject_name(request.get()), line, sizeof(line));
  return line;
}

bool RequestMatchesKey(const std::string& requestPath, const std::string& keyPath) {
  RequestPtr request = ReadRequest(requestPath);
  EvpPkeyPtr key = ReadPrivateKey(keyPath);
  return request && key && EVP_PKEY_eq(X509_REQ_get0_pubkey(request.get()), key.get()) == 1;
}

std::string CertificateText(const std::string& path) {
  X509Ptr certificate = ReadCertificate(path);
  BioPtr bio(BIO_new(BIO_s_mem()));
  if (!certificate || !bio || X509_print(bio.get(), certificate.get()) != 1) return "";
  char* data = nullptr;
  long size = BIO_get_mem_data(bio.get(), &data);
  return std::string(data, static_cast<size_t>(size));
}
