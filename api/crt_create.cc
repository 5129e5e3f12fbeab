#include <unistd.h>

#include <cstdio>
#include <string>

#include "api/certificate.h"
#include "api/request_values.h"
#include "api/subject_reader.h"
#include "common/api_errors.h"
#include "common/log.h"
#include "common/store_paths.h"
#include "platform/olib/olib_file.h"
#include "platform/olib/orva_root.h"
#include "platform/webapi/api_polling.h"
#include "toolkit/activation.h"
#include "toolkit/generation_area.h"
#include "toolkit/mkcert.h"
#include "toolkit/store_file.h"

namespace {

constexpr int kServerValidityDays = 3650;

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
  int key_length = ReadKeyLength(request, "key_length");
  int ca_key_length = ReadKeyLength(request, "ca_key_length");
  std::string aliases = request->GetParam("alias", "").asString();

  CSR_ARGUMENT ca_record;
  CSR_ARGUMENT server_record;
  if (fillCSRInfo(request, &ca_record, true) == -1 ||
      fillCSRInfo(request, &server_record, false) == -1) {
    ORVA_LOG("fill argument from json failed");
    return kErrFailed;
  }
  // Both subjects and the names are checked before the first file is
  // written: a refusal must not leave a new key beside the old certificate.
  if (checkCsrSubject(&ca_record) != 0) {
    ORVA_LOG("Generate CA key & crt failed");
    return kErrBadParameter;
  }
  if (checkCsrSubject(&server_record) != 0) {
    ORVA_LOG("Generate csr failed");
    return kErrFailed;
  }
  if (checkAliasText(aliases.c_str()) != 0) {
    ORVA_LOG("Generate crt failed");
    return kErrFailed;
  }

  int made = genCASet(&ca_record, ca_key_length);
  if (made != 0) {
    ORVA_LOG("Generate CA key & crt failed");
    return made == -2 ? kErrBadParameter : kErrFailed;
  }
  // The live pair is made under work names and installed only once proved:
  // a failure on the way leaves the running key and certificate together.
  StoreFileSet server_pair;
  const std::string server_key =
      server_pair.Add(OrvaPath(kServerKeyPath), StoreContent::kPrivateKey);
  const std::string server_crt =
      server_pair.Add(OrvaPath(kServerCrtPath), StoreContent::kCertificate);
  if (genKey(server_key.c_str(), static_cast<unsigned int>(key_length)) == -1) {
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
  if (genServerCrt(server_request.path(), server_crt.c_str(), kServerValidityDays,
                   aliases.c_str()) == -1) {
    ORVA_LOG("Generate crt failed");
    return kErrFailed;
  }
  if (verifyCrtAndKey(server_crt.c_str(), server_key.c_str(), CYPHER_RSA) != 0) {
    ORVA_LOG("Server crt and key is not matching.");
    return kErrFailed;
  }
  if (server_pair.Install() != 0) {
    ORVA_LOG("Install server crt and key failed");
    return kErrFailed;
  }
  const std::string intermediate = OrvaPath(kInterCrtPath);
  if (OLIBCFileExist(intermediate.c_str()) == 1 && unlink(intermediate.c_str()) == -1) {
    ORVA_LOG("Unlink internal certificate failed");
    return kErrFailed;
  }
  return kErrNone;
}

}  // namespace

void handleCRTAction(ORVA::APIRequest* request, ORVA::APIResponse* response) {
  ORVA::APIPolling polling;
  int code = CreateCertificateSet(request);
  answerInstallRequest(kActivateAfterCreation, code, response, __FILE__);
}
