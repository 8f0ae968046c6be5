// Vorbis comments ("KEY=value", UTF-8) as tags: FLAC's VORBIS_COMMENT block.
#pragma once

#include <cstddef>
#include <cstdint>

#include "core/facts.h"

namespace metainfo {

// Reads a comment block (vendor, count, entries; little-endian lengths) into
// tags. Entries past what the block holds are dropped.
void ReadVorbisComments(const uint8_t* b, size_t n, TagFacts* tags);

}  // namespace metainfo
