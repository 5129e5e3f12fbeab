#include <cstdio>
#include <string>

#include "api/certificate.h"
#include "api/request_values.h"
#include "api/subject_reader.h"
#include "common/api_errors.h"
#include "common/log.h"
#include "common/store_paths.h"
#include "platform/olib/orva_root.h"
#include "platform/webapi/api_polling.h"
#include "toolkit/activation.h"
#include "toolkit/generation_area.h"
#include "toolkit/mkcert.h"
#include "toolkit/store_file.h"

namespace {

// The server request lives only while the certificate is signed, under a
// name of its own, so a pending request of CSR create is never touched.
class ServerRequestFile {
 public:
  ServerRequestFile() : path_(GenerationWorkPath(".crt-server.csr")) {}
  ~ServerRequestFile() { std::remove(path_.c_str()); }  // Ignoring errors: may not exist.
  const char* path() const { return path_.c_str(); }

 private:
  std::string path_;
};

// Makes and installs the new CA and server pair. Returns kErrNone or the
// code to answer with; every failure is logged.
int CreateCertificateSet(ORVA::APIRequest* request) {
  KeyKind server_key_kind, ca_key_kind;
  if (!ReadKeyKind(request, "key_type", "key_length", &server_key_kind) ||
      !ReadKeyKind(request, "ca_key_type", "ca_key_length", &ca_key_kind)) {
    return kErrBadParameter;
  }
  std::string aliases = request->GetParam("alias", "").asString();

  CSR_ARGUMENT ca_record;
  CSR_ARGUMENT server_record;
  if (fillCSRInfo(request, &ca_record, true) == -1 ||
      fillCSRInfo(request, &server_record, false) == -1) {
    ORVA_LOG("fill argument from json failed");
    return kErrFailed;
  }
  // Everything the steps would refuse is refused before the first file is
  // written, in the order the steps would meet it: the CA's key size, the
  // CA's subject, the server's key size, its subject and the names.
  if (checkKeyKind(ca_key_kind) != 0) {
    ORVA_LOG("Generate CA key & crt failed");
    return kErrFailed;
  }
  if (checkCsrSubject(&ca_record) != 0) {
    ORVA_LOG("Generate CA key & crt failed");
    return kErrBadParameter;
  }
  if (checkKeyKind(server_key_kind) != 0) {
    ORVA_LOG("Generate server key failed");
    return kErrFailed;
  }
  if (checkCsrSubject(&server_record) != 0) {
    ORVA_LOG("Generate csr failed");
    return kErrFailed;
  }
  if (checkServerNames(server_record.common_name.c_str(), aliases.c_str()) != 0) {
    ORVA_LOG("Generate crt failed");
    return kErrFailed;
  }

  // The CA, the server pair and the removal of the old intermediate file
  // are one set, installed once all of it is made and proved: a failure on
  // the way leaves the running CA, key and certificate together.
  StoreFileSet set;
  std::string ca_key, ca_crt;
  int made = genCASetInto(&set, &ca_record, ca_key_kind, &ca_key, &ca_crt);
  if (made != 0) {
    ORVA_LOG("Generate CA key & crt failed");
    return made == -2 ? kErrBadParameter : kErrFailed;
  }
  const std::string server_key =
      set.Add(OrvaPath(kServerKeyPath), StoreContent::kPrivateKey);
  const std::string server_crt =
      set.Add(OrvaPath(kServerCrtPath), StoreContent::kCertificate);
  if (genKeyOf(server_key.c_str(), server_key_kind) == -1) {
    ORVA_LOG("Generate server key failed");
    return kErrFailed;
  }
  ServerRequestFile server_request;
  if (!MakeGenerationArea() ||
      genCsr(OrvaPath(kServerCfgPath).c_str(), server_key.c_str(),
             server_request.path(), &server_record) != 0) {
    ORVA_LOG("Generate csr failed");
    return kErrFailed;
  }
  if (genServerCrtHelper(server_request.path(), ca_crt.c_str(), server_crt.c_str(),
                         ca_key.c_str(), kServerValidityDays, aliases.c_str()) == -1) {
    ORVA_LOG("Generate crt failed");
    return kErrFailed;
  }
  if (verifyCrtAndKeyOfAnyType(server_crt.c_str(), server_key.c_str()) != 0) {
    ORVA_LOG("Server crt and key is not matching.");
    return kErrFailed;
  }
  set.Remove(OrvaPath(kInterCrtPath));
  if (set.Install() != 0) {
    ORVA_LOG("Install server crt and key failed");
    return kErrFailed;
  }
  return kErrNone;
}

}  // namespace

void handleCRTAction(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  ORVA::APIPolling polling;
  int code = CreateCertificateSet(request);
  answerInstallRequest(kActivateAfterCreation, code, response, __FILE__,
                       __LINE__);
}
