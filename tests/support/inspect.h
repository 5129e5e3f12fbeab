#ifndef ORVA_TESTS_SUPPORT_INSPECT_H_
#define ORVA_TESTS_SUPPORT_INSPECT_H_

#include <string>

// Reads what tests check in made files, with the OpenSSL library.

// Bits of the public key of the first certificate, request or private key
// in the PEM file; 0 when none can be read.
int CertificateKeyBits(const std::string& path);
int RequestKeyBits(const std::string& path);
int PrivateKeyBits(const std::string& path);

// The request's subject as one line ("/C=TW/O=..."); "" when unreadable.
std::string RequestSubject(const std::string& path);

// True when the private key belongs to the request's public key.
bool RequestMatchesKey(const std::string& requestPath, const std::string& keyPath);

// The certificate in text form as `openssl x509 -text` prints it.
std::string CertificateText(const std::string& path);

#endif  // ORVA_TESTS_SUPPORT_INSPECT_H_
