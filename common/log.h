#ifndef ORVA_COMMON_LOG_H_
#define ORVA_COMMON_LOG_H_

// The system's one way to log. Every message goes to syslog at LOG_ERR as
// "FILE:LINE TEXT", FILE being the base name of the reporting source file.
//
//   ORVA_LOG("Key is not existed");
//   ORVA_LOG_LASTERR("Open %s failed", path);
//
// ORVA_LOG_LASTERR appends "[0x%04X %s:%d]" filled with the system
// library's last error code, file and line, read in that order when the
// message is written. The format is printf's, %m included (errno as it was
// when the macro was reached).
//
// ORVA_LOG_AS and ORVA_LOG_LASTERR_AS report for another place: code that
// works on behalf of a caller passes the caller's __FILE__ and __LINE__, so
// the message names the caller's file and line.

void OrvaLogWrite(const char* file, int line, bool withLastError,
                  const char* format, ...)
    __attribute__((format(printf, 4, 5)));

#define ORVA_LOG(format, ...) \
  OrvaLogWrite(__FILE__, __LINE__, false, format, ##__VA_ARGS__)
#define ORVA_LOG_LASTERR(format, ...) \
  OrvaLogWrite(__FILE__, __LINE__, true, format, ##__VA_ARGS__)

#define ORVA_LOG_AS(file, line, format, ...) \
  OrvaLogWrite(file, line, false, format, ##__VA_ARGS__)
#define ORVA_LOG_LASTERR_AS(file, line, format, ...) \
  OrvaLogWrite(file, line, true, format, ##__VA_ARGS__)

#endif  // ORVA_COMMON_LOG_H_
