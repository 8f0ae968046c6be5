// The last granule position of a logical stream, searched from the end.
#pragma once

#include <cstdint>

namespace metainfo {

// Reads backwards from fileSize in blocks for the last whole page of the
// stream with a granule position and a matching checksum. False when none
// lies within the search's reach.
bool FindLastGranule(int h, uint64_t fileSize, uint32_t serial, uint64_t* granule);

}  // namespace metainfo
