/* libmetainfo: the AVI parser object.
 *
 * Reads the header list of a RIFF "AVI " file and, on request, the "movi" list
 * and the legacy "idx1" index, then delivers a stream's frames one after
 * another. Create the object with CreateAVIParserObject and release it with
 * FreeAVIParserObject.
 *
 * Order of use: init; locateChunk("movi") then parseMovi(getFileHandle());
 * locateChunk("idx1") then parseIdx1(getFileHandle()); optionally
 * setMediaTime; then getNextFrame until it returns 1 (end of stream). */
#ifndef METAINFO_AVI_PARSER_H
#define METAINFO_AVI_PARSER_H

#include <stdint.h>

#include "records.h"

#ifdef __cplusplus
class CAVIParser;
extern "C" {
#else
typedef struct CAVIParser CAVIParser;
#endif

/* 0x80070057 for a null out; 0x8007000E when no object could be made. */
MM_EXPORT int32_t CreateAVIParserObject(CAVIParser** out);
/* Destroys the object (closing its file); 0x80070057 for null. */
MM_EXPORT int32_t FreeAVIParserObject(CAVIParser* p);

#ifdef __cplusplus
}

/* A RIFF chunk header: identifier and type word read big-endian (so "RIFF"
 * compares as 0x52494646), size little-endian. */
struct _CHUNKHEADER {
    uint32_t ckID;
    uint32_t ckSize;
    uint32_t ckType;
};

struct _AVIMainHeader {
    uint32_t cb;
    uint32_t dwMicroSecPerFrame;
    uint32_t dwMaxBytesPerSec;
    uint32_t dwFlags; /* read big-endian */
    uint32_t dwTotalFrames;
    uint32_t dwInitialFrames;
    uint32_t dwStreams;
    uint32_t dwSuggestedBufferSize;
    uint32_t dwWidth;
    uint32_t dwHeight;
    uint32_t dwReserved[4];
    /* Bits of the big-endian dwFlags word. */
    uint32_t bHasIndex; /* bit 4 */
    uint32_t bCopyrighted; /* bit 17 */
    uint32_t bInterleaved; /* bit 8 */
    uint32_t bMustUseIndex; /* bit 5 */
};

struct _AVIStreamHeader {
    uint32_t fccType; /* big-endian: "vids" = 0x76696473 */
    uint32_t fccHandler; /* big-endian */
    uint32_t dwFlags; /* big-endian */
    uint32_t dwPriorityLanguage;
    uint32_t dwInitialFrames;
    uint32_t dwScale;
    uint32_t dwRate;
    uint32_t dwStart;
    uint32_t dwLength;
    uint32_t dwSuggestedBufferSize;
    uint32_t dwQuality;
    uint32_t dwSampleSize;
};

/* Video stream format: a bitmap header and room for a palette (never filled). */
struct _AVIVideoFormat {
    uint32_t biSize;
    uint32_t biWidth;
    uint32_t biHeight;
    uint16_t biPlanes;
    uint16_t biBitCount;
    uint32_t biCompression;
    uint32_t biSizeImage;
    uint32_t biXPelsPerMeter;
    uint32_t biYPelsPerMeter;
    uint32_t biClrUsed;
    uint32_t biClrImportant;
    uint32_t bmiColors[256];
};

/* Audio stream format. */
struct _AVIAudioFormat {
    uint16_t wFormatTag;
    uint16_t nChannels;
    uint32_t nSamplesPerSec;
    uint32_t nAvgBytesPerSec;
    uint16_t nBlockAlign;
    uint16_t wBitsPerSample;
    uint16_t cbSize;
};

/* One 16-byte "idx1" entry with its presentation time. */
struct _AVIIndexEntry {
    uint32_t ckid; /* big-endian, e.g. "00dc" */
    uint32_t dwFlags; /* big-endian: a plain key frame holds 0x10000000 */
    uint32_t dwChunkOffset; /* relative to the "movi" type word */
    uint32_t dwChunkLength;
    uint16_t wStream; /* from the first two characters of ckid */
    uint16_t wType; /* the last two characters of ckid */
    uint32_t dwTimeMs;
};

/* A frame delivered by getNextFrame; pData belongs to the caller
 * (release with MM_MediaExtractor_FreeBuffer). */
struct _FrameInfo {
    uint32_t dwFlags;
    unsigned char* pData;
    uint32_t dwSize;
    uint32_t dwTimeMs;
};

/* A chunk header inside "movi". */
struct _SUBCHUNK {
    uint32_t ckID;
    uint32_t ckSize;
    int nStream;
    char szType[3];
};

