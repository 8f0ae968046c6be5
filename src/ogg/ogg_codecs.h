// The first packets of an Ogg logical stream: which codec it carries, its
// identification header, and where its comments are.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "core/facts.h"
#include "flac/vorbis_comment.h"

namespace metainfo {

struct OggStream {
    enum Codec : uint8_t { kUnknown, kVorbis, kOpus, kFlac, kTheora };
    uint32_t serial = 0;
    Codec codec = kUnknown;
    StreamFacts facts;
    uint32_t granuleRate = 0;  // granule positions per second (audio)
    uint64_t preSkip = 0;  // granules before the first audible sample
    int16_t outputGain = 0;  // Opus: dB in Q7.8 the decoder applies
    uint32_t granuleShift = 0;  // Theora: low granule bits count frames since the keyframe
    bool granuleFromZero = false;  // Theora before 3.2.1: a granule numbers its frame from 0
    uint32_t packets = 0;  // complete packets seen
    bool done = false;  // every header packet read
    std::vector<uint8_t> partial;  // a packet continued on the next page
};

// Reads the stream's next header packet into the stream (and its comments
// into tags and pictures). False when the packet is not what the codec
// requires there, which ends the stream's headers.
bool ReadHeaderPacket(const uint8_t* p, size_t n, OggStream* s, TagFacts* tags, PictureSink* pictures);

}  // namespace metainfo
