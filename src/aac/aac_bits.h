// The bit reader of all AAC syntax code (and of the MP4 decoder configuration).
#pragma once

#include <cstdint>

namespace metainfo {

// bitmask[n] = (1 << n) - 1 for n = 0..8.
extern const uint32_t bitmask[9];

// Reads n bits (1..8), most significant first. *bitCount is the number of
// bits still unread in byte *bytePos (8 = at a byte start). A read spans at
// most two bytes; the caller guarantees both lie inside buf.
uint32_t GetBits(const uint8_t* buf, int n, int* bitCount, int* bytePos);

}  // namespace metainfo
