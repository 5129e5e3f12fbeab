#include "toolkit/generation_area.h"

#include <sys/stat.h>

#include <cerrno>

#include "common/store_paths.h"
#include "platform/olib/orva_root.h"

bool MakeGenerationArea() {
  return mkdir(OrvaPath(kGenDir).c_str(), 0700) == 0 || errno == EEXIST;
}

std::string GenerationWorkPath(const char* name) {
  return OrvaPath(kGenDir) + "/" + name;
}
