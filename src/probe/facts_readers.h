// The accurate interface's table of facts readers, by media type, above the
// format folders.
#pragma once

#include <cstdint>

#include "core/facts.h"

namespace metainfo {

// Formats only the accurate interface reads: codes past the MM_ types, so
// that the C interface's answers for these files stay as they are.
enum AccurateType : int {
    kAccurateFlac = 100,
    kAccurateOgg = 101,
    kAccurateMatroska = 102,
    kAccurateAiff = 103,
};

// The media type of a file as the accurate interface sees it: the MM_
// detection, widened where it turns real files away, then the formats only
// the accurate interface reads (MEDIA_TYPE_UNKNOWN when none).
int AccurateMediaType(const char* path);

// Reads the facts of a file of a known type: its own reader where the format
// has one, else the MM_ answers. MM_OK, or why the file could not be read.
int32_t ReadFacts(const char* path, int type, MediaFacts* facts);

}  // namespace metainfo
