#ifndef ORVA_HOST_FRONT_CONFIG_H_
#define ORVA_HOST_FRONT_CONFIG_H_

#include <cstddef>
#include <string>

#include "host/listen_address.h"

// What nginx, the server facing the network, is set up with.
struct FrontSettings {
  ListenAddress http;           // a real port, never 0
  ListenAddress https;          // a real port, never 0; used when `with_https`
  bool with_https = false;      // listen with TLS on `https` too
  int backend_port = 0;         // the host's own listener on 127.0.0.1
  std::string web;              // the page's folder (absolute)
  // The ACME webroot (absolute): its .well-known/acme-challenge/ is served.
  std::string acme_webroot;
  size_t max_body_bytes = 0;    // larger request bodies get 413
  bool workers_as_nobody = false;  // the master runs as root: drop rights
};

// The text of nginx's configuration file for `settings`. Only the page
// folder and the ACME webroot are named by absolute path, quoted and with
// "$" written as a variable, so no folder name can add a directive or a
// variable. Every other file is relative: the pid file, logs and temporary
// folders to nginx's prefix (-p), the TLS pair ("tls/server.pem", the
// certificate followed by its chain, and "tls/server.key") to the
// configuration file's own folder, so that a copy of the file in another
// folder is tested against the pair beside it.
std::string FrontConfig(const FrontSettings& settings);

#endif  // ORVA_HOST_FRONT_CONFIG_H_
