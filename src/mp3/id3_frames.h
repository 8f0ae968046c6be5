// Filling metadata items from the bodies of ID3v2 frames. Bodies are changed
// in place (byte order, genre compaction).
#pragma once

#include <cstdint>

#include "core/quirks.h"
#include "metainfo/records.h"

namespace metainfo {

// Identifier of a frame: four characters big-endian, or three for v2.2.
constexpr uint32_t FrameId(const char (&s)[5]) {
    return uint32_t(uint8_t(s[0])) << 24 | uint32_t(uint8_t(s[1])) << 16 | uint32_t(uint8_t(s[2])) << 8 | uint8_t(s[3]);
}
constexpr uint32_t FrameId(const char (&s)[4]) {
    return uint32_t(uint8_t(s[0])) << 16 | uint32_t(uint8_t(s[1])) << 8 | uint8_t(s[2]);
}

// 0; MM_E_FAIL for a short "PCNT" or a "POPM" without terminator.
int32_t GetMetaData(uint32_t id, uint8_t* body, uint32_t size, _MMMetaInfo* meta, const Quirks& quirks);

// True for the frames that fill the record; all others are passed over.
bool IsTableFrame(uint32_t id);

// The item a text frame of v2.4 takes its encoding code from, or null.
_MMMetaItem* V24TextItem(uint32_t id, _MMMetaInfo* meta);

int32_t FillTextFrame(uint8_t* body, uint32_t size, _MMMetaItem* item, const Quirks& quirks);
int32_t FillCommentsFrame(uint8_t* body, uint32_t size, _MMMetaItem* item, const Quirks& quirks);
int32_t FillGenreFrame(uint8_t* body, uint32_t size, _MMMetaItem* item, const Quirks& quirks);
int32_t FillTimeStamp(const uint8_t* body, uint32_t size, _MMMetaInfo* meta, const Quirks& quirks);

// Swaps UTF-16 text that starts with FF FE into big-endian order, mark
// included. MM_E_INVALIDARG for an odd length with that mark.
int32_t AdjustByteOrder(uint8_t* text, uint32_t length);
// Drops a v2.4 data length indicator: length - 4, or length below 4 bytes.
uint32_t RemoveDataLengthIndicator(uint8_t* body, uint32_t length);
// Zeroes trailing bytes below 33 of a v1 field and sets the item's length.
void ReshapeV1Item(_MMMetaItem* item, uint32_t fieldLength);

}  // namespace metainfo
