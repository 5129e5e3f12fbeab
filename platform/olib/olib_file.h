#ifndef ORVA_PLATFORM_OLIB_OLIB_FILE_H_
#define ORVA_PLATFORM_OLIB_OLIB_FILE_H_

// File utilities of the system library. Paths are used as given; callers
// place fixed device paths under the device root themselves (OrvaPath).

// 1 when `path` names an existing file system object, 0 when not (or when
// `path` is null or empty; the last error is then set).
int OLIBCFileExist(const char* path);

// Removes a leading UTF-8 byte order mark (EF BB BF) from the file at `path`.
// The file is rewritten through a temporary file in the same directory that
// is renamed over it, keeping its mode, so a reader sees the old content or
// the new, never a cut file. A file without the mark is left untouched.
// Returns 0 when the file holds no mark afterwards, -1 on failure (the last
// error is set and the file is unchanged).
int OLIBCFileUTF8BomStrip(const char* path);

// Removes the file at `path`. Returns 0 on success, -1 on failure with the
// last error set to errno.
int OLIBCSysUnlink(const char* path);

// True when `name` can name one entry of a system directory: non-empty,
// only letters, digits, ".", "-" and "_", and neither "." nor "..".
bool OLIBIsSafeFileName(const char* name);

#endif  // ORVA_PLATFORM_OLIB_OLIB_FILE_H_
