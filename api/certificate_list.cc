#include <string>

#include "api/certificate.h"
#include "api/certificate_info.h"
#include "common/api_errors.h"
#include "common/log.h"
#include "common/store_paths.h"
#include "platform/olib/olib_file.h"
#include "platform/olib/orva_root.h"

namespace {

enum class ReadResult { kRead, kMissing, kUnreadable };

// Appends the entries of one store file; logs the failure it reports.
ReadResult ReadStoreFile(const char* devicePath, Json::Value& entries,
                         ORVA::APIRequest* request) {
  std::string path = OrvaPath(devicePath);
  if (OLIBCFileExist(path.c_str()) != 1) {
    ORVA_LOG("File %s not existed.", devicePath);
    return ReadResult::kMissing;
  }
  if (getCertificateInfo(path, entries, request) != 0) {
    ORVA_LOG("Get certificate info failed.%s", devicePath);
    return ReadResult::kUnreadable;
  }
  return ReadResult::kRead;
}

}  // namespace

void handleListAction(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  Json::Value result(Json::objectValue);
  Json::Value entries(Json::arrayValue);
  std::string type = request->GetParam("type", "all").asString();
  const bool all = type == "all";

  struct Listed {
    const char* path;
    const char* type;
    bool optional_in_all;
  };
  const Listed kFiles[] = {
      {kServerCrtPath, "server_cert", false},
      {kCaCrtPath, "root_cert", false},
      {kInterCrtPath, "inter_cert", true},
  };
  for (const Listed& file : kFiles) {
    if (!all && type != file.type) continue;
    if (all && file.optional_in_all &&
        OLIBCFileExist(OrvaPath(file.path).c_str()) != 1) {
      continue;
    }
    switch (ReadStoreFile(file.path, entries, request)) {
      case ReadResult::kRead:
        break;
      case ReadResult::kMissing:
        response->SetError(kErrFileMissing, Json::Value());
        return;
      case ReadResult::kUnreadable:
        response->SetError(kErrFailed, Json::Value());
        return;
    }
  }
  result["certificates"] = entries;
  response->SetSuccess(result);
}
