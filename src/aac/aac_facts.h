// The facts of an ADTS AAC file: its frames counted, ID3 tags between them
// stepped over.
#pragma once

#include <cstdint>

#include "core/audio_frames.h"
#include "core/facts.h"
#include "core/quirks.h"

namespace metainfo {

// Whether the file is an ADTS stream once ID3 tags before and between its
// first frames are stepped over (the MM_ detection takes only a leading tag).
bool LooksLikeAdts(const char* path);

// Shows every ADTS frame to visit; *rate gets the stream's sampling rate.
// False when the file holds no ADTS stream.
bool WalkAdtsFrames(const char* path, uint32_t* rate, const FrameVisitor& visit);

// MM_E_UNSUPPORTED for ADIF and other files without ADTS frames.
int32_t AacFacts(const char* path, const Quirks& quirks, MediaFacts* facts);

}  // namespace metainfo
