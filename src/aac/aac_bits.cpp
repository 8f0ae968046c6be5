#include "aac/aac_bits.h"

namespace metainfo {

const uint32_t bitmask[9] = {0, 1, 3, 7, 15, 31, 63, 127, 255};

uint32_t GetBits(const uint8_t* buf, int n, int* bitCount, int* bytePos) {
    const int c = *bitCount;
    const int p = *bytePos;
    if (c < n) {
        const int rest = n - c;
        uint32_t value = (buf[p] & bitmask[c]) << rest;
        value |= static_cast<uint32_t>(buf[p + 1]) >> (8 - rest);
        *bytePos = p + 1;
        *bitCount = 8 - rest;
        return value;
    }
    const uint32_t value = (static_cast<uint32_t>(buf[p]) >> (c - n)) & bitmask[n];
    if (c == n) {
        *bytePos = p + 1;
        *bitCount = 8;
    } else {
        *bitCount = c - n;
    }
    return value;
}

}  // namespace metainfo
