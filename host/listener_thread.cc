#include "host/listener_thread.h"

#include <chrono>

ListenerThread::ListenerThread(httplib::Server* server)
    : server_(server), thread_([this] {
        server_->listen_after_bind();
        loop_ended_ = true;
      }) {
  // stop() only reaches a loop that already runs, so the destructor must not
  // come before the loop has started.
  while (!server_->is_running() && !loop_ended_) {
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
}

ListenerThread::~ListenerThread() {
  server_->stop();
  thread_.join();
}
