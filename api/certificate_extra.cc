#include "api/certificate_extra.h"

#include "api/acme_methods.h"
#include "api/method_rules.h"
#include "upload/certificate_bundle.h"

namespace {

const ORVA::APIEntry gExtraTable[kExtraApiCount] = {
    {"ORVA.Core.Certificate.Bundle", 1, "import", doBundleImport_v1},
    {"ORVA.Core.Certificate.Bundle", 1, "export", doBundleExport_v1},
    {"ORVA.Core.Certificate.ACME", 1, "set", doAcmeSet_v1},
    {"ORVA.Core.Certificate.ACME", 1, "get", doAcmeGet_v1},
    {"ORVA.Core.Certificate.ACME", 1, "issue", doAcmeIssue_v1},
    {"ORVA.Core.Certificate.ACME", 1, "delete", doAcmeDelete_v1},
    {"ORVA.Core.Certificate.ACME", 1, "renew", doAcmeRenew_v1},
};

}  // namespace

extern "C" const ORVA::APIEntry* GetAPITable() { return gExtraTable; }
extern "C" int GetAPITableSize() { return kExtraApiCount; }

void doBundleImport_v1(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  CheckThen(request, response,
            {{"bundle_tmp", kParameterText, true}, {"password", kParameterText, false}},
            ImportBundle);
}

void doBundleExport_v1(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  CheckThen(request, response,
            {{"format", kParameterText, true},
             {"password", kParameterText, false},
             {"legacy", kParameterText, false},
             {"include_key", kParameterText, false}},
            ExportBundle);
}

void doAcmeSet_v1(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  CheckThen(request, response,
            {{"domains", kParameterJsonArray, true},
             {"email", kParameterText, true},
             {"agree_tos", kParameterText, true},
             {"directory", kParameterText, false},
             {"challenge", kParameterText, false},
             {"dns_provider", kParameterText, false},
             {"dns_credentials", kParameterText, false},
             {"dns_resolvers", kParameterJsonArray, false},
             {"dns_propagation_check", kParameterText, false},
             {"key_type", kParameterText, false},
             {"renew_days", kParameterWholeNumber, false},
             {"eab_kid", kParameterText, false},
             {"eab_hmac", kParameterText, false}},
            SetAcme);
}

void doAcmeGet_v1(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  CheckThen(request, response, {}, GetAcme);
}

void doAcmeIssue_v1(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  CheckThen(request, response, {}, IssueAcme);
}

void doAcmeDelete_v1(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  CheckThen(request, response, {}, DeleteAcme);
}

void doAcmeRenew_v1(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  CheckThen(request, response, {}, RenewDue);
}
