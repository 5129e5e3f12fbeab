#include "toolkit/acme_values.h"

#include <arpa/inet.h>

#include <cctype>
#include <cstdlib>
#include <memory>

namespace {

bool IsLabel(const std::string& label) {
  if (label.empty() || label.size() > 63 || label.front() == '-' || label.back() == '-') {
    return false;
  }
  for (unsigned char c : label) {
    if (!std::isalnum(c) && c != '-') return false;
  }
  return true;
}

bool IsPort(const std::string& text) {
  if (text.empty() || text.size() > 5) return false;
  for (unsigned char c : text) {
    if (!std::isdigit(c)) return false;
  }
  const long port = std::strtol(text.c_str(), nullptr, 10);
  return port >= 1 && port <= 65535;
}

}  // namespace

bool IsAcmeDomain(const std::string& name, bool wildcard) {
  if (wildcard && name.compare(0, 2, "*.") == 0) return IsAcmeDomain(name.substr(2), false);
  if (name.empty() || name.size() > 253) return false;
  size_t start = 0, labels = 0;
  for (;;) {
    const size_t dot = name.find('.', start);
    if (!IsLabel(name.substr(start, dot - start))) return false;
    ++labels;
    if (dot == std::string::npos) break;
    start = dot + 1;
  }
  return labels >= 2;
}

bool IsAcmeEmail(const std::string& address) {
  const size_t at = address.find('@');
  if (at == 0 || at == std::string::npos || address.size() > 254) return false;
  for (size_t i = 0; i < at; ++i) {
    const unsigned char c = address[i];
    if (!std::isalnum(c) && std::string("._%+-").find(c) == std::string::npos) return false;
  }
  return IsAcmeDomain(address.substr(at + 1), false);
}

bool IsHttpsUrl(const std::string& url) {
  static const char kScheme[] = "https://";
  if (url.compare(0, sizeof(kScheme) - 1, kScheme) != 0 || url.size() > 2048) return false;
  for (unsigned char c : url) {
    if (c <= ' ' || c >= 0x7F || c == '"' || c == '\'' || c == '\\' || c == '@') return false;
  }
  return !UrlHost(url).empty();
}

std::string UrlHost(const std::string& url) {
  const size_t start = url.find("://");
  if (start == std::string::npos) return "";
  const size_t end = url.find_first_of("/?#", start + 3);
  return url.substr(start + 3, end == std::string::npos ? std::string::npos : end - start - 3);
}

bool IsResolver(const std::string& resolver) {
  const size_t colon = resolver.rfind(':');
  if (colon == std::string::npos || !IsPort(resolver.substr(colon + 1))) return false;
  const std::string host = resolver.substr(0, colon);
  unsigned char address[16];
  if (host.size() > 2 && host.front() == '[' && host.back() == ']') {
    return inet_pton(AF_INET6, host.substr(1, host.size() - 2).c_str(), address) == 1;
  }
  return inet_pton(AF_INET, host.c_str(), address) == 1 || IsAcmeDomain(host, false);
}

bool IsVariableName(const std::string& name) {
  if (name.empty() || name.size() > 128 || !std::isupper(static_cast<unsigned char>(name[0]))) {
    return false;
  }
  for (unsigned char c : name) {
    if (!std::isupper(c) && !std::isdigit(c) && c != '_') return false;
  }
  return true;
}

bool IsPlainValue(const std::string& value) {
  if (value.empty() || value.size() > 4096) return false;
  for (unsigned char c : value) {
    if (c < 0x20 || c == 0x7F) return false;
  }
  return true;
}

bool ParseJsonObject(const std::string& text, Json::Value* object) {
  Json::CharReaderBuilder builder;
  builder["stackLimit"] = 16;
  std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  Json::Value parsed;
  std::string errors;
  try {
    if (!reader->parse(text.data(), text.data() + text.size(), &parsed, &errors) ||
        !parsed.isObject()) {
      return false;
    }
  } catch (const Json::Exception&) {
    return false;
  }
  *object = parsed;
  return true;
}
