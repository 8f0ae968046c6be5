// EVRC storage files ("#!EVRC\n", then packets of a rate octet and a payload).
#pragma once

#include <cstdint>

#include "metainfo/records.h"

namespace metainfo {

int32_t EVRC_GetClipInfo(const char* path, _MMClipInfo* clip);
int32_t EVRC_GetCodecType(const char* path, _MM_CODECTYPE* codec);
int32_t EVRC_GetTrackType(const char* path, int* mask);

}  // namespace metainfo
