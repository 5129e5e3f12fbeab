#ifndef ORVA_HOST_HTTPS_LISTENER_H_
#define ORVA_HOST_HTTPS_LISTENER_H_

#include <httplib.h>
#include <openssl/ssl.h>

#include <atomic>
#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>
#include <thread>

#include "host/call_order.h"
#include "host/listen_address.h"
#include "host/listener_thread.h"
#include "host/server_credentials.h"

// The HTTPS listener. It is up while "runHTTPS" is "yes" in the system
// configuration and the store's server certificate and key load; it then
// presents them, with the intermediate certificates as the chain. A reload
// reads the configuration and the store again: every TLS handshake after it
// presents the files as they were at the reload, without closing the
// listening socket; a store that no longer loads takes the listener down
// (one log line says why) and a later reload brings it up again. The HTTP
// listener is never touched.
class HttpsListener {
 public:
  enum class State { kOff, kDown, kUp };

  // `install` sets up the routes of every server the listener makes; it is
  // called on the thread that brings the listener up. The store is read in
  // a turn of `store_order` (which must outlive the listener), so a reload
  // never sees a certificate change half done.
  HttpsListener(ListenAddress address,
                std::function<void(httplib::Server*)> install, CallOrder* store_order);
  // Stop().
  ~HttpsListener();

  HttpsListener(const HttpsListener&) = delete;
  HttpsListener& operator=(const HttpsListener&) = delete;

  // Brings the listener up (or leaves it off or down, as the configuration
  // and the store say) and starts the thread that serves RequestReload.
  // Call once.
  void Start();

  // Asks for a reload and returns at once. Requests made while a reload is
  // under way lead to one more reload after it.
  void RequestReload();

  // Takes the listener down, ends the reload thread and waits for both.
  // Calling it again does nothing.
  void Stop();

  // kOff: "runHTTPS" is not "yes"; kDown: the store or the address failed
  // (logged); kUp: serving.
  State state() const { return state_; }
  // The bound port while up, else 0.
  int port() const { return state_ == State::kUp ? bound_port_.load() : 0; }

 private:
  void ReloadLoop();
  // Reads the configuration and the store and brings the listener to the
  // state they ask for. Runs on one thread at a time.
  void Apply();
  bool BringUp();
  void TakeDown();
  bool SetUpContext(SSL_CTX* context);
  // OpenSSL's certificate callback: gives the handshake the current files.
  static int SelectCertificate(SSL* ssl, void* listener);

  const ListenAddress address_;
  const std::function<void(httplib::Server*)> install_;
  CallOrder* const store_order_;
  // The port bound first, kept so that port 0 binds the same port again.
  std::atomic<int> bound_port_{0};
  std::atomic<State> state_{State::kOff};

  std::mutex credentials_mutex_;
  std::shared_ptr<const ServerCredentials> credentials_;

  std::mutex apply_mutex_;  // one Apply at a time; guards the two below
  std::unique_ptr<httplib::SSLServer> server_;
  std::unique_ptr<ListenerThread> listener_;

  std::mutex request_mutex_;
  std::condition_variable request_signal_;
  bool reload_requested_ = false;
  bool stopping_ = false;
  std::thread reload_thread_;
};

#endif  // ORVA_HOST_HTTPS_LISTENER_H_
