#include "support/ogg_builder.h"

#include <algorithm>

#include "support/flac_builder.h"

namespace testing_support {
namespace {

uint32_t OggCrc(const std::vector<uint8_t>& bytes) {
    uint32_t r = 0;
    for (const uint8_t byte : bytes) {
        r ^= uint32_t(byte) << 24;
        for (int b = 0; b < 8; ++b) r = (r & 0x80000000u) != 0 ? (r << 1) ^ 0x04C11DB7u : r << 1;
    }
    return r;
}

Bytes Page(uint8_t flags, uint64_t granule, uint32_t serial, uint32_t sequence, const std::vector<uint8_t>& lacing,
           const std::vector<uint8_t>& body) {
    Bytes page;
    page.str("OggS").u8(0).u8(flags).le64(granule).le32(serial).le32(sequence).le32(0).u8(
        static_cast<uint32_t>(lacing.size()));
    page.raw(lacing).raw(body);
    const uint32_t crc = OggCrc(page.data());
    for (int i = 0; i < 4; ++i) page.data()[22 + static_cast<size_t>(i)] = static_cast<uint8_t>(crc >> (8 * i));
    return page;
}

}  // namespace

Bytes OggStreamPages(uint32_t serial, const std::vector<Bytes>& packets, size_t segmentsPerPage, uint64_t lastGranule) {
    // Every lacing value with its bytes and whether it ends a packet.
    struct Segment {
        std::vector<uint8_t> bytes;
        bool ends;
    };
    std::vector<Segment> segments;
    for (const Bytes& packet : packets) {
        size_t at = 0;
        const std::vector<uint8_t>& d = packet.data();
        for (;;) {
            const size_t n = std::min<size_t>(255, d.size() - at);
            segments.push_back(
                {std::vector<uint8_t>(d.begin() + static_cast<long>(at), d.begin() + static_cast<long>(at + n)),
                 n < 255});
            at += n;
            if (n < 255) break;
        }
    }
    Bytes out;
    uint32_t sequence = 0;
    bool continued = false;
    for (size_t first = 0; first < segments.size(); first += segmentsPerPage) {
        const size_t last = std::min(segments.size(), first + segmentsPerPage);
        std::vector<uint8_t> lacing, body;
        bool endsPacket = false;
        for (size_t i = first; i < last; ++i) {
            lacing.push_back(static_cast<uint8_t>(segments[i].bytes.size()));
            body.insert(body.end(), segments[i].bytes.begin(), segments[i].bytes.end());
            endsPacket = endsPacket || segments[i].ends;
        }
        const bool final = last == segments.size();
        const uint8_t flags = static_cast<uint8_t>((continued ? 1 : 0) | (first == 0 ? 2 : 0) | (final ? 4 : 0));
        const uint64_t granule = final ? lastGranule : endsPacket ? 0 : ~uint64_t(0);
        out.raw(Page(flags, granule, serial, sequence++, lacing, body));
        continued = !segments[last - 1].ends;
    }
    return out;
}

Bytes VorbisIdPacket(uint32_t channels, uint32_t rate, uint32_t nominalBitRate) {
    Bytes b;
    b.u8(1).str("vorbis").le32(0).u8(channels).le32(rate).le32(0).le32(nominalBitRate).le32(0).u8(0xB8).u8(1);
    return b;
}

Bytes OpusHeadPacket(uint32_t channels, uint32_t preSkip, uint32_t inputRate, int16_t gain) {
    Bytes b;
    b.str("OpusHead").u8(1).u8(channels).le16(preSkip).le32(inputRate).le16(static_cast<uint16_t>(gain)).u8(0);
    return b;
}

Bytes FlacMappingPacket(uint32_t rate, uint32_t channels, uint32_t bitsPerSample) {
    Bytes b;
    b.u8(0x7F).str("FLAC").u8(1).u8(0).be16(1).str("fLaC");
    return b.raw(FlacBlock(0, FlacStreamInfo(rate, channels, bitsPerSample, 0)));
}

std::string Base64Picture(uint32_t type, const std::string& mime, const std::string& description,
                          const std::vector<uint8_t>& data) {
    const Bytes block = FlacPicture(type, mime, description, Bytes().raw(data));
    static const char kDigits[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string out;
    const std::vector<uint8_t>& d = block.data();
    for (size_t i = 0; i < d.size(); i += 3) {
        const uint32_t n =
            uint32_t(d[i]) << 16 | (i + 1 < d.size() ? uint32_t(d[i + 1]) << 8 : 0) | (i + 2 < d.size() ? d[i + 2] : 0);
        out += kDigits[n >> 18];
        out += kDigits[(n >> 12) & 63];
        out += i + 1 < d.size() ? kDigits[(n >> 6) & 63] : '=';
        out += i + 2 < d.size() ? kDigits[n & 63] : '=';
    }
    return out;
}

}  // namespace testing_support
