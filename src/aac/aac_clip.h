// Clip information and codec type of raw AAC files (ADIF and ADTS).
#pragma once

#include <cstdint>

#include "core/codes.h"
#include "metainfo/records.h"

namespace metainfo {

// Indexed by sampling_frequency_index; 0 for the reserved indices 12..15.
extern const uint32_t g_uSamplingFrequencyTable[16];
// Indexed by ADTS channel_configuration; configuration 0 gives 0xFFFFFFFF.
extern const uint32_t channelMapTab[8];

// The slot functions of the dispatch tables.
int32_t AAC_GetTrackType(const char* path, int* mask);
int32_t AAC_GetClipInfo(const char* path, _MMClipInfo* clip);
int32_t AAC_GetCodecType(const char* path, _MM_CODECTYPE* codec);
// Kept for callers of the old interface: does nothing.
int32_t Check_AAC_CodecType(const char* path, void* unused1, const uint8_t* buf, void* unused2, void* unused3);

// Walks the raw data blocks of the ADTS frame at `frame` (of which `available`
// bytes were read) while *walkerState is still 1, and writes its profile.
int AdtsFrame(const uint8_t* frame, int available, uint32_t* walkerState, uint32_t* profile);

// What the walk of a stream's first raw data blocks found: the walker state
// (1 before the walk) and the profile. With `walk` false the blocks are not
// walked again and the values are taken as they are.
struct AacWalk {
    uint32_t state = 1;
    uint32_t profile = 0;
    bool walk = true;
};

// Fill the clip info from the first ADTS frame / the ADIF header found at
// `offset` in buf, of which bytesRead bytes hold file data. clip->nFileSize
// must be set; skippedTagBytes is what the duration leaves out.
int32_t UnpackADTSHeader(const uint8_t* buf, int bytesRead, int offset, _MMClipInfo* clip, uint32_t skippedTagBytes,
                         AacWalk* walk);
int32_t UnpackADIFHeader(const uint8_t* buf, int bytesRead, int offset, _MMClipInfo* clip, uint32_t skippedTagBytes,
                         AacWalk* walk);

// Reads the stream from the handle's position (just after any ID3v2 tag).
// *codec holds the walker state (1) on entry and the codec code on return.
int32_t ParseClipInfo(int h, _MMClipInfo* clip, uint32_t skippedTagBytes, uint32_t* codec, uint32_t* profile);

}  // namespace metainfo
