#include "support/media.h"

namespace testing_support {
namespace {

const int kBitrates[2][3][16] = {
    {{0, 32, 64, 96, 128, 160, 192, 224, 256, 288, 320, 352, 384, 416, 448, 0},
     {0, 32, 48, 56, 64, 80, 96, 112, 128, 160, 192, 224, 256, 320, 384, 0},
     {0, 32, 40, 48, 56, 64, 80, 96, 112, 128, 160, 192, 224, 256, 320, 0}},
    {{0, 32, 48, 56, 64, 80, 96, 112, 128, 144, 160, 176, 192, 224, 256, 0},
     {0, 8, 16, 24, 32, 40, 48, 56, 64, 80, 96, 112, 128, 144, 160, 0},
     {0, 8, 16, 24, 32, 40, 48, 56, 64, 80, 96, 112, 128, 144, 160, 0}},
};
const int kRates[3][3] = {{44100, 48000, 32000}, {22050, 24000, 16000}, {11025, 12000, 8000}};

}  // namespace

std::vector<uint8_t> Mp3Header(const Mp3FrameLayout& s) {
    uint8_t layerBits = static_cast<uint8_t>(4 - s.layer);  // Layer I = 3, III = 1
    return {0xFF, static_cast<uint8_t>(0xE0 | s.version << 3 | layerBits << 1 | (s.crc ? 0 : 1)),
            static_cast<uint8_t>(s.bitrateIndex << 4 | s.samplingIndex << 2 | s.padding << 1),
            static_cast<uint8_t>(s.channelMode << 6)};
}

uint32_t Mp3FrameSize(const Mp3FrameLayout& s) {
    int lsf = s.version == 3 ? 0 : 1;
    int row = s.version == 3 ? 0 : (s.version == 2 ? 1 : 2);
    int bitrate = kBitrates[lsf][s.layer - 1][s.bitrateIndex] * 1000;
    int rate = kRates[row][s.samplingIndex];
    if (s.layer == 1) return static_cast<uint32_t>((12 * bitrate / rate + s.padding) * 4);
    int coefficient = (s.layer == 3 && lsf) ? 72 : 144;
    return static_cast<uint32_t>(coefficient * bitrate / rate + s.padding);
}

std::vector<uint8_t> Mp3Frame(const Mp3FrameLayout& shape) {
    std::vector<uint8_t> frame = Mp3Header(shape);
    frame.resize(Mp3FrameSize(shape), 0);
    return frame;
}

std::vector<uint8_t> Id3v2Tag(int version, const std::vector<uint8_t>& body, uint8_t flags) {
    Bytes b;
    b.str("ID3").u8(static_cast<uint32_t>(version)).u8(0).u8(flags).syncsafe32(static_cast<uint32_t>(body.size()));
    return b.raw(body).data();
}

std::vector<uint8_t> AdtsFrame(const AdtsFields& s, const std::vector<uint8_t>& payload) {
    uint32_t headerSize = s.crc ? 9 : 7;
    uint32_t length = headerSize + static_cast<uint32_t>(payload.size());
    std::vector<uint8_t> h(headerSize, 0);
    h[0] = 0xFF;
    h[1] = static_cast<uint8_t>(0xF0 | s.mpegId << 3 | (s.crc ? 0 : 1));
    h[2] = static_cast<uint8_t>(s.profile << 6 | s.samplingIndex << 2 | (s.channelConfig >> 2));
    h[3] = static_cast<uint8_t>(static_cast<uint32_t>(s.channelConfig & 3) << 6 | (length >> 11));
    h[4] = static_cast<uint8_t>(length >> 3);
    h[5] = static_cast<uint8_t>((length & 7) << 5 | 0x1F);
    h[6] = static_cast<uint8_t>(0xFC | (s.rawBlocks & 3));
    h.insert(h.end(), payload.begin(), payload.end());
    return h;
}

std::vector<uint8_t> SilentAacBlock() { return {0x00, 0xC8, 0x00, 0x07}; }

}  // namespace testing_support
