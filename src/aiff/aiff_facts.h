// The facts of an AIFF or AIFC file: one walk over its chunks.
#pragma once

#include <cstddef>
#include <cstdint>

#include "core/facts.h"

namespace metainfo {

bool LooksLikeAiff(const char* path, const uint8_t* head, size_t n);

int32_t AiffFacts(const char* path, int type, MediaFacts* facts);

}  // namespace metainfo
