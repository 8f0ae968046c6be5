#include "support/avi_builder.h"

#include <cstdio>

namespace testing_support {

Bytes RiffChunk(const std::string& id, const Bytes& body) {
    Bytes out;
    out.str(id).le32(static_cast<uint32_t>(body.size())).raw(body);
    if (body.size() & 1) out.u8(0);
    return out;
}

Bytes RiffList(const std::string& type, const std::vector<Bytes>& children, const std::string& id) {
    Bytes body;
    body.str(type);
    for (const Bytes& c : children) body.raw(c);
    return Bytes().str(id).le32(static_cast<uint32_t>(body.size())).raw(body);
}

static Bytes AviMainHeader(const AviMainFields& s) {
    Bytes body;
    body.le32(s.microSecPerFrame).le32(0).le32(0).le32(s.flags).le32(s.totalFrames).le32(0).le32(s.streams);
    return RiffChunk("avih", body.le32(0).le32(s.width).le32(s.height).zeros(16));
}

static Bytes AviStreamHeader(const AviStreamFields& s) {
    Bytes body;
    body.str(s.type).str(s.handler).le32(0).le32(0).le32(0).le32(s.scale).le32(s.rate).le32(0).le32(s.length);
    return RiffChunk("strh", body.le32(0).le32(0xFFFFFFFF).le32(s.sampleSize).zeros(8));
}

AviStreamFields AviVideoStream(uint32_t scale, uint32_t rate, uint32_t length) {
    return {"vids", "FMP4", scale, rate, length, 0};
}

AviStreamFields AviAudioStream(uint32_t avgBytesPerSec, uint32_t length) {
    return {"auds", std::string(4, '\0'), 1, avgBytesPerSec, length, 1};
}

Bytes AviVideoFormat(uint32_t width, uint32_t height, const std::string& compression, const Bytes& extra) {
    Bytes body;
    body.le32(40 + static_cast<uint32_t>(extra.size())).le32(width).le32(height).le16(1).le16(24).str(compression);
    return RiffChunk("strf", body.le32(width * height * 3).le32(0).le32(0).le32(0).le32(0).raw(extra));
}

Bytes AviAudioFormat(uint16_t formatTag, uint16_t channels, uint32_t sampleRate, uint32_t avgBytesPerSec,
                     uint16_t blockAlign, uint16_t bits) {
    Bytes body;
    body.le16(formatTag).le16(channels).le32(sampleRate).le32(avgBytesPerSec).le16(blockAlign).le16(bits).le16(0);
    return RiffChunk("strf", body);
}

Bytes AviStrl(const AviStreamFields& shape, const Bytes& strf) {
    return RiffList("strl", {AviStreamHeader(shape), strf});
}

Bytes AviHdrl(const AviMainFields& main, const std::vector<Bytes>& lists) {
    std::vector<Bytes> children{AviMainHeader(main)};
    children.insert(children.end(), lists.begin(), lists.end());
    return RiffList("hdrl", children);
}

static std::string AviChunkId(uint32_t stream, const std::string& type) {
    char id[8];
    std::snprintf(id, sizeof id, "%02u", stream % 100);
    return std::string(id) + type;
}

std::vector<uint8_t> AviFile(const Bytes& hdrl, const std::vector<AviFrame>& frames, bool withIndex) {
    Bytes movi;
    movi.str("movi");
    Bytes index;
    for (const AviFrame& f : frames) {
        uint32_t offset = static_cast<uint32_t>(movi.size());  // from the "movi" type word
        std::string id = AviChunkId(f.stream, f.type);
        movi.raw(RiffChunk(id, f.data));
        index.str(id).le32(f.flags).le32(offset).le32(static_cast<uint32_t>(f.data.size()));
    }
    Bytes body;
    body.str("AVI ").raw(hdrl).str("LIST").le32(static_cast<uint32_t>(movi.size())).raw(movi);
    if (withIndex) body.raw(RiffChunk("idx1", index));
    return Bytes().str("RIFF").le32(static_cast<uint32_t>(body.size())).raw(body).data();
}

std::vector<uint8_t> AviVideoOnly(uint32_t n, uint32_t keyEvery, uint32_t scale, uint32_t rate) {
    AviMainFields main;
    main.totalFrames = n;
    Bytes hdrl = AviHdrl(main, {AviStrl(AviVideoStream(scale, rate, n), AviVideoFormat(16, 16, "FMP4"))});
    std::vector<AviFrame> frames;
    for (uint32_t i = 0; i < n; ++i) {
        Bytes data;
        data.be32(i).fill(i % 7, static_cast<uint8_t>(i));
        frames.push_back({0, "dc", data, keyEvery != 0 && i % keyEvery == 0 ? 0x10u : 0u});
    }
    return AviFile(hdrl, frames);
}

AviParserHandle::AviParserHandle() { CreateAVIParserObject(&p_); }
AviParserHandle::~AviParserHandle() { FreeAVIParserObject(p_); }

int32_t AviParserHandle::OpenIndexed(const std::string& path) {
    int32_t r = p_->init(path.c_str(), nullptr);
    if (r == MM_OK) r = p_->locateChunk("movi");
    if (r == MM_OK) r = p_->parseMovi(p_->getFileHandle());
    if (r == MM_OK) r = p_->locateChunk("idx1");
    if (r == MM_OK) r = p_->parseIdx1(p_->getFileHandle());
    return r;
}

}  // namespace testing_support
