#include "platform/webapi/api_response.h"

namespace ORVA {

void APIResponse::SetSuccess(const Json::Value& data) {
  outcome_ = Outcome::kSuccess;
  error_code_ = 0;
  data_ = data;
}

void APIResponse::SetError(int code, const Json::Value& data) {
  outcome_ = Outcome::kError;
  error_code_ = code;
  data_ = data;
}

Json::Value APIResponse::ToJson() const {
  if (outcome_ == Outcome::kSuccess) {
    Json::Value answer(Json::objectValue);
    answer["success"] = true;
    answer["data"] = data_;
    return answer;
  }
  Json::Value answer = HostErrorJson(error_code_);
  if (!data_.isNull()) answer["data"] = data_;
  return answer;
}

Json::Value HostErrorJson(int code) {
  Json::Value answer(Json::objectValue);
  answer["success"] = false;
  answer["error"]["code"] = code;
  return answer;
}

}  // namespace ORVA
