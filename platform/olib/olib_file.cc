#include "platform/olib/olib_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cctype>
#include <cerrno>
#include <cstring>
#include <string>

#include "platform/olib/olib_error.h"

namespace {

constexpr unsigned char kBom[3] = {0xEF, 0xBB, 0xBF};

// Closes a descriptor when it goes out of scope.
class FdGuard {
 public:
  explicit FdGuard(int fd) : fd_(fd) {}
  ~FdGuard() {
    if (fd_ >= 0) close(fd_);
  }
  FdGuard(const FdGuard&) = delete;
  FdGuard& operator=(const FdGuard&) = delete;
  int get() const { return fd_; }
  // Closes now and reports the result, so write errors that surface on
  // close are not lost.
  int Close() {
    int result = close(fd_);
    fd_ = -1;
    return result;
  }

 private:
  int fd_;
};

bool WriteAll(int fd, const char* data, size_t size) {
  while (size > 0) {
    ssize_t written = write(fd, data, size);
    if (written < 0) {
      if (errno == EINTR) continue;
      return false;
    }
    data += written;
    size -= static_cast<size_t>(written);
  }
  return true;
}

bool ReadAll(int fd, std::string* content) {
  char buffer[8192];
  for (;;) {
    ssize_t got = read(fd, buffer, sizeof(buffer));
    if (got < 0) {
      if (errno == EINTR) continue;
      return false;
    }
    if (got == 0) return true;
    content->append(buffer, static_cast<size_t>(got));
  }
}

}  // namespace

int OLIBCFileExist(const char* path) {
  if (path == nullptr || *path == '\0') {
    OLIB_SET_ERROR(OLIB_ERR_BAD_ARGUMENT);
    return 0;
  }
  struct stat info;
  if (lstat(path, &info) != 0) {
    OLIB_SET_ERROR(errno);
    return 0;
  }
  return 1;
}

int OLIBCFileUTF8BomStrip(const char* path) {
  if (path == nullptr || *path == '\0') {
    OLIB_SET_ERROR(OLIB_ERR_BAD_ARGUMENT);
    return -1;
  }
  FdGuard source(open(path, O_RDONLY | O_CLOEXEC));
  struct stat info;
  std::string content;
  if (source.get() < 0 || fstat(source.get(), &info) != 0 ||
      !ReadAll(source.get(), &content)) {
    OLIB_SET_ERROR(errno);
    return -1;
  }
  if (!S_ISREG(info.st_mode)) {
    OLIB_SET_ERROR(OLIB_ERR_BAD_ARGUMENT);
    return -1;
  }
  if (content.compare(0, sizeof(kBom), reinterpret_cast<const char*>(kBom),
                      sizeof(kBom)) != 0) {
    return 0;
  }

  std::string temporary = std::string(path) + ".bomXXXXXX";
  FdGuard target(mkostemp(&temporary[0], O_CLOEXEC));
  if (target.get() < 0) {
    OLIB_SET_ERROR(errno);
    return -1;
  }
  bool written = fchmod(target.get(), info.st_mode & 07777) == 0 &&
                 WriteAll(target.get(), content.data() + sizeof(kBom),
                          content.size() - sizeof(kBom)) &&
                 fsync(target.get()) == 0;
  int saved_errno = errno;
  if (target.Close() != 0 && written) {
    written = false;
    saved_errno = errno;
  }
  if (!written || rename(temporary.c_str(), path) != 0) {
    if (written) saved_errno = errno;
    unlink(temporary.c_str());  // Ignoring errors: the original is intact.
    OLIB_SET_ERROR(saved_errno);
    return -1;
  }
  return 0;
}

int OLIBCSysUnlink(const char* path) {
  if (path == nullptr || *path == '\0') {
    OLIB_SET_ERROR(OLIB_ERR_BAD_ARGUMENT);
    return -1;
  }
  if (unlink(path) != 0) {
    OLIB_SET_ERROR(errno);
    return -1;
  }
  return 0;
}

bool OLIBIsSafeFileName(const char* name) {
  if (name == nullptr || *name == '\0' || std::strcmp(name, ".") == 0 ||
      std::strcmp(name, "..") == 0) {
    return false;
  }
  for (const char* p = name; *p != '\0'; ++p) {
    unsigned char c = static_cast<unsigned char>(*p);
    if (!std::isalnum(c) && c != '.' && c != '-' && c != '_') return false;
  }
  return true;
}
