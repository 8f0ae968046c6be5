// MPEG audio frame headers: decoding one header and finding the stream's
// first frame behind any leading ID3v2 tags.
#pragma once

#include <cstdint>

namespace metainfo {

struct _FrameHeader_Info {
    uint8_t headerKind;  // 1 constant bit rate, 2 Xing, 3 VBRI
    uint8_t versionId;  // raw version bits: 0 MPEG-2.5, 2 MPEG-2, 3 MPEG-1
    uint8_t layerIndex;  // 0, 1, 2 for Layer I, II, III
    uint8_t channelMode;  // 3 = single channel
    uint8_t protectionBit;  // 1 = no CRC
    uint32_t firstFrameOffset;
    uint32_t bitRate;  // bit/s
    uint32_t sampleRate;
    uint32_t frameSize;  // padding included
    uint32_t samplesPerFrame;
    uint32_t xingOffset;
};

// Frame size in bytes (> 0), or MM_E_FAIL for a header that does not decode.
// *signature always receives layer, version and sampling index.
int32_t MP3GetFrameSize(const uint8_t* header, uint32_t* signature, _FrameHeader_Info* info);

// Positions the file after up to three chained leading ID3v2 tags.
int32_t CheckID3Header(int h);

// 0 when two consecutive frames of the same kind stand within the first 4096
// bytes after the leading tags; MM_E_UNSUPPORTED when not.
int32_t VerifyMP3(int h, const uint8_t* probe, _FrameHeader_Info* info);

// True for a byte pair that may start an MPEG audio frame and whose next
// three bytes hold no FF (an FF there cannot belong to a valid header).
bool IsMP3SyncCandidate(const uint8_t* p);

}  // namespace metainfo
