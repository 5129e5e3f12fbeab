#ifndef ORVA_TESTS_SUPPORT_CERTIFICATES_H_
#define ORVA_TESTS_SUPPORT_CERTIFICATES_H_

#include <string>

// PEM fixtures made with the machine's openssl tool, the one place tests
// make them, at real paths whose folders are made. Each returns true on
// success. Keys are written as the tool writes them ("BEGIN PRIVATE KEY"):
// RSA or DSA of `bits`, or EC on P-256.

enum class KeyType { kRsa, kEc, kDsa };

// A self-signed CA certificate for `subject` with a new key.
bool MakeSelfSignedCa(const std::string& keyPath, const std::string& certPath,
                      const std::string& subject, int bits = 2048,
                      KeyType type = KeyType::kRsa);

// A new key and a certificate for `subject` signed by the CA.
bool MakeSignedCertificate(const std::string& caKeyPath, const std::string& caCertPath,
                           const std::string& keyPath, const std::string& certPath,
                           const std::string& subject, int bits = 2048,
                           KeyType type = KeyType::kRsa);

// A new RSA key of 2048 bits and a certificate signing request for `subject`.
bool MakeRequest(const std::string& keyPath, const std::string& csrPath,
                 const std::string& subject);

// The first certificate, or else the first certificate signing request, of
// the PEM file at `path` as the OpenSSL library prints it ("Subject: C=TW,
// O=...", "Public-Key: (2048 bit)", alternative names); "" for neither.
std::string PemText(const std::string& path);

// Runs a shell command line for test set-up, without input or output;
// true when it exited with 0.
bool RunForTest(const std::string& commandLine);

#endif  // ORVA_TESTS_SUPPORT_CERTIFICATES_H_
