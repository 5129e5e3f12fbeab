#ifndef ORVA_PLATFORM_OLIB_OLIB_ERROR_H_
#define ORVA_PLATFORM_OLIB_OLIB_ERROR_H_

// Last-error bookkeeping of the system library.
//
// Every library operation that fails records a code together with the
// library source file and line where it failed. The record is per thread and
// stays until the next failure overwrites it; success never clears it.

// Error codes. Values below 0x1000 are errno values of a failed system call.
enum {
  OLIB_ERR_NONE = 0,
  OLIB_ERR_BAD_ARGUMENT = 0x1001,
  OLIB_ERR_OUT_OF_MEMORY = 0x1002,
  OLIB_ERR_TIMEOUT = 0x1003,
  OLIB_ERR_CHILD_FAILED = 0x1004,
  OLIB_ERR_NOT_FOUND = 0x1005,
};

// The calling thread's last error code; 0 when nothing has failed yet.
int OLIBCErrGet();
// Base name of the library source file of the last error; "" when none.
// The text is static and never freed.
const char* OLIBCErrorGetFile();
// Source line of the last error; 0 when none.
int OLIBCErrorGetLine();

// Records `code` as the calling thread's last error at `file`:`line`.
// `file` must be a static text (normally __FILE__).
void OLIBCErrSet(int code, const char* file, int line);

#define OLIB_SET_ERROR(code) OLIBCErrSet((code), __FILE__, __LINE__)

#endif  // ORVA_PLATFORM_OLIB_OLIB_ERROR_H_
