// bench_keygen: RSA key generation inside one process with libcrypto, the
// lower bound of a design that starts the openssl tool for every key.
//
//   bench_keygen BITS < lines
//
// For every line read from standard input, makes one RSA key of BITS bits,
// writes it as a PEM private key to memory (the tool writes the same text to
// its file), and prints the milliseconds it took on a line of its own,
// flushed at once: a caller can interleave these keys with runs of the tool
// ("yes | head -20 | bench_keygen 2048" makes twenty). Exits 0 at the end of
// the input, 1 on a failure (logged to stderr), 2 on bad arguments.

#include <openssl/bio.h>
#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/rsa.h>

#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <memory>

#include "common/raii.h"

namespace {

struct EvpPkeyCtxDeleter {
  void operator()(EVP_PKEY_CTX* context) const { EVP_PKEY_CTX_free(context); }
};
using EvpPkeyCtxPtr = std::unique_ptr<EVP_PKEY_CTX, EvpPkeyCtxDeleter>;

// Makes one key of `bits` bits and its PEM text. True on success.
bool MakeKey(unsigned int bits) {
  EvpPkeyCtxPtr context(EVP_PKEY_CTX_new_id(EVP_PKEY_RSA, nullptr));
  if (!context || EVP_PKEY_keygen_init(context.get()) <= 0 ||
      EVP_PKEY_CTX_set_rsa_keygen_bits(context.get(), static_cast<int>(bits)) <= 0) {
    return false;
  }
  EVP_PKEY* made = nullptr;
  if (EVP_PKEY_keygen(context.get(), &made) <= 0) return false;
  EvpPkeyPtr key(made);
  BioPtr pem(BIO_new(BIO_s_mem()));
  return pem && PEM_write_bio_PrivateKey(pem.get(), key.get(), nullptr, nullptr,
                                         0, nullptr, nullptr) == 1;
}

// A key size from 512 to 16384 bits, or 0.
unsigned long ParseBits(const char* text) {
  char* end = nullptr;
  unsigned long value = std::strtoul(text, &end, 10);
  if (end == text || *end != '\0' || value < 512 || value > 16384) return 0;
  return value;
}

// Reads up to the end of the next input line. False at the end of input.
bool NextLine() {
  int c;
  while ((c = std::getchar()) != EOF) {
    if (c == '\n') return true;
  }
  return false;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 2) {
    std::fputs("usage: bench_keygen BITS < lines\n", stderr);
    return 2;
  }
  unsigned long bits = ParseBits(argv[1]);
  if (bits == 0) {
    std::fputs("bench_keygen: BITS is 512..16384\n", stderr);
    return 2;
  }
  while (NextLine()) {
    auto start = std::chrono::steady_clock::now();
    if (!MakeKey(static_cast<unsigned int>(bits))) {
      std::fputs("bench_keygen: key generation failed\n", stderr);
      ERR_print_errors_fp(stderr);
      return 1;
    }
    std::chrono::duration<double, std::milli> took =
        std::chrono::steady_clock::now() - start;
    std::printf("%.3f\n", took.count());
    std::fflush(stdout);
  }
  return 0;
}
