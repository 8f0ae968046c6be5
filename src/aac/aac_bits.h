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

// Moves to the start of the next byte unless already at a byte start.
void byte_alignment(int* bytePos, int* bitCount);

// A GetBits position over the `size` bytes that were read. The AAC syntax
// trusts the stream, so every read is checked here instead: a read that would
// pass the data returns 0 and marks the reader exhausted, and an exhausted
// reader reads nothing more. A corrupt stream thus ends the walk at the end of
// the data instead of running past it.
struct AacBitReader {
    const uint8_t* buf;
    int size;
    int bytePos;
    int bitCount;
    bool exhausted;
    // Set once a short-window TNS filter has been read: the walker reads its
    // coefficients one bit shorter than the encoders write them, so from there
    // on the walk may leave the element boundaries.
    bool shortWindowTns;
};

AacBitReader MakeAacBitReader(const uint8_t* buf, int size, int bytePos, int bitCount = 8);

// n bits (0..32), read through GetBits in pieces of at most 8.
uint32_t ReadBits(AacBitReader* r, int n);
// The next n bits (0..8) without consuming them.
uint32_t PeekBits(AacBitReader* r, int n);
// Advances by whole bytes, keeping the bit count.
void SkipBytes(AacBitReader* r, uint32_t count);
void AlignToByte(AacBitReader* r);

}  // namespace metainfo
