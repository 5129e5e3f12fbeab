#ifndef ORVA_HOST_SERVE_COMMAND_H_
#define ORVA_HOST_SERVE_COMMAND_H_

#include <string>
#include <vector>

#include "host/listen_address.h"

struct ServeOptions {
  std::string root;                          // the device root (must exist)
  ListenAddress http{"127.0.0.1", 8080};
  ListenAddress https{"127.0.0.1", 8443};
  std::string web;                           // "": StaticFiles::DefaultDirectory()
  // Web-API modules loaded after the certificate module; a method is served
  // by the first module that has it.
  std::vector<std::string> modules;
};

// `orva-webapi serve`: serves the web API and the web page over HTTP and,
// when the configuration and the store allow, HTTPS, until SIGINT or
// SIGTERM. Prints the URLs and the token file's path once it listens, and
// "orva-webapi: stopped" after a clean shutdown. Returns the exit status: 0
// after a clean shutdown, 1 when it could not start (a message says why).
int RunServe(const ServeOptions& options);

#endif  // ORVA_HOST_SERVE_COMMAND_H_
