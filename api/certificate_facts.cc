#include "api/certificate_facts.h"

#include <openssl/bio.h>
#include <openssl/objects.h>
#include <openssl/pem.h>

#include <map>
#include <mutex>
#include <utility>

#include "api/certificate_info.h"
#include "common/pem_password.h"
#include "common/raii.h"

namespace {

// Content kept per path is at most this big; a larger file is decoded on
// every read. Store certificate files are a few KiB.
constexpr size_t kMaxKeptBytes = 64 * 1024;
// Paths kept at once; the store has three certificate files.
constexpr size_t kMaxKeptPaths = 16;

struct Kept {
  std::string pem;
  std::shared_ptr<const CertificateFactsList> facts;
};

struct KeptFacts {
  std::mutex mutex;
  std::map<std::string, Kept> by_path;
};

KeptFacts& Keeper() {
  static KeptFacts keeper;
  return keeper;
}

}  // namespace

CertificateFactsList DecodeCertificateFacts(const std::string& pem) {
  CertificateFactsList list;
  BioPtr bio(BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size())));
  if (!bio) return list;
  while (list.size() <= kMaxListedCertificates) {
    X509Ptr certificate(
        PEM_read_bio_X509(bio.get(), nullptr, RefusePemPassword, nullptr));
    if (!certificate) break;
    CertificateFacts facts;
    X509_NAME2Json(X509_get_issuer_name(certificate.get()), facts.issuer);
    X509_NAME2Json(X509_get_subject_name(certificate.get()), facts.subject);
    const char* algorithm = OBJ_nid2ln(X509_get_signature_nid(certificate.get()));
    if (algorithm != nullptr) facts.signature_algorithm = algorithm;
    ASN1_TIME2Json(X509_get0_notBefore(certificate.get()), facts.valid_from);
    ASN1_TIME2Json(X509_get0_notAfter(certificate.get()), facts.valid_till);
    facts.certificate.reset(certificate.release(), X509_free);
    list.push_back(std::move(facts));
  }
  return list;
}

std::shared_ptr<const CertificateFactsList> CertificateFactsOf(
    const std::string& path, const std::string& pem) {
  KeptFacts& keeper = Keeper();
  {
    std::lock_guard<std::mutex> lock(keeper.mutex);
    auto found = keeper.by_path.find(path);
    if (found != keeper.by_path.end() && found->second.pem == pem) {
      return found->second.facts;
    }
  }
  // Decoded outside the lock: readers of other paths do not wait for it.
  auto facts = std::make_shared<const CertificateFactsList>(DecodeCertificateFacts(pem));
  if (pem.size() <= kMaxKeptBytes) {
    std::lock_guard<std::mutex> lock(keeper.mutex);
    if (keeper.by_path.size() >= kMaxKeptPaths && keeper.by_path.count(path) == 0) {
      keeper.by_path.clear();
    }
    keeper.by_path[path] = Kept{pem, facts};
  }
  return facts;
}
