#ifndef ORVA_HOST_CALL_ORDER_H_
#define ORVA_HOST_CALL_ORDER_H_

#include <condition_variable>
#include <cstdint>
#include <mutex>
#include <string>

// The order of method calls in the server: calls that change the store run
// one at a time, in the order they came. Calls that only read the store
// ("list") never wait for them: every store file is replaced whole, so a
// reader sees each file old or new, and a long key generation holds up
// nobody but the next change. A reader that needs a whole set at once (the
// HTTPS reload reads a key with its certificate) takes a turn like a
// change.
class CallOrder {
 public:
  CallOrder() = default;

  CallOrder(const CallOrder&) = delete;
  CallOrder& operator=(const CallOrder&) = delete;

  // False for the calls that only read single store files and take no turn.
  static bool NeedsTurn(const std::string& api, const std::string& method);

  // Waits for its turn and holds it for as long as it lives; for a call
  // that needs none, does nothing.
  class Turn {
   public:
    explicit Turn(CallOrder* order);
    Turn(CallOrder* order, const std::string& api, const std::string& method);
    ~Turn();

    Turn(const Turn&) = delete;
    Turn& operator=(const Turn&) = delete;

   private:
    CallOrder* order_;  // null when no turn is held
  };

 private:
  void Enter();
  void Leave();

  std::mutex mutex_;
  std::condition_variable changed_;
  // Calls take numbers as they come; the call numbered `next_to_start_`
  // starts once the one before it has ended.
  uint64_t next_number_ = 0;
  uint64_t next_to_start_ = 0;
  bool running_ = false;
};

#endif  // ORVA_HOST_CALL_ORDER_H_
