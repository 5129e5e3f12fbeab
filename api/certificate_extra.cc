#include "api/certificate_extra.h"

#include "api/method_rules.h"
#include "upload/certificate_bundle.h"

namespace {

const ORVA::APIEntry gExtraTable[kExtraApiCount] = {
    {"ORVA.Core.Certificate.Bundle", 1, "import", doBundleImport_v1},
    {"ORVA.Core.Certificate.Bundle", 1, "export", doBundleExport_v1},
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
