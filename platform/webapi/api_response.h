#ifndef ORVA_PLATFORM_WEBAPI_API_RESPONSE_H_
#define ORVA_PLATFORM_WEBAPI_API_RESPONSE_H_

#include <json/json.h>

namespace ORVA {

// The answer to one web-API request, written by a handler and read back by
// the host once the handler has returned.
class APIResponse {
 public:
  enum class Outcome { kNone, kSuccess, kError };

  APIResponse() = default;

  // Answers the request as a success carrying `data`.
  void SetSuccess(const Json::Value& data);
  // Answers the request as a failure with `code`; `data` is kept as given.
  void SetError(int code, const Json::Value& data);
  // Asks the host to restart its web server once the answer has gone out.
  void SetHttpdRestart(bool restart) { httpd_restart_ = restart; }
  // false: the handler sends its own output (a download); the host writes
  // no answer of its own.
  void SetEnableOutput(bool enable) { output_enabled_ = enable; }

  Outcome outcome() const { return outcome_; }
  int error_code() const { return error_code_; }
  const Json::Value& data() const { return data_; }
  bool httpd_restart() const { return httpd_restart_; }
  bool output_enabled() const { return output_enabled_; }

  // The answer as the host encodes it: {"success":true,"data":DATA} or
  // {"success":false,"error":{"code":CODE}}, with "data":DATA beside
  // "error" when a failure carries data. Only meaningful when the outcome
  // is not kNone.
  Json::Value ToJson() const;

 private:
  Outcome outcome_ = Outcome::kNone;
  int error_code_ = 0;
  Json::Value data_;
  bool httpd_restart_ = false;
  bool output_enabled_ = true;
};

// The answer of a host-level failure (400, 401, 404, 413, 500) in the same
// shape as a module's error answer.
Json::Value HostErrorJson(int code);

}  // namespace ORVA

#endif  // ORVA_PLATFORM_WEBAPI_API_RESPONSE_H_
