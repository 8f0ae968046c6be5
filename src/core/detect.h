// Media type from content (the first 128 bytes, then frame checks), and the
// check of a file's content against the type its extension claims.
#pragma once

#include <cstdint>

namespace metainfo {

int32_t DetectMediaType(const char* path, int* type);
int32_t CheckMediaType(const char* path);

}  // namespace metainfo
