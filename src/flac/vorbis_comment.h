// Vorbis comments ("KEY=value", UTF-8) as FLAC, Ogg Vorbis, Opus and Ogg FLAC
// carry them, and FLAC's picture block, which Ogg streams also carry in base64.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "core/facts.h"

namespace metainfo {

// Where pictures found in header packets go: their facts, and the bytes of
// one of them when asked.
struct PictureSink {
    std::vector<PictureFacts> list;
    int64_t want = -1;  // the picture whose bytes to keep
    std::vector<uint8_t> bytes;

    void Add(PictureFacts picture, const uint8_t* data);
};

// Reads a comment block (vendor, count, comments; little-endian lengths) into
// tags. False when it breaks off before its count of comments; what was read
// so far is kept. Base64 pictures go to pictures, or are dropped without one.
bool ReadVorbisComments(const uint8_t* p, size_t n, TagFacts* tags, PictureSink* pictures = nullptr);

// A picture block (type, MIME, description, sizes, data). dataOffset receives
// where the image bytes start within p; they need not lie within n.
bool ReadPictureHead(const uint8_t* p, size_t n, PictureFacts* picture, size_t* dataOffset);

// The same, with the image bytes within n.
bool ReadPictureBlock(const uint8_t* p, size_t n, PictureFacts* picture, size_t* dataOffset);

}  // namespace metainfo
