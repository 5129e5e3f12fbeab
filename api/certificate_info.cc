#include "api/certificate_info.h"

#include <openssl/bio.h>
#include <openssl/objects.h>

#include <cstdio>
#include <memory>

#include "api/certificate_facts.h"
#include "common/file_util.h"
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
    char text[1024] = {0};
    if (X509_NAME_get_text_by_NID(name, attribute.nid, text, sizeof(text)) > 0) {
      object[attribute.key] = text;
    }
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
  Json::Value additional =
      request != nullptr ? request->GetParam("additional", Json::Value())
                         : Json::Value();
  std::string pem;
  if (!ReadWholeFile(path, &pem)) return 4;
  std::shared_ptr<const CertificateFactsList> facts = CertificateFactsOf(path, pem);
  const char* type = FileType(path);
  for (const CertificateFacts& certificate : *facts) {
    Json::Value entry(Json::objectValue);
    entry["issuer"] = certificate.issuer;
    entry["subject"] = certificate.subject;
    entry["signature_algorithm"] = certificate.signature_algorithm;
    if (additional.isArray()) {
      for (const Json::Value& element : additional) {
        if (element == Json::Value("valid_from")) {
          entry["valid_from"] = certificate.valid_from;
        } else if (element == Json::Value("valid_till")) {
          entry["valid_till"] = certificate.valid_till;
        }
      }
    }
    if (type != nullptr) entry["type"] = type;
    entries.append(entry);
  }
  return 0;
}
