// The QCP format-chunk reader as the MP4 QCELP configuration needs it.
#pragma once

#include <cstddef>
#include <cstdint>

namespace metainfo {

// Decodes a QCP "fmt " chunk from a buffer of size bytes that starts at the
// chunk identifier. False when the chunk cannot be read.
bool ParseQcpFormat(const uint8_t* chunk, size_t size, uint32_t* avgBitrate, uint32_t* sampleRate,
                    uint32_t* bitsPerSample);

}  // namespace metainfo
