#include "platform/webapi/api_request.h"

#include <utility>

namespace ORVA {

APIRequest::APIRequest(std::string api, std::string method, int version,
                       Json::Value params)
    : api_(std::move(api)),
      method_(std::move(method)),
      version_(version),
      params_(params.isObject() ? std::move(params)
                                : Json::Value(Json::objectValue)) {}

Json::Value APIRequest::GetParam(const std::string& name,
                                 const Json::Value& fallback) const {
  const Json::Value* value = params_.find(name.data(), name.data() + name.size());
  return value != nullptr ? *value : fallback;
}

bool APIRequest::HasParam(const std::string& name) const {
  return params_.find(name.data(), name.data() + name.size()) != nullptr;
}

void APIRequest::SetParam(const std::string& name, const Json::Value& value) {
  params_[name] = value;
}

}  // namespace ORVA
