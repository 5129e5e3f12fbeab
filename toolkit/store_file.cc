#include "toolkit/store_file.h"

#include <fcntl.h>
#include <openssl/err.h>
#include <openssl/pem.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "common/log.h"
#include "common/pem_password.h"
#include "common/raii.h"
#include "platform/olib/olib_error.h"

namespace {

std::string DirectoryOf(const std::string& path) {
  std::string::size_type slash = path.rfind('/');
  if (slash == std::string::npos) return ".";
  return slash == 0 ? "/" : path.substr(0, slash);
}

// Flushes a directory, so a rename in it lasts through a power cut.
void SyncDirectory(const std::string& path) {
  int fd = open(DirectoryOf(path).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  if (fd < 0) return;  // Ignoring errors: the rename itself is done.
  fsync(fd);
  close(fd);
}

// True when the file at `path` holds a whole PEM object of `content`.
bool HoldsWhole(const std::string& path, StoreContent content) {
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
      whole = X509Ptr(PEM_read_X509(file.get(), nullptr, RefusePemPassword,
                                    nullptr)) != nullptr;
      break;
  }
  ERR_clear_error();  // A failed read is reported by the caller.
  return whole;
}

bool WriteAll(int fd, const std::string& text) {
  size_t done = 0;
  while (done < text.size()) {
    ssize_t written = write(fd, text.data() + done, text.size() - done);
    if (written < 0 && errno == EINTR) continue;
    if (written <= 0) return false;
    done += static_cast<size_t>(written);
  }
  return true;
}

bool SyncFile(const std::string& path) {
  int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (fd < 0) return false;
  bool synced = fsync(fd) == 0;
  close(fd);
  return synced;
}

}  // namespace

PendingStoreFile::PendingStoreFile(const std::string& target,
                                   StoreContent content)
    : target_(target), content_(content) {
  std::string name = target + ".tmpXXXXXX";
  int fd = mkostemp(&name[0], O_CLOEXEC);
  if (fd < 0) {
    OLIB_SET_ERROR(errno);
    ORVA_LOG_LASTERR("Create temporary file for %s failed", target.c_str());
    return;
  }
  close(fd);  // The tool opens the file by its name.
  temporary_ = name;
}

PendingStoreFile::~PendingStoreFile() {
  if (ok() && !installed_) {
    unlink(temporary_.c_str());  // Ignoring errors: the target is intact.
  }
}

int PendingStoreFile::Install() {
  if (!ok()) return -1;
  if (!HoldsWhole(temporary_, content_)) {
    ORVA_LOG("The tool's output for %s is incomplete", target_.c_str());
    return -1;
  }
  if (!SyncFile(temporary_)) {
    OLIB_SET_ERROR(errno);
    ORVA_LOG_LASTERR("Flush %s failed", temporary_.c_str());
    return -1;
  }
  if (chmod(temporary_.c_str(), 0400) != 0) {
    ORVA_LOG("chmod(%s) failed", target_.c_str());
    return -1;
  }
  if (rename(temporary_.c_str(), target_.c_str()) != 0) {
    OLIB_SET_ERROR(errno);
    ORVA_LOG_LASTERR("Rename %s to %s failed", temporary_.c_str(),
                     target_.c_str());
    return -1;
  }
  installed_ = true;
  SyncDirectory(target_);
  return 0;
}

int WriteTextFile(const std::string& path, const std::string& text) {
  std::string temporary = path + ".tmpXXXXXX";
  int fd = mkostemp(&temporary[0], O_CLOEXEC);
  if (fd < 0) {
    OLIB_SET_ERROR(errno);
    return -1;
  }
  bool written = WriteAll(fd, text) && fchmod(fd, 0644) == 0 && fsync(fd) == 0;
  int error = errno;
  if (close(fd) != 0 && written) {
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
  SyncDirectory(path);
  return 0;
}

StoreFileSet::~StoreFileSet() {
  for (size_t i = installed_; i < members_.size(); ++i) {
    unlink(members_[i].work.c_str());  // Ignoring errors: may not exist.
  }
}

std::string StoreFileSet::Add(const std::string& target) {
  std::string::size_type slash = target.rfind('/');
  std::string work = slash == std::string::npos
                         ? ".new-" + target
                         : target.substr(0, slash + 1) + ".new-" + target.substr(slash + 1);
  members_.push_back({target, work});
  return work;
}

int StoreFileSet::Install() {
  for (; installed_ < members_.size(); ++installed_) {
    const Member& member = members_[installed_];
    if (rename(member.work.c_str(), member.target.c_str()) != 0) {
      OLIB_SET_ERROR(errno);
      ORVA_LOG_LASTERR("Rename %s to %s failed", member.work.c_str(),
                       member.target.c_str());
      return -1;
    }
    SyncDirectory(member.target);
  }
  return 0;
}
