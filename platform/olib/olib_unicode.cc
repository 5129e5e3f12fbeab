#include "platform/olib/olib_unicode.h"

int OLIBCUnicodeIsUTF8(const char* text) {
  if (text == nullptr) return 0;
  const unsigned char* p = reinterpret_cast<const unsigned char*>(text);
  while (*p != 0) {
    unsigned char lead = *p;
    int continuation;
    unsigned int min_value;
    unsigned int value;
    if (lead < 0x80) {
      ++p;
      continue;
    } else if (lead >= 0xC2 && lead <= 0xDF) {
      continuation = 1;
      min_value = 0x80;
      value = lead & 0x1F;
    } else if (lead >= 0xE0 && lead <= 0xEF) {
      continuation = 2;
      min_value = 0x800;
      value = lead & 0x0F;
    } else if (lead >= 0xF0 && lead <= 0xF4) {
      continuation = 3;
      min_value = 0x10000;
      value = lead & 0x07;
    } else {
      return 0;
    }
    ++p;
    for (int i = 0; i < continuation; ++i, ++p) {
      if ((*p & 0xC0) != 0x80) return 0;  // Also stops at the terminator.
      value = (value << 6) | (*p & 0x3F);
    }
    if (value < min_value || value > 0x10FFFF ||
        (value >= 0xD800 && value <= 0xDFFF)) {
      return 0;
    }
  }
  return 1;
}
