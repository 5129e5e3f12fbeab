#include "toolkit/key_strength.h"

bool IsStrongKey(const EVP_PKEY* key) {
  if (key == nullptr) return false;
  switch (EVP_PKEY_get_base_id(key)) {
    case EVP_PKEY_RSA:
      return EVP_PKEY_get_bits(key) >= kMinRsaKeyBits;
    case EVP_PKEY_EC:
      return EVP_PKEY_get_bits(key) >= kMinEcKeyBits;
    case EVP_PKEY_DSA:
      return false;
    default:
      return true;
  }
}
