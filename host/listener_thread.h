#ifndef ORVA_HOST_LISTENER_THREAD_H_
#define ORVA_HOST_LISTENER_THREAD_H_

#include <httplib.h>

#include <atomic>
#include <thread>

// Runs the accept loop of a bound server on a thread of its own.
class ListenerThread {
 public:
  // Starts the accept loop of `server`, which must be bound and must
  // outlive this object, and returns once the server is running.
  explicit ListenerThread(httplib::Server* server);
  // Stops the server and waits for its accept loop and for the requests
  // under way.
  ~ListenerThread();

  ListenerThread(const ListenerThread&) = delete;
  ListenerThread& operator=(const ListenerThread&) = delete;

 private:
  httplib::Server* server_;
  std::atomic<bool> loop_ended_{false};
  std::thread thread_;
};

#endif  // ORVA_HOST_LISTENER_THREAD_H_
