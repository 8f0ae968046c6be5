// MPEG audio streams for the MP3 tests: runs of frames, Xing and VBRI frames.
#pragma once

#include <cstdint>
#include <vector>

#include "support/media.h"

namespace testing_support {

// count frames of the same kind, payload zeroed.
std::vector<uint8_t> Mp3Frames(const Mp3FrameSpec& shape, int count);

struct XingSpec {
    uint32_t flags = 0xF;
    uint32_t frames = 0;
    uint32_t bytes = 0;
    std::vector<uint8_t> toc;  // 100 entries when flag 4 is set (default 0, 2.56, ...)
    uint32_t quality = 57;
    const char* tag = "Xing";
};
// A frame of the given kind's size, carrying a Xing header at the offset the reader expects.
std::vector<uint8_t> XingFrame(const Mp3FrameSpec& shape, const XingSpec& xing);
uint32_t XingDistanceFor(const Mp3FrameSpec& shape);

struct VbriSpec {
    uint16_t version = 1, delay = 0x0102, quality = 75;
    uint32_t bytes = 0, frames = 0;
    uint16_t entries = 0, scale = 1, entrySize = 2, framesPerEntry = 0;
};
// A frame with "VBRI" at byte 36 (16-bit fields written little-endian as read).
std::vector<uint8_t> VbriFrame(const Mp3FrameSpec& shape, const VbriSpec& vbri);

}  // namespace testing_support
