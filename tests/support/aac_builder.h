// Builders of AAC syntax for tests: raw data block elements written bit by
// bit, ADIF headers with program configuration elements, ADTS files.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "support/media.h"

namespace testing_support {

// Writes fields most significant bit first.
class BitWriter {
public:
    BitWriter& put(uint32_t value, int bits);
    BitWriter& align();
    size_t bitSize() const { return bits_; }
    const std::vector<uint8_t>& bytes() const { return data_; }

private:
    std::vector<uint8_t> data_;
    size_t bits_ = 0;
};

// A single channel element (or LFE with id 3) of one long window without any
// band: 29 bits.
void PutSilentSce(BitWriter& w, int id = 0);
// A channel pair of two such channels, with or without a common window.
void PutSilentCpe(BitWriter& w, bool commonWindow);
// A fill element of payloadBytes bytes whose first four bits are extensionType.
void PutFill(BitWriter& w, int extensionType, int payloadBytes);
// A data stream element of count zero bytes.
void PutDataStream(BitWriter& w, int count, bool byteAlign);
// The END element, then byte alignment.
void PutEnd(BitWriter& w);

// A raw data block: one silent SCE (or CPE when stereo), an optional fill
// element, END; padded with a plain fill element to exactly `bytes` bytes
// when bytes is not 0 (at least 11 bytes, 13 for a CPE).
std::vector<uint8_t> AacBlock(bool stereo, int sbrExtension = 0, size_t bytes = 0);

// One program_config_element.
struct PceLayout {
    int objectType = 1;
    int samplingIndex = 4;
    std::vector<bool> front;  // is_cpe of each front element
    std::vector<bool> side;
    std::vector<bool> back;
    int lfe = 0;
    int assocData = 0;
    int validCc = 0;
    bool monoMixdown = false;
    std::string comment;
};

struct AdifLayout {
    bool copyright = false;
    bool variableRate = false;
    uint32_t bitrate = 128000;  // 23 bits
    uint32_t bufferFullness = 0;
    std::vector<PceLayout> pces{PceLayout{}};
};
// The ADIF header, its program configuration elements and the first raw data block.
std::vector<uint8_t> AdifFile(const AdifLayout& layout, const std::vector<uint8_t>& firstBlock);

// ADTS frames, one per entry of sizes (each at least 18 bytes: 7 header + 11 block).
std::vector<uint8_t> AdtsFrames(const AdtsFields& layout, const std::vector<size_t>& sizes, int sbrExtension = 0);
AdtsFields AdtsLayout(int samplingIndex, int channelConfig, int profile = 1);
// n frames of the smallest kind: header and a silent block, 11 bytes.
std::vector<uint8_t> SilentAdts(int n, const AdtsFields& shape = {});

}  // namespace testing_support
