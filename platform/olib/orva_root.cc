#include "platform/olib/orva_root.h"

#include <cstdlib>

std::string OrvaPath(const std::string& devicePath) {
  const char* root = std::getenv("ORVA_ROOT");
  std::string result = (root != nullptr) ? root : "";
  while (!result.empty() && result.back() == '/') result.pop_back();
  result += devicePath;
  return result;
}
