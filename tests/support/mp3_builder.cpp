#include "support/mp3_builder.h"

#include <algorithm>

namespace testing_support {
namespace {

std::vector<uint8_t> FrameWith(const Mp3Shape& shape, size_t at, const Bytes& body) {
    std::vector<uint8_t> frame = Mp3Frame(shape);
    frame.resize(std::max(frame.size(), at + body.size()), 0);
    std::copy(body.data().begin(), body.data().end(), frame.begin() + static_cast<long>(at));
    return frame;
}

}  // namespace

std::vector<uint8_t> Mp3Frames(int count, const Mp3Shape& shape) {
    Bytes out;
    for (int i = 0; i < count; ++i) out.raw(Mp3Frame(shape));
    return out.data();
}

std::vector<uint8_t> XingFrame(const XingFields& xing, const Mp3Shape& shape) {
    Bytes body;
    body.str(xing.tag).be32(xing.flags);
    if (xing.flags & 1) body.be32(xing.frames);
    if (xing.flags & 2) body.be32(xing.bytes);
    for (int i = 0; (xing.flags & 4) && i < 100; ++i) body.u8(static_cast<uint32_t>(i * 256 / 100));
    if (xing.flags & 8) body.be32(xing.quality);
    const bool mono = shape.channelMode == 3;
    const size_t at = shape.version == 3 ? (mono ? 21 : 36) : (mono ? 13 : 21);
    return FrameWith(shape, at, body);
}

std::vector<uint8_t> VbriFrame(const VbriFields& v) {
    Bytes body;
    body.str("VBRI").le16(1).le16(v.delay).le16(75).be32(v.bytes).be32(v.frames);
    body.le16(10).le16(v.scale).le16(2).le16(v.framesPerEntry);
    return FrameWith({}, 36, body);
}

}  // namespace testing_support
