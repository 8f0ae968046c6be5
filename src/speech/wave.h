// RIFF WAVE files with PCM, ADPCM, A-law or mu-law content: MIME, codec, clip
// information, and a range of whole seconds cut into a buffer or a new file.
#pragma once

#include <cstddef>
#include <cstdint>

#include "metainfo/records.h"

namespace metainfo {

struct _FormatChunk {
    uint32_t nChunkId;
    uint32_t nChunkSize;
    uint16_t wFormatTag;
    uint16_t nChannels;
    uint32_t nSamplesPerSec;
    uint32_t nAvgBytesPerSec;
    uint16_t nBlockAlign;
    uint16_t wBitsPerSample;
    // Where the range extraction starts counting: the position of the "data"
    // chunk id plus the sizes of the chunks before "fmt " (counted again).
    uint32_t nDataOffset;
};

// Request 0x781: what range extraction needs.
struct _WaveAudioInfo {
    uint32_t nDuration;  // whole seconds
    uint32_t nChunkId;
    uint32_t nChunkSize;
    uint16_t wFormatTag;
    uint16_t nChannels;
    uint32_t nSamplesPerSec;
    uint16_t nBlockAlign;
    uint16_t wBitsPerSample;
    uint32_t nDataOffset;
    uint32_t nAvgBytesPerSec;
};

// Output modes of GetAudioData_WAVE.
constexpr int kWaveToBuffer = 0x791;
constexpr int kWaveToFile = 0x792;

int32_t ParseFormatChunk(const uint8_t* buffer, size_t length, _FormatChunk* format);
// Requests 2, 4, 5 and 0x781.
int32_t GetMediaInfo_WAVE(const char* path, void* out, int request);
// Mode 0x791: *data receives a new buffer of *size bytes. Mode 0x792: *data
// is the output path.
int32_t GetAudioData_WAVE(const char* path, int startSec, int endSec, unsigned char** data, int* size, int mode);

int32_t WAVE_GetClipInfo(const char* path, _MMClipInfo* clip);
int32_t WAVE_GetMIMEType(const char* path, _MM_MIMETYPE* mime);
int32_t WAVE_GetCodecType(const char* path, _MM_CODECTYPE* codec);
int32_t WAVE_GetTrackType(const char* path, int* mask);
int32_t WAVE_GetAudioData2Buf(const char* path, int startSec, int endSec, unsigned char** data, int* size);

}  // namespace metainfo
