/* libmetainfo's version. The shared library's soname carries the major
 * number (libmetainfo.so.MAJOR); CMake and pkg-config read the version from
 * here. */
#ifndef METAINFO_VERSION_H
#define METAINFO_VERSION_H

#include "records.h"

#define MM_VERSION_MAJOR 0
#define MM_VERSION_MINOR 2
#define MM_VERSION_PATCH 0
#define MM_VERSION_STRING "0.2.0"
/* MAJOR * 10000 + MINOR * 100 + PATCH, for comparisons at compile time. */
#define MM_VERSION_NUMBER (MM_VERSION_MAJOR * 10000 + MM_VERSION_MINOR * 100 + MM_VERSION_PATCH)

#ifdef __cplusplus
extern "C" {
#endif

/* The version of the library in use, "MAJOR.MINOR.PATCH" (static storage). */
MM_EXPORT const char* MM_Version(void);
/* The same as MM_VERSION_NUMBER of the library in use. */
MM_EXPORT int MM_VersionNumber(void);

#ifdef __cplusplus
}
#endif

#endif /* METAINFO_VERSION_H */
