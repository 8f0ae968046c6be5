// MPEG audio stream analysis: the stream kind (constant bit rate, Xing, VBRI),
// duration and bit rates, and the answers of the MP3 table slots.
#pragma once

#include <cstddef>
#include <cstdint>

#include "metainfo/records.h"
#include "mp3/mp3_frame.h"

namespace metainfo {

// The stream description that range extraction works from. The holder owns
// xingToc (array delete).
struct _MP3AudioInfo {
    uint32_t headerKind;  // copy of _FrameHeader_Info::headerKind
    uint32_t tagBytes;  // trailing ID3v1 tag: 128 or 0
    uint32_t firstFrameOffset;
    uint32_t avgBitRate;  // bit/s
    uint32_t fileSize;
    uint32_t duration;  // whole seconds
    uint32_t sampleRate;
    uint32_t samplesPerFrame;
    uint8_t* xingToc;  // 100 bytes, or null
    uint32_t totalFrames;
    uint32_t totalBytes;
    int32_t quality;  // -1 when the Xing header has none; VBRI scale word
    uint32_t frameSize;
    uint32_t xingFlags;
    uint32_t xingOffset;
    uint16_t vbriVersion, vbriDelay, vbriQuality;
    uint16_t vbriTocEntries, vbriTocEntrySize, vbriFramesPerEntry;
};

constexpr int kXingFramesOnly = 2;  // ParseXingHeader mode: frame count, no record
constexpr int kXingWholeRecord = 1;

// Distance of the Xing tag from the frame start: after the header and the
// side information.
uint32_t XingDistance(const _FrameHeader_Info& header);

// Sampled average bit rate (bit/s) of the frames in the 4096 bytes at start;
// 0 when no frame decodes there.
int32_t GetAvBitrate(int h, uint32_t start, int unused);

// tag points at "Xing" with `available` bytes behind it; fields the bytes do
// not hold read as 0. Returns the frame count (see the modes).
uint32_t ParseXingHeader(const uint8_t* tag, size_t available, _MP3AudioInfo* info, int mode);

int32_t GetAudioInfo_MP3(int h, const uint8_t* vbrTag, size_t available, _MP3AudioInfo* info,
                         const _FrameHeader_Info* header, uint32_t tagBytes);
int32_t GetClipInfo_MP3(int h, const uint8_t* vbrTag, size_t available, _MMClipInfo* clip,
                        const _FrameHeader_Info* header, uint32_t tagBytes);

// request: INFO_CLIPINFO (_MMClipInfo), INFO_MIMETYPE (_MM_MIMETYPE),
// INFO_CODECTYPE (_MM_CODECTYPE), INFO_MP3_AUDIO (_MP3AudioInfo).
int32_t GetMediaInfo_MP3(const char* path, void* out, int request);

int32_t MP3_GetClipInfo(const char* path, _MMClipInfo* clip);
int32_t MP3_GetMIMEType(const char* path, _MM_MIMETYPE* mime);
int32_t MP3_GetCodecType(const char* path, _MM_CODECTYPE* codec);
int32_t MP3_GetTrackType(const char* path, int* mask);

}  // namespace metainfo
