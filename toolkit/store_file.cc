#include "toolkit/store_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>

#include "common/log.h"
#include "common/raii.h"
#include "platform/olib/olib_error.h"

PendingStoreFile::PendingStoreFile(const std::string& target)
    : target_(target) {
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
  return 0;
}

int WriteTextFile(const std::string& path, const std::string& text) {
  FilePtr file(std::fopen(path.c_str(), "w"));
  if (!file) {
    OLIB_SET_ERROR(errno);
    return -1;
  }
  bool written =
      std::fwrite(text.data(), 1, text.size(), file.get()) == text.size();
  if (std::fclose(file.release()) != 0) written = false;
  if (!written) {
    OLIB_SET_ERROR(errno);
    return -2;
  }
  return 0;
}
