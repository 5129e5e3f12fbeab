#include "tests/support/method_calls.h"

MethodAnswer CallMethod(MethodHandler handler, const Json::Value& params) {
  // The handlers read their parameters only; the API and method names are
  // the host's routing.
  ORVA::APIRequest request("ORVA.Core.Certificate", "call", 1, params);
  MethodAnswer answer;
  ORVA::DownloadCollector collector;
  handler(&request, &answer.response);
  answer.download = collector.result();
  return answer;
}

Json::Value SubjectParams(const std::string& prefix) {
  Json::Value params(Json::objectValue);
  const char* fields[][2] = {{"country", "TW"},       {"state", "Taipei"},
                             {"city", "Neihu"},       {"organization", "Storage Works"},
                             {"department", "Lab"},   {"common_name", "new.local"},
                             {"email", "admin@new.local"}};
  for (const auto& field : fields) params[prefix + field[0]] = field[1];
  return params;
}

Json::Value Params(const TempDeviceRoot& root, std::string changes) {
  for (size_t at; (at = changes.find("ROOT")) != std::string::npos;) {
    changes.replace(at, 4, root.root());
  }
  Json::Value params = SubjectParams(), ca = SubjectParams("ca_"), changed;
  Json::Reader().parse(changes, changed);
  ca["ca_common_name"] = "Local Root";
  for (const std::string& name : ca.getMemberNames()) params[name] = ca[name];
  for (const std::string& name : changed.getMemberNames()) {
    if (changed[name].isNull()) params.removeMember(name);
    if (!changed[name].isNull()) params[name] = changed[name];
  }
  return params;
}
