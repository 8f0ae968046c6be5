// The bit reader of all AAC syntax code (and of the MP4 decoder configuration).
#pragma once

#include <cstdint>

#include "core/byte_reader.h"

namespace metainfo {

// bitmask[n] = (1 << n) - 1 for n = 0..8.
extern const uint32_t bitmask[9];

// Reads n bits (1..8), most significant first. *bitCount is the number of
// bits still unread in byte *bytePos (8 = at a byte start). A read spans at
// most two bytes; the caller guarantees both lie inside buf.
uint32_t GetBits(const uint8_t* buf, int n, int* bitCount, int* bytePos);

// Moves to the start of the next byte unless already at a byte start.
void byte_alignment(int* bytePos, int* bitCount);

// A bit position over the `size` bytes that were read. The AAC syntax trusts
// the stream, so every read is checked here instead: a read that would pass
// the data returns 0 and marks the reader exhausted, and an exhausted reader
// reads nothing more. A corrupt stream thus ends the walk at the end of the
// data instead of running past it.
struct AacBitReader {
    const uint8_t* buf;
    int size;
    // Bits consumed, counted from the most significant bit of buf[0].
    int64_t bitPos;
    bool exhausted;
    // Set once a short-window TNS filter has been read: the walker reads its
    // coefficients one bit shorter than the encoders write them, so from there
    // on the walk may leave the element boundaries.
    bool shortWindowTns;
};

// A reader at byte bytePos with bitCount (1..8) bits of that byte unread.
AacBitReader MakeAacBitReader(const uint8_t* buf, int size, int bytePos, int bitCount = 8);

// The byte that holds the next bit.
inline int BytePosition(const AacBitReader& r) { return static_cast<int>(r.bitPos >> 3); }
inline bool AtByteStart(const AacBitReader& r) { return (r.bitPos & 7) == 0; }
// Moves to the start of byte bytePos (not below 0).
inline void SetBytePosition(AacBitReader* r, int bytePos) {
    r->bitPos = static_cast<int64_t>(bytePos < 0 ? 0 : bytePos) * 8;
}

// Bits left before the end of the data; negative once a skip has passed it.
inline int64_t RemainingBits(const AacBitReader* r) { return static_cast<int64_t>(r->size) * 8 - r->bitPos; }

// The 64 bits from the position on, most significant first; bits past the
// data read as 0. Only called with at least one bit left, so the first byte
// lies inside the data.
inline uint64_t BitWindow(const AacBitReader* r) {
    const int64_t at = r->bitPos >> 3;
    uint64_t word = 0;
    if (at + 8 <= r->size) {
        word = ReadBE64(r->buf + at);
    } else {
        for (int64_t i = at; i < at + 8; ++i) word = word << 8 | (i < r->size ? r->buf[i] : 0u);
    }
    return word << (r->bitPos & 7);
}

// Claims n bits: false (and the reader exhausted) when they pass the data.
inline bool Claim(AacBitReader* r, int64_t n) {
    if (r->exhausted || n > RemainingBits(r)) {
        r->exhausted = true;
        return false;
    }
    return true;
}

// n bits (0..32).
inline uint32_t ReadBits(AacBitReader* r, int n) {
    if (n <= 0) return 0;
    if (!Claim(r, n)) return 0;
    const uint64_t window = BitWindow(r);
    r->bitPos += n;
    return static_cast<uint32_t>(window >> (64 - n));
}

// The next n bits (0..32) without consuming them.
inline uint32_t PeekBits(AacBitReader* r, int n) {
    if (n <= 0) return 0;
    if (!Claim(r, n)) return 0;
    return static_cast<uint32_t>(BitWindow(r) >> (64 - n));
}

// Advances by whole bytes, keeping the bit offset within the byte.
void SkipBytes(AacBitReader* r, uint32_t count);
void AlignToByte(AacBitReader* r);

}  // namespace metainfo
