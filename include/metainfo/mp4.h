/* libmetainfo: functions of MP4 / 3GPP files offered beside the dispatch tables. */
#ifndef METAINFO_MP4_H
#define METAINFO_MP4_H

#include <stdint.h>

#include "records.h"

#ifdef __cplusplus
extern "C" {
#endif

/* The codec query of an open MP4 file. The walk starts at the descriptor's
   current position and moves it; the descriptor stays open and the caller's.
   0 is not a descriptor here (-1). */
MM_EXPORT int32_t MP4_GetCodecTypeEx(int fd, _MM_CODECTYPE* codec);

/* Reads the maker box "@mkr" of an MP4 file. nValid becomes 1 once one was
   read to its end; otherwise the record is left untouched. The buffers belong
   to the caller: release each with MM_MediaExtractor_FreeBuffer. */
MM_EXPORT int32_t MP4_GetMakerInfo(const char* path, _MAKERINFO* maker);

#ifdef __cplusplus
}
#endif

#endif
