// MPEG audio streams for the MP3 tests: runs of frames, Xing and VBRI frames.
#pragma once

#include <cstdint>
#include <vector>

#include "support/media.h"

namespace testing_support {

using Mp3Shape = Mp3FrameLayout;

// count frames of the same kind, payload zeroed.
std::vector<uint8_t> Mp3Frames(int count, const Mp3Shape& shape = {});

struct XingFields {
    uint32_t flags = 0xF, frames = 0, bytes = 0, quality = 57;  // TOC entries are i * 256 / 100
    const char* tag = "Xing";
};
// A frame of the given kind's size, carrying a Xing header at the offset the reader expects
// (36, or 21 for MPEG-1 mono and MPEG-2/2.5 stereo, or 13 for MPEG-2/2.5 mono).
std::vector<uint8_t> XingFrame(const XingFields& xing, const Mp3Shape& shape = {});

struct VbriFields {
    uint16_t delay = 0x0102, scale = 1, framesPerEntry = 0;
    uint32_t bytes = 0, frames = 0;  // version 1, quality 75, 10 entries of 2 bytes
};
// A frame with "VBRI" at byte 36 (16-bit fields little-endian, 32-bit ones big-endian).
std::vector<uint8_t> VbriFrame(const VbriFields& vbri);

}  // namespace testing_support
