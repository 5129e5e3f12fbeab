#include "platform/olib/orva_conf.h"

#include <fstream>

#include "platform/olib/orva_root.h"

OrvaConf::OrvaConf() {
  std::ifstream file(OrvaPath("/usr/orva/etc/orva.conf"));
  std::string line;
  while (std::getline(file, line)) {
    if (!line.empty() && line.back() == '\r') line.pop_back();
    if (line.empty() || line[0] == '#') continue;
    std::string::size_type equals = line.find('=');
    if (equals == std::string::npos || equals == 0) continue;
    std::string value = line.substr(equals + 1);
    if (value.size() >= 2 && value.front() == '"' && value.back() == '"') {
      value = value.substr(1, value.size() - 2);
    }
    settings_[line.substr(0, equals)] = value;
  }
}

OrvaConf::~OrvaConf() = default;

std::string OrvaConf::Info(const char* key, const char* fallback) const {
  auto found = key != nullptr ? settings_.find(key) : settings_.end();
  if (found != settings_.end()) return found->second;
  return fallback != nullptr ? fallback : "";
}
