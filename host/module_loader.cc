#include "host/module_loader.h"

#include <dlfcn.h>

#include "common/file_util.h"

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

std::vector<std::string> ModuleLoader::DefaultModulePaths() {
  return {ExecutableDirectory() + "/ORVA.Core.Certificate.so",
          ExecutableDirectory() + "/ORVA.Core.Certificate.Extra.so"};
}

bool ModuleSet::Load(const std::vector<std::string>& named, std::string* error) {
  std::vector<std::string> paths = ModuleLoader::DefaultModulePaths();
  paths.insert(paths.end(), named.begin(), named.end());
  for (const std::string& path : paths) {
    modules_.push_back(std::make_unique<ModuleLoader>());
    if (!modules_.back()->Load(path, error)) return false;
    tables_.push_back(modules_.back()->table());
  }
  return true;
}
