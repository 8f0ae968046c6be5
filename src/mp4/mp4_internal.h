// MP4 / 3GPP boxes: records and box readers shared by the walk, the sample
// descriptions, the user-data metadata and the maker boxes.
#pragma once

#include <cstddef>
#include <cstdint>

#include "core/list_node.h"
#include "core/quirks.h"
#include "core/file_memo.h"
#include "metainfo/records.h"

namespace metainfo {

constexpr uint32_t FourCC(const char (&s)[5]) {
    return uint32_t(uint8_t(s[0])) << 24 | uint32_t(uint8_t(s[1])) << 16 | uint32_t(uint8_t(s[2])) << 8 |
           uint32_t(uint8_t(s[3]));
}

// Walk modes (what one walk gathers).
enum Mp4Mode { kModeMeta = 1, kModeClip = 2, kModeTrackType = 3, kModeMaker = 8 };

// Result codes of the box readers besides those of records.h.
constexpr int32_t kMp4NotOpened = -1;
constexpr int32_t kMp4BadFirstBox = -2;
constexpr int32_t kMp4ShortRead = -4;
constexpr int32_t kMp4BadIlst = -6;
constexpr int32_t kMp4BadContainer = -7;
constexpr int32_t kMp4BadMode = -8;
constexpr int32_t kMp4BadEntry = -9;

struct _BOXHEADER {
    uint32_t size;
    uint32_t type;
    uint32_t largeSizeHigh;
    uint32_t largeSizeLow;
};

struct _MP4BOX {
    uint32_t size;
    uint32_t type;
    uint32_t largeSizeHigh;
    uint32_t largeSizeLow;
    uint8_t userType[16];
};

struct _MP4FULLBOX {
    _MP4BOX box;
    uint8_t version;
    uint32_t flags;
};

struct _FILETYPEBOX {
    _MP4BOX box;
    uint32_t majorBrand;
    uint32_t minorVersion;
    uint32_t* compatibleBrands;
    uint32_t brandCount;
};

// One node per "trak" of a clip-information walk.
struct MP4TrackNode {
    ListNode link;
    uint32_t kind;  // 1 audio, 16 video, 0 other
    uint32_t ordinal;
    uint32_t codec;
    uint32_t codecDetail;
    uint32_t bitrate;
    uint32_t sampleRateOrWidth;
    uint32_t channelsOrHeight;
    uint32_t bitsOrFrameRate;
};

struct Mp4Truth;

struct _ME_ClipInfoEx {
    _MMClipInfo clip;
    MP4TrackNode* tracks;  // head of the ring, null without "trak"
    // Set by a codec query, which walks the same boxes but reports no bit
    // rate: no sample-size table is summed for it.
    bool codecOnly;
    // The accurate reader's record, filled by the same walk; null for MM_ calls.
    Mp4Truth* truth;
};

// The node being filled: the last one of the ring (null without any).
MP4TrackNode* CurrentTrack(_ME_ClipInfoEx* info);
void FreeTrackList(_ME_ClipInfoEx* info);
void RefineClipInfo(_ME_ClipInfoEx* info);

// A whole box read into memory: at most what the box declares and the file
// still holds from the box start.
struct BoxBuffer {
    uint8_t* data = nullptr;
    size_t size = 0;
    BoxBuffer() = default;
    BoxBuffer(const BoxBuffer&) = delete;
    BoxBuffer& operator=(const BoxBuffer&) = delete;
    ~BoxBuffer() { delete[] data; }
};
// What an element of size bytes at start holds before the file ends.
uint64_t BytesHeld(int64_t start, uint64_t size);
// Reads size bytes from the current position. Returns false when the buffer
// cannot be allocated; out->size tells how many bytes the file gave.
bool ReadBoxBuffer(int h, uint32_t size, BoxBuffer* out);
// Reads the box at the current position whole when it has the expected type
// and a size below the file's. Each reader answers its own codes for a wrong
// box (badBox) and a buffer it cannot have (noMemory). *size: the box's size.
int32_t ReadWholeBox(int h, uint32_t type, int32_t badBox, int32_t noMemory, BoxBuffer* buf, uint32_t* size);

// Box headers. Reads the header at the current position and leaves the
// stream after its first 8 bytes. Bytes missing at the end of the file read
// as 0, and the result is then 0 instead of 8: a walk must stop there, as the
// box's start can no longer be told from the stream's position.
int getBoxHeader(int h, _BOXHEADER* header);
// Header length (8, 16; "uuid" 12 or 20), 1 for a size of 0, 0 when the
// buffer is too short for the header.
int AnaBox(const uint8_t* buf, size_t avail, _MP4BOX* box);
int AnaFullBox(const uint8_t* buf, size_t avail, _MP4FULLBOX* box);
int32_t AnaFileType(const uint8_t* buf, size_t avail, _FILETYPEBOX* ftyp);

// Position helpers over the file being walked.
int64_t Tell(int h);
void SeekTo(int h, int64_t pos);
// Sizes that no box of this file can have.
bool BadBoxSize(uint32_t size);

// Walks the children of a box whose content runs up to end, starting at the
// current position. For each child, the stream stands at the child start and
// visit(type, start, size) is called; the stream is then put at the child end.
// A child of size 0 or of the file's size or more ends the walk with
// MM_E_FAIL.
template <typename Visit>
int32_t WalkChildren(int h, int64_t end, Visit&& visit) {
    // Each child has a size of at least 1 and starts before the file's end,
    // so every step moves strictly forward.
    for (int64_t start = Tell(h); start >= 0 && start < end; start = Tell(h)) {
        _BOXHEADER child{};
        if (getBoxHeader(h, &child) == 0 || BadBoxSize(child.size)) return MM_E_FAIL;
        SeekTo(h, start);
        visit(child.type, start, child.size);
        SeekTo(h, start + child.size);
    }
    return MM_OK;
}

// The walk (mp4_walk.cpp).
int32_t MP4_ParseFile(int h, int mode, void* out);
// Opens path and walks it; *key (when given) tells what was walked.
int32_t MP4_GetMediaInfo(const char* path, int mode, void* out, FileMemoKey* key = nullptr);
// Walks the file open as h from the start.
int32_t Mp4WalkOpened(int h, const char* path, int mode, void* out);
int32_t MP4_GetMediaInfoFd(int fd, int mode, void* out);
int32_t AnaMvhd(int h, _ME_ClipInfoEx* info);
int32_t AnaMdhd(int h, _ME_ClipInfoEx* info);
int32_t AnaTkhd(int h, _ME_ClipInfoEx* info);
int32_t AnaHdlr(int h, uint32_t* handlerType);

// The codec query (mp4_codec.cpp).
// Keeps the codec answer the clip walk of key's file gave: the codec query of
// the same settled file, which walks the same boxes, then takes it.
void RememberCodecAnswer(const FileMemoKey& key, int32_t walk, const _ME_ClipInfoEx& info);

// Sample descriptions (mp4_sample.cpp).
int32_t AnaStsd(int h, uint32_t handlerType, _ME_ClipInfoEx* info);
int32_t AnaStsz(int h, uint32_t handlerType, _ME_ClipInfoEx* info);
int32_t AnaESDBox(const uint8_t* esds, size_t avail, int kind, _ME_ClipInfoEx* info);
size_t AnaBaseDescriptor(const uint8_t* descriptor, size_t avail);

struct mp4AudioSpecificConfig {
    uint8_t audioObjectType;
    uint8_t samplingFrequencyIndex;
    uint32_t samplingFrequency;
    uint8_t channelConfiguration;
    uint8_t frameLengthFlag;
    uint8_t dependsOnCoreCoder;
    uint16_t coreCoderDelay;
    uint8_t extensionFlag;
    int8_t sbrPresentFlag;
    uint8_t implicitSbr;
    uint8_t psPresentFlag;
};
// bits must hold kAscBufferSize readable bytes (zero padding past the data).
constexpr size_t kAscBufferSize = 512;
int32_t AudioSpecificConfig(const uint8_t* bits, mp4AudioSpecificConfig* asc, const Quirks& quirks);

// The fields of an "esds" box (from its header); dsi: the decoder-specific
// information, null when the box ends before it.
struct EsdsFields {
    uint8_t objectType = 0;
    uint32_t maxBitrate = 0;
    uint32_t avgBitrate = 0;
    const uint8_t* dsi = nullptr;
    size_t dsiAvail = 0;
};
// MM_OK once the bit rates are read; kMp4BadEntry when not an "esds".
int32_t ReadEsds(const uint8_t* esds, size_t avail, EsdsFields* fields);

// User data (mp4_udta.cpp).
int32_t AnaUdta(int h, int mode, void* out);
int32_t AnaMeta(int h, _MMMetaInfo* meta);
int32_t AnaIlst(int h, _MMMetaInfo* meta);
int32_t AnaID32(int h, _MMMetaInfo* meta);
uint32_t judgeLangue(const char* data);
void GenreToString(_MMMetaItem* item);
// A 3GPP text box ("titl", "albm", ...) whole in buf: its text's bytes
// (album: without the trailing track byte). False when it is not one.
bool Read3gppText(const uint8_t* buf, size_t avail, bool album, const uint8_t** text, size_t* length);
// A "yrrc" box whole in buf.
bool Read3gppYear(const uint8_t* buf, size_t avail, uint16_t* year);

// Maker boxes (mp4_maker.cpp).
int32_t AnaMaker(int h, _MAKERINFO* maker);
// Releases the buffers of a maker record filled by AnaMaker.
void FreeMakerBuffers(_MAKERINFO* maker);

}  // namespace metainfo
