#ifndef ORVA_API_CERTIFICATE_INFO_H_
#define ORVA_API_CERTIFICATE_INFO_H_

#include <openssl/asn1.h>
#include <openssl/x509.h>

#include <string>

#include <json/json.h>

#include "platform/webapi/api_request.h"

// Appends one certificate entry per PEM certificate of the file at `path`
// to `entries` (an array, or null, which becomes an array on the first
// append): "issuer", "subject", "signature_algorithm"; "valid_from",
// "valid_till", "names" (AltNamesJson), "key" (KeyJson), "fingerprint"
// (Sha256Fingerprint) and "compatibility" (CompatibilityVerdict, with the
// certificates of the same file, the installed intermediate file and the
// local CA as possible issuers) when the request's "additional" array
// names them; and "type"
// when `path` is one of the three store certificate files under the device
// root. Reading stops quietly at the first block that does not decode, and
// after kMaxListedCertificates entries (logged: the rest are not listed).
// Returns 0 when the file was read (also when it held no certificate), 4
// when it could not be opened (`entries` unchanged).
int getCertificateInfo(const std::string& path, Json::Value& entries,
                       ORVA::APIRequest* request);

// Sets in `object` the keys "country", "state", "city", "organization",
// "department", "common_name" and "email" for the attributes `name` holds
// with a non-empty value (first value, at most 1023 bytes). Keys the name
// lacks are not touched, so a name without any leaves a null value null.
void X509_NAME2Json(X509_NAME* name, Json::Value& object);

// Sets `value` to the time as the library prints it; untouched when nothing
// was printed.
void ASN1_TIME2Json(const ASN1_TIME* time, Json::Value& value);

#endif  // ORVA_API_CERTIFICATE_INFO_H_
