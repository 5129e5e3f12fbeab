#ifndef ORVA_PLATFORM_WEBAPI_API_REQUEST_H_
#define ORVA_PLATFORM_WEBAPI_API_REQUEST_H_

#include <json/json.h>

#include <string>

namespace ORVA {

// One web-API request: its API name, method, version and parameters. The
// parameters are held as a JSON object, one member per parameter; values
// arrive as texts and the parameter checker may convert them in place.
class APIRequest {
 public:
  // `params` must be a JSON object (or null, meaning no parameters).
  APIRequest(std::string api, std::string method, int version,
             Json::Value params);

  const std::string& api() const { return api_; }
  const std::string& method() const { return method_; }
  int version() const { return version_; }

  // A copy of the parameter's value, or a copy of `fallback` when the
  // request does not carry it.
  Json::Value GetParam(const std::string& name,
                       const Json::Value& fallback) const;

  // True when the request carries the parameter, whatever its value.
  bool HasParam(const std::string& name) const;

  // Replaces (or adds) a parameter's value.
  void SetParam(const std::string& name, const Json::Value& value);

  // All parameters as one JSON object.
  const Json::Value& params() const { return params_; }

 private:
  std::string api_;
  std::string method_;
  int version_;
  Json::Value params_;
};

}  // namespace ORVA

#endif  // ORVA_PLATFORM_WEBAPI_API_REQUEST_H_
