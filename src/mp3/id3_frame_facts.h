// The frames of an ID3v2 tag as facts for the accurate interface.
#pragma once

#include <cstdint>
#include <vector>

#include "core/facts.h"

namespace metainfo {

// Reads the v2 tag at `at` in h (a file of fileSize bytes) into tags and
// pictures, through the frame walker the MM_ interface uses. False only when
// memory runs out.
bool ReadId3V2Facts(int h, uint64_t fileSize, uint64_t at, TagFacts* tags, std::vector<PictureFacts>* pictures);

}  // namespace metainfo
