#include <fcntl.h>
#include <openssl/pem.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <string>
#include <vector>

#include "common/api_errors.h"
#include "common/file_util.h"
#include "common/log.h"
#include "common/raii.h"
#include "common/shell_command.h"
#include "common/store_paths.h"
#include "platform/olib/olib_file.h"
#include "platform/olib/orva_root.h"
#include "toolkit/activation.h"
#include "toolkit/store_file.h"
#include "upload/imported_set.h"
#include "upload/sslca_form_handler.h"

namespace {

// Command lines of the import fit in this many bytes, terminating zero
// included.
constexpr size_t kImportCommandSize = 8192;

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

// Rewrites the copy at `path` (still private to its owner) with its
// certificates alone, so a key block uploaded beside a certificate never
// reaches a file that everyone may read. False (logged) when it cannot.
bool KeepCertificatesOnly(const std::string& path) {
  std::vector<X509Ptr> certificates;
  BioPtr text(BIO_new(BIO_s_mem()));
  if (loadCrtList(path.c_str(), certificates) != 0 || certificates.empty() || !text) {
    ORVA_LOG("Read certificates of %s failed", path.c_str());
    return false;
  }
  for (const X509Ptr& certificate : certificates) {
    if (PEM_write_bio_X509(text.get(), certificate.get()) != 1) {
      ORVA_LOG("Write certificates of %s failed", path.c_str());
      return false;
    }
  }
  char* data = nullptr;
  long size = BIO_get_mem_data(text.get(), &data);
  if (!OverwriteFile(path, std::string(data, static_cast<size_t>(size)))) {
    ORVA_LOG("Write %s failed.(errno:%d/%m)", path.c_str(), errno);
    return false;
  }
  return true;
}

}  // namespace

int InstallUploads(const std::string& certPath, const std::string& keyPath,
                   const std::string* interPath) {
  for (const std::string* source : {&certPath, &keyPath, interPath}) {
    if (source != nullptr && !IsReadableRegularFile(*source)) {
      ORVA_LOG("Uploaded file %s is not a readable regular file",
               source->c_str());
      return kErrStoreWrite;
    }
  }

  struct Upload {
    const std::string* source;
    const char* target;
    StoreContent content;
  };
  const Upload uploads[] = {
      {&certPath, kServerCrtPath, StoreContent::kImportedCertificate},
      {&keyPath, kServerKeyPath, StoreContent::kPrivateKey},
      {interPath, kInterCrtPath, StoreContent::kImportedCertificate},
  };
  StoreFileSet set;
  for (const Upload& upload : uploads) {
    if (upload.source == nullptr) continue;
    if (!MakeDirectories(DirectoryOf(OrvaPath(upload.target)))) return kErrStoreWrite;
    const std::string copy = set.Add(OrvaPath(upload.target), upload.content);
    if (copy.empty()) return kErrStoreWrite;
    ShellCommand command(kImportCommandSize);
    command.Append("/bin/cp %s %s", {*upload.source, copy});
    if (RunShellCommand(command) != 0) {
      ORVA_LOG("CA copy command failed:%s", command.line());
      return kErrStoreWrite;
    }
    if (upload.content == StoreContent::kImportedCertificate &&
        !KeepCertificatesOnly(copy)) {
      return kErrStoreWrite;
    }
  }
  if (set.Install() != 0) return kErrStoreWrite;
  if (interPath != nullptr) return kErrNone;

  const std::string installed = OrvaPath(kInterCrtPath);
  if (OLIBCFileExist(installed.c_str()) != 0) {
    // Ignoring the result: a removal that fails never fails the import.
    OLIBCSysUnlink(installed.c_str());
  }
  return kErrNone;
}

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
  answerInstallRequest(kActivateAfterImport, code, response, __FILE__,
                       __LINE__);
}
