// The constant tables of the AAC syntax: scale factor band offsets, prediction
// limits and the Huffman codebooks (generated into aac_tables.cpp by
// gen_aac_tables.py).
#pragma once

#include <cstdint>

namespace metainfo {

// A node of a Huffman decoding tree. An inner node holds the indices of the
// nodes reached by a 0 bit and by a 1 bit; a leaf has kHuffLeaf set in `zero`
// and the codeword's index in the low bits. Node 0 is the root.
struct HuffNode {
    uint16_t zero;
    uint16_t one;
};
constexpr uint16_t kHuffLeaf = 0x8000;

// A spectral codebook (1..11): quads (dimension 4) or pairs (dimension 2) of
// values in -lav..lav (signed) or 0..lav with sign bits after the codeword;
// book 11 escapes the value 16.
struct SpectralBook {
    const HuffNode* tree;
    uint16_t nodes;
    uint8_t dimension;
    uint8_t lav;
    bool isSigned;
    bool escape;
};

constexpr int kSamplingIndexCount = 12;

// Indexed by sampling_frequency_index (0..11).
extern const uint8_t num_swb_long_window[kSamplingIndexCount];
extern const uint8_t num_swb_short_window[kSamplingIndexCount];
// num_swb + 1 offsets each; the last is 1024 (long) or 128 (short).
extern const uint16_t* const swb_offset_long_window[kSamplingIndexCount];
extern const uint16_t* const swb_offset_short_window[kSamplingIndexCount];
extern const uint8_t pred_sfb_max[kSamplingIndexCount];

// Scale factor codebook: leaves hold the differential value + 60 (0..120).
constexpr int kScaleFactorNodes = 241;
extern const HuffNode hcb_sf[kScaleFactorNodes];

// Indexed by codebook number; entry 0 is empty.
extern const SpectralBook hcb_table[12];

}  // namespace metainfo
