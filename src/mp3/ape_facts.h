// APEv2 (and APEv1) tags at the end of an MP3 file, before any ID3v1 tag.
#pragma once

#include <vector>

#include "core/facts.h"

namespace metainfo {

// Fills tags and pictures from the file's APE tag. False only when memory
// runs out; a file without one leaves tags and pictures as they are.
bool ReadApeFacts(const char* path, TagFacts* tags, std::vector<PictureFacts>* pictures);

}  // namespace metainfo
