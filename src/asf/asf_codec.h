// Codec, profile and level of one ASF Stream Properties Object.
#pragma once

#include <cstdint>

#include "metainfo/records.h"

namespace metainfo {

// h stands just after a Stream Properties Object's size field. 0, or
// MM_E_INVALIDARG for a null record or handle. Other stream types leave the
// file 38 bytes past the object's end, where the walk reads on.
int32_t ASF_GetCodecInfo(int h, _MM_CODECTYPE* codec);

// WMV9 level for a profile's rules (0 when no rule fires); exposed for tests.
uint32_t ASF_SimpleProfileLevel(uint32_t kbps, uint32_t fps, int32_t w, int32_t h);
uint32_t ASF_MainProfileLevel(uint32_t kbps, uint32_t fps, bool interlaced, int32_t w, int32_t h);
uint32_t ASF_AdvancedProfileLevel(uint32_t fps, bool interlaced, int32_t w, int32_t h);

}  // namespace metainfo
