#include "tests/toolkit/toolkit_test_util.h"

#include "common/raii.h"

CSR_ARGUMENT FullSubject() {
  return {"TW", "Taipei", "Neihu", "Storage Works", "Lab", "nas.local", "admin@nas.local"};
}

std::string TemporaryFilesIn(const std::string& directory) {
  std::string names;
  DirPtr dir(opendir(directory.c_str()));
  while (struct dirent* entry = dir ? readdir(dir.get()) : nullptr) {
    std::string name = entry->d_name;
    if (name.find(".tmp") != std::string::npos) names += name + " ";
  }
  return names;
}
