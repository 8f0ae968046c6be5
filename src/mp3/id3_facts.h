// ID3 tags of an MP3 or AAC file for the accurate interface: the v2 tag at
// the start (read with the frame walker the MM_ interface uses) and the v1
// tag at the end for what v2 lacks.
#pragma once

#include <cstdint>
#include <vector>

#include "core/facts.h"

namespace metainfo {

// Fills tags and pictures from the file's ID3 tags. *tagEnd gets the bytes
// the v2 tags at the start take (footers and tags repeated behind the first
// included): where the audio starts. False only when memory runs out; a file
// without tags (or that cannot be read) leaves tags and pictures as they are.
// `beforeV1` (an APE tag's texts) fills what the v2 tag lacks ahead of the v1
// tag, whose fields are short Latin-1 texts and a bare year.
bool ReadId3Facts(const char* path, TagFacts* tags, std::vector<PictureFacts>* pictures, uint64_t* tagEnd,
                  const TagFacts* beforeV1 = nullptr);

// Fills tags and pictures from an ID3v2 tag at `offset` inside another
// container (a WAVE "id3 " chunk). False only when memory runs out.
bool ReadId3FactsAt(const char* path, uint64_t offset, TagFacts* tags, std::vector<PictureFacts>* pictures);

}  // namespace metainfo
