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

void byte_alignment(int* bytePos, int* bitCount) {
    if (*bitCount != 8) {
        *bitCount = 8;
        *bytePos += 1;
    }
}

AacBitReader MakeAacBitReader(const uint8_t* buf, int size, int bytePos, int bitCount) {
    AacBitReader r{buf, size, 0, false, false};
    if (buf == nullptr || size < 0 || bytePos < 0 || bitCount < 1 || bitCount > 8) {
        r.exhausted = true;
        return r;
    }
    r.bitPos = static_cast<int64_t>(bytePos) * 8 + (8 - bitCount);
    return r;
}

void SkipBytes(AacBitReader* r, uint32_t count) {
    if (r->exhausted) return;
    if ((r->bitPos >> 3) + count > r->size) {
        r->exhausted = true;
        return;
    }
    r->bitPos += static_cast<int64_t>(count) * 8;
}

void AlignToByte(AacBitReader* r) { r->bitPos = (r->bitPos + 7) & ~int64_t{7}; }

}  // namespace metainfo
