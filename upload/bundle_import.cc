#include <string>

#include "common/api_errors.h"
#include "common/file_util.h"
#include "common/log.h"
#include "toolkit/activation.h"
#include "upload/bundle_reader.h"
#include "upload/certificate_bundle.h"
#include "upload/set_install.h"

void ImportBundle(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  const std::string path = request->GetParam("bundle_tmp", "").asString();
  const std::string password = request->GetParam("password", "").asString();
  std::string content;
  BundleParts parts;
  int code = kErrBundleNoPair;
  if (!ReadWholeFile(path, &content)) {
    ORVA_LOG("Read the bundle %s failed", path.c_str());
  } else {
    code = ReadBundle(content, password, &parts);
  }
  if (code == kErrNone) code = ProveAndInstallSet(parts.certificate, parts.key, parts.chain);
  answerInstallRequest(kActivateAfterImport, code, response, __FILE__, __LINE__);
}
