#ifndef ORVA_TOOLKIT_KEY_KIND_H_
#define ORVA_TOOLKIT_KEY_KIND_H_

// The kind of key the device makes: RSA of a number of bits, or EC on the
// NIST curve of that many bits (256: P-256, 384: P-384).
enum class KeyAlgorithm { kRsa, kEc };

struct KeyKind {
  KeyAlgorithm algorithm = KeyAlgorithm::kRsa;
  int bits = 2048;
};

// The curve name the openssl tool takes for an EC kind ("P-256", "P-384");
// null for any other size or an RSA kind.
const char* EcCurveName(const KeyKind& kind);

#endif  // ORVA_TOOLKIT_KEY_KIND_H_
