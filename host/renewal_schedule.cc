#include "host/renewal_schedule.h"

#include "common/log.h"

RenewalSchedule::RenewalSchedule(WebapiService* service)
    : service_(service), thread_(&RenewalSchedule::Run, this) {}

RenewalSchedule::~RenewalSchedule() {
  {
    std::lock_guard<std::mutex> lock(mutex_);
    stopping_ = true;
  }
  stopping_changed_.notify_all();
  thread_.join();
}

void RenewalSchedule::Run() {
  std::unique_lock<std::mutex> lock(mutex_);
  while (!stopping_) {
    lock.unlock();
    Check();
    lock.lock();
    stopping_changed_.wait_for(lock, kInterval, [this] { return stopping_; });
  }
}

void RenewalSchedule::Check() {
  ORVA_LOG("Certificate renewal: checking what is due");
  WebapiCall renew;
  renew.api = kRenewalApi;
  renew.method = kRenewalMethod;
  const char* certificate = nullptr;
  const CallOutcome outcome = service_->Call(renew, &certificate);
  if (outcome.http_status == 404) {
    ORVA_LOG("Certificate renewal: no loaded module has the method %s %s", kRenewalApi,
             kRenewalMethod);
    return;
  }
  ORVA_LOG("Certificate renewal %s: %s%s%s",
           outcome.success ? "done" : "failed, tried again at the next check",
           ToOneLineJson(outcome.answer).c_str(),
           certificate != nullptr ? "; HTTPS certificate: " : "",
           certificate != nullptr ? certificate : "");
}
