#ifndef ORVA_API_CERTIFICATE_FACTS_H_
#define ORVA_API_CERTIFICATE_FACTS_H_

#include <memory>
#include <string>
#include <vector>

#include <json/json.h>
#include <openssl/x509.h>

// What a certificate entry shows of one certificate, decoded once.
struct CertificateFacts {
  Json::Value issuer;   // null, or the name object (X509_NAME2Json)
  Json::Value subject;  // likewise
  std::string signature_algorithm;  // long name; "" when it has none
  Json::Value valid_from;  // the printed time, or null when none was printed
  Json::Value valid_till;
  // The certificate itself, for what is worked out only when asked for
  // (names, key, fingerprint, compatibility); never null. Only read.
  std::shared_ptr<X509> certificate;
};

using CertificateFactsList = std::vector<CertificateFacts>;

// A store file lists at most this many certificates.
inline constexpr size_t kMaxListedCertificates = 64;

// The facts of the PEM certificates in `pem`, in order, at most
// kMaxListedCertificates + 1 of them (so a caller sees that more follow);
// decoding stops quietly at the first block that does not decode.
CertificateFactsList DecodeCertificateFacts(const std::string& pem);

// The facts of the file at `path` whose whole content is `pem`. Decoding a
// certificate costs the library far more than reading its file, and the
// store's few files rarely change, so the facts of each path are kept with
// the exact content they came from and reused while the content is the
// same, byte for byte; any change is decoded anew. Safe to call from
// several threads. The result is shared and never changes.
std::shared_ptr<const CertificateFactsList> CertificateFactsOf(
    const std::string& path, const std::string& pem);

#endif  // ORVA_API_CERTIFICATE_FACTS_H_
