// ASF (WMA/WMV): one walk of the Header Object answers clip information,
// track types, codec type and metadata.
#pragma once

#include <cstdint>

#include "metainfo/records.h"

namespace metainfo {

// Query modes of the header walk.
enum AsfMode : uint16_t {
    kAsfModeMeta = 1,
    kAsfModeClip = 2,
    kAsfModeTrack = 3,
    kAsfModeCodec = 5,
};

// Slot-4 entry points.
int32_t ASF_GetClipInfo(const char* path, _MMClipInfo* clip);
int32_t ASF_GetTrackType(const char* path, int* mask);
int32_t ASF_GetCodecType(const char* path, _MM_CODECTYPE* codec);
int32_t ASF_GetMetaInfo(const char* path, _MMMetaInfo* meta, int pictureLimit);

// One object of the Header Object as the facts walk meets it.
struct AsfObjectRef {
    const uint8_t* guid;
    int64_t start;  // where its GUID stands in the file
    uint64_t size;  // at least the object header, and inside the Header Object
};

// Receives each object of the facts walk, the file standing just after the
// object's size; the walk goes on at the object's end whatever it reads.
class AsfObjectVisitor {
public:
    virtual ~AsfObjectVisitor() = default;
    virtual int32_t Object(int h, const AsfObjectRef& object) = 0;
};

// The header walk for facts: the same opening and object count as the
// query modes, every object bounded by the Header Object's size. 0, -1 when
// the header is broken, or the visitor's failure. fileSize: the file's size.
int32_t ASF_WalkHeader(const char* path, AsfObjectVisitor* visitor, uint64_t* fileSize);

// The walk: 0, or -1 on any failure. out is the record of the mode (mode 3:
// the 32-bit track-type bits); flag is the picture size allowance of mode 1.
int32_t ASF_GetMediaInfo(const char* path, uint16_t mode, void* out, int32_t flag);

// Object handlers of the clip-information mode; the file stands just after
// the object's GUID (ASF_GetSteamType: at a Stream Type field).
int32_t ASF_ParseFilePropertyObj(int h, _MMClipInfo* clip);

// The File Properties fields both answers use.
struct AsfFileFields {
    uint64_t fileSize;
    uint64_t playDuration;  // 100-ns units
    uint32_t preroll;  // milliseconds (the low half of its 64-bit field)
    uint32_t maxBitrate;
};
constexpr uint32_t kAsfFileFieldsSize = 88;  // from the object's size field
// b: the object from its size field on, kAsfFileFieldsSize bytes.
AsfFileFields ASF_DecodeFileFields(const uint8_t* b);
int32_t ASF_ParseStreamPropertyObj(int h, _MMClipInfo* clip);
int32_t ASF_GetVideoIndex(int h, uint32_t* videoStream);
uint32_t ASF_GetSteamType(int h);
int32_t ASF_ParseStreamBiterateObj(int h, _MMClipInfo* clip, uint32_t videoStream);
int32_t ASF_ParseExtStreamPropertyObj(int h, _MMClipInfo* clip, uint32_t videoStream);

// Narrows UTF-16LE text in place to its low bytes; returns the count kept.
uint32_t ASF_unicode2ascii(uint8_t* buf, uint32_t length);
// 1 when the lengths are equal and the bytes match, else 0.
int ASF_IsEqualName(const uint8_t* bytes, const char* name, uint32_t length, uint32_t nameLength);

}  // namespace metainfo
