#include "ogg/ogg_page.h"

#include <array>

#include "core/byte_reader.h"

namespace metainfo {
namespace {

// The page checksum: polynomial 0x04C11DB7, MSB first, no reflection, zero start.
std::array<uint32_t, 256> MakeCrcTable() {
    std::array<uint32_t, 256> t{};
    for (uint32_t i = 0; i < 256; ++i) {
        uint32_t r = i << 24;
        for (int b = 0; b < 8; ++b) r = (r & 0x80000000u) != 0 ? (r << 1) ^ 0x04C11DB7u : r << 1;
        t[i] = r;
    }
    return t;
}

}  // namespace

bool ParseOggPage(const uint8_t* p, size_t n, OggPage* page) {
    if (n < kOggHeaderSize || !BytesEqual(p, "OggS", 4) || p[4] != 0) return false;
    page->flags = p[5];
    page->granule = ReadLE64(p + 6);
    page->serial = ReadLE32(p + 14);
    page->sequence = ReadLE32(p + 18);
    page->crc = ReadLE32(p + 22);
    page->segmentCount = p[26];
    page->headerSize = kOggHeaderSize + page->segmentCount;
    if (n < page->headerSize) return false;
    page->lacing = p + kOggHeaderSize;
    page->bodySize = 0;
    for (size_t i = 0; i < page->segmentCount; ++i) page->bodySize += page->lacing[i];
    return true;
}

bool OggCrcMatches(const uint8_t* p, size_t n, uint32_t crc) {
    static const std::array<uint32_t, 256> table = MakeCrcTable();
    uint32_t r = 0;
    for (size_t i = 0; i < n; ++i) {
        // The checksum field itself counts as zeros.
        const uint8_t byte = i >= 22 && i < 26 ? 0 : p[i];
        r = (r << 8) ^ table[((r >> 24) ^ byte) & 0xFFu];
    }
    return r == crc;
}

}  // namespace metainfo
