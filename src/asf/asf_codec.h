// Codec, profile and level of one ASF Stream Properties Object.
#pragma once

#include <cstdint>

#include "metainfo/records.h"

namespace metainfo {

// h stands just after a Stream Properties Object's size field. 0, or
// MM_E_INVALIDARG for a null record or handle. Other stream types leave the
// file 38 bytes past the object's end, where the walk reads on.
int32_t ASF_GetCodecInfo(int h, _MM_CODECTYPE* codec);

// ffprobe's codec_name of a WAVEFORMATEX format tag (PCM by its sample
// size), or nullptr when unknown.
const char* ASF_AudioCodecName(uint16_t formatTag, uint16_t bitsPerSample);
// ffprobe's bits_per_sample: the sample size of PCM, a codec's fixed size, else 0.
uint32_t ASF_AudioSampleBits(uint16_t formatTag, uint16_t bitsPerSample);
// ffprobe's codec_name of a BITMAPINFOHEADER compression FourCC (either
// case), or nullptr when unknown.
const char* ASF_VideoCodecName(uint32_t compression);
// The profile name of WMV3 from its sequence header's first byte.
const char* ASF_Wmv3ProfileName(uint8_t first);

// WMV9 level for a profile's rules (0 when no rule fires); exposed for tests.
uint32_t ASF_SimpleProfileLevel(uint32_t kbps, uint32_t fps, int32_t w, int32_t h);
uint32_t ASF_MainProfileLevel(uint32_t kbps, uint32_t fps, bool interlaced, int32_t w, int32_t h);
uint32_t ASF_AdvancedProfileLevel(uint32_t fps, bool interlaced, int32_t w, int32_t h);

}  // namespace metainfo
