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

// The items that are not empty as name=encoding:text, text bytes outside
// printable ASCII as \xNN (UTF-16LE text whose high bytes are all zero as its low
// bytes, after "~" in place of ":"), then the picture ("pic" with its buffer, "picsize"
// without), rating, play count and album artist, e.g. "title=3:Name genre=3:Rock pic=300".
std::string MetaSummary(const _MMMetaInfo& meta);

}  // namespace testing_support
