#include "support/ebml_builder.h"

#include <cstring>

namespace testing_support {

namespace {
Bytes& Id(Bytes& b, uint32_t id) {
    for (int shift = 24; shift >= 0; shift -= 8) {
        if ((id >> shift) != 0) b.u8(id >> shift);
    }
    return b;
}
}  // namespace

Bytes Ebml(uint32_t id, const Bytes& body, bool unknownSize) {
    Bytes b;
    Id(b, id);
    const uint64_t n = body.size();
    if (unknownSize) {
        b.u8(0x01).fill(7, 0xFF);
    } else if (n < 0x7F) {
        b.u8(0x80 | static_cast<uint32_t>(n));
    } else if (n < 0x3FFF) {
        b.be16(0x4000 | static_cast<uint32_t>(n));
    } else {
        b.u8(0x01).u8(0).u8(0).u8(0).be32(static_cast<uint32_t>(n));
    }
    return b.raw(body);
}

Bytes EbmlUint(uint32_t id, uint64_t v) {
    Bytes body;
    int bytes = 1;
    while (bytes < 8 && (v >> (8 * bytes)) != 0) ++bytes;
    for (int i = bytes - 1; i >= 0; --i) body.u8(static_cast<uint32_t>(v >> (8 * i)));
    return Ebml(id, body);
}

Bytes EbmlFloat(uint32_t id, double v, bool single) {
    Bytes body;
    if (single) {
        const float f = static_cast<float>(v);
        uint32_t bits = 0;
        std::memcpy(&bits, &f, sizeof bits);
        body.be32(bits);
    } else {
        uint64_t bits = 0;
        std::memcpy(&bits, &v, sizeof bits);
        body.be64(bits);
    }
    return Ebml(id, body);
}

Bytes EbmlText(uint32_t id, const std::string& s) { return Ebml(id, Bytes().str(s)); }

Bytes EbmlDocHeader(const std::string& docType) {
    return Ebml(0x1A45DFA3, Bytes()
                                .raw(EbmlUint(0x4286, 1))
                                .raw(EbmlUint(0x42F2, 4))
                                .raw(EbmlUint(0x42F3, 8))
                                .raw(EbmlText(0x4282, docType))
                                .raw(EbmlUint(0x4287, 4)));
}

}  // namespace testing_support
