// Records on one line, for table-driven tests: a row states every field at once.
#pragma once

#include <string>

#include "metainfo/records.h"

namespace testing_support {

// The fields that are not zero, in record order, e.g.
// "mp3 size=1600128 dur=100 bps=128000 audio=1 abps=128000 hz=44100 ch=2 bits=16 spf=2304"
// (c1/c2: the reserved words; abps/vbps: audio/video bit rates; w, h, fps: the picture).
std::string ClipSummary(const _MMClipInfo& clip);

// Codes in hex, "a=codec/profile/subtype v=codec/profile/level", e.g. "a=6001/6010/0 v=5003/5010/5020".
std::string CodecSummary(const _MM_CODECTYPE& codec);

}  // namespace testing_support
