// ASF (WMA/WMV) facts for the accurate interface, from one walk of the
// Header Object.
#pragma once

#include <cstdint>

#include "core/facts.h"

namespace metainfo {

// MM_OK, or MM_E_FAIL when the Header Object is broken.
int32_t AsfFacts(const char* path, int type, MediaFacts* facts);

}  // namespace metainfo
