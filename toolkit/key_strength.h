#ifndef ORVA_TOOLKIT_KEY_STRENGTH_H_
#define ORVA_TOOLKIT_KEY_STRENGTH_H_

#include <openssl/evp.h>

// The smallest keys that the device's own HTTPS (its TLS library refuses
// smaller ones in every handshake) and current clients accept.
inline constexpr int kMinRsaKeyBits = 2048;
inline constexpr int kMinEcKeyBits = 256;

// False for an RSA key below kMinRsaKeyBits, an EC key below kMinEcKeyBits
// and any DSA key; true for every other key. A null key is not strong.
bool IsStrongKey(const EVP_PKEY* key);

#endif  // ORVA_TOOLKIT_KEY_STRENGTH_H_
