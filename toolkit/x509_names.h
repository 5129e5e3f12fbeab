#ifndef ORVA_TOOLKIT_X509_NAMES_H_
#define ORVA_TOOLKIT_X509_NAMES_H_

#include <openssl/x509.h>
#include <openssl/x509v3.h>

#include <string>
#include <vector>

// One subjectAltName entry as text: `kind` is "DNS", "IP", "email", "URI"
// or "other"; `value` is the name as UTF-8, an IP address as address text
// ("" for an address of another length than 4 or 16 bytes), and "" for
// the other kinds.
struct AltName {
  std::string kind;
  std::string value;
};

// The entries of `names` (null: none), in order.
std::vector<AltName> AltNamesOf(const GENERAL_NAMES* names);

// An ASN.1 string as UTF-8 text; "" when it cannot be converted.
std::string Utf8Text(const ASN1_STRING* value);

// The first common name of `name` as UTF-8 text; "" when it has none.
std::string CommonNameOf(const X509_NAME* name);

// True when `issuer` issued `subject`: the names agree and the issuer's key
// verifies the subject's signature. Leaves no error in the thread's queue.
bool IssuedBy(X509* subject, X509* issuer);

#endif  // ORVA_TOOLKIT_X509_NAMES_H_
