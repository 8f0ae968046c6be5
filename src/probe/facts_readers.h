// The accurate interface's table of facts readers, by media type, above the
// format folders.
#pragma once

#include <cstdint>

#include "core/facts.h"

namespace metainfo {

// The media type of a file as the accurate interface sees it: the MM_
// detection, widened where it turns real files away (MEDIA_TYPE_UNKNOWN
// when none).
int AccurateMediaType(const char* path);

// Reads the facts of a file of a known type: its own reader where the format
// has one, else the MM_ answers. MM_OK, or why the file could not be read.
int32_t ReadFacts(const char* path, int type, MediaFacts* facts);

}  // namespace metainfo
