/* libmetainfo: the exported C interface.
 *
 * Ask for the media type of a path, then pass that type back to the queries.
 * Every query parses the file anew. A thread keeps the bytes it read of its
 * last two files, known by device, inode, size and times, so the queries of
 * one probe read each byte once; a changed file is read anew. Buffers handed
 * out by the library belong to the caller and are released with
 * MM_MediaExtractor_FreeBuffer (pictures: FreeMetaInfo). */
#ifndef METAINFO_METAINFO_H
#define METAINFO_METAINFO_H

#include <stddef.h>
#include <stdint.h>

#include "records.h"
#include "version.h"

#ifdef __cplusplus
extern "C" {
#endif

/* Signatures of the per-format functions held in the dispatch tables. */
typedef int32_t (*MM_TrackTypeFn)(const char* path, int* mask);
typedef int32_t (*MM_MetaInfoFn)(const char* path, _MMMetaInfo* meta, int pictureLimit);
typedef int32_t (*MM_ClipInfoFn)(const char* path, _MMClipInfo* clip);
typedef int32_t (*MM_MIMETypeFn)(const char* path, _MM_MIMETYPE* mime);
typedef int32_t (*MM_AudioDataFn)(const char* path, int startSec, int endSec, unsigned char** data, int* size);
typedef int32_t (*MM_CodecTypeFn)(const char* path, _MM_CODECTYPE* codec);
typedef int32_t (*MM_VideoDataFn)(const char* path, int startSec, int endSec, unsigned char** data, int* size);

/* Dispatch tables, indexed by media type; a null slot means "not offered". */
MM_EXPORT extern const MM_TrackTypeFn MM_GetTrackType[MM_MEDIA_SLOTS];
MM_EXPORT extern const MM_MetaInfoFn MM_GetMetaInfo[MM_MEDIA_SLOTS];
MM_EXPORT extern const MM_ClipInfoFn MM_GetClipInfo[MM_MEDIA_SLOTS];
MM_EXPORT extern const MM_MIMETypeFn MM_GetMIMEType[MM_MEDIA_SLOTS];
MM_EXPORT extern const MM_AudioDataFn MM_GetAudioData[MM_MEDIA_SLOTS];
MM_EXPORT extern const MM_CodecTypeFn MM_GetCodecType[MM_MEDIA_SLOTS];
MM_EXPORT extern const MM_VideoDataFn MM_GetVideoData[MM_MEDIA_SLOTS];

MM_EXPORT int32_t MM_MediaExtractor_DetectMediaType(const char* path, int* type);
MM_EXPORT int32_t MM_MediaExtractor_CheckMediaType(const char* path);
MM_EXPORT int32_t MM_MediaExtractor_GetTrackType(const char* path, int type, int* mask);
MM_EXPORT int32_t MM_MediaExtractor_GetCodecType(const char* path, int type, _MM_CODECTYPE* codec);
MM_EXPORT int32_t MM_MediaExtractor_GetCodecTypeEx(const char* path, int type, _MM_CODECTYPE* codec);
MM_EXPORT int32_t MM_MediaExtractor_GetClipInfo(const char* path, int type, _MMClipInfo* clip);
MM_EXPORT int32_t MM_MediaExtractor_FreeClipInfo(_MMClipInfo* clip);
MM_EXPORT int32_t MM_MediaExtractor_GetMetaInfo(const char* path, int type, _MMMetaInfo* meta);
MM_EXPORT int32_t MM_MediaExtractor_FreeMetaInfo(_MMMetaInfo* meta);
MM_EXPORT int32_t MM_MediaExtractor_GetMIMEType(const char* path, _MM_MIMETYPE* mime);
MM_EXPORT int32_t MM_MediaExtractor_GetAudioData(const char* path, int startSec, int endSec, unsigned char** data,
                                                 int* size);
MM_EXPORT int32_t MM_MediaExtractor_GetVideoData(const char* path, int startSec, int endSec, unsigned char** data,
                                                 int* size);
MM_EXPORT int32_t MM_MediaExtractor_GetMakerInfo(const char* path, _MAKERINFO* maker);

/* Releases any buffer the library handed out (MIME strings, audio data,
 * maker buffers). Null is accepted. */
MM_EXPORT void MM_MediaExtractor_FreeBuffer(void* p);

/* Where log lines go on hosts without Android's log. Priorities follow
 * Android's numbers (2 verbose .. 6 error); tag may be null. Null sink: no output. */
typedef void (*MM_LogSink)(int priority, const char* tag, const char* message);
MM_EXPORT void MM_MediaExtractor_SetLogSink(MM_LogSink sink);

/* A content-protection service for ".dcf" and ".fl" files. Without one, every
 * file is read as a plain file. */
typedef struct MM_DrmProvider {
    void* context;
    /* Calls emit(emit_ctx, key, value) for each metadata pair of path;
       returns 0 when the service has metadata for the path, non-zero when it has none. */
    int (*getMetadata)(void* context, const char* path,
                       void (*emit)(void* emit_ctx, const char* key, const char* value), void* emit_ctx);
    /* Opens a decrypt session; null when it cannot. *decryptApiType receives the
       session's decrypt API type (2 = container-based decryption). */
    void* (*openDecryptSession)(void* context, const char* path, int* decryptApiType);
    /* Positional read of plain bytes; returns bytes read, 0 at the end, negative on error. */
    long long (*pread)(void* context, void* session, void* buf, size_t size, long long offset);
    void (*closeDecryptSession)(void* context, void* session);
} MM_DrmProvider;

/* Installs (a copy of) the provider; null removes it. */
MM_EXPORT void MM_MediaExtractor_SetDrmProvider(const MM_DrmProvider* provider);

/* Hooks through which a separate MIDI component may attach; nothing in this
 * library reads them. */
MM_EXPORT extern void* Get_MIDI_MetaInfo_init;
MM_EXPORT extern void* Get_MIDI_MetaInfo_metadataitemcount;
MM_EXPORT extern void* Get_MIDI_MetaInfo_metadataitem;
MM_EXPORT extern void* Get_MIDI_MetaInfo_free;
MM_EXPORT extern void* Get_MIDI_MetaInfo_close;
MM_EXPORT extern void* Check_MIDI_Duration;

#ifdef __cplusplus
}
#endif

#endif