#define AVI_STREAM_SLOTS 2
#define AVI_KEYFRAME_FLAGS 0x10000000u

class CAVIParser {
public:
    MM_EXPORT int32_t init(const char* path, _MMClipInfo* clip);
    MM_EXPORT int32_t free();
    MM_EXPORT uint32_t getDuration();
    MM_EXPORT uint32_t getStreamNum();
    /* The stream's codec (video: fccHandler, audio: wFormatTag), -1 past the streams. */
    MM_EXPORT int32_t getStreamType(int i);
    MM_EXPORT int32_t getMediaInfo();
    MM_EXPORT int32_t parseJunk(int handle);

    /* Positions the parser's file at the top-level "LIST movi" (fourcc "movi")
     * or at the "idx1" chunk (fourcc "idx1"). 0 when found. */
    MM_EXPORT int32_t locateChunk(const char* fourcc);
    int getFileHandle() const { return hFile; }

    MM_EXPORT int32_t parseMovi(int handle);
    MM_EXPORT int32_t parseIdx1(int handle);
    MM_EXPORT uint32_t searchNextIndex(uint32_t stream, uint32_t i);
    MM_EXPORT uint32_t searchPreIndex(uint32_t stream, uint32_t i);
    MM_EXPORT int32_t setMediaTime(uint32_t stream, uint32_t timeMs, uint32_t* actualMs);
    /* 0 with a frame, 1 at the end of the stream, else a failure code. */
    MM_EXPORT int32_t getNextFrame(uint32_t stream, _FrameInfo* info);

    uint32_t getIndexCount() const { return nIndexCount; }
    const _AVIIndexEntry* getIndexEntries() const { return pIndex; }
    const _AVIStreamHeader* getStreamHeader(uint32_t i) const {
        return i < nStreamNum && i < AVI_STREAM_SLOTS ? &aStreams[i].header : nullptr;
    }
    const _AVIMainHeader* getMainHeader() const { return &mainHeader; }
    const _AVIVideoFormat* getVideoFormat() const { return pVideoFormat; }
    const _AVIAudioFormat* getAudioFormat() const { return pAudioFormat; }

private:
    // Parenthesised so that no compiler reads int32_t:: as a qualifier.
    friend int32_t(::CreateAVIParserObject)(CAVIParser** out);
    friend int32_t(::FreeAVIParserObject)(CAVIParser* p);

    struct StreamSlot {
        _AVIStreamHeader header;
        uint32_t nStreamIndex;
        uint32_t nStreamCodec;
    };

    CAVIParser();
    ~CAVIParser();
    CAVIParser(const CAVIParser&) = delete;
    CAVIParser& operator=(const CAVIParser&) = delete;

    int32_t parseListChunks();
    int32_t parseInfo();
    int32_t parseHdrl();
    int32_t ParseStrl(const unsigned char* body, uint32_t size);
    int32_t getAVIMainHeader(const unsigned char* body, uint32_t size);
    int32_t getAVIStreamHeader(const unsigned char* body, uint32_t size, _AVIStreamHeader* header, uint32_t* chunkSize);
    int32_t getAVIStreamFormat(const unsigned char* chunk, uint32_t avail, uint32_t fccType);
    int32_t getChunkHeader(int handle, _CHUNKHEADER* header);
    int32_t getChunkHeader(const unsigned char* buf, _CHUNKHEADER* header);
    int32_t getIndexEntry(int handle, _AVIIndexEntry* entry);
    int32_t getSubChunk(int handle, _SUBCHUNK* sub);
    bool previousOfStream(uint32_t stream, uint32_t i, uint32_t* j) const;
    bool nextOfStream(uint32_t stream, uint32_t i, uint32_t* j) const;
    void releaseIndex();
    void reset();

    int hFile;
    uint32_t nFileSize;
    uint32_t nRiffEnd;
    _AVIMainHeader mainHeader;
    StreamSlot aStreams[AVI_STREAM_SLOTS];
    uint32_t nExtraSize[AVI_STREAM_SLOTS];
    unsigned char* pExtra[AVI_STREAM_SLOTS];
    _AVIIndexEntry* pIndex;
    _AVIVideoFormat* pVideoFormat;
    _AVIAudioFormat* pAudioFormat;
    uint32_t nStreamNum;
    uint32_t nDurationMs;
    uint32_t nIndexCount;
    uint32_t nCurIndex[AVI_STREAM_SLOTS];
    uint32_t nLastIndex[AVI_STREAM_SLOTS];
    uint32_t nMoviBase;
    uint32_t nMoviEnd;
    uint32_t nMoviSize;
};

#endif /* __cplusplus */

#endif
