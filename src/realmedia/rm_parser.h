// RealMedia header chunks (".RMF", "PROP", "MDPR", "CONT") and the answers
// of media type 2. All multi-byte fields are big-endian.
#pragma once

#include <cstdint>

#include "metainfo/records.h"

namespace metainfo {

// Results of RM_GetMediaInfo besides 0 and the shared codes.
constexpr int32_t kRmNotRealMedia = -1;  // cannot open, no ".RMF", bad header size
constexpr int32_t kRmBadHeader = -2;  // version, header count, or no "PROP" next
constexpr int32_t kRmBadChunk = -3;  // chunk size, past the end, malformed "CONT"
constexpr int32_t kRmReadFailed = -4;  // out of memory or short read

struct _PROPERTIES {
    uint32_t object_id;
    uint32_t size;
    uint16_t object_version;
    uint32_t max_bit_rate;
    uint32_t avg_bit_rate;
    uint32_t max_packet_size;
    uint32_t avg_packet_size;
    uint32_t num_packets;
    int32_t duration;  // whole seconds
    uint32_t preroll;  // whole seconds
    uint32_t index_offset;
    uint32_t data_offset;
    uint16_t num_streams;
    uint16_t flags;
};

// The media properties' fields, plain so that they move as one block.
struct MediaPropertiesFields {
    uint32_t object_id;
    uint32_t size;
    uint16_t object_version;
    uint16_t stream_number;
    uint32_t max_bit_rate;
    uint32_t avg_bit_rate;
    uint32_t max_packet_size;
    uint32_t avg_packet_size;
    uint32_t start_time;
    uint32_t preroll;  // whole seconds
    uint32_t duration;  // whole seconds
    uint8_t stream_name_size;
    unsigned char* stream_name;  // stream_name_size + 2 bytes, two zeros after the text
    uint8_t mime_type_size;
    unsigned char* mime_type;  // same rule
    uint32_t type_specific_len;
    unsigned char* type_specific_data;  // type_specific_len + 2 bytes
};

struct _MEDIA_PROPERTIES : MediaPropertiesFields {
    _MEDIA_PROPERTIES();
    ~_MEDIA_PROPERTIES();
    _MEDIA_PROPERTIES(const _MEDIA_PROPERTIES&) = delete;
    _MEDIA_PROPERTIES& operator=(const _MEDIA_PROPERTIES&) = delete;
    // Takes over other's buffers, leaving other empty.
    void TakeFrom(_MEDIA_PROPERTIES* other);
};

// First audio substream header.
struct _RA_OpaqueHdr {
    uint16_t version;
    uint32_t sample_rate;
    uint32_t sample_size;
    uint32_t channels;
    uint8_t codec_id_len;
    unsigned char fourcc[4];
};

// First video substream header.
struct _RV_OpaqueHdr {
    uint32_t tag;
    unsigned char fourcc[4];
    uint16_t width;
    uint16_t height;
    uint32_t frame_rate;
};

// Decoders over a whole chunk of size bytes (the buffer holds at least that).
int32_t anaProperties(const unsigned char* chunk, uint32_t size, _PROPERTIES* prop);
int32_t anaMediaProperties(const unsigned char* chunk, uint32_t size, _MEDIA_PROPERTIES* mp);
int32_t anaContentHdr(const unsigned char* chunk, uint32_t size, _MMMetaInfo* meta);

// Type-specific data of len bytes; fields the data does not hold read as zero.
void parseRAOpaquedata(const unsigned char* data, uint32_t len, _RA_OpaqueHdr* ra);
void parseRASingleSubstreamHdr(const unsigned char* data, uint32_t len, uint64_t at, _RA_OpaqueHdr* ra);
void parseRVOpaquedata(const unsigned char* data, uint32_t len, _RV_OpaqueHdr* rv);
void parseRVSingleSubstreamHdr(const unsigned char* data, uint32_t len, uint64_t at, _RV_OpaqueHdr* rv);

// Codec code of a RealMedia FourCC, 0 when the table has none.
uint32_t RmCodecCode(const unsigned char fourcc[4]);

// request: 1 meta, 2 clip, 3 track type, 4 MIME, 5 codec.
int32_t RM_GetMediaInfo(const char* path, uint16_t request, void* out);

// Dispatch-table entries: 0 on success, 1 on any failure (clip info passes
// the worker's result through).
int32_t RM_GetMetaInfo(const char* path, _MMMetaInfo* meta, int pictureLimit);
int32_t RM_GetClipInfo(const char* path, _MMClipInfo* clip);
int32_t RM_GetTrackType(const char* path, int* mask);
int32_t RM_GetMIMEType(const char* path, _MM_MIMETYPE* mime);
int32_t RM_GetCodecType(const char* path, _MM_CODECTYPE* codec);

}  // namespace metainfo
