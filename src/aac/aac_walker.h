// The raw_data_block walker: steps over the channel elements of an AAC block
// without decoding them, to reach the fill elements that may announce SBR.
#pragma once

#include <cstdint>

#include "aac/aac_bits.h"

namespace metainfo {

// Walker state: the caller sets kWalkPlain before walking; RawDataStream sets
// kWalkSbrFound when a fill element carries an SBR extension payload. Nothing
// sets 3 (AAC+ v2): parametric stereo is not detected.
constexpr uint32_t kWalkPlain = 1;
constexpr uint32_t kWalkSbrFound = 2;

// Element results: 0 when the element was walked, else one of these.
enum WalkError : int {
    kWalkTooManyGroups = 1,
    kWalkScaleFactorRange = 4,
    kWalkPulseStart = 5,
    kWalkBadCodeword = 10,
    kWalkBadCodebook = 11,
    kWalkMaxSfb = 16,
    kWalkBadSamplingIndex = 17,
    // The element ran into the end of the data read.
    kWalkOutOfData = -1,
};

int single_lfe_channel_element(AacBitReader* r, int samplingIndex);
int channel_pair_element(AacBitReader* r, int samplingIndex);
int coupling_channel_element(AacBitReader* r, int samplingIndex);

// Adds the channels of one program_config_element to *channels (a channel
// pair counts two) and writes its object_type. Always 0.
int program_config_element(AacBitReader* r, uint32_t* channels, uint32_t* objectType);

// Walks one raw_data_block up to and including its END element (then aligned
// to a byte). Element errors do not stop the walk: it goes on reading element
// ids where the element stopped. It ends at END or when the data runs out
// (r->exhausted). Always 1.
int RawDataStream(AacBitReader* r, uint32_t* walkerState, int samplingIndex);

}  // namespace metainfo
