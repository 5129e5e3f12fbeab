#include "api/certificate_info.h"

#include <openssl/bio.h>
#include <openssl/crypto.h>
#include <openssl/objects.h>
#include <openssl/x509.h>

#include <cstdio>
#include <memory>

#include "api/certificate_facts.h"
#include "common/file_util.h"
#include "common/log.h"
#include "common/raii.h"
#include "common/store_paths.h"
#include "platform/olib/orva_root.h"

namespace {

struct NameAttribute {
  const char* key;
  int nid;
};

const NameAttribute kNameAttributes[] = {
    {"country", NID_countryName},
    {"state", NID_stateOrProvinceName},
    {"city", NID_localityName},
    {"organization", NID_organizationName},
    {"department", NID_organizationalUnitName},
    {"common_name", NID_commonName},
    {"email", NID_pkcs9_emailAddress},
};

// The role of a store file, or null for any other path.
const char* FileType(const std::string& path) {
  if (path == OrvaPath(kCaCrtPath)) return "root_cert";
  if (path == OrvaPath(kServerCrtPath)) return "server_cert";
  if (path == OrvaPath(kInterCrtPath)) return "inter_cert";
  return nullptr;
}

}  // namespace

void X509_NAME2Json(X509_NAME* name, Json::Value& object) {
  for (const NameAttribute& attribute : kNameAttributes) {
    int index = X509_NAME_get_index_by_NID(name, attribute.nid, -1);
    if (index < 0) continue;
    // Converted from whatever string type the name uses (UCS-2 and UCS-4
    // included), so every value arrives as UTF-8 text.
    unsigned char* text = nullptr;
    int length = ASN1_STRING_to_UTF8(
        &text, X509_NAME_ENTRY_get_data(X509_NAME_get_entry(name, index)));
    if (length > 0) {
      object[attribute.key] = std::string(reinterpret_cast<char*>(text),
                                          static_cast<size_t>(length));
    }
    OPENSSL_free(text);
  }
}

void ASN1_TIME2Json(const ASN1_TIME* time, Json::Value& value) {
  BioPtr bio(BIO_new(BIO_s_mem()));
  if (!bio) return;
  ASN1_TIME_print(bio.get(), time);
  BIO_write(bio.get(), "", 1);
  char* text = nullptr;
  BIO_get_mem_data(bio.get(), &text);
  if (text != nullptr) value = text;
}

int getCertificateInfo(const std::string& path, Json::Value& entries,
                       ORVA::APIRequest* request) {
  // The asked-for fields are read once, however long the list.
  bool valid_from = false;
  bool valid_till = false;
  Json::Value additional =
      request != nullptr ? request->GetParam("additional", Json::Value())
                         : Json::Value();
  if (additional.isArray()) {
    for (const Json::Value& element : additional) {
      valid_from = valid_from || element == Json::Value("valid_from");
      valid_till = valid_till || element == Json::Value("valid_till");
    }
  }
  std::string pem;
  if (!ReadWholeFile(path, &pem)) return 4;
  std::shared_ptr<const CertificateFactsList> facts = CertificateFactsOf(path, pem);
  size_t listed = facts->size();
  if (listed > kMaxListedCertificates) {
    listed = kMaxListedCertificates;
    ORVA_LOG("%s holds more than %zu certificates; the rest are not listed",
             path.c_str(), kMaxListedCertificates);
  }
  const char* type = FileType(path);
  for (size_t i = 0; i < listed; ++i) {
    const CertificateFacts& certificate = (*facts)[i];
    Json::Value entry(Json::objectValue);
    entry["issuer"] = certificate.issuer;
    entry["subject"] = certificate.subject;
    entry["signature_algorithm"] = certificate.signature_algorithm;
    if (valid_from) entry["valid_from"] = certificate.valid_from;
    if (valid_till) entry["valid_till"] = certificate.valid_till;
    if (type != nullptr) entry["type"] = type;
    entries.append(entry);
  }
  return 0;
}
