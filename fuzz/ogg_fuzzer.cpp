// Ogg files (Vorbis, Opus, FLAC, Theora streams) through the accurate
// interface. The input's last byte picks the suffix (bits 0-1) and, in bit 6,
// whether every page the input holds gets its right checksum first, so that
// mutated pages reach what the reader does behind its checksum test. Every
// picture found is copied.
#include <vector>

#include "ogg/ogg_page.h"
#include "support.h"

namespace {

const char* const kSuffixes[] = {".ogg", ".opus", ".oga", ".ogv"};

uint32_t Checksum(const uint8_t* p, size_t n) {
    uint32_t r = 0;
    for (size_t i = 0; i < n; ++i) {
        const uint8_t byte = i >= 22 && i < 26 ? 0 : p[i];
        r ^= static_cast<uint32_t>(byte) << 24;
        for (int bit = 0; bit < 8; ++bit) r = (r & 0x80000000u) != 0 ? (r << 1) ^ 0x04C11DB7u : r << 1;
    }
    return r;
}

std::vector<uint8_t> WithChecksums(const uint8_t* data, size_t size) {
    std::vector<uint8_t> b(data, data + size);
    for (size_t i = 0; i < b.size(); ++i) {
        metainfo::OggPage page;
        if (b[i] != 'O' || !metainfo::ParseOggPage(b.data() + i, b.size() - i, &page)) continue;
        const size_t whole = page.headerSize + page.bodySize;
        if (whole > b.size() - i) continue;
        const uint32_t crc = Checksum(b.data() + i, whole);
        for (int k = 0; k < 4; ++k) b[i + 22 + static_cast<size_t>(k)] = static_cast<uint8_t>(crc >> (8 * k));
    }
    return b;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    if (size == 0 || (data[size - 1] & 0x40) == 0) {
        fuzz::FuzzProbe(data, size, kSuffixes);
        return 0;
    }
    const std::vector<uint8_t> fixed = WithChecksums(data, size);
    fuzz::FuzzProbe(fixed.data(), fixed.size(), kSuffixes);
    return 0;
}
