#include "host/call_order.h"

bool CallOrder::NeedsTurn(const std::string& api, const std::string& method) {
  return !(api == "ORVA.Core.Certificate" && method == "list");
}

void CallOrder::Enter() {
  std::unique_lock<std::mutex> lock(mutex_);
  const uint64_t number = next_number_++;
  changed_.wait(lock, [&] { return number == next_to_start_ && !running_; });
  ++next_to_start_;
  running_ = true;
}

void CallOrder::Leave() {
  {
    std::lock_guard<std::mutex> lock(mutex_);
    running_ = false;
  }
  changed_.notify_all();
}

CallOrder::Turn::Turn(CallOrder* order) : order_(order) { order_->Enter(); }

CallOrder::Turn::Turn(CallOrder* order, const std::string& api,
                      const std::string& method)
    : order_(NeedsTurn(api, method) ? order : nullptr) {
  if (order_ != nullptr) order_->Enter();
}

CallOrder::Turn::~Turn() {
  if (order_ != nullptr) order_->Leave();
}
