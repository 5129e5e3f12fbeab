#include "host/serve_command.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <memory>

#include "common/file_util.h"
#include "common/store_paths.h"
#include "host/access_token.h"
#include "host/device_root_init.h"
#include "host/front_server.h"
#include "host/http_server.h"
#include "host/listener_thread.h"
#include "host/module_loader.h"
#include "host/renewal_schedule.h"
#include "platform/olib/orva_root.h"

namespace {

int Fail(const std::string& message) {
  std::fprintf(stderr, "orva-webapi: %s\n", message.c_str());
  return 1;
}

// The page's folder, absolute: `wanted`, else "web" beside the executable
// when it is a folder, else the web folder of the checkout it was built
// from.
std::string WebFolder(const std::string& wanted) {
  std::string folder = wanted;
  struct stat info;
  if (folder.empty()) {
    folder = ExecutableDirectory() + "/web";
    if (stat(folder.c_str(), &info) != 0 || !S_ISDIR(info.st_mode)) folder = ORVA_SOURCE_WEB_DIR;
  }
  std::unique_ptr<char, decltype(&std::free)> resolved(realpath(folder.c_str(), nullptr),
                                                       &std::free);
  if (!resolved || stat(resolved.get(), &info) != 0 || !S_ISDIR(info.st_mode)) {
    std::fprintf(stderr, "orva-webapi: no web page: %s is not a folder\n", folder.c_str());
    return folder.front() == '/' ? folder : ExecutableDirectory() + "/" + folder;
  }
  return resolved.get();
}

// The port of `address`, a free one for port 0; -1 when none is free.
int ChosenPort(const ListenAddress& address) {
  return address.port != 0 ? address.port : FreeTcpPort(address.host);
}

std::string HttpsLine(const FrontServer& front) {
  const ListenAddress& address = front.settings().https;
  switch (front.https()) {
    case FrontServer::Https::kUp:
      return ListenUrl("https", address.host, address.port, "/");
    case FrontServer::Https::kOff:
      return "off (runHTTPS is not \"yes\")";
    case FrontServer::Https::kDown:
      break;
  }
  return "down (see the log)";
}

std::string EndOf(int status) {
  return WIFSIGNALED(status) ? "signal " + std::to_string(WTERMSIG(status))
                             : "status " + std::to_string(WEXITSTATUS(status));
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

  ModuleSet modules;
  if (!modules.Load(options.modules, &error)) return Fail(error);

  // Every thread started from here on inherits the blocked signals, so they
  // reach only the sigwait below. Programs the host starts get a clean
  // signal mask from the system library.
  sigset_t signals;
  sigemptyset(&signals);
  sigaddset(&signals, SIGINT);
  sigaddset(&signals, SIGTERM);
  sigaddset(&signals, SIGCHLD);
  pthread_sigmask(SIG_BLOCK, &signals, nullptr);
  signal(SIGPIPE, SIG_IGN);  // A client that hangs up is a failed write.
  openlog("orva-webapi", LOG_PERROR | LOG_PID, LOG_USER);

  FrontSettings settings;
  settings.http = options.http;
  settings.https = options.https;
  settings.http.port = ChosenPort(options.http);
  settings.https.port = ChosenPort(options.https);
  settings.web = WebFolder(options.web);
  settings.acme_webroot = OrvaPath(kAcmeWebroot);
  settings.max_body_bytes = WebapiService::kMaxBodyBytes;
  settings.workers_as_nobody = geteuid() == 0;
  if (settings.http.port <= 0 || settings.https.port <= 0) {
    return Fail("no free port on " + options.http.host + " or " + options.https.host);
  }

  CallOrder store_order;
  std::unique_ptr<FrontServer> front;
  WebapiService service(modules.tables(), token, [&front] { return front->Reload(); },
                        &store_order);
  httplib::Server backend;
  service.Install(&backend);
  socket_t backend_socket = -1;
  backend.set_socket_options([&backend_socket](socket_t fd) {
    const int yes = 1;
    setsockopt(fd, SOL_SOCKET, SO_REUSEADDR, &yes, sizeof(yes));
    fcntl(fd, F_SETFD, FD_CLOEXEC);  // nginx and the tools must not hold the port
    backend_socket = fd;
  });
  settings.backend_port = backend.bind_to_any_port("127.0.0.1");
  // nginx opens a connection per call. The library listens with a backlog of
  // 5: a burst of more waits a second for the client to send its SYN again.
  if (settings.backend_port <= 0 || listen(backend_socket, SOMAXCONN) != 0) {
    return Fail("cannot listen on 127.0.0.1");
  }
  front = std::make_unique<FrontServer>(settings, &store_order);
  ListenerThread backend_listener(&backend);
  if (!front->Start(&error)) return Fail(error);

  std::printf("orva-webapi: serving the device root %s\n", root.c_str());
  std::printf("nginx: %s (configuration, pid file, error log)\n", FrontServer::Folder().c_str());
  std::printf("web:   %s\n", settings.web.c_str());
  const ListenAddress& http = settings.http;
  std::printf("http:  %s\n", ListenUrl("http", http.host, http.port, "/").c_str());
  std::printf("https: %s\n", HttpsLine(*front).c_str());
  std::printf("token: %s (send it as \"Authorization: Bearer TOKEN\" to /webapi)\n",
              TokenPath(root).c_str());
  std::fflush(stdout);
  auto renewals = std::make_unique<RenewalSchedule>(&service);

  int exit_status = 0;
  for (int signal_number = 0; signal_number != SIGINT && signal_number != SIGTERM;) {
    sigwait(&signals, &signal_number);
    int status = 0;
    if (signal_number == SIGCHLD && front->Ended(&status)) {
      std::fprintf(stderr, "orva-webapi: nginx ended on its own (%s); stopping\n",
                   EndOf(status).c_str());
      exit_status = 1;
      break;
    }
  }
  renewals.reset();  // before nginx goes: a renewal may still reload it
  front->Stop();
  if (exit_status == 0) {
    std::printf("orva-webapi: stopped\n");
    std::fflush(stdout);
  }
  return exit_status;
}
