#include "api/certificate_info.h"

#include <openssl/bio.h>
#include <openssl/crypto.h>
#include <openssl/objects.h>
#include <openssl/x509.h>

#include <cstdio>
#include <ctime>
#include <memory>
#include <vector>

#include "api/certificate_details.h"
#include "api/certificate_facts.h"
#include "api/compatibility.h"
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

// What the request's "additional" array asks for, read once however long
// the array is.
struct Additional {
  bool valid_from = false;
  bool valid_till = false;
  bool names = false;
  bool key = false;
  bool fingerprint = false;
  bool compatibility = false;
};

Additional ReadAdditional(ORVA::APIRequest* request) {
  Additional asked;
  Json::Value additional =
      request != nullptr ? request->GetParam("additional", Json::Value()) : Json::Value();
  if (!additional.isArray()) return asked;
  const struct {
    const char* name;
    bool Additional::*flag;
  } kFields[] = {
      {"valid_from", &Additional::valid_from}, {"valid_till", &Additional::valid_till},
      {"names", &Additional::names},           {"key", &Additional::key},
      {"fingerprint", &Additional::fingerprint},
      {"compatibility", &Additional::compatibility},
  };
  for (const Json::Value& element : additional) {
    for (const auto& field : kFields) {
      if (element == Json::Value(field.name)) asked.*field.flag = true;
    }
  }
  return asked;
}

// The facts of the store file at `devicePath`; none when it cannot be read.
std::shared_ptr<const CertificateFactsList> StoreFileFacts(const char* devicePath) {
  const std::string path = OrvaPath(devicePath);
  std::string pem;
  if (!ReadWholeFile(path, &pem)) return std::make_shared<const CertificateFactsList>();
  return CertificateFactsOf(path, pem);
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
  const Additional asked = ReadAdditional(request);
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
  // A certificate's issuer is among those the device presents with it or
  // its local CA.
  std::vector<std::shared_ptr<const CertificateFactsList>> presented;
  std::vector<X509*> issuers;
  if (asked.compatibility) {
    presented = {facts, StoreFileFacts(kInterCrtPath), StoreFileFacts(kCaCrtPath)};
    for (const auto& file : presented) {
      for (const CertificateFacts& certificate : *file) issuers.push_back(certificate.certificate.get());
    }
  }
  const time_t now = std::time(nullptr);
  for (size_t i = 0; i < listed; ++i) {
    const CertificateFacts& certificate = (*facts)[i];
    Json::Value entry(Json::objectValue);
    entry["issuer"] = certificate.issuer;
    entry["subject"] = certificate.subject;
    entry["signature_algorithm"] = certificate.signature_algorithm;
    X509* x509 = certificate.certificate.get();
    if (asked.valid_from) entry["valid_from"] = certificate.valid_from;
    if (asked.valid_till) entry["valid_till"] = certificate.valid_till;
    if (asked.names) entry["names"] = AltNamesJson(x509);
    if (asked.key) entry["key"] = KeyJson(x509);
    if (asked.fingerprint) entry["fingerprint"] = Sha256Fingerprint(x509);
    if (asked.compatibility) entry["compatibility"] = CompatibilityVerdict(x509, issuers, now);
    if (type != nullptr) entry["type"] = type;
    entries.append(entry);
  }
  return 0;
}
