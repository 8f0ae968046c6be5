#include "support/mp4_accurate_builder.h"

namespace testing_support {

ByteVec Edts(uint32_t segment, int32_t mediaTime) {
    Bytes elst;
    elst.be32(1).be32(segment).be32(static_cast<uint32_t>(mediaTime)).be32(0x10000);
    return Box("edts", FullBox("elst", 0, 0, elst));
}

ByteVec TimedTrak(const std::string& handler, uint32_t timescale, uint64_t duration, const ByteVec& entry,
                  uint32_t count, uint32_t delta, uint32_t size, const ByteVec& edts, const ByteVec& more) {
    const ByteVec stbl = Box(
        "stbl",
        Join({Stsd({entry}), FullBox("stts", 0, 0, Bytes().be32(1).be32(count).be32(delta)), Stsz(size, count), more}));
    const ByteVec mdia = Box(
        "mdia", Join({Mdhd(duration > 0xFFFFFFFFu ? 1 : 0, timescale, duration), Hdlr(handler), Box("minf", stbl)}));
    const ByteVec tkhd = FullBox("tkhd", 0, 7, Bytes().zeros(20 + 52).be32(0).be32(0));
    return Box("trak", Join({tkhd, edts, mdia}));
}

ByteVec PackBits(std::initializer_list<std::pair<uint32_t, int>> fields) {
    ByteVec out;
    int used = 8;
    for (const auto& f : fields) {
        for (int bit = f.second - 1; bit >= 0; --bit) {
            if (used == 8) {
                out.push_back(0);
                used = 0;
            }
            out.back() = static_cast<uint8_t>(out.back() | ((f.first >> bit) & 1u) << (7 - used));
            ++used;
        }
    }
    return out;
}

ByteVec FreeformItem(const std::string& mean, const std::string& name, const std::string& value) {
    return Box("----", Join({FullBox("mean", 0, 0, Bytes().str(mean)), FullBox("name", 0, 0, Bytes().str(name)),
                             Box("data", Bytes().be32(1).be32(0).str(value))}));
}

ByteVec ItemList(const ByteVec& items) {
    return FullBox("meta", 0, 0,
                   Join({FullBox("hdlr", 0, 0, Bytes().be32(0).str("mdirappl").zeros(9)), Box("ilst", items)}));
}

}  // namespace testing_support
