#include "api/certificate.h"

#include <initializer_list>
#include <utility>

#include "common/api_errors.h"
#include "platform/webapi/parameter_checker.h"
#include "upload/sslca_form_handler.h"

namespace {

enum RuleType { kTextRule = 4, kArrayRule = 8, kNumberRule = 14 };

struct Rule {
  const char* name;
  RuleType type;
  bool necessary;
};

Json::Value BuildRules(std::initializer_list<Rule> rules) {
  Json::Value set(Json::objectValue);
  for (const Rule& rule : rules) {
    set["field"][rule.name]["type"] = static_cast<int>(rule.type);
    set["field"][rule.name]["necessary"] = rule.necessary;
  }
  return set;
}

// Runs `action` when the request passes `rules`; answers 5503 otherwise.
template <typename Action>
void CheckThen(ORVA::APIRequest* request, ORVA::APIResponse* response,
               std::initializer_list<Rule> rules, Action&& action) {
  if (!ParameterChecker::check(request, BuildRules(rules))) {
    response->SetError(kErrBadParameter, Json::Value());
    return;
  }
  action(request, response);
}

const ORVA::APIEntry gTable[kCertificateApiCount] = {
    {"ORVA.Core.Certificate", 1, "list", doCertificateList_v1},
    {"ORVA.Core.Certificate", 1, "export", doCertificateExport_v1},
    {"ORVA.Core.Certificate", 1, "import", doCertificateImport_v1},
    {"ORVA.Core.Certificate.CSR", 1, "create", doCertificateCreateCSR_v1},
    {"ORVA.Core.Certificate.CSR", 1, "renew", doCertificateRenew_v1},
    {"ORVA.Core.Certificate.CSR", 1, "sign", doCertificateSign_v1},
    {"ORVA.Core.Certificate.CRT", 1, "create", doCertificateCreateCRT_v1},
};

}  // namespace

extern "C" const ORVA::APIEntry* GetAPITable() { return gTable; }

void doCertificateList_v1(ORVA::APIRequest* request,
                          ORVA::APIResponse* response) {
  CheckThen(request, response,
            {{"type", kTextRule, false}, {"additional", kArrayRule, false}},
            handleListAction);
}

void doCertificateExport_v1(ORVA::APIRequest* request,
                            ORVA::APIResponse* response) {
  SSLCAFormHandler handler;
  CheckThen(request, response, {{"file", kTextRule, true}},
            [&handler](ORVA::APIRequest* checked, ORVA::APIResponse* answer) {
              handler.DownloadAction(checked, answer);
            });
}

void doCertificateImport_v1(ORVA::APIRequest* request,
                            ORVA::APIResponse* response) {
  SSLCAFormHandler handler;
  CheckThen(request, response,
            {{"cert_tmp", kTextRule, true},
             {"key_tmp", kTextRule, true},
             {"inter_cert_tmp", kTextRule, false}},
            [&handler](ORVA::APIRequest* checked, ORVA::APIResponse* answer) {
              handler.ProcessJsonReq(checked, answer);
            });
}

void doCertificateCreateCSR_v1(ORVA::APIRequest* request,
                               ORVA::APIResponse* response) {
  CheckThen(request, response,
            {{"country", kTextRule, true},
             {"state", kTextRule, true},
             {"city", kTextRule, true},
             {"organization", kTextRule, true},
             {"department", kTextRule, true},
             {"common_name", kTextRule, true},
             {"email", kTextRule, true}},
            handleCSRAction);
}

void doCertificateRenew_v1(ORVA::APIRequest* request,
                           ORVA::APIResponse* response) {
  handleRenewAction(request, response);
}

void doCertificateSign_v1(ORVA::APIRequest* request,
                          ORVA::APIResponse* response) {
  CheckThen(request, response,
            {{"alias", kTextRule, false},
             {"days", kNumberRule, true},
             {"csr", kTextRule, true},
             {"csr_tmp", kTextRule, true}},
            handleSignCSRAction);
}

void doCertificateCreateCRT_v1(ORVA::APIRequest* request,
                               ORVA::APIResponse* response) {
  CheckThen(request, response,
            {{"ca_country", kTextRule, true},
             {"ca_state", kTextRule, true},
             {"ca_city", kTextRule, true},
             {"ca_organization", kTextRule, true},
             {"ca_department", kTextRule, true},
             {"ca_common_name", kTextRule, true},
             {"ca_email", kTextRule, true},
             {"country", kTextRule, true},
             {"state", kTextRule, true},
             {"city", kTextRule, true},
             {"organization", kTextRule, true},
             {"department", kTextRule, true},
             {"common_name", kTextRule, true},
             {"email", kTextRule, true}},
            handleCRTAction);
}
