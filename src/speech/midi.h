// MIDI-family files are recognised but not parsed: fixed answers.
#pragma once

#include <cstdint>

#include "metainfo/records.h"

namespace metainfo {

int32_t MIDI_GetTrackType(const char* path, int* mask);
int32_t MIDI_GetClipInfo(const char* path, _MMClipInfo* clip);
int32_t MIDI_GetMetaInfo(const char* path, _MMMetaInfo* meta, int pictureLimit);

}  // namespace metainfo
