/* libmetainfo: exported per-format functions that copy a time range of the
 * compressed audio into a new file. Times are whole seconds. */
#ifndef METAINFO_EXTRACT_H
#define METAINFO_EXTRACT_H

#include <stdint.h>

#include "records.h"

#ifdef __cplusplus
extern "C" {
#endif

typedef int32_t (*MM_AudioToFileFn)(const char* path, int startSec, int endSec, const char* outPath);

/* Each audio format that can be cut declares its function here. */

/* MP3: the leading ID3v2 data, a Xing frame rewritten for the range (when the
 * source has one), the frames of [startSec, endSec) and the trailing ID3v1 tag. */
MM_EXPORT int32_t MP3_GetAudioData2File(const char* path, int startSec, int endSec, const char* outPath);
/* AMR: a new file with the source's magic and the range's frames. */
MM_EXPORT int32_t AMR_GetAudioData2File(const char* path, int startSec, int endSec, const char* outPath);
/* WAVE: a new RIFF WAVE file with the source's header chunks and the range's samples. */
MM_EXPORT int32_t WAVE_GetAudioData2File(const char* path, int startSec, int endSec, const char* outPath);

#ifdef __cplusplus
}
#endif

#endif
