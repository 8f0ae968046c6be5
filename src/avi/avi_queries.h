// AVI entries of the dispatch tables (media type 11).
#pragma once

#include <cstdint>

#include "core/facts.h"
#include "metainfo/records.h"

namespace metainfo {

int32_t AVI_GetClipInfo(const char* path, _MMClipInfo* clip);
int32_t AVI_GetTrackType(const char* path, int* bits);
// Not offered for AVI: 0x80004002 without opening the file. Kept out of the
// codec table, so the public codec query answers "unsupported".
int32_t AVI_GetCodecType(const char* path, _MM_CODECTYPE* codec);
int32_t AVI_GetMIMEType(const char* path, _MM_MIMETYPE* mime);

// The accurate facts: codecs, sizes, rates and the longest stream's duration.
int32_t AviFacts(const char* path, MediaFacts* facts);

}  // namespace metainfo
