#ifndef ORVA_HOST_CALL_ORDER_H_
#define ORVA_HOST_CALL_ORDER_H_

#include <condition_variable>
#include <cstdint>
#include <mutex>
#include <string>

// The order of method calls in the server: calls that change the store run
// one at a time, while reading calls ("list") run side by side with each
// other but never beside a changing call. Calls start in the order they
// came: a waiting writer goes before readers that come after it, and a
// waiting reader before writers that come after it, so neither a stream of
// "list" calls nor a stream of certificate changes can hold the other off.
class CallOrder {
 public:
  CallOrder() = default;

  CallOrder(const CallOrder&) = delete;
  CallOrder& operator=(const CallOrder&) = delete;

  // True for the calls that only read the store and may share the lock.
  static bool IsSharedCall(const std::string& api, const std::string& method);

  // Waits for its turn and holds the lock, shared or exclusive as `api` and
  // `method` ask (or as `shared` says), for as long as it lives.
  class Turn {
   public:
    Turn(CallOrder* order, const std::string& api, const std::string& method);
    Turn(CallOrder* order, bool shared);
    ~Turn();

    Turn(const Turn&) = delete;
    Turn& operator=(const Turn&) = delete;

   private:
    CallOrder* order_;
    bool shared_;
  };

 private:
  void Enter(bool shared);
  void Leave(bool shared);

  std::mutex mutex_;
  std::condition_variable changed_;
  // Calls take numbers as they come; the call numbered `next_to_start_`
  // starts once the calls running allow it.
  uint64_t next_number_ = 0;
  uint64_t next_to_start_ = 0;
  int readers_running_ = 0;
  bool writer_running_ = false;
};

#endif  // ORVA_HOST_CALL_ORDER_H_
