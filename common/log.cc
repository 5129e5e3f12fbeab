#include "common/log.h"

#include <syslog.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <string>

#include "platform/olib/olib_error.h"

namespace {

const char* BaseName(const char* path) {
  const char* slash = std::strrchr(path, '/');
  return slash != nullptr ? slash + 1 : path;
}

}  // namespace

void OrvaLogWrite(const char* file, int line, bool withLastError,
                  const char* format, ...) {
  const int saved_errno = errno;
  std::string text;
  va_list args;
  va_start(args, format);
  va_list measure;
  va_copy(measure, args);
  errno = saved_errno;
  int length = std::vsnprintf(nullptr, 0, format, measure);
  va_end(measure);
  if (length > 0) {
    text.resize(static_cast<size_t>(length) + 1);
    errno = saved_errno;
    std::vsnprintf(&text[0], text.size(), format, args);
    text.resize(static_cast<size_t>(length));
  }
  va_end(args);

  if (withLastError) {
    int code = OLIBCErrGet();
    const char* error_file = OLIBCErrorGetFile();
    int error_line = OLIBCErrorGetLine();
    syslog(LOG_ERR, "%s:%d %s[0x%04X %s:%d]", BaseName(file), line,
           text.c_str(), static_cast<unsigned int>(code), error_file,
           error_line);
  } else {
    syslog(LOG_ERR, "%s:%d %s", BaseName(file), line, text.c_str());
  }
  errno = saved_errno;
}
