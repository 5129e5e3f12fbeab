#include "tests/support/method_calls.h"

#include "api/certificate.h"

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

ORVA::APIResponse CallCreateCsr() {
  Json::Value params = SubjectParams();
  params["key_length"] = "2048";
  return CallMethod(doCertificateCreateCSR_v1, params).response;
}

ORVA::APIResponse CallRenew() { return CallMethod(doCertificateRenew_v1).response; }

ORVA::APIResponse CallSign(const std::string& csrPath) {
  Json::Value params(Json::objectValue);
  params["days"] = "30";
  params["csr"] = "request.csr";
  params["csr_tmp"] = csrPath;
  params["alias"] = "client.local";
  return CallMethod(doCertificateSign_v1, params).response;
}

ORVA::APIResponse CallCreateCrt() {
  Json::Value params = SubjectParams();
  const Json::Value ca = SubjectParams("ca_");
  for (const std::string& name : ca.getMemberNames()) params[name] = ca[name];
  params["ca_common_name"] = "New Root";
  params["key_length"] = "2048";
  params["ca_key_length"] = "2048";
  params["alias"] = "new.local;10.0.0.1";
  return CallMethod(doCertificateCreateCRT_v1, params).response;
}

ORVA::APIResponse CallImport(const std::string& certPath, const std::string& keyPath,
                             const std::string& interPath) {
  Json::Value params(Json::objectValue);
  params["cert_tmp"] = certPath;
  params["key_tmp"] = keyPath;
  params["inter_cert_tmp"] = interPath;
  return CallMethod(doCertificateImport_v1, params).response;
}

MethodAnswer CallExport(const std::string& set) {
  Json::Value params(Json::objectValue);
  params["file"] = set;
  return CallMethod(doCertificateExport_v1, params);
}
