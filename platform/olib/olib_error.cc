#include "platform/olib/olib_error.h"

#include <cstring>

namespace {

struct LastError {
  int code = OLIB_ERR_NONE;
  const char* file = "";
  int line = 0;
};

thread_local LastError tLastError;

const char* BaseName(const char* path) {
  const char* slash = std::strrchr(path, '/');
  return slash != nullptr ? slash + 1 : path;
}

}  // namespace

int OLIBCErrGet() { return tLastError.code; }

const char* OLIBCErrorGetFile() { return tLastError.file; }

int OLIBCErrorGetLine() { return tLastError.line; }

void OLIBCErrSet(int code, const char* file, int line) {
  tLastError.code = code;
  tLastError.file = file != nullptr ? BaseName(file) : "";
  tLastError.line = line;
}
