#include "toolkit/store_file.h"

#include <fcntl.h>
#include <openssl/err.h>
#include <openssl/pem.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "common/file_util.h"
#include "common/log.h"
#include "common/pem_password.h"
#include "common/raii.h"
#include "platform/olib/olib_error.h"

namespace {

mode_t ModeOf(StoreContent content) {
  switch (content) {
    case StoreContent::kImportedCertificate:
    case StoreContent::kText:
      return 0644;
    case StoreContent::kPrivateKey:
    case StoreContent::kRequest:
    case StoreContent::kCertificate:
      break;
  }
  return 0400;
}

// True when the file at `path` holds a whole PEM object of `content`.
bool HoldsWhole(const std::string& path, StoreContent content) {
  if (content == StoreContent::kText) return true;
  FilePtr file(std::fopen(path.c_str(), "r"));
  if (!file) return false;
  bool whole = false;
  switch (content) {
    case StoreContent::kPrivateKey:
      whole = EvpPkeyPtr(PEM_read_PrivateKey(file.get(), nullptr,
                                             RefusePemPassword, nullptr)) != nullptr;
      break;
    case StoreContent::kRequest: {
      X509_REQ* request =
          PEM_read_X509_REQ(file.get(), nullptr, RefusePemPassword, nullptr);
      whole = request != nullptr;
      X509_REQ_free(request);
      break;
    }
    case StoreContent::kCertificate:
    case StoreContent::kImportedCertificate:
      whole = X509Ptr(PEM_read_X509(file.get(), nullptr, RefusePemPassword,
                                    nullptr)) != nullptr;
      break;
    case StoreContent::kText:
      break;
  }
  ERR_clear_error();  // A failed read is reported by the caller.
  return whole;
}

// Creates an empty temporary file beside `target`; "" with errno set when
// it cannot.
std::string CreateTemporary(const std::string& target) {
  std::string name = target + ".tmpXXXXXX";
  int fd = mkostemp(&name[0], O_CLOEXEC);
  if (fd < 0) return "";
  close(fd);  // The writer opens the file by its name.
  return name;
}

bool SyncFile(const std::string& path) {
  int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (fd < 0) return false;
  bool synced = fsync(fd) == 0;
  int error = errno;
  close(fd);
  errno = error;
  return synced;
}

}  // namespace

StoreFileSet::~StoreFileSet() {
  if (installed_) return;
  for (const Member& member : members_) {
    // Ignoring errors: a member renamed before a failure is gone already.
    if (!member.temporary.empty()) unlink(member.temporary.c_str());
  }
}

std::string StoreFileSet::Add(const std::string& target, StoreContent content) {
  std::string temporary;
  if (MakeDirectories(DirectoryOf(target))) temporary = CreateTemporary(target);
  if (temporary.empty()) {
    OLIB_SET_ERROR(errno);
    ORVA_LOG_LASTERR("Create temporary file for %s failed", target.c_str());
    failed_ = true;
  }
  members_.push_back({target, temporary, content});
  return temporary;
}

int StoreFileSet::Install() {
  if (failed_) return -1;
  for (const Member& member : members_) {
    if (!HoldsWhole(member.temporary, member.content)) {
      ORVA_LOG("The tool's output for %s is incomplete", member.target.c_str());
      return -1;
    }
    if (!SyncFile(member.temporary)) {
      OLIB_SET_ERROR(errno);
      ORVA_LOG_LASTERR("Flush %s failed", member.temporary.c_str());
      return -1;
    }
    if (chmod(member.temporary.c_str(), ModeOf(member.content)) != 0) {
      ORVA_LOG("chmod(%s) failed", member.target.c_str());
      return -1;
    }
  }
  // Keys go last: until then the old key stays beside the files it matches.
  for (bool keys : {false, true}) {
    for (Member& member : members_) {
      if ((member.content == StoreContent::kPrivateKey) != keys) continue;
      if (rename(member.temporary.c_str(), member.target.c_str()) != 0) {
        OLIB_SET_ERROR(errno);
        ORVA_LOG_LASTERR("Rename %s to %s failed", member.temporary.c_str(),
                         member.target.c_str());
        return -1;
      }
      member.temporary.clear();
      SyncDirectory(DirectoryOf(member.target));
    }
  }
  installed_ = true;
  return 0;
}

int WriteTextFile(const std::string& path, const std::string& text) {
  std::string temporary = CreateTemporary(path);
  if (temporary.empty()) {
    OLIB_SET_ERROR(errno);
    return -1;
  }
  int fd = open(temporary.c_str(), O_WRONLY | O_CLOEXEC);
  bool written = fd >= 0 && WriteAll(fd, text.data(), text.size()) &&
                 fchmod(fd, ModeOf(StoreContent::kText)) == 0 && fsync(fd) == 0;
  int error = errno;
  if (fd >= 0 && close(fd) != 0 && written) {
    written = false;
    error = errno;
  }
  if (written && rename(temporary.c_str(), path.c_str()) != 0) {
    written = false;
    error = errno;
  }
  if (!written) {
    unlink(temporary.c_str());  // Ignoring errors: `path` is unchanged.
    OLIB_SET_ERROR(error);
    return -2;
  }
  SyncDirectory(DirectoryOf(path));
  return 0;
}
