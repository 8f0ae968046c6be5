#include "metainfo/version.h"

extern "C" {

MM_EXPORT const char* MM_Version(void) { return MM_VERSION_STRING; }

MM_EXPORT int MM_VersionNumber(void) { return MM_VERSION_NUMBER; }

}  // extern "C"
