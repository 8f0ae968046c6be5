// Small builders of media bytes that several formats' tests need.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "support/bytes.h"

namespace testing_support {

// One MPEG audio frame of the right size for its header, payload zeroed.
// version: 3 MPEG-1, 2 MPEG-2, 0 MPEG-2.5; layer: 1..3; channelMode 3 = mono.
struct Mp3FrameLayout {
    int version = 3;
    int layer = 3;
    int bitrateIndex = 9;  // 128 kbit/s for MPEG-1 Layer III
    int samplingIndex = 0;  // 44100 Hz for MPEG-1
    int padding = 0;
    int channelMode = 0;
    bool crc = false;
};
std::vector<uint8_t> Mp3Header(const Mp3FrameLayout& shape);
std::vector<uint8_t> Mp3Frame(const Mp3FrameLayout& shape);
uint32_t Mp3FrameSize(const Mp3FrameLayout& shape);

// An ID3v2 tag header (version 2..4) for a body of bodySize bytes, then the body.
std::vector<uint8_t> Id3v2Tag(int version, const std::vector<uint8_t>& body, uint8_t flags = 0);

// An ADTS frame: 7-byte header (9 with CRC) followed by payload.
struct AdtsFields {
    int profile = 1;  // 0 main, 1 LC, 2 SSR
    int samplingIndex = 4;  // 44100 Hz
    int channelConfig = 2;
    int mpegId = 0;  // 0 MPEG-4, 1 MPEG-2
    bool crc = false;
    int rawBlocks = 0;  // number_of_raw_data_blocks_in_frame
};
std::vector<uint8_t> AdtsFrame(const AdtsFields& shape, const std::vector<uint8_t>& payload);

// A silent AAC raw data block: one SCE with no bands, then END (4 bytes).
std::vector<uint8_t> SilentAacBlock();

}  // namespace testing_support
