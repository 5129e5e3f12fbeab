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

}  // namespace ORVA

// The module's exported entry: `const ORVA::APIEntry* GetAPITable()`.
using GetAPITableFunction = const ORVA::APIEntry* (*)();

#endif  // ORVA_PLATFORM_WEBAPI_API_TABLE_H_
