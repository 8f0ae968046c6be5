// The facts of a RIFF or RF64 WAVE file: one walk over its chunks.
#pragma once

#include <cstdint>

#include "core/facts.h"

namespace metainfo {

// Whether the first bytes start an RF64/BW64 WAVE file (64-bit sizes in a
// "ds64" chunk), which the MM_ detection does not take.
bool IsRf64Wave(const uint8_t* head, size_t n);

int32_t WaveFacts(const char* path, MediaFacts* facts);

}  // namespace metainfo
