#include "api/subject_reader.h"

#include "common/log.h"

namespace {

constexpr char kPlaceholderDomain[] = "server.example.com";

struct SubjectField {
  std::string CSR_ARGUMENT::*member;
  const char* server_name;
  const char* ca_name;
  const char* server_default;
  const char* ca_default;
};

const SubjectField kSubjectFields[] = {
    {&CSR_ARGUMENT::country, "country", "ca_country", "TW", "TW"},
    {&CSR_ARGUMENT::state, "state", "ca_state", "Taipei", "Taipei"},
    {&CSR_ARGUMENT::city, "city", "ca_city", "Taipel", "Taipel"},
    {&CSR_ARGUMENT::organization, "organization", "ca_organization",
     "Organization", "Organization"},
    {&CSR_ARGUMENT::department, "department", "ca_department", "Department",
     "Department"},
    {&CSR_ARGUMENT::common_name, "common_name", "ca_common_name",
     kPlaceholderDomain, kPlaceholderDomain},
    {&CSR_ARGUMENT::email, "email", "ca_email", "admin@server.example.com",
     "ca@server.example.com"},
};

}  // namespace

int fillCSRInfo(ORVA::APIRequest* request, CSR_ARGUMENT* record, bool ca) {
  if (record == nullptr) {
    ORVA_LOG("sanity check failed");
    return -1;
  }
  for (const SubjectField& field : kSubjectFields) {
    const char* name = ca ? field.ca_name : field.server_name;
    const char* fallback = ca ? field.ca_default : field.server_default;
    record->*field.member = request->GetParam(name, fallback).asString();
  }
  return 0;
}

void FillFromSubjectJson(const Json::Value& subject, CSR_ARGUMENT* record) {
  if (!subject.isObject()) return;
  const struct {
    const char* key;
    std::string CSR_ARGUMENT::*member;
  } kFields[] = {
      {"common_name", &CSR_ARGUMENT::common_name},
      {"country", &CSR_ARGUMENT::country},
      {"email", &CSR_ARGUMENT::email},
      {"city", &CSR_ARGUMENT::city},
      {"organization", &CSR_ARGUMENT::organization},
      {"department", &CSR_ARGUMENT::department},
      {"state", &CSR_ARGUMENT::state},
  };
  for (const auto& field : kFields) {
    const Json::Value& value = subject[field.key];
    if (!value.isNull()) record->*field.member = value.asString();
  }
}
