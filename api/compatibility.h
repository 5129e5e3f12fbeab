#ifndef ORVA_API_COMPATIBILITY_H_
#define ORVA_API_COMPATIBILITY_H_

#include <openssl/x509.h>

#include <ctime>
#include <vector>

#include <json/json.h>

// The verdict of current TLS clients on one certificate at time `now`: one
// {"code": CODE, "clients": [NAME, ...]} per problem found, naming the
// clients that refuse the certificate for it, in this order; an empty array
// when none is found. Codes are stable; client names are for people.
//
//   expired             the validity has ended
//   not_yet_valid       the validity has not begun
//   expires_soon        the validity ends within 30 days
//   empty_names         a subjectAltName extension without entries
//   name_missing        (server) the common name is not among the DNS or IP
//                       names, or there is no name at all; clients that
//                       read names only from subjectAltName refuse it even
//                       when it has no DNS or IP name, the others only when
//                       it has some
//   no_server_auth      (server) no extendedKeyUsage (Apple's clients) or
//                       one without serverAuth (every client)
//   validity_too_long   (server) valid for more than 825 days (Apple's)
//   weak_key            RSA below 2048 bits, EC below 256, or DSA
//   weak_signature      signed with MD5 or SHA-1 (self-signed ones excepted:
//                       their signature is never checked)
//   ca_not_strict       (CA) basicConstraints not critical, or no keyUsage
//                       keyCertSign (strict verifiers)
//   incomplete_chain    (server, not self-signed) issued by none of
//                       `issuers`, the certificates the device presents
//                       with it and its local CA
//
// "(server)" checks apply to certificates that are no CA, "(CA)" ones to
// CA certificates (X509_check_ca).
Json::Value CompatibilityVerdict(X509* certificate, const std::vector<X509*>& issuers,
                                 time_t now);

#endif  // ORVA_API_COMPATIBILITY_H_
