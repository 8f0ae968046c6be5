// The ID3v2 reader as the MP4 "ID32" box needs it.
#pragma once

#include <cstdint>

#include "metainfo/records.h"

namespace metainfo {

// Parses the ID3v2 tag that starts at the current position of h and is
// tagBytes long into meta. 0 on success, non-zero on failure.
int32_t ParseEmbeddedID3(int h, uint32_t tagBytes, _MMMetaInfo* meta);

}  // namespace metainfo
