// Units of compressed audio as a format's frame walk finds them, for copying
// a time range without decoding.
#pragma once

#include <cstdint>
#include <functional>

namespace metainfo {

struct AudioFrame {
    uint64_t offset = 0;
    uint32_t length = 0;
    uint32_t samples = 0;  // at the stream's rate
};

// Sees each frame in order; returns false to stop the walk.
using FrameVisitor = std::function<bool(const AudioFrame&)>;

}  // namespace metainfo
