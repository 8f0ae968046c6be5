// The ID3v1 reader as RealMedia metadata uses it: a file without a usable
// "CONT" chunk may still carry an ID3v1 tag at its end.
#pragma once

#include <cstdint>

#include "metainfo/records.h"

namespace metainfo {

// Reads the ID3v1 tag at the end of the open file h into meta, replacing the
// whole record when there is one. 0 on success, non-zero when there is none.
int32_t RmParseID3V1(int h, _MMMetaInfo* meta);

}  // namespace metainfo
