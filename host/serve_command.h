#ifndef ORVA_HOST_SERVE_COMMAND_H_
#define ORVA_HOST_SERVE_COMMAND_H_

#include <string>
#include <vector>

#include "host/listen_address.h"

struct ServeOptions {
  std::string root;                          // the device root (must exist)
  ListenAddress http{"127.0.0.1", 8080};     // nginx's; port 0: any free port
  ListenAddress https{"127.0.0.1", 8443};    // nginx's, when HTTPS is on
  std::string web;  // "": "web" beside the executable, else the checkout's
  // Web-API modules loaded after the certificate module; a method is served
  // by the first module that has it.
  std::vector<std::string> modules;
};

// `orva-webapi serve`: runs the web API on a listener of its own on
// 127.0.0.1 and nginx in front of it (FrontServer), which serves the page
// and passes /webapi on, over HTTP and, when the configuration and the
// store allow, HTTPS, until SIGINT or SIGTERM; renews the certificates that
// are due at start and then regularly (RenewalSchedule). Prints the URLs
// nginx listens on and the token file's path once nginx listens, and
// "orva-webapi: stopped" after a clean shutdown. Returns the exit status: 0
// after a clean shutdown; 1 when it could not start or nginx ended on its
// own (a message says why).
int RunServe(const ServeOptions& options);

#endif  // ORVA_HOST_SERVE_COMMAND_H_
