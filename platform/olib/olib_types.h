#ifndef ORVA_PLATFORM_OLIB_OLIB_TYPES_H_
#define ORVA_PLATFORM_OLIB_OLIB_TYPES_H_

// The system's boolean type: TRUE is 1, every other value counts as false
// where a caller compares with TRUE.
typedef int BOOL;
#ifndef TRUE
#define TRUE 1
#endif
#ifndef FALSE
#define FALSE 0
#endif

#endif  // ORVA_PLATFORM_OLIB_OLIB_TYPES_H_
