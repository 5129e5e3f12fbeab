#include <cstdio>
#include <cstring>
#include <string>

#include "common/api_errors.h"
#include "common/log.h"
#include "common/raii.h"
#include "platform/olib/olib_unicode.h"
#include "upload/sslca_form_handler.h"

namespace {

int MissingHeaderCode(__CA kind) {
  switch (kind) {
    case CA_KEY:
      return kErrKeyHeader;
    case CA_CRT:
      return kErrCrtHeader;
    case CA_INTERCRT:
      return kErrInterCrtHeader;
    case CA_CSR:
      return kErrCsrHeader;
  }
  return kErrFailed;
}

// Reads up to and including the first newline, or to the end of the file.
// False when not one byte could be read.
bool ReadFirstLine(FILE* stream, std::string* line) {
  int c;
  while ((c = std::fgetc(stream)) != EOF) {
    line->push_back(static_cast<char>(c));
    if (c == '\n') break;
  }
  return !line->empty();
}

}  // namespace

int SSLCAFormHandler::checkHeaderType(const char* file, const char* header,
                                      __tag_CYPHER* cypher,
                                      Json::Value& /*data*/, __CA kind) {
  FilePtr stream(file != nullptr ? std::fopen(file, "r") : nullptr);
  if (!stream) {
    ORVA_LOG("Open CA file failed");
    return kErrFailed;
  }
  std::string line;
  if (!ReadFirstLine(stream.get(), &line)) {
    ORVA_LOG("Read CA file failed");
    return MissingHeaderCode(kind);
  }
  // Like the C text it stands for, the line ends at its first zero byte.
  const char* text = line.c_str();
  if (OLIBCUnicodeIsUTF8(text) == 0) return kErrNotUtf8;
  if (std::strstr(text, header) == nullptr) return MissingHeaderCode(kind);
  if (std::strcmp(header, "PRIVATE KEY") == 0) {
    if (std::strstr(text, "DSA") != nullptr) {
      *cypher = CYPHER_DSA;
    } else if (std::strstr(text, "RSA") != nullptr) {
      *cypher = CYPHER_RSA;
    }
  }
  return kErrNone;
}

int SSLCAFormHandler::checkCSRHeader(const char* file) {
  if (file == nullptr) {
    ORVA_LOG("Bad parameter");
    return kErrBadParameter;
  }
  __tag_CYPHER unused_cypher = CYPHER_NONE;
  Json::Value unused_data;
  int result = checkHeaderType(file, "CERTIFICATE REQUEST", &unused_cypher,
                               unused_data, CA_CSR);
  if (result != kErrNone) {
    ORVA_LOG("Check CSR header failed.");
    return result;
  }
  return kErrNone;
}
