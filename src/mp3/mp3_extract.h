// Copying a time range of an MP3 stream into a buffer or a playable file.
#pragma once

#include <cstdint>

#include "mp3/mp3_info.h"

namespace metainfo {

// Byte offsets in the source: [start, end).
struct _DataRange {
    uint32_t start;
    uint32_t end;
};

constexpr int kMP3ToBuffer = 1937;
constexpr int kMP3ToFile = 1938;

// Audio-data slot: bare frames of [startSec, endSec) into a new buffer.
int32_t MP3_GetAudioData2Buf(const char* path, int startSec, int endSec, unsigned char** data, int* size);

// target: unsigned char** for kMP3ToBuffer, the output path for kMP3ToFile.
int32_t GetAudioData_MP3(const char* path, int startSec, int endSec, void* target, int* size, int mode);

// Byte range of [startSec, *endSec); *endSec is cut to the duration. Both
// offsets are moved to the next frame sync and kept within the audio.
int32_t GetMP3DataPos(int h, const _MP3AudioInfo* info, int startSec, int* endSec, _DataRange* range);

int32_t WriteDataToFile(int h, const char* outPath, const _MP3AudioInfo* info, const _DataRange* range,
                        uint32_t timeSpan);
void WriteXingHeader(int h, int out, const _MP3AudioInfo* info, uint8_t* scratch, uint32_t timeSpan, uint32_t byteSpan);
void Int2Str(uint8_t* out, uint32_t value);

}  // namespace metainfo
