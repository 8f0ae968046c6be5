// Facts of MP3 and AAC files for the accurate interface.
#pragma once

#include <cstdint>

#include "core/facts.h"

namespace metainfo {

// The audio as the MM_ answers give it for now; tags and pictures from the
// ID3 tags as they stand.
int32_t Mp3Facts(const char* path, int type, MediaFacts* facts);

}  // namespace metainfo
