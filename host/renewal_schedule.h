#ifndef ORVA_HOST_RENEWAL_SCHEDULE_H_
#define ORVA_HOST_RENEWAL_SCHEDULE_H_

#include <chrono>
#include <condition_variable>
#include <mutex>
#include <thread>

#include "host/http_server.h"

// The method that renews what is due (the ACME certificate, a server
// certificate of the local CA near its end) and answers success when
// nothing failed: run once by "orva-webapi renew", regularly by serve.
inline constexpr char kRenewalApi[] = "ORVA.Core.Certificate.ACME";
inline constexpr char kRenewalMethod[] = "renew";

// serve's renewal check: the renewal method called on a thread of its own
// at once and then every kInterval, through the service like a request (in
// a writer's turn of the call order, the web server reloaded when the
// answer asks for it), each attempt and its answer logged. A failed check
// is simply made again at the next time.
class RenewalSchedule {
 public:
  // Short enough that a certificate of 90 days is renewed within half a
  // day of coming due, long enough that a failing authority is not pressed.
  static constexpr std::chrono::hours kInterval{12};

  // Starts the thread and returns at once: the first check never delays
  // the server's start. `service` must outlive this object.
  explicit RenewalSchedule(WebapiService* service);
  // Wakes the thread and waits for it to end: at once between checks, else
  // once the check under way has ended (its tools have time limits).
  ~RenewalSchedule();

  RenewalSchedule(const RenewalSchedule&) = delete;
  RenewalSchedule& operator=(const RenewalSchedule&) = delete;

 private:
  void Run();
  void Check();

  WebapiService* const service_;
  std::mutex mutex_;
  std::condition_variable stopping_changed_;
  bool stopping_ = false;
  std::thread thread_;  // last: started once the members above exist
};

#endif  // ORVA_HOST_RENEWAL_SCHEDULE_H_
