#include "host/listen_address.h"

bool ParseListenAddress(const std::string& text, ListenAddress* address) {
  std::string::size_type colon = text.rfind(':');
  if (colon == std::string::npos || colon == 0) return false;
  std::string host = text.substr(0, colon);
  std::string port_text = text.substr(colon + 1);
  if (host.front() == '[') {
    if (host.size() < 3 || host.back() != ']') return false;
    host = host.substr(1, host.size() - 2);
  } else if (host.find(':') != std::string::npos) {
    return false;  // An IPv6 literal must be bracketed.
  }
  if (port_text.empty() || port_text.size() > 5) return false;
  int port = 0;
  for (char c : port_text) {
    if (c < '0' || c > '9') return false;
    port = port * 10 + (c - '0');
  }
  if (port > 65535) return false;
  address->host = host;
  address->port = port;
  return true;
}

std::string ListenUrl(const std::string& scheme, const std::string& host,
                      int port, const std::string& path) {
  std::string shown = host.find(':') != std::string::npos ? "[" + host + "]" : host;
  return scheme + "://" + shown + ":" + std::to_string(port) + path;
}
