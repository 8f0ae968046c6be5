// The audio facts of an MPEG audio file: codec, rate, channels, and the
// duration its Xing/Info, LAME or VBRI header states, else an estimate.
#pragma once

#include <cstdint>

#include "core/facts.h"

namespace metainfo {

// Fills facts->format, mime, duration, bit rate and the audio stream.
// MM_E_FAIL when no MPEG audio stream starts the file after its ID3 tags.
int32_t Mp3StreamFacts(const char* path, MediaFacts* facts);

}  // namespace metainfo
