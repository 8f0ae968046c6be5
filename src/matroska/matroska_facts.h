// Matroska and WebM files for the accurate interface.
#pragma once

#include <cstddef>
#include <cstdint>

#include "core/facts.h"

namespace metainfo {

// An EBML header whose DocType is "matroska" or "webm" in the first bytes.
bool LooksLikeMatroska(const char* path, const uint8_t* head, size_t n);

// MM_OK, MM_E_FAIL when the file is no Matroska or its Segment holds no
// Info nor Tracks, MM_E_OUTOFMEMORY.
int32_t MatroskaFacts(const char* path, int type, MediaFacts* facts);

}  // namespace metainfo
