#ifndef ORVA_HOST_LISTEN_ADDRESS_H_
#define ORVA_HOST_LISTEN_ADDRESS_H_

#include <string>

// Where a listener binds: a host name or address literal and a TCP port.
struct ListenAddress {
  std::string host;
  int port = 0;  // 0: any free port, chosen when the listener binds
};

// Parses "HOST:PORT" or "[IPV6]:PORT" (port 0 to 65535, decimal digits
// only). Returns false, leaving *address untouched, for anything else.
bool ParseListenAddress(const std::string& text, ListenAddress* address);

// The URL of `path` (starting with "/") on `host` and `port` for `scheme`
// ("http" or "https"); an IPv6 literal is written in brackets.
std::string ListenUrl(const std::string& scheme, const std::string& host,
                      int port, const std::string& path);

#endif  // ORVA_HOST_LISTEN_ADDRESS_H_
