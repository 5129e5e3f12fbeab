#ifndef ORVA_TESTS_SUPPORT_INSPECT_H_
#define ORVA_TESTS_SUPPORT_INSPECT_H_

#include <string>

// The first certificate, or else the first certificate signing request, of
// the PEM file at `path` in text form as the OpenSSL library prints it
// ("Subject: C=TW, O=...", "Public-Key: (1024 bit)", alternative names);
// "" when the file holds neither.
std::string PemText(const std::string& path);

#endif  // ORVA_TESTS_SUPPORT_INSPECT_H_
