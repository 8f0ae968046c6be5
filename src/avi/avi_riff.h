// Small RIFF helpers shared by the AVI parser's files.
#pragma once

#include <cstdint>

namespace metainfo {
namespace avi {

// A four-character code as the parser compares it (read big-endian).
constexpr uint32_t Fourcc(const char (&s)[5]) {
    return uint32_t(uint8_t(s[0])) << 24 | uint32_t(uint8_t(s[1])) << 16 | uint32_t(uint8_t(s[2])) << 8 |
           uint32_t(uint8_t(s[3]));
}

// "avih" chunk header and body as the header list holds them.
constexpr uint32_t kMainHeaderBytes = 64;
// "strh" fields from fccType to dwSampleSize.
constexpr uint32_t kStreamHeaderFieldBytes = 48;
constexpr uint32_t kBitmapHeaderBytes = 40;
constexpr uint32_t kWaveFormatBytes = 18;
constexpr uint32_t kIndexEntryBytes = 16;

}  // namespace avi
}  // namespace metainfo
