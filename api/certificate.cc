#include "api/certificate.h"

#include "api/method_rules.h"
#include "upload/sslca_form_handler.h"

namespace {

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
            {{"type", kParameterText, false}, {"additional", kParameterJsonArray, false}},
            handleListAction);
}

void doCertificateExport_v1(ORVA::APIRequest* request,
                            ORVA::APIResponse* response) {
  SSLCAFormHandler handler;
  CheckThen(request, response, {{"file", kParameterText, true}},
            [&handler](ORVA::APIRequest* checked, ORVA::APIResponse* answer) {
              handler.DownloadAction(checked, answer);
            });
}

void doCertificateImport_v1(ORVA::APIRequest* request,
                            ORVA::APIResponse* response) {
  SSLCAFormHandler handler;
  CheckThen(request, response,
            {{"cert_tmp", kParameterText, true},
             {"key_tmp", kParameterText, true},
             {"inter_cert_tmp", kParameterText, false}},
            [&handler](ORVA::APIRequest* checked, ORVA::APIResponse* answer) {
              handler.ProcessJsonReq(checked, answer);
            });
}

void doCertificateCreateCSR_v1(ORVA::APIRequest* request,
                               ORVA::APIResponse* response) {
  CheckThen(request, response,
            {{"country", kParameterText, true},
             {"state", kParameterText, true},
             {"city", kParameterText, true},
             {"organization", kParameterText, true},
             {"department", kParameterText, true},
             {"common_name", kParameterText, true},
             {"email", kParameterText, true},
             {"key_type", kParameterText, false}},
            handleCSRAction);
}

void doCertificateRenew_v1(ORVA::APIRequest* request,
                           ORVA::APIResponse* response) {
  handleRenewAction(request, response);
}

void doCertificateSign_v1(ORVA::APIRequest* request,
                          ORVA::APIResponse* response) {
  CheckThen(request, response,
            {{"alias", kParameterText, false},
             {"days", kParameterWholeNumber, true},
             {"csr", kParameterText, true},
             {"csr_tmp", kParameterText, true}},
            handleSignCSRAction);
}

void doCertificateCreateCRT_v1(ORVA::APIRequest* request,
                               ORVA::APIResponse* response) {
  CheckThen(request, response,
            {{"ca_country", kParameterText, true},
             {"ca_state", kParameterText, true},
             {"ca_city", kParameterText, true},
             {"ca_organization", kParameterText, true},
             {"ca_department", kParameterText, true},
             {"ca_common_name", kParameterText, true},
             {"ca_email", kParameterText, true},
             {"country", kParameterText, true},
             {"state", kParameterText, true},
             {"city", kParameterText, true},
             {"organization", kParameterText, true},
             {"department", kParameterText, true},
             {"common_name", kParameterText, true},
             {"email", kParameterText, true},
             {"key_type", kParameterText, false},
             {"ca_key_type", kParameterText, false}},
            handleCRTAction);
}
