#include "support/rm_builder.h"

#include <string>

namespace testing_support {

Bytes RmChunk(const std::string& id, const Bytes& body) {
    return Bytes().str(id).be32(static_cast<uint32_t>(body.size() + 8)).raw(body);
}

static Bytes RmProp(const RmProps& p) {
    Bytes body;
    body.be16(p.version).be32(p.maxBitRate).be32(p.avgBitRate).be32(1400).be32(700).be32(100);
    body.be32(p.durationMs).be32(2000).be32(0).be32(0).be16(p.numStreams).be16(0);
    return RmChunk("PROP", body);
}

Bytes RmMdpr(const RmStream& s) {
    Bytes body;
    body.be16(s.version).be16(s.number).be32(s.maxBitRate).be32(s.avgBitRate).be32(1400).be32(700).be32(0);
    body.be32(3000).be32(s.durationMs).u8(static_cast<uint32_t>(s.name.size())).str(s.name);
    body.u8(static_cast<uint32_t>(s.mime.size())).str(s.mime);
    body.be32(static_cast<uint32_t>(s.typeData.size())).raw(s.typeData);
    return RmChunk("MDPR", body);
}

Bytes RmCont(const std::string& title, const std::string& author, const std::string& copyright,
             const std::string& comment) {
    Bytes body;
    body.be16(0);
    for (const std::string* s : {&title, &author, &copyright, &comment}) {
        body.be16(static_cast<uint32_t>(s->size())).str(*s);
    }
    return RmChunk("CONT", body);
}

namespace {

// Bytes 0..43 of a RealAudio header: magic, version, ".raN", the header
// version again, its size, and the fields the readers step over.
Bytes RaPreamble(int version) {
    Bytes b;
    b.u8(0x2E).u8(0x72).u8(0x61).u8(0xFD).be16(static_cast<uint16_t>(version)).be16(0);
    b.str(".ra" + std::to_string(version)).be32(0).be16(static_cast<uint16_t>(version)).be32(0x4E);
    b.be16(0).be32(0).zeros(12);  // through 35
    b.be16(1).be16(0).be16(0).be16(0);  // 36..43
    return b;
}

}  // namespace

Bytes RaHeaderV4(uint16_t sampleRate, uint16_t sampleSize, uint16_t channels, const std::string& fourcc) {
    Bytes b = RaPreamble(4);
    b.be16(sampleRate).be16(0).be16(sampleSize).be16(channels);  // 44..51
    b.u8(4).str("Int0").u8(static_cast<uint32_t>(fourcc.size())).str(fourcc);  // 52..
    return b;
}

Bytes RaHeaderV5(uint16_t sampleRate, uint16_t sampleSize, uint16_t channels, const std::string& fourcc) {
    Bytes b = RaPreamble(5);
    b.be16(0).be16(sampleRate).be16(0).be16(0);  // 44..51
    b.be16(0).be16(sampleSize).be16(channels);  // 52..57
    b.str("Int0").str(fourcc);  // 58..65
    return b;
}

Bytes RvHeader(const std::string& fourcc, uint16_t width, uint16_t height, uint16_t fps) {
    Bytes b;
    b.be32(34).str("VIDO").str(fourcc).be16(width).be16(height).be16(12).be32(0).be16(fps).be16(0).be32(0);
    return b.be16(8).zeros(4);
}

Bytes RmMulti(uint16_t rules, const Bytes& substream) {
    Bytes b;
    b.str("MLTI").be16(rules);
    for (uint16_t i = 0; i < rules; ++i) b.be16(0);
    b.be16(1).be32(static_cast<uint32_t>(substream.size())).raw(substream);
    return b;
}

std::vector<uint8_t> RmFile(const RmProps& props, const std::vector<Bytes>& chunks, size_t dataBytes) {
    Bytes out;
    out.raw(RmChunk(".RMF", Bytes().be16(0).be32(0).be32(static_cast<uint32_t>(chunks.size() + 3)))).raw(RmProp(props));
    for (const Bytes& c : chunks) out.raw(c);
    out.raw(RmChunk("DATA", Bytes().be16(0).be32(0).be32(0).zeros(dataBytes)));
    return out.data();
}

}  // namespace testing_support
