#include "platform/olib/olib_service.h"

#include <unistd.h>

#include <string>

#include "platform/olib/olib_error.h"
#include "platform/olib/olib_file.h"
#include "platform/olib/olib_process.h"
#include "platform/olib/orva_root.h"

namespace {

std::string ServicePath(const char* name) {
  return OrvaPath("/usr/orva/etc/services/") + name;
}

}  // namespace

int OLIBServiceIsEnabled(const char* name) {
  if (!OLIBIsSafeFileName(name)) {
    OLIB_SET_ERROR(OLIB_ERR_BAD_ARGUMENT);
    return 0;
  }
  return access(ServicePath(name).c_str(), X_OK) == 0 ? 1 : 0;
}

int OLIBServiceRestart(const char* name) {
  if (!OLIBIsSafeFileName(name)) {
    OLIB_SET_ERROR(OLIB_ERR_BAD_ARGUMENT);
    return -1;
  }
  std::string path = ServicePath(name);
  const char* argv[] = {path.c_str(), "restart", nullptr};
  return OLIBProcessRun(argv, kOLIBServiceRestartSeconds);
}
