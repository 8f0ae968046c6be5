// The MP4 / 3GPP / QuickTime facts reader of the accurate interface.
#pragma once

#include <cstdint>

#include "core/facts.h"

namespace metainfo {

// MM_OK, MM_E_FAIL when the file's boxes are broken, MM_E_OUTOFMEMORY.
int32_t Mp4Facts(const char* path, int type, MediaFacts* facts);

}  // namespace metainfo
