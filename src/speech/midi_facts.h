// Standard MIDI Files read for their play time: every track's events walked
// through the tempo map.
#pragma once

#include <cstdint>

#include "core/facts.h"

namespace metainfo {

// MM_OK, or MM_E_FAIL when the file holds no MThd header or is larger than
// this reader walks.
int32_t MidiFacts(const char* path, MediaFacts* facts);

}  // namespace metainfo
