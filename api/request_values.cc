#include "api/request_values.h"

#include <climits>
#include <cstdlib>
#include <string>

#include "common/log.h"

namespace {

int ReadKeyLength(ORVA::APIRequest* request, const char* name, const char* fallback) {
  Json::Value value = request->GetParam(name, fallback);
  if (value.isInt()) return value.asInt();
  if (!value.isString()) return 0;
  std::string text = value.asString();
  long bits = std::strtol(text.c_str(), nullptr, 10);
  if (bits > INT_MAX || bits < INT_MIN) return 0;
  return static_cast<int>(bits);
}

}  // namespace

bool ReadKeyKind(ORVA::APIRequest* request, const char* typeName, const char* lengthName,
                 KeyKind* kind) {
  const std::string type = request->GetParam(typeName, "rsa").asString();
  if (type == "rsa") {
    *kind = {KeyAlgorithm::kRsa, ReadKeyLength(request, lengthName, "2048")};
  } else if (type == "ec") {
    *kind = {KeyAlgorithm::kEc, ReadKeyLength(request, lengthName, "256")};
  } else {
    ORVA_LOG("Key type \"%s\" refused: keys are \"rsa\" or \"ec\"", type.c_str());
    return false;
  }
  return true;
}
