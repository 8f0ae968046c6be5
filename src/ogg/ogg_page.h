// Ogg pages: the fixed header, its segment table and checksum, read from a
// file at a 64-bit position.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace metainfo {

constexpr size_t kOggHeaderSize = 27;
// Header, a full segment table and 255 segments of 255 bytes.
constexpr size_t kOggMaxPage = kOggHeaderSize + 255 + size_t{255} * 255;
constexpr uint64_t kOggNoGranule = ~uint64_t(0);  // no packet ends on the page

struct OggPage {
    uint8_t flags = 0;  // 1 continued packet, 2 first page of a stream, 4 last
    uint64_t granule = kOggNoGranule;
    uint32_t serial = 0;
    uint32_t sequence = 0;
    uint32_t crc = 0;
    uint8_t segmentCount = 0;
    const uint8_t* lacing = nullptr;  // segmentCount lacing values
    size_t headerSize = 0;  // fixed header and segment table
    size_t bodySize = 0;
};

// The page whose capture starts at p (n bytes available): capture, version 0
// and a whole segment table. The body may lie past n.
bool ParseOggPage(const uint8_t* p, size_t n, OggPage* page);

// True when the page's n = headerSize + bodySize bytes at p carry its checksum.
bool OggCrcMatches(const uint8_t* p, size_t n, uint32_t crc);

}  // namespace metainfo
