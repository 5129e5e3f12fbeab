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
    case StoreContent::kPrivateText:
      return 0600;
    case StoreContent::kPrivateKey:
    case StoreContent::kRequest:
    case StoreContent::kCertificate:
      break;
  }
  return 0400;
}

// True when the file at `path` holds a whole PEM object of `content`.
bool HoldsWhole(const std::string& path, StoreContent content) {
  if (content == StoreContent::kText || content == StoreContent::kPrivateText) return true;
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
    case StoreContent::kPrivateText:
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
  for (const Member& member : members_) {
    // Ignoring errors: these names are gone once installed or put back.
    if (!member.temporary.empty()) unlink(member.temporary.c_str());
    if (!member.kept.empty()) unlink(member.kept.c_str());
  }
}

std::string StoreFileSet::Add(const std::string& target, StoreContent content) {
  const std::string temporary = CreateTemporary(target);
  if (temporary.empty()) {
    OLIB_SET_ERROR(errno);
    ORVA_LOG_LASTERR("Create temporary file for %s failed", target.c_str());
    failed_ = true;
  }
  members_.push_back({target, temporary, content, ""});
  return temporary;
}

void StoreFileSet::Remove(const std::string& target) {
  members_.push_back({target, "", StoreContent::kText, ""});
}

bool StoreFileSet::Prepare(const Member& member) {
  if (member.temporary.empty()) return true;
  if (!HoldsWhole(member.temporary, member.content)) {
    ORVA_LOG("The tool's output for %s is incomplete", member.target.c_str());
    return false;
  }
  if (!SyncFile(member.temporary)) {
    OLIB_SET_ERROR(errno);
    ORVA_LOG_LASTERR("Flush %s failed", member.temporary.c_str());
    return false;
  }
  if (chmod(member.temporary.c_str(), ModeOf(member.content)) != 0) {
    ORVA_LOG("chmod(%s) failed", member.target.c_str());
    return false;
  }
  return true;
}

// Keeps the old file under a second name, so it can be put back. A folder
// in the way is not kept: its rename fails and the set is put back.
bool StoreFileSet::Keep(Member* member) {
  struct stat info;
  if (lstat(member->target.c_str(), &info) != 0 || S_ISDIR(info.st_mode)) {
    return true;
  }
  std::string kept = CreateTemporary(member->target);
  if (kept.empty() || unlink(kept.c_str()) != 0 ||
      link(member->target.c_str(), kept.c_str()) != 0) {
    OLIB_SET_ERROR(errno);
    ORVA_LOG_LASTERR("Keep %s failed", member->target.c_str());
    return false;
  }
  member->kept = kept;
  return true;
}

bool StoreFileSet::Replace(Member* member) {
  if (member->temporary.empty()) {
    if (unlink(member->target.c_str()) != 0 && errno != ENOENT) {
      OLIB_SET_ERROR(errno);
      ORVA_LOG_LASTERR("Remove %s failed", member->target.c_str());
      return false;
    }
    return true;
  }
  if (rename(member->temporary.c_str(), member->target.c_str()) != 0) {
    OLIB_SET_ERROR(errno);
    ORVA_LOG_LASTERR("Rename %s to %s failed", member->temporary.c_str(),
                     member->target.c_str());
    return false;
  }
  member->temporary.clear();
  return true;
}

void StoreFileSet::PutBack(Member* member) {
  // Ignoring errors: each step puts back what it can.
  if (member->kept.empty()) {
    unlink(member->target.c_str());
  } else {
    rename(member->kept.c_str(), member->target.c_str());
    member->kept.clear();
  }
}

int StoreFileSet::Install() {
  if (failed_) return -1;
  for (const Member& member : members_) {
    if (!Prepare(member)) return -1;
  }
  // Keys go last: until then the old key stays beside the files it matches.
  std::vector<Member*> order;
  for (bool keys : {false, true}) {
    for (Member& member : members_) {
      if ((member.content == StoreContent::kPrivateKey) == keys) order.push_back(&member);
    }
  }
  for (Member* member : order) {
    if (!Keep(member)) return -1;
  }
  for (size_t done = 0; done < order.size(); ++done) {
    if (Replace(order[done])) continue;
    while (done > 0) PutBack(order[--done]);
    return -1;
  }
  for (Member* member : order) {
    SyncDirectory(DirectoryOf(member->target));
    if (!member->kept.empty()) unlink(member->kept.c_str());
    member->kept.clear();
  }
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
