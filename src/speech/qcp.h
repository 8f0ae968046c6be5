// QCP files (RIFF form "QLCM": QCELP-13K, EVRC or SMV speech): clip
// information and codec type.
#pragma once

#include <cstdint>

#include "metainfo/records.h"

namespace metainfo {

// request 2 fills a _MMClipInfo, request 5 a _MM_CODECTYPE.
int32_t QCP_GetMediaInfo(const char* path, int request, void* out);

int32_t QCP_GetClipInfo(const char* path, _MMClipInfo* clip);
int32_t QCP_GetCodecType(const char* path, _MM_CODECTYPE* codec);
int32_t QCP_GetTrackType(const char* path, int* mask);

}  // namespace metainfo
