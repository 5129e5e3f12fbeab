#ifndef ORVA_API_CERTIFICATE_DETAILS_H_
#define ORVA_API_CERTIFICATE_DETAILS_H_

#include <openssl/x509.h>

#include <string>

#include <json/json.h>

// What "list" shows of a certificate when "additional" asks for it, read
// from the decoded certificate.

// Every subjectAltName entry as "KIND:VALUE" ("DNS:nas.local",
// "IP:192.168.1.2", "email:admin@nas.local", "URI:...", "other:"), in
// order; an empty array when there is none.
Json::Value AltNamesJson(X509* certificate);

// The public key: {"type":"RSA","bits":2048}, {"type":"EC","curve":"P-256"}
// (the curve's NIST name, else its short name), or {"type":NAME,"bits":N}
// for another algorithm; null when the key cannot be read.
Json::Value KeyJson(X509* certificate);

// The SHA-256 digest of the certificate as upper-case hex pairs joined by
// ":"; "" when it cannot be made.
std::string Sha256Fingerprint(X509* certificate);

#endif  // ORVA_API_CERTIFICATE_DETAILS_H_
