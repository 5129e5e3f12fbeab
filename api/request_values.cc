#include "api/request_values.h"

#include <climits>
#include <cstdlib>
#include <string>

int ReadKeyLength(ORVA::APIRequest* request, const char* name) {
  Json::Value value = request->GetParam(name, "2048");
  if (value.isInt()) return value.asInt();
  if (!value.isString()) return 0;
  std::string text = value.asString();
  long bits = std::strtol(text.c_str(), nullptr, 10);
  if (bits > INT_MAX || bits < INT_MIN) return 0;
  return static_cast<int>(bits);
}
