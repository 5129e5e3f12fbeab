#include "api/local_server_renewal.h"


#include <string>

#include "api/certificate_info.h"
#include "api/installed_server.h"
#include "api/subject_reader.h"
#include "common/api_errors.h"
#include "common/log.h"
#include "common/raii.h"
#include "common/store_paths.h"
#include "platform/olib/orva_root.h"
#include "toolkit/generation_area.h"
#include "toolkit/mkcert.h"
#include "toolkit/store_file.h"
#include "toolkit/x509_names.h"

namespace {

// The subject and the ";"-joined DNS and IP names of the installed server
// certificate. False when it cannot be read.
bool ReadServerNames(CSR_ARGUMENT* subject, std::string* aliases) {
  X509Ptr certificate = ReadFirstCertificate(kServerCrtPath);
  if (!certificate) return false;
  Json::Value names(Json::objectValue);
  X509_NAME2Json(X509_get_subject_name(certificate.get()), names);
  FillFromSubjectJson(names, subject);
  GeneralNamesPtr alt_names(static_cast<GENERAL_NAMES*>(
      X509_get_ext_d2i(certificate.get(), NID_subject_alt_name, nullptr, nullptr)));
  for (const AltName& name : AltNamesOf(alt_names.get())) {
    if (name.kind != "DNS" && name.kind != "IP") continue;
    if (!aliases->empty()) *aliases += ";";
    *aliases += name.value;
  }
  return true;
}

}  // namespace

int ResignLocalServerCertificate() {
  CSR_ARGUMENT subject;
  std::string aliases;
  if (!ReadServerNames(&subject, &aliases)) {
    ORVA_LOG("Read %s failed", kServerCrtPath);
    return kErrFailed;
  }
  if (!MakeGenerationArea()) {
    ORVA_LOG_LASTERR("Create the generation area failed");
    return kErrFailed;
  }
  GenerationWorkFile request(".resign-server.csr");
  StoreFileSet set;
  const std::string certificate = set.Add(OrvaPath(kServerCrtPath), StoreContent::kCertificate);
  const std::string key = OrvaPath(kServerKeyPath);
  if (genCsr(OrvaPath(kServerCfgPath).c_str(), key.c_str(), request.path().c_str(), &subject) != 0 ||
      genServerCrt(request.path().c_str(), certificate.c_str(), kServerValidityDays,
                   aliases.c_str()) != 0 ||
      verifyCrtAndKeyOfAnyType(certificate.c_str(), key.c_str()) != 0 || set.Install() != 0) {
    ORVA_LOG("Renew the local server certificate failed");
    return kErrFailed;
  }
  return kErrNone;
}
