#include "host/call_order.h"

bool CallOrder::IsSharedCall(const std::string& api, const std::string& method) {
  return api == "ORVA.Core.Certificate" && method == "list";
}

void CallOrder::Enter(bool shared) {
  std::unique_lock<std::mutex> lock(mutex_);
  const uint64_t number = next_number_++;
  changed_.wait(lock, [&] {
    return number == next_to_start_ && !writer_running_ && (shared || readers_running_ == 0);
  });
  ++next_to_start_;
  if (shared) {
    ++readers_running_;
  } else {
    writer_running_ = true;
  }
  // The next call may be a reader that can run beside this one.
  changed_.notify_all();
}

void CallOrder::Leave(bool shared) {
  {
    std::lock_guard<std::mutex> lock(mutex_);
    if (shared) {
      --readers_running_;
    } else {
      writer_running_ = false;
    }
  }
  changed_.notify_all();
}

CallOrder::Turn::Turn(CallOrder* order, const std::string& api,
                      const std::string& method)
    : Turn(order, IsSharedCall(api, method)) {}

CallOrder::Turn::Turn(CallOrder* order, bool shared) : order_(order), shared_(shared) {
  order_->Enter(shared_);
}

CallOrder::Turn::~Turn() { order_->Leave(shared_); }
