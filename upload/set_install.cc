#include "upload/set_install.h"

#include "common/api_errors.h"
#include "common/log.h"
#include "toolkit/generation_area.h"
#include "upload/imported_set.h"
#include "upload/sslca_form_handler.h"

int ProveAndInstallSet(const std::string& certificate, const std::string& key,
                       const std::string& chain) {
  if (!MakeGenerationArea()) {
    ORVA_LOG_LASTERR("Create the generation area failed");
    return kErrStoreWrite;
  }
  GenerationWorkFile certificate_file(".set-server.crt"), key_file(".set-server.key"),
      chain_file(".set-server-ca.crt");
  if (!certificate_file.Write(certificate) || !key_file.Write(key) ||
      (!chain.empty() && !chain_file.Write(chain))) {
    ORVA_LOG_LASTERR("Write the set's parts failed");
    return kErrStoreWrite;
  }
  const std::string chain_path = chain.empty() ? "" : chain_file.path();
  Json::Value unused_reply;
  SSLCAFormHandler handler;
  int code = handler.checkCAContent(certificate_file.path().c_str(), key_file.path().c_str(),
                                    chain_path.c_str(), unused_reply);
  if (code != kErrNone) return code;
  return InstallUploads(certificate_file.path(), key_file.path(),
                        chain.empty() ? nullptr : &chain_path);
}
