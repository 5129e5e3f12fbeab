#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>

#include "common/api_errors.h"
#include "common/log.h"
#include "common/store_paths.h"
#include "platform/olib/olib_file.h"
#include "platform/olib/orva_root.h"
#include "toolkit/activation.h"
#include "upload/sslca_form_handler.h"
#include "upload/staged_copy.h"

namespace {

constexpr mode_t kCertificateMode = 0644;
constexpr mode_t kKeyMode = 0400;

// True when `path` can be opened for reading and names a regular file. The
// open does not wait, whatever the path names.
bool IsReadableRegularFile(const std::string& path) {
  int fd = open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
  if (fd < 0) return false;
  struct stat info;
  bool regular = fstat(fd, &info) == 0 && S_ISREG(info.st_mode);
  close(fd);
  return regular;
}

// Copies the validated uploads into the store: the certificate, the key and,
// when `interPath` is not null, the intermediate certificate; without one the
// installed intermediate certificate is removed. Every source is checked and
// every copy made before the first store file is replaced, so a refused or
// failed copy leaves the store files as they were. Returns 5502 or 5515.
int InstallUploads(const std::string& certPath, const std::string& keyPath,
                   const std::string* interPath) {
  for (const std::string* source : {&certPath, &keyPath, interPath}) {
    if (source != nullptr && !IsReadableRegularFile(*source)) {
      ORVA_LOG("Uploaded file %s is not a readable regular file",
               source->c_str());
      return kErrStoreWrite;
    }
  }

  StagedCopy certificate, key, intermediate;
  int code = certificate.Stage(certPath, OrvaPath(kServerCrtPath),
                               kCertificateMode);
  if (code == kErrNone) {
    code = key.Stage(keyPath, OrvaPath(kServerKeyPath), kKeyMode);
  }
  if (code == kErrNone && interPath != nullptr) {
    code = intermediate.Stage(*interPath, OrvaPath(kInterCrtPath),
                              kCertificateMode);
  }
  if (code != kErrNone) return code;

  code = certificate.Commit();
  if (code == kErrNone) code = key.Commit();
  if (code != kErrNone) return code;
  if (interPath != nullptr) return intermediate.Commit();

  const std::string installed = OrvaPath(kInterCrtPath);
  if (OLIBCFileExist(installed.c_str()) != 0) {
    // Ignoring the result: a removal that fails never fails the import.
    OLIBCSysUnlink(installed.c_str());
  }
  return kErrNone;
}

}  // namespace

void SSLCAFormHandler::ProcessJsonReq(ORVA::APIRequest* request,
                                      ORVA::APIResponse* response) {
  const std::string keyPath = request->GetParam("key_tmp", "").asString();
  const std::string certPath = request->GetParam("cert_tmp", "").asString();
  const std::string interPath =
      request->GetParam("inter_cert_tmp", "").asString();

  Json::Value unused_reply;

  int code = checkCAContent(certPath.c_str(), keyPath.c_str(),
                            interPath.c_str(), unused_reply);
  if (code != kErrNone) {
    ORVA_LOG("ProcessJsonReq: checkCAContent failed");
  } else {
    // The parameter's presence alone decides whether an intermediate
    // certificate stays installed.
    code = InstallUploads(
        certPath, keyPath,
        request->HasParam("inter_cert_tmp") ? &interPath : nullptr);
  }
  answerInstallRequest(kActivateAfterImport, code, response, __FILE__);
}
