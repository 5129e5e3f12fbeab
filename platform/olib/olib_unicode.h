#ifndef ORVA_PLATFORM_OLIB_OLIB_UNICODE_H_
#define ORVA_PLATFORM_OLIB_OLIB_UNICODE_H_

// Nonzero when the zero-ended `text` is well-formed UTF-8: no overlong
// forms, no surrogates, nothing above U+10FFFF, no cut sequence. A null
// pointer gives 0.
int OLIBCUnicodeIsUTF8(const char* text);

#endif  // ORVA_PLATFORM_OLIB_OLIB_UNICODE_H_
