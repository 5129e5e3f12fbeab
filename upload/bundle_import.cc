#include <string>

#include "common/api_errors.h"
#include "common/file_util.h"
#include "common/log.h"
#include "toolkit/activation.h"
#include "toolkit/generation_area.h"
#include "upload/bundle_reader.h"
#include "upload/certificate_bundle.h"
#include "upload/imported_set.h"
#include "upload/sslca_form_handler.h"

namespace {

// Proves and installs the parts as the import does its three uploads; they
// wait in private work files, since the checks and the install read files.
int InstallParts(const BundleParts& parts) {
  if (!MakeGenerationArea()) {
    ORVA_LOG_LASTERR("Create the generation area failed");
    return kErrStoreWrite;
  }
  GenerationWorkFile certificate(".bundle-server.crt"), key(".bundle-server.key"),
      chain(".bundle-server-ca.crt");
  if (!certificate.Write(parts.certificate) || !key.Write(parts.key) ||
      (!parts.chain.empty() && !chain.Write(parts.chain))) {
    ORVA_LOG_LASTERR("Write the bundle's parts failed");
    return kErrStoreWrite;
  }
  const std::string chain_path = parts.chain.empty() ? "" : chain.path();
  Json::Value unused_reply;
  SSLCAFormHandler handler;
  int code = handler.checkCAContent(certificate.path().c_str(), key.path().c_str(),
                                    chain_path.c_str(), unused_reply);
  if (code != kErrNone) return code;
  return InstallUploads(certificate.path(), key.path(),
                        parts.chain.empty() ? nullptr : &chain_path);
}

}  // namespace

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
  if (code == kErrNone) code = InstallParts(parts);
  answerInstallRequest(kActivateAfterImport, code, response, __FILE__, __LINE__);
}
