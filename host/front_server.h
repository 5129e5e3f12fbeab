#ifndef ORVA_HOST_FRONT_SERVER_H_
#define ORVA_HOST_FRONT_SERVER_H_

#include <sys/types.h>

#include <atomic>
#include <mutex>
#include <string>

#include "host/call_order.h"
#include "host/front_config.h"

// nginx, the server that faces the network, run and supervised as a child
// of the host: it serves the page and the ACME challenge folder itself,
// holds the limits, terminates TLS with a copy of the store's pair and
// passes /webapi to the host's own listener. Its configuration, pid file,
// error log, temporary files and TLS copy live in the front folder,
// FrontServer::Folder().
class FrontServer {
 public:
  enum class Https { kOff, kDown, kUp };
  // Which certificate HTTPS presents after a reload.
  enum class Certificate {
    kNew,       // the store's pair as it is now
    kPrevious,  // the store's pair did not load (logged): the one before, if any
    kNone,      // HTTPS is off ("runHTTPS" is not "yes")
  };

  // `settings.with_https` is decided by the object. The store's pair is
  // copied in a turn of `store_order`, which must outlive the object, so a
  // copy never holds half a change.
  FrontServer(FrontSettings settings, CallOrder* store_order);
  // Stop().
  ~FrontServer();

  FrontServer(const FrontServer&) = delete;
  FrontServer& operator=(const FrontServer&) = delete;

  // Writes the configuration, with HTTPS when "runHTTPS" is "yes" and the
  // store's pair passes nginx's configuration test (otherwise without, and
  // logged), starts nginx and returns once it has bound its ports. False,
  // with the reason in *error, when nginx refuses the configuration or ends
  // before it listens. Call once.
  bool Start(std::string* error);

  // Reads the system configuration and the store again and, when nginx's
  // configuration test passes with them, reloads nginx gracefully: requests
  // under way finish, later handshakes present the new pair. Reloads run
  // one at a time.
  Certificate Reload();

  // True once nginx has ended, with its wait status in *status; never
  // blocks.
  bool Ended(int* status);

  // Asks nginx to finish the requests under way and end, and waits for it;
  // after 10 s ends it, and every process it started, at once. Calling it
  // again does nothing.
  void Stop();

  Https https() const { return https_; }
  const FrontSettings& settings() const { return settings_; }

  // The front folder: /usr/orva/var/webapi under the device root.
  static std::string Folder();

 private:
  // Writes the configuration into the check folder, with the store's pair
  // beside it when `withHttps`, and runs nginx's test on it. False with a
  // reason in *problem when the pair cannot be copied or the test fails.
  bool Stage(bool withHttps, std::string* problem);
  // Moves what Stage wrote to where nginx reads it.
  bool Promote(bool withHttps);

  FrontSettings settings_;
  CallOrder* const store_order_;
  std::mutex reload_mutex_;  // one Stage and Promote at a time
  std::atomic<Https> https_{Https::kOff};
  std::atomic<pid_t> pid_{-1};  // nginx's master while it runs
};

#endif  // ORVA_HOST_FRONT_SERVER_H_
