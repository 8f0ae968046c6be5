// The accurate interface's reader of Ogg files (Vorbis, Opus, FLAC, Theora).
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "core/facts.h"

namespace metainfo {

// An Ogg page capture at the start of the file.
bool LooksLikeOgg(const char* path, const uint8_t* head, size_t n);

// The bytes of the file's picture at ordinal, found again in its header
// packets. False when the file no longer holds it.
bool OggPictureBytes(const char* path, uint32_t ordinal, std::vector<uint8_t>* bytes);

// MM_OK, MM_E_FAIL when no stream's headers can be read, MM_E_OUTOFMEMORY.
int32_t OggFacts(const char* path, int type, MediaFacts* facts);

}  // namespace metainfo
