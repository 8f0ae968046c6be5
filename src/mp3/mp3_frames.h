// The audio frames of an MPEG audio file, walked one header at a time.
#pragma once

#include <cstdint>

#include "core/audio_frames.h"

namespace metainfo {

// Shows every audio frame after the leading ID3 tags to visit (a Xing, Info
// or VBRI frame is not audio and is left out); stops at the first bytes that
// are not a frame of the same stream. *rate gets the sampling rate. False when
// no MPEG audio stream starts the file.
bool WalkMp3Frames(const char* path, uint32_t* rate, const FrameVisitor& visit);

}  // namespace metainfo
