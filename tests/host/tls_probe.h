#ifndef ORVA_TESTS_HOST_TLS_PROBE_H_
#define ORVA_TESTS_HOST_TLS_PROBE_H_

#include <functional>
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

// Probes every 20 ms for up to 10 s until `done` holds for a handshake;
// returns the last one seen.
PresentedCertificates ProbeTlsUntil(
    int port, const std::function<bool(const PresentedCertificates&)>& done);

#endif  // ORVA_TESTS_HOST_TLS_PROBE_H_
