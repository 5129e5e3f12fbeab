#ifndef ORVA_PLATFORM_WEBAPI_API_TABLE_H_
#define ORVA_PLATFORM_WEBAPI_API_TABLE_H_

#include "platform/webapi/api_request.h"
#include "platform/webapi/api_response.h"

namespace ORVA {

using APIHandler = void (*)(APIRequest*, APIResponse*);

// One row of a module's API table.
struct APIEntry {
  const char* api;
  int version;
  const char* method;
  APIHandler handler;
};

// A module's table as the host keeps it: the rows (owned by the module)
// and how many there are.
struct APITable {
  const APIEntry* rows = nullptr;
  int count = 0;
};

}  // namespace ORVA

// The module's exported entry: `const ORVA::APIEntry* GetAPITable()`.
using GetAPITableFunction = const ORVA::APIEntry* (*)();
// Optional: `int GetAPITableSize()`, the number of rows of that table. A
// module without it has seven rows, as the certificate module does.
using GetAPITableSizeFunction = int (*)();
inline constexpr int kDefaultApiTableSize = 7;

#endif  // ORVA_PLATFORM_WEBAPI_API_TABLE_H_
