// MPEG audio header tables, indexed as the frame header decoder uses them.
#pragma once

#include <cstdint>

namespace metainfo {

extern const uint8_t lsfIndex[4];  // by version bits: 0 only for MPEG-1
extern const uint8_t idIndex[4];  // by version bits: row of samplerateTab
extern const int16_t bitrateTab[135];  // kbit/s, lsf*45 + layerIndex*15 + bitrateIndex
extern const uint32_t samplerateTab[9];  // idIndex*3 + samplingIndex
extern const uint16_t samplesPerFrameTab[10];
extern const uint32_t dwCoefficients[6];  // lsf*3 + layerIndex
extern const uint32_t dwSlotSizes[3];  // layerIndex
extern const char* const szMP3MimeType[8];  // aliases; only the first is reported

}  // namespace metainfo
