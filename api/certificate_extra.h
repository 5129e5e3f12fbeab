#ifndef ORVA_API_CERTIFICATE_EXTRA_H_
#define ORVA_API_CERTIFICATE_EXTRA_H_

#include "platform/webapi/api_request.h"
#include "platform/webapi/api_response.h"
#include "platform/webapi/api_table.h"

// The second module, ORVA.Core.Certificate.Extra.so: methods beside the
// certificate module's seven, with their own table. The host looks methods
// up by (api, version, method) in both modules' tables.

// Number of rows of this module's table.
inline constexpr int kExtraApiCount = 7;

// The table's rows, always at the same address, and their number.
extern "C" const ORVA::APIEntry* GetAPITable();
extern "C" int GetAPITableSize();

// ORVA.Core.Certificate.Bundle v1. Each handler checks the request against
// its rule set, answers 5503 with null data when the check fails, and
// otherwise runs ImportBundle or ExportBundle (upload/certificate_bundle.h).
void doBundleImport_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
void doBundleExport_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);

// ORVA.Core.Certificate.ACME v1. Each handler checks the request against
// its rule set, answers 5503 with null data when the check fails, and
// otherwise runs the method of api/acme_methods.h.
void doAcmeSet_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
void doAcmeGet_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
void doAcmeIssue_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
void doAcmeDelete_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);
void doAcmeRenew_v1(ORVA::APIRequest* request, ORVA::APIResponse* response);

#endif  // ORVA_API_CERTIFICATE_EXTRA_H_
