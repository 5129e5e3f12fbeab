#ifndef ORVA_HOST_LISTEN_ADDRESS_H_
#define ORVA_HOST_LISTEN_ADDRESS_H_

#include <string>

// Where a listener binds: a host name or address literal and a TCP port.
struct ListenAddress {
  std::string host;
  int port = 0;  // 0: any free port, chosen when the listener binds
};

// Parses "HOST:PORT" or "[IPV6]:PORT" (port 0 to 65535, decimal digits
// only; the host of letters, digits, ".", "-" and, in brackets, ":").
// Returns false, leaving *address untouched, for anything else.
bool ParseListenAddress(const std::string& text, ListenAddress* address);

// The URL of `path` (starting with "/") on `host` and `port` for `scheme`
// ("http" or "https"); an IPv6 literal is written in brackets.
std::string ListenUrl(const std::string& scheme, const std::string& host,
                      int port, const std::string& path);

// A TCP port on `host` that nothing is bound to at the moment of the call
// (the system's choice for port 0), or -1 when `host` does not resolve or
// no socket binds there. Another program may take it before the caller
// binds it: a caller that cannot bind it itself passes it on at once.
int FreeTcpPort(const std::string& host);

#endif  // ORVA_HOST_LISTEN_ADDRESS_H_
