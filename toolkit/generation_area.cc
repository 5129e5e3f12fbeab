#include "toolkit/generation_area.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "common/file_util.h"
#include "common/store_paths.h"
#include "platform/olib/orva_root.h"

bool MakeGenerationArea() {
  const std::string area = OrvaPath(kGenDir);
  if (mkdir(area.c_str(), 0700) == 0) return true;
  if (errno != EEXIST) return false;
  // It holds keys: an area left with a looser mode is made private again.
  struct stat info;
  if (lstat(area.c_str(), &info) != 0) return false;
  if (!S_ISDIR(info.st_mode)) {
    errno = ENOTDIR;
    return false;
  }
  return (info.st_mode & 07777) == 0700 || chmod(area.c_str(), 0700) == 0;
}

std::string GenerationWorkPath(const char* name) {
  return OrvaPath(kGenDir) + "/" + name;
}

GenerationWorkFile::~GenerationWorkFile() {
  unlink(path_.c_str());  // Ignoring errors: the file may never have been made.
}

bool GenerationWorkFile::Write(const std::string& content) {
  unlink(path_.c_str());  // Ignoring errors: a leftover goes, a missing file is fine.
  int fd = open(path_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0600);
  if (fd < 0) return false;
  bool written = WriteAll(fd, content.data(), content.size());
  int saved = errno;
  close(fd);
  errno = saved;
  return written;
}
