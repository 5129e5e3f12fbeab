#ifndef ORVA_API_CERTIFICATE_H_
#define ORVA_API_CERTIFICATE_H_

#include "platform/webapi/api_request.h"
#include "platform/webapi/api_response.h"
#include "platform/webapi/api_table.h"

// The module's API table: seven rows, always at the same address, with no
// end marker. The host looks methods up by (api, version, method).
extern "C" const ORVA::APIEntry* GetAPITable();

// Number of rows of the API table.
inline constexpr int kCertificateApiCount = 7;

// Handlers. Each checks the request against its rule set, answers 5503 with
// null data when the check fails, and otherwise runs its action function,
// which writes exactly one answer (or, for export, a download). The host
// owns both objects.
void doCertificateList_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
void doCertificateExport_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
void doCertificateImport_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
void doCertificateCreateCSR_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
// Checks nothing: renewal takes no parameters.
void doCertificateRenew_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
void doCertificateSign_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
void doCertificateCreateCRT_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);

// Action functions: each ends with exactly one SetSuccess or SetError.
void handleListAction(ORVA::APIRequest* request, ORVA::APIResponse* response);
void handleCSRAction(ORVA::APIRequest* request, ORVA::APIResponse* response);
void handleRenewAction(ORVA::APIRequest* request, ORVA::APIResponse* response);
void handleSignCSRAction(ORVA::APIRequest* request, ORVA::APIResponse* response);
void handleCRTAction(ORVA::APIRequest* request, ORVA::APIResponse* response);

#endif  // ORVA_API_CERTIFICATE_H_
