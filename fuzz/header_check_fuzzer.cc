// Fuzz target: the PEM header checks of uploaded files on arbitrary file
// contents. Beyond crashes it checks each answer against the rule it must
// follow, judged from the first line alone by an independent reading.

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <string>

#include <json/json.h>

#include "common/api_errors.h"
#include "fuzz/fuzz_scratch.h"
#include "upload/sslca_form_handler.h"

namespace {

// Well-formed UTF-8 by the table of well-formed byte sequences (RFC 3629,
// Unicode 3.9 table 3-7), read up to the first zero byte.
bool IsWellFormedUtf8(const std::string& text) {
  const unsigned char* p = reinterpret_cast<const unsigned char*>(text.c_str());
  while (*p != 0) {
    unsigned char b0 = p[0];
    if (b0 <= 0x7F) {
      p += 1;
      continue;
    }
    unsigned char low = 0x80, high = 0xBF;
    int length = 0;
    if (b0 >= 0xC2 && b0 <= 0xDF) {
      length = 2;
    } else if (b0 >= 0xE0 && b0 <= 0xEF) {
      length = 3;
      if (b0 == 0xE0) low = 0xA0;
      if (b0 == 0xED) high = 0x9F;
    } else if (b0 >= 0xF0 && b0 <= 0xF4) {
      length = 4;
      if (b0 == 0xF0) low = 0x90;
      if (b0 == 0xF4) high = 0x8F;
    } else {
      return false;
    }
    if (p[1] < low || p[1] > high) return false;
    for (int i = 2; i < length; ++i) {
      if (p[i] < 0x80 || p[i] > 0xBF) return false;
    }
    p += length;
  }
  return true;
}

struct Check {
  const char* header;
  __CA kind;
  int missing_code;
};

const Check kChecks[] = {
    {"CERTIFICATE", CA_CRT, kErrCrtHeader},
    {"PRIVATE KEY", CA_KEY, kErrKeyHeader},
    {"CERTIFICATE", CA_INTERCRT, kErrInterCrtHeader},
    {"CERTIFICATE REQUEST", CA_CSR, kErrCsrHeader},
};

// The result the check must give for a file whose first line (newline
// included, "" for an empty file) is `line`.
int ExpectedResult(const std::string& line, const Check& check) {
  if (line.empty()) return check.missing_code;
  if (!IsWellFormedUtf8(line)) return kErrNotUtf8;
  if (std::strstr(line.c_str(), check.header) == nullptr) return check.missing_code;
  return kErrNone;
}

__tag_CYPHER ExpectedCypher(const std::string& line, const Check& check,
                            int result) {
  if (result != kErrNone || std::strcmp(check.header, "PRIVATE KEY") != 0) {
    return CYPHER_NONE;
  }
  if (std::strstr(line.c_str(), "DSA") != nullptr) return CYPHER_DSA;
  if (std::strstr(line.c_str(), "RSA") != nullptr) return CYPHER_RSA;
  return CYPHER_NONE;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const FuzzScratch& scratch = FuzzScratch::Get();
  static const std::string path = scratch.Path("/upload.pem");
  scratch.WriteFile(path, data, size);

  const char* bytes = reinterpret_cast<const char*>(data);
  const void* newline = size > 0 ? std::memchr(bytes, '\n', size) : nullptr;
  size_t line_length =
      newline != nullptr ? static_cast<const char*>(newline) - bytes + 1 : size;
  const std::string line(bytes != nullptr ? bytes : "", line_length);

  SSLCAFormHandler handler;
  Json::Value untouched;
  for (const Check& check : kChecks) {
    __tag_CYPHER cypher = CYPHER_NONE;
    int result =
        handler.checkHeaderType(path.c_str(), check.header, &cypher, untouched, check.kind);
    if (result != ExpectedResult(line, check)) std::abort();
    if (cypher != ExpectedCypher(line, check, result)) std::abort();
  }
  if (!untouched.isNull()) std::abort();
  if (handler.checkCSRHeader(path.c_str()) != ExpectedResult(line, kChecks[3])) {
    std::abort();
  }
  return 0;
}
