#include <openssl/evp.h>
#include <openssl/pem.h>

#include <algorithm>
#include <cstdio>
#include <string>

#include "api/certificate.h"
#include "api/certificate_info.h"
#include "api/csr_generate.h"
#include "api/subject_reader.h"
#include "common/api_errors.h"
#include "common/log.h"
#include "common/pem_password.h"
#include "common/raii.h"
#include "common/store_paths.h"
#include "platform/olib/orva_root.h"
#include "toolkit/key_strength.h"

namespace {

constexpr int kDefaultKeyLength = 2048;

// The subject of the first "server_cert" entry of `info`, or null.
Json::Value ServerSubject(const Json::Value& info) {
  if (!info.isArray()) return Json::Value();
  for (const Json::Value& entry : info) {
    if (entry.isObject() && entry["type"].isString() &&
        entry["type"].asString() == "server_cert") {
      return entry["subject"];
    }
  }
  return Json::Value();
}

// The key to renew the installed server certificate with: the type of its
// first certificate's key, RSA at its modulus size raised to the smallest
// size keys are made with, EC on P-384 for a curve of 384 bits or more and
// P-256 below, and RSA of 2048 bits for any other type. Returns false
// (logged) when it cannot be read.
bool InstalledKeyKind(KeyKind* kind) {
  FilePtr file(std::fopen(OrvaPath(kServerCrtPath).c_str(), "r"));
  if (!file) {
    ORVA_LOG_LASTERR("open %s failed ", kServerCrtPath);
    return false;
  }
  X509Ptr certificate(PEM_read_X509(file.get(), nullptr, RefusePemPassword, nullptr));
  if (!certificate) {
    ORVA_LOG_LASTERR("read x509 failed");
    return false;
  }
  EvpPkeyPtr key(X509_get_pubkey(certificate.get()));
  if (!key) {
    ORVA_LOG_LASTERR("get public key from file failed");
    return false;
  }
  const int bits = EVP_PKEY_get_bits(key.get());
  switch (EVP_PKEY_base_id(key.get())) {
    case EVP_PKEY_RSA:
      *kind = {KeyAlgorithm::kRsa, std::max(bits, kMinRsaKeyBits)};
      break;
    case EVP_PKEY_EC:
      *kind = {KeyAlgorithm::kEc, bits >= 384 ? 384 : 256};
      break;
    default:
      *kind = {KeyAlgorithm::kRsa, kDefaultKeyLength};
  }
  return true;
}

}  // namespace

void handleRenewAction(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  Json::Value info;
  if (getCertificateInfo(OrvaPath(kServerCrtPath), info, request) != 0) {
    ORVA_LOG("Get certificate info failed.%s", kServerCrtPath);
    response->SetError(kErrFailed, Json::Value());
    return;
  }
  CSR_ARGUMENT record;
  FillFromSubjectJson(ServerSubject(info), &record);
  KeyKind kind;
  if (!InstalledKeyKind(&kind)) {
    ORVA_LOG_LASTERR("Getting key length from %s failed", kServerCrtPath);
    response->SetError(kErrFailed, Json::Value());
    return;
  }
  if (generateCSR(kind, record) == 0) {
    ORVA_LOG_LASTERR("Generate csr from renew action failed");
    response->SetError(kErrFailed, Json::Value());
    return;
  }
  response->SetSuccess(Json::Value());
}
