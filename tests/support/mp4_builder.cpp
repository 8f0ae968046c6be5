#include "support/mp4_builder.h"

#include <cstring>

namespace testing_support {

ByteVec Box(const std::string& type, const ByteVec& body) {
    return Bytes().be32(static_cast<uint32_t>(8 + body.size())).str(type).raw(body).data();
}

ByteVec FullBox(const std::string& type, uint8_t version, uint32_t flags, const ByteVec& body) {
    return Box(type, Bytes().u8(version).be24(flags).raw(body).data());
}

ByteVec Ftyp(const std::string& brand) { return Box("ftyp", Bytes().str(brand).be32(0).str(brand).str("mp41")); }

namespace {
ByteVec TimeHeader(const std::string& type, uint8_t version, uint32_t timescale, uint64_t duration, uint64_t creation,
                   size_t tail) {
    Bytes b;
    if (version == 1) {
        b.be64(creation).be64(creation).be32(timescale).be64(duration);
    } else {
        const auto created = static_cast<uint32_t>(creation);
        b.be32(created).be32(created).be32(timescale).be32(static_cast<uint32_t>(duration));
    }
    b.zeros(tail);
    return FullBox(type, version, 0, b);
}
}  // namespace

ByteVec Mvhd(uint8_t version, uint32_t timescale, uint64_t duration, uint64_t creation) {
    return TimeHeader("mvhd", version, timescale, duration, creation, 80);
}

ByteVec Mdhd(uint8_t version, uint32_t timescale, uint64_t duration, uint64_t creation) {
    return TimeHeader("mdhd", version, timescale, duration, creation, 4);
}

static ByteVec Tkhd(uint8_t version, uint32_t width, uint32_t height) {
    Bytes b;
    b.zeros(version == 1 ? 32 : 20);  // times, track ID, reserved, duration
    b.zeros(8 + 8 + 36);  // reserved, layer/group/volume, matrix
    b.be32(width << 16).be32(height << 16);
    return FullBox("tkhd", version, 7, b);
}

ByteVec Hdlr(const std::string& handler) {
    return FullBox("hdlr", 0, 0, Bytes().be32(0).str(handler).zeros(12).str("handler").u8(0));
}

ByteVec AudioEntry(const std::string& type, uint16_t channels, uint16_t bits, uint16_t rate, const ByteVec& children) {
    Bytes b;
    b.zeros(6).be16(1).zeros(8).be16(channels).be16(bits).zeros(4).be16(rate).be16(0).raw(children);
    return Box(type, b);
}

ByteVec VisualEntry(const std::string& type, uint16_t width, uint16_t height, const ByteVec& children) {
    Bytes b;
    b.zeros(6).be16(1).zeros(16).be16(width).be16(height).be32(0x480000).be32(0x480000).be32(0).be16(1);
    return Box(type, b.zeros(32).be16(0x18).be16(0xFFFF).raw(children));
}

// A descriptor: tag, then its length in 7-bit groups (high bit: more follow).
static Bytes Descriptor(uint8_t tag, const Bytes& body) {
    Bytes d;
    d.u8(tag);
    const size_t n = body.size();
    if (n >= 128) d.u8(0x80 | static_cast<uint8_t>(n >> 7));
    d.u8(static_cast<uint8_t>(n & 0x7F)).raw(body);
    return d;
}

ByteVec Esds(uint8_t objectType, uint32_t avgBitrate, const ByteVec& decoderInfo) {
    Bytes dsi;
    if (!decoderInfo.empty()) dsi = Descriptor(0x05, Bytes(decoderInfo));
    Bytes config;
    config.u8(objectType).u8(0x15).be24(0).be32(avgBitrate + 1000).be32(avgBitrate).raw(dsi);
    Bytes es;
    es.be16(1).u8(0).raw(Descriptor(0x04, config)).u8(0x06).u8(1).u8(2);
    return FullBox("esds", 0, 0, Descriptor(0x03, es).data());
}

ByteVec Stsd(std::initializer_list<ByteVec> entries) {
    Bytes b;
    b.be32(static_cast<uint32_t>(entries.size()));
    for (const ByteVec& e : entries) b.raw(e);
    return FullBox("stsd", 0, 0, b);
}

ByteVec Stsz(uint32_t sampleSize, uint32_t sampleCount, const std::vector<uint32_t>& sizes) {
    Bytes b;
    b.be32(sampleSize).be32(sampleCount);
    for (uint32_t s : sizes) b.be32(s);
    return FullBox("stsz", 0, 0, b);
}

ByteVec Trak(const std::string& handler, uint32_t timescale, uint32_t duration, const ByteVec& stblChildren,
             uint32_t width, uint32_t height) {
    ByteVec minf =
        Box("minf",
            Join({handler == "vide" ? FullBox("vmhd", 0, 1, Bytes().zeros(8)) : FullBox("smhd", 0, 0, Bytes().zeros(4)),
                  Box("stbl", stblChildren)}));
    ByteVec mdia = Box("mdia", Join({Mdhd(0, timescale, duration), Hdlr(handler), minf}));
    return Box("trak", Join({Tkhd(0, width, height), mdia}));
}

ByteVec TextBox(const std::string& type, const std::string& text) {
    return FullBox(type, 0, 0, Bytes().be16(0x15C7).str(text));
}

ByteVec IlstItem(const std::string& type, uint32_t dataType, const ByteVec& value) {
    return Box(type, Box("data", Bytes().be32(dataType).be32(0).raw(value)));
}

ByteVec Movie(const ByteVec& moovChildren, const ByteVec& after) {
    return Join({Ftyp(), Box("moov", moovChildren), after});
}

Mp4ClipWalk WalkClip(const std::string& path, bool refine) {
    metainfo::_ME_ClipInfoEx info;
    std::memset(&info, 0, sizeof info);
    Mp4ClipWalk walk;
    walk.result = metainfo::MP4_GetMediaInfo(path.c_str(), metainfo::kModeClip, &info);
    if (refine) metainfo::RefineClipInfo(&info);
    walk.clip = info.clip;
    if (info.tracks != nullptr) {
        metainfo::ListNode* n = &info.tracks->link;
        do {
            walk.nodes.push_back(*reinterpret_cast<metainfo::MP4TrackNode*>(n));
            n = n->next;
        } while (n != &info.tracks->link);
    }
    metainfo::FreeTrackList(&info);
    return walk;
}

}  // namespace testing_support
