#include "toolkit/request_facts.h"

#include <openssl/err.h>
#include <openssl/pem.h>
#include <openssl/x509v3.h>

#include <cstdio>

#include "common/log.h"
#include "common/pem_password.h"
#include "common/raii.h"
#include "toolkit/x509_names.h"

namespace {

// The DNS and IP entries of the request's subjectAltName, in order.
std::vector<std::string> AlternativeNames(X509_REQ* request) {
  std::vector<std::string> names;
  STACK_OF(X509_EXTENSION)* extensions = X509_REQ_get_extensions(request);
  GeneralNamesPtr entries(static_cast<GENERAL_NAMES*>(
      X509V3_get_d2i(extensions, NID_subject_alt_name, nullptr, nullptr)));
  sk_X509_EXTENSION_pop_free(extensions, X509_EXTENSION_free);
  for (const AltName& entry : AltNamesOf(entries.get())) {
    if (entry.kind == "DNS" || entry.kind == "IP") names.push_back(entry.value);
  }
  return names;
}

}  // namespace

bool ReadRequestFacts(const char* path, RequestFacts* facts) {
  FilePtr file(std::fopen(path, "r"));
  X509ReqPtr request(
      file ? PEM_read_X509_REQ(file.get(), nullptr, RefusePemPassword, nullptr) : nullptr);
  if (!request) {
    ERR_clear_error();
    ORVA_LOG("Read request %s failed", path);
    return false;
  }
  X509_NAME* subject = X509_REQ_get_subject_name(request.get());
  facts->common_name = CommonNameOf(subject);
  facts->has_email = X509_NAME_get_index_by_NID(subject, NID_pkcs9_emailAddress, -1) >= 0;
  facts->names = AlternativeNames(request.get());
  facts->ec_key = EVP_PKEY_get_base_id(X509_REQ_get0_pubkey(request.get())) == EVP_PKEY_EC;
  ERR_clear_error();
  return true;
}
