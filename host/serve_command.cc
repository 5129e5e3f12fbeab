#include "host/serve_command.h"

#include <signal.h>
#include <syslog.h>

#include <cstdio>
#include <memory>

#include "host/access_token.h"
#include "host/device_root_init.h"
#include "host/http_server.h"
#include "host/https_listener.h"
#include "host/listener_thread.h"
#include "host/module_loader.h"
#include "host/static_files.h"

namespace {

int Fail(const std::string& message) {
  std::fprintf(stderr, "orva-webapi: %s\n", message.c_str());
  return 1;
}

std::string HttpsLine(const HttpsListener& https, const ListenAddress& address) {
  switch (https.state()) {
    case HttpsListener::State::kUp:
      return ListenUrl("https", address.host, https.port(), "/");
    case HttpsListener::State::kOff:
      return "off (runHTTPS is not \"yes\")";
    case HttpsListener::State::kDown:
      break;
  }
  return "down (see the log)";
}

}  // namespace

int RunServe(const ServeOptions& options) {
  std::string root;
  if (!UseDeviceRoot(options.root, &root)) {
    return Fail("no device root at " + options.root + " (run init)");
  }
  AccessToken token;
  std::string error;
  if (!token.LoadFromFile(TokenPath(root), &error)) return Fail(error + " (run init)");

  std::vector<std::unique_ptr<ModuleLoader>> modules;
  std::vector<std::string> paths = ModuleLoader::DefaultModulePaths();
  paths.insert(paths.end(), options.modules.begin(), options.modules.end());
  std::vector<ORVA::APITable> tables;
  for (const std::string& path : paths) {
    modules.push_back(std::make_unique<ModuleLoader>());
    if (!modules.back()->Load(path, &error)) return Fail(error);
    tables.push_back(modules.back()->table());
  }

  StaticFiles web;
  std::string web_directory =
      options.web.empty() ? StaticFiles::DefaultDirectory() : options.web;
  if (!web.Open(web_directory)) {
    std::fprintf(stderr, "orva-webapi: no web page: %s is not a folder\n",
                 web_directory.c_str());
  }

  // Every thread started from here on inherits the blocked signals, so they
  // reach only the sigwait below. Programs the module starts get a clean
  // signal mask from the system library.
  sigset_t stop_signals;
  sigemptyset(&stop_signals);
  sigaddset(&stop_signals, SIGINT);
  sigaddset(&stop_signals, SIGTERM);
  pthread_sigmask(SIG_BLOCK, &stop_signals, nullptr);
  signal(SIGPIPE, SIG_IGN);  // A client that hangs up is a failed write.
  openlog("orva-webapi", LOG_PERROR | LOG_PID, LOG_USER);

  // The service and the HTTPS listener know each other: the listener sets
  // up its servers through the service, and the service asks it to reload.
  CallOrder store_order;
  std::unique_ptr<WebapiService> service;
  HttpsListener https(
      options.https, [&service](httplib::Server* server) { service->Install(server); },
      &store_order);
  service = std::make_unique<WebapiService>(
      std::move(tables), token, web, [&https] { https.RequestReload(); }, &store_order);

  httplib::Server http;
  service->Install(&http);
  int http_port = options.http.port;
  if (http_port == 0) {
    http_port = http.bind_to_any_port(options.http.host);
  } else if (!http.bind_to_port(options.http.host, http_port)) {
    http_port = -1;
  }
  if (http_port <= 0) {
    return Fail("cannot listen on " +
                ListenUrl("http", options.http.host, options.http.port, "/"));
  }
  auto http_listener = std::make_unique<ListenerThread>(&http);
  https.Start();

  std::printf("orva-webapi: serving the device root %s\n", root.c_str());
  std::printf("web:   %s\n", web.directory().empty() ? "none" : web.directory().c_str());
  std::printf("http:  %s\n", ListenUrl("http", options.http.host, http_port, "/").c_str());
  std::printf("https: %s\n", HttpsLine(https, options.https).c_str());
  std::printf("token: %s (send it as \"Authorization: Bearer TOKEN\" to /webapi)\n",
              TokenPath(root).c_str());
  std::fflush(stdout);

  int signal_number = 0;
  sigwait(&stop_signals, &signal_number);
  https.Stop();
  http_listener.reset();
  std::printf("orva-webapi: stopped\n");
  std::fflush(stdout);
  return 0;
}
