#include "tests/host/tls_probe.h"

#include <openssl/ssl.h>
#include <openssl/x509.h>

#include <chrono>
#include <memory>
#include <thread>

#include "common/raii.h"

namespace {

struct SslCtxDeleter {
  void operator()(SSL_CTX* context) const { SSL_CTX_free(context); }
};
struct SslDeleter {
  void operator()(SSL* ssl) const { SSL_free(ssl); }
};

std::string CommonName(X509* certificate) {
  char name[256] = {};
  if (X509_NAME_get_text_by_NID(X509_get_subject_name(certificate), NID_commonName,
                                name, sizeof(name)) < 0) {
    return "";
  }
  return name;
}

}  // namespace

PresentedCertificates ProbeTls(int port) {
  PresentedCertificates presented;
  std::unique_ptr<SSL_CTX, SslCtxDeleter> context(SSL_CTX_new(TLS_client_method()));
  if (!context) return presented;
  SSL_CTX_set_verify(context.get(), SSL_VERIFY_NONE, nullptr);
  std::string address = "127.0.0.1:" + std::to_string(port);
  BIO* connection = BIO_new_connect(address.c_str());
  if (connection == nullptr) return presented;
  std::unique_ptr<SSL, SslDeleter> ssl(SSL_new(context.get()));
  if (!ssl) {
    BIO_free(connection);
    return presented;
  }
  SSL_set_bio(ssl.get(), connection, connection);  // ssl owns the BIO now.
  if (SSL_connect(ssl.get()) != 1) return presented;
  presented.connected = true;
  X509Ptr certificate(SSL_get1_peer_certificate(ssl.get()));
  if (certificate) presented.common_name = CommonName(certificate.get());
  STACK_OF(X509)* chain = SSL_get_peer_cert_chain(ssl.get());
  if (chain != nullptr && sk_X509_num(chain) > 0) {
    presented.chain_length = sk_X509_num(chain);
    presented.chain_top_name = CommonName(sk_X509_value(chain, sk_X509_num(chain) - 1));
  }
  SSL_shutdown(ssl.get());
  return presented;
}

PresentedCertificates ProbeTlsUntil(
    int port, const std::function<bool(const PresentedCertificates&)>& done) {
  auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(10);
  PresentedCertificates presented = ProbeTls(port);
  while (!done(presented) && std::chrono::steady_clock::now() < deadline) {
    std::this_thread::sleep_for(std::chrono::milliseconds(20));
    presented = ProbeTls(port);
  }
  return presented;
}
