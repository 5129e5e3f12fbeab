#include "toolkit/generation_area.h"

#include <sys/stat.h>

#include <cerrno>

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
