#include "host/listen_address.h"

#include <netdb.h>
#include <sys/socket.h>
#include <unistd.h>

#include <cctype>
#include <cstdlib>

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
  for (char c : host) {
    if (!std::isalnum(static_cast<unsigned char>(c)) && c != '.' && c != '-' && c != ':') {
      return false;
    }
  }
  if (host.empty() || port_text.empty() || port_text.size() > 5) return false;
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

int FreeTcpPort(const std::string& host) {
  addrinfo hints{};
  hints.ai_socktype = SOCK_STREAM;
  hints.ai_flags = AI_PASSIVE | AI_NUMERICSERV;
  addrinfo* found = nullptr;
  if (getaddrinfo(host.c_str(), "0", &hints, &found) != 0) return -1;
  int port = -1;
  int fd = socket(found->ai_family, SOCK_STREAM | SOCK_CLOEXEC, 0);
  sockaddr_storage bound{};
  socklen_t length = sizeof(bound);
  if (fd >= 0 && bind(fd, found->ai_addr, found->ai_addrlen) == 0 &&
      getsockname(fd, reinterpret_cast<sockaddr*>(&bound), &length) == 0) {
    char service[NI_MAXSERV];
    if (getnameinfo(reinterpret_cast<sockaddr*>(&bound), length, nullptr, 0, service,
                    sizeof(service), NI_NUMERICSERV) == 0) {
      port = std::atoi(service);
    }
  }
  if (fd >= 0) close(fd);
  freeaddrinfo(found);
  return port;
}
