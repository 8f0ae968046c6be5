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
    AacBitReader r{buf, size, bytePos, bitCount, false, false};
    if (buf == nullptr || size < 0 || bytePos < 0 || bitCount < 1 || bitCount > 8) r.exhausted = true;
    return r;
}

namespace {

// True when the bytes a read of n (1..8) bits touches all lie inside the data.
bool CanRead(const AacBitReader* r, int n) {
    if (r->exhausted) return false;
    const int64_t last = static_cast<int64_t>(r->bytePos) + (r->bitCount < n ? 1 : 0);
    return r->bytePos >= 0 && last < r->size;
}

}  // namespace

uint32_t ReadBits(AacBitReader* r, int n) {
    uint32_t value = 0;
    while (n > 0) {
        const int piece = n > 8 ? 8 : n;
        if (!CanRead(r, piece)) {
            r->exhausted = true;
            return 0;
        }
        value = value << piece | GetBits(r->buf, piece, &r->bitCount, &r->bytePos);
        n -= piece;
    }
    return value;
}

uint32_t PeekBits(AacBitReader* r, int n) {
    if (n <= 0) return 0;
    if (!CanRead(r, n)) {
        r->exhausted = true;
        return 0;
    }
    int bitCount = r->bitCount;
    int bytePos = r->bytePos;
    return GetBits(r->buf, n, &bitCount, &bytePos);
}

void SkipBytes(AacBitReader* r, uint32_t count) {
    if (r->exhausted) return;
    const int64_t to = static_cast<int64_t>(r->bytePos) + count;
    if (to > r->size) {
        r->exhausted = true;
        return;
    }
    r->bytePos = static_cast<int>(to);
}

void AlignToByte(AacBitReader* r) { byte_alignment(&r->bytePos, &r->bitCount); }

}  // namespace metainfo
