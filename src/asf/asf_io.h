// Little-endian field reads and seeks on an open ASF file.
#pragma once

#include <cstdint>

namespace metainfo {
namespace asf {

// Size of an object's GUID and 64-bit size: no object can be smaller.
constexpr uint32_t kObjectHeaderSize = 24;
constexpr int kVerbose = 2;
extern const char* const kLogTag;

// Exactly n bytes, or false on a short read.
bool ReadExact(int h, void* buf, uint32_t n);
// Up to n bytes; what a short read misses is left zero.
void ReadOrZero(int h, void* buf, uint32_t n);

bool Read16(int h, uint16_t* v);
bool Read32(int h, uint32_t* v);
// The low 32 bits of a 64-bit size: the only part of a size that is used.
bool ReadSize(int h, uint32_t* v);
uint16_t Get16(int h);
uint32_t Get32(int h);
uint64_t Get64(int h);

// Relative move by a signed 64-bit amount; false when the seek fails.
bool SeekBy(int h, int64_t delta);
bool SeekTo(int h, int64_t position);

// Bytes from the current position to the end of the file, as far as the
// walk knows the file's size.
uint64_t BytesLeft(int h);

bool SameGuid(const uint8_t* read, const uint8_t* guid);

}  // namespace asf
}  // namespace metainfo
