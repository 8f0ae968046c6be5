#include "support/flac_builder.h"

#include <cstdio>

#include "metainfo/probe.h"

namespace testing_support {

Bytes FlacBlock(uint8_t type, const Bytes& body, bool last) {
    return Bytes().u8(type | (last ? 0x80u : 0u)).be24(static_cast<uint32_t>(body.size())).raw(body);
}

Bytes FlacStreamInfo(uint32_t rate, uint32_t channels, uint32_t bits, uint64_t samples) {
    const uint64_t packed = uint64_t{rate} << 44 | uint64_t{channels - 1} << 41 | uint64_t{bits - 1} << 36 | samples;
    return Bytes().be16(4096).be16(4096).be24(0).be24(0).be64(packed).zeros(16);
}

Bytes VorbisComments(const std::vector<std::string>& entries) {
    Bytes b;
    b.le32(6).str("vendor").le32(static_cast<uint32_t>(entries.size()));
    for (const std::string& e : entries) b.le32(static_cast<uint32_t>(e.size())).str(e);
    return b;
}

Bytes FlacPicture(uint32_t type, const std::string& mime, const std::string& description, const Bytes& image) {
    Bytes b;
    b.be32(type).be32(static_cast<uint32_t>(mime.size())).str(mime);
    b.be32(static_cast<uint32_t>(description.size())).str(description).be32(1).be32(1).be32(24).be32(0);
    return b.be32(static_cast<uint32_t>(image.size())).raw(image);
}

Bytes AiffChunk(const std::string& id, const Bytes& body) {
    Bytes b;
    b.str(id).be32(static_cast<uint32_t>(body.size())).raw(body);
    return body.size() % 2 != 0 ? b.u8(0) : b;
}

Bytes AiffForm(const std::string& kind, const std::vector<Bytes>& chunks) {
    Bytes body;
    body.str(kind);
    for (const Bytes& c : chunks) body.raw(c);
    return Bytes().str("FORM").be32(static_cast<uint32_t>(body.size())).raw(body);
}

Bytes AiffComm(uint16_t channels, uint32_t frames, uint16_t bits, uint32_t rate, const std::string& compression) {
    Bytes b;
    b.be16(channels).be32(frames).be16(bits);
    int shift = 0;
    uint64_t mantissa = rate;
    while (mantissa != 0 && (mantissa & (uint64_t{1} << 63)) == 0) {
        mantissa <<= 1;
        ++shift;
    }
    b.be16(rate == 0 ? 0 : static_cast<uint32_t>(16383 + 63 - shift)).be64(mantissa);
    if (!compression.empty()) b.str(compression).u8(0).u8(0);
    return b;
}

Bytes ApeTag(const std::vector<ApeItem>& items, uint32_t version) {
    Bytes body;
    for (const ApeItem& i : items) {
        body.le32(static_cast<uint32_t>(i.value.size())).le32(i.binary ? 2 : 0).str(i.key).u8(0).raw(i.value);
    }
    const auto size = static_cast<uint32_t>(body.size() + 32);
    return body.str("APETAGEX").le32(version).le32(size).le32(static_cast<uint32_t>(items.size())).le32(0).zeros(8);
}

std::string ProbeSummary(const std::string& path) {
    mi_info* info = nullptr;
    const int probed = mi_probe(path.c_str(), &info);
    if (probed != MI_OK) return "error " + std::to_string(probed);
    std::string s = std::string(info->format) + " " + info->mime + " " + std::to_string(info->duration_ms) +
                    (info->duration_exact != 0 ? "" : "~");
    for (size_t i = 0; i < info->stream_count; ++i) {
        const mi_stream& t = info->streams[i];
        s += " | " + std::string(t.codec) + " " + std::to_string(t.sample_rate) + "x" + std::to_string(t.channels) +
             "x" + std::to_string(t.bits_per_sample) + " " + std::to_string(t.bit_rate);
    }
    auto text = [](const char* p) { return std::string(p != nullptr ? p : ""); };
    s += " | " + text(info->title) + ";" + text(info->artist) + ";" + text(info->album) + ";" +
         text(info->album_artist) + ";" + text(info->genre) + ";" + text(info->date) + ";" +
         std::to_string(info->year) + ";" + std::to_string(info->track) + "/" + std::to_string(info->track_total) +
         ";" + std::to_string(info->disc) + "/" + std::to_string(info->disc_total) + ";" + text(info->comment) + ";" +
         text(info->composer);
    for (size_t i = 0; i < info->tag_count; ++i) s += " " + text(info->tags[i].key) + "=" + text(info->tags[i].value);
    for (size_t i = 0; i < info->picture_count; ++i) {
        const mi_picture& p = info->pictures[i];
        std::vector<uint8_t> bytes(static_cast<size_t>(p.size));
        size_t got = 0;
        s += " | " + text(p.mime) + " " + std::to_string(p.type) + " " + text(p.description) + " " +
             std::to_string(p.size) + " ";
        if (mi_picture_copy(path.c_str(), info, i, bytes.data(), bytes.size(), &got) != MI_OK) s += "nocopy";
        for (size_t k = 0; k < got && k < 4; ++k) {
            char hex[3];
            std::snprintf(hex, sizeof hex, "%02x", bytes[k]);
            s += hex;
        }
    }
    mi_info_free(info);
    return s;
}

}  // namespace testing_support
