#include "tests/support/inspect.h"

#include <openssl/pem.h>

#include "common/raii.h"

std::string PemText(const std::string& path) {
  BioPtr text(BIO_new(BIO_s_mem()));
  FilePtr file(std::fopen(path.c_str(), "r"));
  if (!file || !text) return "";
  X509Ptr certificate(PEM_read_X509(file.get(), nullptr, nullptr, nullptr));
  if (certificate) {
    X509_print(text.get(), certificate.get());
  } else {
    std::rewind(file.get());
    X509_REQ* request = PEM_read_X509_REQ(file.get(), nullptr, nullptr, nullptr);
    if (request != nullptr) X509_REQ_print(text.get(), request);
    X509_REQ_free(request);
  }
  char* data = nullptr;
  long size = BIO_get_mem_data(text.get(), &data);
  return std::string(data, static_cast<size_t>(size));
}
