// The MP4 / 3GPP entries of the dispatch tables.
#pragma once

#include <cstdint>

#include "metainfo/records.h"

namespace metainfo {

int32_t MP4_GetTrackType(const char* path, int* bits);
int32_t MP4_GetMetaInfo(const char* path, _MMMetaInfo* meta, int pictureLimit);
int32_t MP4_GetClipInfo(const char* path, _MMClipInfo* clip);
int32_t MP4_GetCodecType(const char* path, _MM_CODECTYPE* codec);

}  // namespace metainfo
