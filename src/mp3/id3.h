// ID3 tags (v1/v1.1 and v2.2/2.3/2.4) into the shared metadata record. The
// MP4 and RealMedia readers reuse ParseID3V2 and ParseID3V1 on their own handles.
#pragma once

#include <cstdint>

#include "core/quirks.h"
#include "metainfo/records.h"

namespace metainfo {

// Parse context of a v2 tag.
struct ID3_MetaInfo {
    _MMMetaInfo* meta;  // record being filled
    uint32_t sizeBound;  // largest acceptable tag size (file size, or an embedding box's payload)
    uint32_t remaining;  // tag bytes not yet consumed
    uint32_t pictureLimit;  // 0: no pictures; else pictures above 0x80000 bytes only up to this size
    uint8_t version;  // 2, 3 or 4
    uint8_t unsync;  // tag-wide unsynchronisation
};

constexpr int kGenreCount = 148;
extern const char* const id3_strGenre[kGenreCount];

// Metadata slot of MP3 and AAC: v2 tag at the start, else the v1 tag at the end.
// 0 when a tag was read, 1 when none, MM_E_INVALIDARG for a null record or a
// file that cannot be opened.
int32_t ID3_GetMetaInfo(const char* path, _MMMetaInfo* meta, int pictureLimit);

// h positioned at a v2 tag header; ctx->meta, sizeBound and pictureLimit set.
// 0 success, 1 failure (items filled so far stay).
int32_t ParseID3V2(int h, ID3_MetaInfo* ctx);

// The v1 tag in the last 128 bytes of h. On success the record is replaced
// whole (a picture it held is released). 0; MM_E_OUTOFMEMORY when the last
// 128 bytes cannot be read; MM_E_FAIL without "TAG".
int32_t ParseID3V1(int h, _MMMetaInfo* meta);

// Sets up a context as ID3_GetMetaInfo does and clears the items' lengths and
// encodings, the picture fields, rating, play count and album artist.
// h, when not 0, is the file open from path (its size is then known without a stat).
int32_t ID3_InitMetaData(const char* path, _MMMetaInfo* meta, ID3_MetaInfo* ctx, int pictureLimit, int h = 0);

// One frame as the walker meets it; the file stands at its body.
struct ID3_Frame {
    uint32_t id;  // four characters, or three in v2.2 (FrameId)
    uint32_t size;  // the size its header states
    uint32_t stored;  // bytes its body takes in the file
    uint8_t flags;  // second flag byte (v2.3/2.4); 0 in v2.2
    bool unsync;  // the body is stored unsynchronised
};

// Takes the frames of a tag. It leaves the file after the body (the walker
// reads the next header from where it stands).
class ID3_FrameSink {
public:
    // MM_OK walks on; any other result ends the walk with it.
    virtual int32_t Frame(int h, const ID3_Frame& frame, ID3_MetaInfo* ctx) = 0;

protected:
    ~ID3_FrameSink() = default;
};

// The frames of the tag whose header ParseV2Header read, in file order.
// MM_OK at the tag's end, padding or the file's end; MM_E_FAIL for a frame
// that does not fit the tag; else what the sink returned.
int32_t WalkID3Frames(int h, ID3_MetaInfo* ctx, const Quirks& quirks, ID3_FrameSink* sink);

// Bytes of unsynchronised data (at most rawLength) that yield `want` plain
// bytes, as Sync reads them.
uint32_t UnsyncRawSpan(const uint8_t* raw, uint32_t rawLength, uint32_t want);

// Steps of ParseID3V2, visible for tests.
constexpr int32_t kID3ShortHeader = static_cast<int32_t>(0x80070005u);
int32_t ParseV2Header(int h, ID3_MetaInfo* ctx);
int32_t ParseV2Header(int h, ID3_MetaInfo* ctx, const Quirks& quirks);
int32_t ParseID3V2_2(int h, ID3_MetaInfo* ctx);
int32_t ParseID3V2_3(int h, ID3_MetaInfo* ctx);
int32_t ParseID3V2_4(int h, ID3_MetaInfo* ctx);
int32_t GetPicData(int h, uint32_t frameSize, ID3_MetaInfo* ctx, bool unsync);

}  // namespace metainfo
