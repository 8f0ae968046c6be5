// Vorbis comments (Ogg Vorbis, Opus, FLAC): KEY=value texts into tags, and
// base64 pictures.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "core/facts.h"

namespace metainfo {

// Where pictures go: their facts, and the bytes of one of them when asked.
struct PictureSink {
    std::vector<PictureFacts> list;
    int64_t want = -1;  // the picture whose bytes to keep
    std::vector<uint8_t> bytes;

    void Add(PictureFacts picture, const uint8_t* data);
};

// Reads a comment block (vendor, count, comments) at p. False when it breaks
// off before its count of comments; what was read so far is kept.
bool ReadVorbisComments(const uint8_t* p, size_t n, TagFacts* tags, PictureSink* pictures);

// A picture block (type, MIME, description, sizes, data) as FLAC stores it.
// dataOffset receives where the image bytes start within p.
bool ReadPictureBlock(const uint8_t* p, size_t n, PictureFacts* picture, size_t* dataOffset);

}  // namespace metainfo
