#include "support/mp3_builder.h"

#include <cstring>

namespace testing_support {

std::vector<uint8_t> Mp3Frames(const Mp3FrameSpec& shape, int count) {
    std::vector<uint8_t> out;
    const std::vector<uint8_t> frame = Mp3Frame(shape);
    for (int i = 0; i < count; ++i) out.insert(out.end(), frame.begin(), frame.end());
    return out;
}

uint32_t XingDistanceFor(const Mp3FrameSpec& shape) {
    const bool mono = shape.channelMode == 3;
    if (shape.version == 3) return mono ? 21 : 36;
    return mono ? 13 : 21;
}

std::vector<uint8_t> XingFrame(const Mp3FrameSpec& shape, const XingSpec& xing) {
    std::vector<uint8_t> frame = Mp3Frame(shape);
    Bytes body;
    body.str(xing.tag).be32(xing.flags);
    if (xing.flags & 1) body.be32(xing.frames);
    if (xing.flags & 2) body.be32(xing.bytes);
    if (xing.flags & 4) {
        if (xing.toc.size() == 100) {
            body.raw(xing.toc);
        } else {
            for (int i = 0; i < 100; ++i) body.u8(static_cast<uint32_t>(i * 256 / 100));
        }
    }
    if (xing.flags & 8) body.be32(xing.quality);
    const uint32_t at = XingDistanceFor(shape);
    if (frame.size() < at + body.size()) frame.resize(at + body.size(), 0);
    std::memcpy(frame.data() + at, body.data().data(), body.size());
    return frame;
}

std::vector<uint8_t> VbriFrame(const Mp3FrameSpec& shape, const VbriSpec& v) {
    std::vector<uint8_t> frame = Mp3Frame(shape);
    Bytes body;
    body.str("VBRI").le16(v.version).le16(v.delay).le16(v.quality).be32(v.bytes).be32(v.frames);
    body.le16(v.entries).le16(v.scale).le16(v.entrySize).le16(v.framesPerEntry);
    if (frame.size() < 36 + body.size()) frame.resize(36 + body.size(), 0);
    std::memcpy(frame.data() + 36, body.data().data(), body.size());
    return frame;
}

}  // namespace testing_support
