/* libmetainfo: records, codes and vocabularies shared by every query.
 *
 * All records are plain data that the caller allocates and the library fills.
 * A record is cleared by filling it with zero bytes. */
#ifndef METAINFO_RECORDS_H
#define METAINFO_RECORDS_H

#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

#if defined(_WIN32)
#define MM_EXPORT __declspec(dllexport)
#else
#define MM_EXPORT __attribute__((visibility("default")))
#endif

/* Result codes (COM style; any non-zero value is a failure). */
#define MM_OK ((int32_t)0)
#define MM_E_INVALIDARG ((int32_t)0x80070057u)
#define MM_E_FAIL ((int32_t)0x80004005u)
#define MM_E_UNSUPPORTED ((int32_t)0x800700E7u)
#define MM_E_NOEXTENSION ((int32_t)0x80004003u)
#define MM_E_NOTPROVIDED ((int32_t)0x80004002u)
#define MM_E_NOTIMPL ((int32_t)0x80004001u)
#define MM_E_OUTOFMEMORY ((int32_t)0x8007000Eu)

/* Media type codes: also the slot index into the dispatch tables. */
typedef enum MediaType {
    MEDIA_TYPE_NONE = 0,
    MEDIA_TYPE_MP3 = 1,
    MEDIA_TYPE_REALMEDIA = 2,
    MEDIA_TYPE_MP4 = 3,
    MEDIA_TYPE_ASF = 4,
    MEDIA_TYPE_MIDI = 5,
    MEDIA_TYPE_AAC = 6,
    MEDIA_TYPE_WAVE = 7,
    MEDIA_TYPE_AMR_NB = 8,
    MEDIA_TYPE_AMR_WB = 9,
    MEDIA_TYPE_IMELODY = 10,
    MEDIA_TYPE_AVI = 11,
    MEDIA_TYPE_QCP = 12,
    MEDIA_TYPE_EVRC = 13,
    MEDIA_TYPE_UNUSED14 = 14,
    MEDIA_TYPE_SND = 15,
    MEDIA_TYPE_UNKNOWN = 255
} MediaType;

#define MM_MEDIA_SLOTS 16

/* Track-type bits of the track-type query. */
#define TRACK_AUDIO 0x1
#define TRACK_VIDEO 0x10

/* Request codes passed to each format's worker. */
typedef enum InfoRequest {
    INFO_METADATA = 1,
    INFO_CLIPINFO = 2,
    INFO_TRACKTYPE = 3,
    INFO_MIMETYPE = 4,
    INFO_CODECTYPE = 5,
    INFO_MAKERINFO = 8,
    INFO_WAVE_AUDIO = 0x781,
    INFO_MP3_AUDIO = 0xF01,
    INFO_AMR_AUDIO = 0x3001
} InfoRequest;

/* Encodings of a metadata item's payload (the nEncoding values). */
typedef enum TextEncoding {
    ENCODING_BINARY = 0, /* little-endian integer of nLength bytes */
    ENCODING_RAW = 2, /* raw 8-bit bytes / ASCII */
    ENCODING_LATIN1 = 3, /* ISO-8859-1 */
    ENCODING_UTF16BE = 4, /* UTF-16 big-endian, FE FF mark kept when present */
    ENCODING_UTF8 = 5,
    ENCODING_UTF16LE = 6
} TextEncoding;

/* Index into _MMMetaInfo.aItems. */
typedef enum MetaItemKind {
    META_TITLE = 0,
    META_ARTIST = 1,
    META_ALBUM = 2,
    META_GENRE = 3,
    META_YEAR = 4,
    META_COPYRIGHT = 5,
    META_RESERVED6 = 6,
    META_COMPOSER = 7,
    META_TRACKNUMBER = 8,
    META_LANGUAGE = 9,
    META_COMMENT = 10,
    META_FILETYPE = 11,
    META_CONDUCTOR = 12,
    META_PUBLISHER = 13,
    META_DATE = 14,
    META_TIME = 15,
    META_PICTURE_FORMAT = 16
} MetaItemKind;

#define MM_META_ITEMS 17
#define MM_META_DATA_SIZE 128

/* Sizes and positions are read in 64 bits on every target. Where a 32-bit
 * field carries one, a file of 4 GiB or more reads as 0xFFFFFFFF (ASF: the low
 * 32 bits of the size its header states). Products that the fields have
 * always been computed from in 32 bits (file size x 8 for a bit rate) wrap
 * from that value, the same on 32- and 64-bit hosts. MP4 files of 2 GiB or
 * more are refused with 0x80004005. */
typedef struct _MMClipInfo {
    char szFormat[128];
    uint32_t nFileSize;
    uint32_t nDuration; /* milliseconds through the public interface */
    uint32_t nBitrate;
    uint32_t nReserved1; /* MP4 creation time */
    uint32_t nReserved2;
    uint32_t bHasAudio;
    uint32_t bHasVideo;
    uint32_t nAudioBitrate;
    uint32_t nSampleRate;
    uint32_t nChannels;
    uint32_t nBitsPerSample;
    uint32_t nSamplesPerFrame;
    uint32_t nVideoBitrate;
    uint32_t nWidth;
    uint32_t nHeight;
    uint32_t nFrameRate;
} _MMClipInfo;

typedef struct _MMMetaItem {
    uint32_t nEncoding;
    unsigned char szData[MM_META_DATA_SIZE]; /* not necessarily NUL-terminated */
    uint32_t nLength; /* valid bytes of szData, 0 = empty */
} _MMMetaItem;

typedef struct _MMMetaInfo {
    _MMMetaItem aItems[MM_META_ITEMS];
    unsigned char* pPicture; /* release with MM_MediaExtractor_FreeMetaInfo */
    uint32_t nPictureSize;
    uint32_t nRating;
    uint32_t nPlayCount;
    _MMMetaItem stAlbumArtist;
    uint32_t nReserved;
} _MMMetaInfo;

typedef struct _MM_CODECTYPE {
    uint32_t nAudioCodec;
    uint32_t nAudioProfile;
    uint32_t nAudioSubType;
    uint32_t nVideoCodec;
    uint32_t nVideoProfile;
    uint32_t nVideoLevel;
} _MM_CODECTYPE;

typedef struct _MM_MIMETYPE {
    char* pszMimeType; /* release with MM_MediaExtractor_FreeBuffer */
    uint32_t nMimeLength;
    char* pszVideoMimeType; /* RealMedia only */
    uint32_t nVideoMimeLength;
} _MM_MIMETYPE;

typedef struct _MAKERINFO {
    uint32_t nValid;
    unsigned char* pSmartAlbum;
    uint32_t nSmartAlbumSize;
    unsigned char* pThumbnail;
    uint32_t nThumbnailSize;
    unsigned char* pPhoneModel;
    uint32_t nPhoneModelSize;
} _MAKERINFO;

/* Codec codes with their names, in the order the binding searches them. */
typedef struct MM_CodecName {
    const char* name;
    uint32_t code;
} MM_CodecName;

#define MM_CODECINFO_COUNT 61
MM_EXPORT extern const MM_CodecName codecinfo[MM_CODECINFO_COUNT];

#ifdef __cplusplus
}

static_assert(sizeof(_MMClipInfo) == 128 + 16 * 4, "_MMClipInfo layout");
static_assert(sizeof(_MMMetaItem) == 136, "_MMMetaItem layout");
static_assert(sizeof(_MM_CODECTYPE) == 24, "_MM_CODECTYPE layout");
#endif

#endif
