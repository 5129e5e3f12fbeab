#include "api/certificate_details.h"

#include <openssl/ec.h>
#include <openssl/evp.h>
#include <openssl/objects.h>

#include <cstdio>

#include "common/raii.h"
#include "toolkit/x509_names.h"

Json::Value AltNamesJson(X509* certificate) {
  Json::Value names(Json::arrayValue);
  GeneralNamesPtr entries(static_cast<GENERAL_NAMES*>(
      X509_get_ext_d2i(certificate, NID_subject_alt_name, nullptr, nullptr)));
  for (const AltName& entry : AltNamesOf(entries.get())) {
    names.append(entry.kind + ":" + entry.value);
  }
  return names;
}

Json::Value KeyJson(X509* certificate) {
  const EVP_PKEY* key = X509_get0_pubkey(certificate);
  if (key == nullptr) return Json::Value();
  Json::Value description(Json::objectValue);
  int type = EVP_PKEY_get_base_id(key);
  char curve[80] = {0};
  if (type == EVP_PKEY_EC &&
      EVP_PKEY_get_utf8_string_param(key, "group", curve, sizeof(curve), nullptr) == 1) {
    const char* nist = EC_curve_nid2nist(OBJ_sn2nid(curve));
    description["type"] = "EC";
    description["curve"] = nist != nullptr ? nist : curve;
    return description;
  }
  const char* name = EVP_PKEY_get0_type_name(key);
  description["type"] = name != nullptr ? name : "unknown";
  description["bits"] = EVP_PKEY_get_bits(key);
  return description;
}

std::string Sha256Fingerprint(X509* certificate) {
  unsigned char digest[EVP_MAX_MD_SIZE];
  unsigned int length = 0;
  if (X509_digest(certificate, EVP_sha256(), digest, &length) != 1) return "";
  std::string text;
  for (unsigned int i = 0; i < length; ++i) {
    char pair[4];
    std::snprintf(pair, sizeof(pair), i == 0 ? "%02X" : ":%02X", digest[i]);
    text += pair;
  }
  return text;
}
