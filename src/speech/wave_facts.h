// The facts of a RIFF or RF64 WAVE file: one walk over its chunks.
#pragma once

#include <cstdint>
#include <vector>

#include "core/facts.h"

namespace metainfo {

// Whether the first bytes start an RF64/BW64 WAVE file (64-bit sizes in a
// "ds64" chunk), which the MM_ detection does not take.
bool IsRf64Wave(const uint8_t* head, size_t n);

int32_t WaveFacts(const char* path, MediaFacts* facts);

// Where a WAVE file's samples lie, for copying a range of whole blocks.
struct WaveLayout {
    std::vector<uint8_t> format;  // the "fmt " body
    uint64_t dataOffset = 0;
    uint64_t dataSize = 0;  // whole blocks only
    uint32_t blockAlign = 0, rate = 0, samplesPerBlock = 0;
    bool pcm = false;  // no "fact" chunk needed
};

// False for a file that is no WAVE file with a format, data and blocks of a
// known sample count.
bool ReadWaveLayout(const char* path, WaveLayout* layout);

}  // namespace metainfo
