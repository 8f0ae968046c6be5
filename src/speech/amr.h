// AMR speech files in the storage format of RFC 4867 (narrow-band, wide-band
// and their multi-channel forms): MIME, codec, clip information, and a range
// of whole seconds cut into a buffer or a new AMR file.
#pragma once

#include <cstddef>
#include <cstdint>

#include "core/audio_frames.h"
#include "core/facts.h"
#include "metainfo/records.h"

namespace metainfo {

// File kinds, by magic.
constexpr int kAmrNarrowBand = 0;  // "#!AMR\n"
constexpr int kAmrWideBand = 1;  // "#!AMR-WB\n"
constexpr int kAmrNarrowBandMulti = 2;  // "#!AMR_MC1.0\n"
constexpr int kAmrWideBandMulti = 3;  // "#!AMR-WB_MC1.0\n"

// One parsed frame header with the file it came from.
struct _AMR_FrameInfo {
    int nFileType;
    int nFrameType;
    uint32_t nHeaderLen;
    uint32_t nFrameSize;  // bytes, header byte included
    uint32_t nChannels;
    int nQuality;
    uint32_t nBitrate;
};

// Request 0x3001: what range extraction needs.
struct _AMR_AudioInfo {
    uint32_t nDuration;  // whole seconds
    int nFileType;
    int nFrameType;
    uint32_t nHeaderLen;
    uint32_t nFrameSize;  // of the first frame
    uint32_t nChannels;
    uint32_t nBlockSize;  // average bytes per 20 ms block, the unit of every cut
};

// Output modes of GetAudioData_AMR.
constexpr int kAmrToBuffer = 0x700;
constexpr int kAmrToFile = 0x701;

// Average bytes of a 20 ms block over data (one frame per channel), leaving
// out the largest and the smallest block when there are more than two.
int Get_avBlockSize(const uint8_t* data, int kind, size_t length, uint32_t channels);

// Requests 2, 4, 5 and 0x3001.
int32_t GetMediaInfo_AMR(const char* path, void* out, int request);
// Mode 0x700: *data receives a new buffer of *size bytes. Mode 0x701: *data
// is the output path.
int32_t GetAudioData_AMR(const char* path, int startSec, int endSec, unsigned char** data, int* size, int mode);

int32_t AMR_GetClipInfo(const char* path, _MMClipInfo* clip);
int32_t AMR_GetMIMEType(const char* path, _MM_MIMETYPE* mime);
int32_t AMR_GetCodecType(const char* path, _MM_CODECTYPE* codec);
int32_t AMR_GetTrackType(const char* path, int* mask);

// Shows every block (one frame per channel) to visit; *rate gets the
// sampling rate, *prefix the bytes before the first frame (magic and channel
// description). False when the file is no AMR storage file.
bool WalkAmrFrames(const char* path, uint32_t* rate, uint64_t* prefix, const FrameVisitor& visit);

// The accurate facts: every frame counted (estimated past 16 MiB).
int32_t AmrFacts(const char* path, MediaFacts* facts);
int32_t AMR_GetAudioData2Buf(const char* path, int startSec, int endSec, unsigned char** data, int* size);

}  // namespace metainfo
