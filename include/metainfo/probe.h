/* libmetainfo: accurate answers about a media file.
 *
 * mi_probe reads a file once and returns what it holds as the file says it:
 * durations to the millisecond, codecs in ffprobe's codec_name vocabulary,
 * every tag as UTF-8, every picture. It shares its parsers with the MM_
 * interface of metainfo.h, whose answers keep their device-contract form
 * (whole seconds, fixed item slots, one picture); docs/accurate.md lists
 * where the two differ and why.
 *
 * Everything an mi_info points to belongs to it and lives until
 * mi_info_free. Texts are UTF-8 and NUL-terminated; an absent text is NULL,
 * an absent number 0 (level: -1). */
#ifndef METAINFO_PROBE_H
#define METAINFO_PROBE_H

#include <stddef.h>
#include <stdint.h>

#include "records.h"

#ifdef __cplusplus
extern "C" {
#endif

/* Results of mi_probe and mi_picture_copy. */
typedef enum mi_result {
    MI_OK = 0,
    MI_E_ARGUMENT = 1, /* a null or empty argument, an index out of range */
    MI_E_NOT_FOUND = 2, /* no such file */
    MI_E_ACCESS = 3, /* permission denied */
    MI_E_IS_DIRECTORY = 4,
    MI_E_IO = 5, /* the file could not be read, or changed since it was probed */
    MI_E_EMPTY = 6, /* the file holds no bytes */
    MI_E_NOT_MEDIA = 7, /* no known type */
    MI_E_DAMAGED = 8, /* a known type whose structure breaks off or is broken */
    MI_E_NO_MEMORY = 9,
    MI_E_BUFFER = 10 /* mi_picture_copy: the buffer is smaller than the picture */
} mi_result;

typedef enum mi_stream_kind { MI_STREAM_AUDIO = 1, MI_STREAM_VIDEO = 2 } mi_stream_kind;

typedef struct mi_stream {
    int kind; /* mi_stream_kind */
    const char* codec; /* ffprobe codec_name: "mp3", "aac", "h264", "pcm_s16le" */
    const char* profile; /* ffprobe profile: "LC", "HE-AAC", "High", "Simple" */
    int32_t level; /* ffprobe level (H.264 3.1 is 31); -1 when unknown */
    uint32_t sample_rate; /* Hz, as decoded (HE-AAC: the doubled rate) */
    uint32_t channels;
    uint32_t bits_per_sample; /* stored bits of PCM-like codecs; 0 for others */
    uint32_t width, height;
    uint32_t frame_rate_num, frame_rate_den; /* frames per second as a rational */
    uint64_t bit_rate; /* bit/s, 0 when unknown */
} mi_stream;

/* A tag not among the named fields of mi_info, by the key the file uses
 * ("TPUB", "----:com.apple.iTunes:MOOD", "WM/Publisher"). */
typedef struct mi_tag {
    const char* key;
    const char* value;
} mi_tag;

/* A picture as it lies in the file; mi_picture_copy hands out its bytes. */
typedef struct mi_picture {
    const char* mime; /* "image/jpeg", "image/png", ... */
    int32_t type; /* ID3 picture type (3: front cover); -1 when unknown */
    const char* description;
    uint64_t size; /* bytes of the picture */
    uint64_t offset; /* where its bytes start in the file */
    uint32_t flags; /* MI_PICTURE_UNSYNCHRONISED: stored with ID3 unsynchronisation */
} mi_picture;

#define MI_PICTURE_UNSYNCHRONISED 1u

typedef struct mi_info {
    const char* format; /* "mp3", "mp4", "aac", "asf", "wav", "amr", ... */
    const char* mime;
    int64_t duration_ms; /* -1 when unknown */
    int duration_exact; /* 1: counted or stated by the file; 0: estimated */
    uint64_t bit_rate; /* overall bit/s, 0 when unknown */

    size_t stream_count;
    const mi_stream* streams;

    /* The common tags, UTF-8, trimmed; NULL when absent. */
    const char* title;
    const char* artist;
    const char* album;
    const char* album_artist;
    const char* genre;
    const char* date; /* as the file states it: "2024", "2024-05-01" */
    const char* comment;
    const char* composer;
    int32_t year; /* 0 when none */
    uint32_t track, track_total, disc, disc_total; /* 0 when none */

    size_t tag_count;
    const mi_tag* tags;

    size_t picture_count;
    const mi_picture* pictures;

    const void* internal; /* the library's own; do not touch */
} mi_info;

/* Probes path. On MI_OK *info is set and must be released with
 * mi_info_free; otherwise *info is NULL. */
MM_EXPORT int mi_probe(const char* path, mi_info** info);
MM_EXPORT void mi_info_free(mi_info* info);

/* Copies picture `index` of info (probed from path) into buffer. *size gets
 * the picture's byte count; with a buffer too small (or NULL) the result is
 * MI_E_BUFFER and nothing is copied, so a caller may ask for the size first. */
MM_EXPORT int mi_picture_copy(const char* path, const mi_info* info, size_t index, void* buffer, size_t capacity,
                              size_t* size);

/* Copies the compressed audio of an MP3, ADTS AAC, AMR or WAVE file between
 * start_ms and end_ms into a new file of the same format at out_path: every
 * frame (WAVE: block) that plays within the range, found by walking the
 * frames, so any file size works. MI_E_NOT_MEDIA for other formats,
 * MI_E_ARGUMENT for an empty range or one past the end, MI_E_IO when the
 * output cannot be written (nothing is left behind). */
MM_EXPORT int mi_cut(const char* path, int64_t start_ms, int64_t end_ms, const char* out_path);

/* A short English text of a result ("no such file"), static storage. */
MM_EXPORT const char* mi_result_text(int result);

#ifdef __cplusplus
}
#endif

#endif /* METAINFO_PROBE_H */
