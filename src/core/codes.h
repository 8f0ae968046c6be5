// Library-side view of the shared vocabularies.
#pragma once

#include <cstdint>

#include "metainfo/records.h"

namespace metainfo {

// ASF attribute data type (0..6) to the item encoding it is reported in.
extern const uint32_t TTable[7];

// First codecinfo name for a code, or null when the code has none.
const char* CodecName(uint32_t code);

}  // namespace metainfo
