#ifndef ORVA_PLATFORM_WEBAPI_API_POLLING_H_
#define ORVA_PLATFORM_WEBAPI_API_POLLING_H_

namespace ORVA {

// Marks a long-running request for as long as the object lives, so the host
// can tell that work is under way (ActiveCount).
class APIPolling {
 public:
  APIPolling();
  ~APIPolling();

  APIPolling(const APIPolling&) = delete;
  APIPolling& operator=(const APIPolling&) = delete;

  // Number of APIPolling objects alive in the process.
  static int ActiveCount();
};

}  // namespace ORVA

#endif  // ORVA_PLATFORM_WEBAPI_API_POLLING_H_
