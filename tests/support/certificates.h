#ifndef ORVA_TESTS_SUPPORT_CERTIFICATES_H_
#define ORVA_TESTS_SUPPORT_CERTIFICATES_H_

#include <string>

// Test fixtures made with the machine's openssl tool. Each returns true on
// success. Paths are real paths (already under a device root).

// A self-signed CA certificate with a new RSA key of `bits`.
bool MakeSelfSignedCa(const std::string& keyPath, const std::string& certPath,
                      const std::string& subject, int bits = 2048);

// A new key and a certificate for `subject` signed by the CA.
bool MakeSignedCertificate(const std::string& caKeyPath,
                           const std::string& caCertPath,
                           const std::string& keyPath,
                           const std::string& certPath,
                           const std::string& subject, int bits = 2048);

// A new key and a certificate signing request for `subject`.
bool MakeRequest(const std::string& keyPath, const std::string& csrPath,
                 const std::string& subject, int bits = 2048);

// Runs a shell command line for test set-up; true when it exited with 0.
bool RunForTest(const std::string& commandLine);

#endif  // ORVA_TESTS_SUPPORT_CERTIFICATES_H_
