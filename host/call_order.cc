#include "host/call_order.h"

CallOrder::CallOrder() {
  pthread_rwlockattr_t attributes;
  pthread_rwlockattr_init(&attributes);
  // glibc's default lets new readers overtake a waiting writer.
  pthread_rwlockattr_setkind_np(&attributes,
                                PTHREAD_RWLOCK_PREFER_WRITER_NONRECURSIVE_NP);
  pthread_rwlock_init(&lock_, &attributes);
  pthread_rwlockattr_destroy(&attributes);
}

CallOrder::~CallOrder() { pthread_rwlock_destroy(&lock_); }

bool CallOrder::IsSharedCall(const std::string& api, const std::string& method) {
  return api == "ORVA.Core.Certificate" && method == "list";
}

CallOrder::Turn::Turn(CallOrder* order, const std::string& api,
                      const std::string& method)
    : order_(order) {
  if (IsSharedCall(api, method)) {
    pthread_rwlock_rdlock(&order_->lock_);
  } else {
    pthread_rwlock_wrlock(&order_->lock_);
  }
}

CallOrder::Turn::~Turn() { pthread_rwlock_unlock(&order_->lock_); }
