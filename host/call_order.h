#ifndef ORVA_HOST_CALL_ORDER_H_
#define ORVA_HOST_CALL_ORDER_H_

#include <pthread.h>

#include <string>

// The order of method calls in the server: calls that change the store run
// one at a time, while reading calls ("list") run side by side with each
// other but never beside a changing call. A waiting writer goes before
// readers that come after it, so a stream of "list" calls cannot hold a
// certificate change off for ever.
class CallOrder {
 public:
  CallOrder();
  ~CallOrder();

  CallOrder(const CallOrder&) = delete;
  CallOrder& operator=(const CallOrder&) = delete;

  // True for the calls that only read the store and may share the lock.
  static bool IsSharedCall(const std::string& api, const std::string& method);

  // Holds the lock, shared or exclusive as `api` and `method` ask, for as
  // long as it lives.
  class Turn {
   public:
    Turn(CallOrder* order, const std::string& api, const std::string& method);
    ~Turn();

    Turn(const Turn&) = delete;
    Turn& operator=(const Turn&) = delete;

   private:
    CallOrder* order_;
  };

 private:
  pthread_rwlock_t lock_;
};

#endif  // ORVA_HOST_CALL_ORDER_H_
