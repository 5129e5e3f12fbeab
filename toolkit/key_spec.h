#ifndef ORVA_TOOLKIT_KEY_SPEC_H_
#define ORVA_TOOLKIT_KEY_SPEC_H_

// The kind of key the device makes: RSA of a number of bits, or EC on the
// NIST curve of that many bits (256: P-256, 384: P-384).
enum class KeyAlgorithm { kRsa, kEc };

struct KeySpec {
  KeyAlgorithm algorithm = KeyAlgorithm::kRsa;
  int bits = 2048;
};

// The curve name the openssl tool takes for an EC spec ("P-256", "P-384");
// null for any other size or an RSA spec.
const char* EcCurveName(const KeySpec& spec);

#endif  // ORVA_TOOLKIT_KEY_SPEC_H_
