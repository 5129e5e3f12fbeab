#ifndef ORVA_HOST_MODULE_LOADER_H_
#define ORVA_HOST_MODULE_LOADER_H_

#include <string>

#include "platform/webapi/api_table.h"

// Loads a web-API module with dlopen and takes its table from GetAPITable.
class ModuleLoader {
 public:
  ModuleLoader() = default;
  ~ModuleLoader();

  ModuleLoader(const ModuleLoader&) = delete;
  ModuleLoader& operator=(const ModuleLoader&) = delete;

  // Loads the module at `path`. Returns false with a message in *error when
  // it cannot be loaded or lacks GetAPITable.
  bool Load(const std::string& path, std::string* error);

  // The module's table (rows owned by the module), or null before Load.
  const ORVA::APIEntry* table() const { return table_; }

  // The certificate module installed beside this executable.
  static std::string DefaultModulePath();

 private:
  void* library_ = nullptr;
  const ORVA::APIEntry* table_ = nullptr;
};

#endif  // ORVA_HOST_MODULE_LOADER_H_
