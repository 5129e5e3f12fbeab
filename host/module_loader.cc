#include "host/module_loader.h"

#include <dlfcn.h>
#include <limits.h>
#include <unistd.h>

ModuleLoader::~ModuleLoader() {
  if (library_ != nullptr) dlclose(library_);
}

bool ModuleLoader::Load(const std::string& path, std::string* error) {
  library_ = dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL);
  if (library_ == nullptr) {
    *error = dlerror();
    return false;
  }
  auto get_table =
      reinterpret_cast<GetAPITableFunction>(dlsym(library_, "GetAPITable"));
  if (get_table == nullptr) {
    *error = path + " has no GetAPITable";
    return false;
  }
  auto get_size = reinterpret_cast<GetAPITableSizeFunction>(
      dlsym(library_, "GetAPITableSize"));
  int count = get_size != nullptr ? get_size() : kDefaultApiTableSize;
  if (count < 1) {
    *error = path + " has an empty table";
    return false;
  }
  table_ = {get_table(), count};
  return true;
}

std::string ModuleLoader::DefaultModulePath() {
  char executable[PATH_MAX];
  ssize_t length = readlink("/proc/self/exe", executable, sizeof(executable) - 1);
  std::string directory = ".";
  if (length > 0) {
    std::string path(executable, static_cast<size_t>(length));
    directory = path.substr(0, path.rfind('/'));
  }
  return directory + "/ORVA.Core.Certificate.so";
}
