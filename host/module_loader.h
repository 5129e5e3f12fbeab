#ifndef ORVA_HOST_MODULE_LOADER_H_
#define ORVA_HOST_MODULE_LOADER_H_

#include <memory>
#include <string>
#include <vector>

#include "platform/webapi/api_table.h"

// Loads a web-API module with dlopen and takes its table from GetAPITable.
class ModuleLoader {
 public:
  ModuleLoader() = default;
  ~ModuleLoader();

  ModuleLoader(const ModuleLoader&) = delete;
  ModuleLoader& operator=(const ModuleLoader&) = delete;

  // Loads the module at `path`. Returns false with a message in *error when
  // it cannot be loaded, lacks GetAPITable or gives a size below one.
  bool Load(const std::string& path, std::string* error);

  // The module's table (rows owned by the module); empty before Load.
  const ORVA::APITable& table() const { return table_; }

  // The modules installed beside this executable, loaded by default: the
  // certificate module, then its second module.
  static std::vector<std::string> DefaultModulePaths();

 private:
  void* library_ = nullptr;
  ORVA::APITable table_;
};

// The modules a host command serves methods from: the default modules,
// then those named on its command line.
class ModuleSet {
 public:
  ModuleSet() = default;

  ModuleSet(const ModuleSet&) = delete;
  ModuleSet& operator=(const ModuleSet&) = delete;

  // Loads ModuleLoader::DefaultModulePaths(), then `named`. Returns false
  // with a message in *error at the first module that does not load; the
  // ones before it stay loaded. Call once.
  bool Load(const std::vector<std::string>& named, std::string* error);

  // The loaded modules' tables, in search order; valid while this object
  // lives.
  const std::vector<ORVA::APITable>& tables() const { return tables_; }

 private:
  std::vector<std::unique_ptr<ModuleLoader>> modules_;
  std::vector<ORVA::APITable> tables_;
};

#endif  // ORVA_HOST_MODULE_LOADER_H_
