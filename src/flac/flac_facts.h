// The facts of a FLAC file: its metadata blocks, read once, before the frames.
#pragma once

#include <cstddef>
#include <cstdint>

#include "core/facts.h"

namespace metainfo {

// Whether the file starts a FLAC stream, after any ID3v2 tags put before it
// (those only with a path to read them through).
bool LooksLikeFlac(const char* path, const uint8_t* head, size_t n);

int32_t FlacFacts(const char* path, int type, MediaFacts* facts);

}  // namespace metainfo
