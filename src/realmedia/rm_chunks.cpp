// Decoders of the RealMedia header chunks and of the streams' type-specific data.
#include <cstring>
#include <new>

#include "core/byte_reader.h"
#include "core/codes.h"
#include "realmedia/rm_parser.h"

namespace metainfo {
namespace {

// Big-endian field of n bytes at offset at of a region of len bytes; bytes the
// region does not hold read as zero.
uint32_t FieldAt(const unsigned char* data, uint64_t len, uint64_t at, int n) {
    uint32_t v = 0;
    for (int i = 0; i < n; ++i) {
        uint64_t k = at + static_cast<uint64_t>(i);
        v = v << 8 | (k < len ? data[k] : 0u);
    }
    return v;
}

void CopyFourcc(const unsigned char* data, uint64_t len, uint64_t at, uint32_t n, unsigned char out[4]) {
    std::memset(out, 0, 4);
    for (uint32_t i = 0; i < n && i < 4; ++i) out[i] = static_cast<unsigned char>(FieldAt(data, len, at + i, 1));
}

// A counted text copied into a new buffer of n + 2 bytes ending in two zeros.
unsigned char* CopyText(const unsigned char* src, uint32_t n) {
    unsigned char* p = new (std::nothrow) unsigned char[uint64_t(n) + 2];
    if (p == nullptr) return nullptr;
    if (n != 0) std::memcpy(p, src, n);
    p[n] = 0;
    p[n + 1] = 0;
    return p;
}

void SetItem(_MMMetaItem* item, const unsigned char* text, uint32_t n) {
    uint32_t copy = n < MM_META_DATA_SIZE ? n : MM_META_DATA_SIZE;
    std::memcpy(item->szData, text, copy);
    item->nLength = copy;
    item->nEncoding = ENCODING_LATIN1;
}

struct CodecRow {
    char fourcc[5];
    uint32_t code;
};

const CodecRow kRmCodecs[] = {
    {"sipr", CODEC_RMAUDIO_SIPR}, {"cook", CODEC_RMAUDIO_COOK}, {"atrc", CODEC_RMAUDIO_ATRC},
    {"raac", CODEC_RMAUDIO_RAAC}, {"RV10", CODEC_RMVIDEO_RV10}, {"RV20", CODEC_RMVIDEO_RV20},
    {"RV30", CODEC_RMVIDEO_RV30}, {"RV40", CODEC_RMVIDEO_RV40},
};

}  // namespace

_MEDIA_PROPERTIES::_MEDIA_PROPERTIES() : MediaPropertiesFields() {}

_MEDIA_PROPERTIES::~_MEDIA_PROPERTIES() {
    delete[] stream_name;
    delete[] mime_type;
    delete[] type_specific_data;
}

void _MEDIA_PROPERTIES::TakeFrom(_MEDIA_PROPERTIES* other) {
    if (other == this) return;
    delete[] stream_name;
    delete[] mime_type;
    delete[] type_specific_data;
    static_cast<MediaPropertiesFields&>(*this) = *other;
    static_cast<MediaPropertiesFields&>(*other) = MediaPropertiesFields();
}

uint32_t RmCodecCode(const unsigned char fourcc[4]) {
    for (const CodecRow& row : kRmCodecs) {
        if (std::memcmp(row.fourcc, fourcc, 4) == 0) return row.code;
    }
    return 0;
}

int32_t anaProperties(const unsigned char* chunk, uint32_t size, _PROPERTIES* prop) {
    std::memset(prop, 0, sizeof *prop);
    prop->object_id = FieldAt(chunk, size, 0, 4);
    prop->size = FieldAt(chunk, size, 4, 4);
    prop->object_version = static_cast<uint16_t>(FieldAt(chunk, size, 8, 2));
    if (prop->object_version != 0) return 0;
    prop->max_bit_rate = FieldAt(chunk, size, 10, 4);
    prop->avg_bit_rate = FieldAt(chunk, size, 14, 4);
    prop->max_packet_size = FieldAt(chunk, size, 18, 4);
    prop->avg_packet_size = FieldAt(chunk, size, 22, 4);
    prop->num_packets = FieldAt(chunk, size, 26, 4);
    prop->duration = static_cast<int32_t>(FieldAt(chunk, size, 30, 4)) / 1000;
    prop->preroll = FieldAt(chunk, size, 34, 4) / 1000;
    prop->index_offset = FieldAt(chunk, size, 38, 4);
    prop->data_offset = FieldAt(chunk, size, 42, 4);
    prop->num_streams = static_cast<uint16_t>(FieldAt(chunk, size, 46, 2));
    prop->flags = static_cast<uint16_t>(FieldAt(chunk, size, 48, 2));
    return 0;
}

int32_t anaMediaProperties(const unsigned char* chunk, uint32_t size, _MEDIA_PROPERTIES* mp) {
    mp->object_id = FieldAt(chunk, size, 0, 4);
    mp->size = FieldAt(chunk, size, 4, 4);
    mp->object_version = static_cast<uint16_t>(FieldAt(chunk, size, 8, 2));
    if (mp->object_version != 0) return 0;
    mp->stream_number = static_cast<uint16_t>(FieldAt(chunk, size, 10, 2));
    mp->max_bit_rate = FieldAt(chunk, size, 12, 4);
    mp->avg_bit_rate = FieldAt(chunk, size, 16, 4);
    mp->max_packet_size = FieldAt(chunk, size, 20, 4);
    mp->avg_packet_size = FieldAt(chunk, size, 24, 4);
    mp->start_time = FieldAt(chunk, size, 28, 4);
    mp->preroll = FieldAt(chunk, size, 32, 4) / 1000;
    mp->duration = FieldAt(chunk, size, 36, 4) / 1000;

    // Each counted part must lie inside the chunk.
    ByteReader r(chunk, size);
    if (!r.Seek(40) || !r.U8(&mp->stream_name_size)) return kRmBadChunk;
    const uint8_t* name = r.Peek(mp->stream_name_size);
    if (name == nullptr) return kRmBadChunk;
    r.Skip(mp->stream_name_size);
    if (!r.U8(&mp->mime_type_size)) return kRmBadChunk;
    const uint8_t* mime = r.Peek(mp->mime_type_size);
    if (mime == nullptr) return kRmBadChunk;
    r.Skip(mp->mime_type_size);
    if (!r.BE32(&mp->type_specific_len)) return kRmBadChunk;
    const uint8_t* data = r.Peek(mp->type_specific_len);
    if (data == nullptr) return kRmBadChunk;

    mp->stream_name = CopyText(name, mp->stream_name_size);
    mp->mime_type = CopyText(mime, mp->mime_type_size);
    mp->type_specific_data = CopyText(data, mp->type_specific_len);
    if (mp->stream_name == nullptr || mp->mime_type == nullptr || mp->type_specific_data == nullptr) {
        return kRmReadFailed;
    }
    return 0;
}

int32_t anaContentHdr(const unsigned char* chunk, uint32_t size, _MMMetaInfo* meta) {
    if (FieldAt(chunk, size, 8, 2) != 0) return 0;
    static const int kItems[4] = {META_TITLE, META_ARTIST, META_COPYRIGHT, META_COMMENT};
    uint64_t at = 10;
    for (uint32_t k = 0; k < 4; ++k) {
        if (at + 2 > size) return kRmBadChunk;
        uint32_t n = FieldAt(chunk, size, at, 2);
        at += 2;
        // The text and every length word still to come must fit in the chunk.
        if (at + n + uint64_t{2} * (3 - k) > size) return kRmBadChunk;
        SetItem(&meta->aItems[kItems[k]], chunk + at, n);
        at += n;
    }
    return 0;
}

void parseRASingleSubstreamHdr(const unsigned char* data, uint32_t len, uint64_t at, _RA_OpaqueHdr* ra) {
    uint16_t version = static_cast<uint16_t>(FieldAt(data, len, at, 2));
    if (version == 4) {
        ra->version = version;
        ra->sample_rate = FieldAt(data, len, at + 44, 2);
        ra->sample_size = FieldAt(data, len, at + 48, 2);
        ra->channels = FieldAt(data, len, at + 50, 2);
        ra->codec_id_len = static_cast<uint8_t>(FieldAt(data, len, at + 57, 1));
        CopyFourcc(data, len, at + 58, ra->codec_id_len, ra->fourcc);
    } else if (version == 5) {
        ra->version = version;
        ra->sample_rate = FieldAt(data, len, at + 46, 2);
        ra->sample_size = FieldAt(data, len, at + 54, 2);
        ra->channels = FieldAt(data, len, at + 56, 2);
        ra->codec_id_len = 4;
        CopyFourcc(data, len, at + 62, 4, ra->fourcc);
    }
}

void parseRAOpaquedata(const unsigned char* data, uint32_t len, _RA_OpaqueHdr* ra) {
    std::memset(ra, 0, sizeof *ra);
    static const unsigned char kMark[4] = {0x2E, 0x72, 0x61, 0xFD};
    if (len >= 4 && std::memcmp(data, kMark, 4) == 0) {
        parseRASingleSubstreamHdr(data, len, 4, ra);
    } else if (len >= 4 && std::memcmp(data, "MLTI", 4) == 0) {
        uint32_t rules = FieldAt(data, len, 4, 2);
        parseRASingleSubstreamHdr(data, len, 16 + 2 * uint64_t(rules), ra);
    }
}

void parseRVSingleSubstreamHdr(const unsigned char* data, uint32_t len, uint64_t at, _RV_OpaqueHdr* rv) {
    rv->tag = FieldAt(data, len, at, 4);
    CopyFourcc(data, len, at + 4, 4, rv->fourcc);
    rv->width = static_cast<uint16_t>(FieldAt(data, len, at + 8, 2));
    rv->height = static_cast<uint16_t>(FieldAt(data, len, at + 10, 2));
    // Integer part of the 16.16 frame rate.
    if (rv->tag == 0x5649444Fu) {  // "VIDO"
        rv->frame_rate = FieldAt(data, len, at + 18, 2);
    }
}

void parseRVOpaquedata(const unsigned char* data, uint32_t len, _RV_OpaqueHdr* rv) {
    std::memset(rv, 0, sizeof *rv);
    if (len >= 4 && std::memcmp(data, "MLTI", 4) == 0) {
        uint32_t rules = FieldAt(data, len, 4, 2);
        parseRVSingleSubstreamHdr(data, len, 12 + 2 * uint64_t(rules), rv);
    } else {
        parseRVSingleSubstreamHdr(data, len, 4, rv);
    }
}

}  // namespace metainfo
