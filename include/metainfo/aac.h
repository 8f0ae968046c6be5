/* libmetainfo: copies of a time range of a raw AAC (ADTS) file.
 *
 * Times are whole seconds. The range is mapped to bytes in proportion to the
 * file's size and duration and moved to ADTS frame starts; frames are copied
 * as they are, without decoding. (The names are spelled "Auido".)
 *
 * The offsets are time x file size / duration with the product taken in 32
 * signed bits. Where that product would not fit (a late time in a file of a
 * few megabytes or more), both functions answer 0x800700E7 and cut nothing,
 * rather than cutting at a wrapped, wrong offset. */
#ifndef METAINFO_AAC_H
#define METAINFO_AAC_H

#include <stdint.h>

#include "records.h"

#ifdef __cplusplus
extern "C" {
#endif

/* Writes the range to outPath, with the file's leading ID3v2 tag body and
 * trailing 128-byte "TAG" block. 0 on success; 1 when the file is not read as
 * AAC, the range is rejected or a file cannot be opened; 0x80004005 on a
 * failed allocation, seek or read. */
MM_EXPORT int32_t AAC_GetAuidoData_File(const char* path, int startSec, int endSec, const char* outPath);

/* Returns the whole frames of the range in a new buffer of *length bytes plus
 * a zero byte, to be released with MM_MediaExtractor_FreeBuffer. 0 on
 * success; 1 when the file is not read as AAC, the range is rejected (also a
 * range that holds no frame start), the file cannot be opened or the range
 * cannot be read whole; 0x80004005 on a failed allocation or seek. */
MM_EXPORT int32_t AAC_GetAuidoData_Buf(const char* path, int startSec, int endSec, unsigned char** data, int* length);

#ifdef __cplusplus
}
#endif

#endif
