#ifndef ORVA_TESTS_HOST_TLS_PROBE_H_
#define ORVA_TESTS_HOST_TLS_PROBE_H_

#include <string>

// What one TLS handshake with 127.0.0.1:PORT showed.
struct PresentedCertificates {
  bool connected = false;      // the handshake completed
  std::string common_name;     // of the server's certificate
  int chain_length = 0;        // certificates sent, the server's included
  std::string chain_top_name;  // common name of the last one sent
};

// Makes a new TLS connection (no session resumption, no verification) and
// reports the certificates the server presented.
PresentedCertificates ProbeTls(int port);

#endif  // ORVA_TESTS_HOST_TLS_PROBE_H_
