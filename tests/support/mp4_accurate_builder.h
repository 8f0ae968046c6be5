// Builders of the MP4 boxes the accurate reader reads beyond the clip walk's:
// edit lists, decoding times, freeform items, and a track holding them.
#pragma once

#include <cstdint>
#include <initializer_list>
#include <string>
#include <utility>

#include "support/mp4_builder.h"

namespace testing_support {

// An "edts" with one "elst" segment of segment movie ticks from mediaTime on.
ByteVec Edts(uint32_t segment, int32_t mediaTime);
// A track of count samples of delta ticks and size bytes each, described by
// entry; edts (when not empty) goes before "mdia", stbl boxes in more after
// the sample sizes.
ByteVec TimedTrak(const std::string& handler, uint32_t timescale, uint64_t duration, const ByteVec& entry,
                  uint32_t count, uint32_t delta, uint32_t size, const ByteVec& edts = {}, const ByteVec& more = {});
// Bit fields (value, width) packed most significant first, zero padded.
ByteVec PackBits(std::initializer_list<std::pair<uint32_t, int>> fields);
// An iTunes freeform item: "----" with mean, name and UTF-8 data.
ByteVec FreeformItem(const std::string& mean, const std::string& name, const std::string& value);
// A "meta" full box with "hdlr" (mdir) and an "ilst" of the items.
ByteVec ItemList(const ByteVec& items);

}  // namespace testing_support
