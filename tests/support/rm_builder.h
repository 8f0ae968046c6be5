// Byte builders for RealMedia header chunks (all fields big-endian).
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "support/bytes.h"

namespace testing_support {

// id, size counting the whole chunk, body.
Bytes RmChunk(const std::string& id, const Bytes& body);

struct RmProps {
    uint32_t maxBitRate = 64000;
    uint32_t avgBitRate = 48000;
    uint32_t durationMs = 5000;
    uint16_t numStreams = 1;
    uint16_t version = 0;
};

struct RmStream {
    uint16_t number = 0;
    uint32_t maxBitRate = 32000;
    uint32_t avgBitRate = 24000;
    uint32_t durationMs = 5000;
    std::string name = "Audio Stream";
    std::string mime = "audio/x-pn-realaudio";
    Bytes typeData;
    uint16_t version = 0;
};
Bytes RmMdpr(const RmStream& s);
Bytes RmCont(const std::string& title, const std::string& author, const std::string& copyright,
             const std::string& comment);

// Audio type data: the 2E 72 61 FD mark and a version 4 or 5 header.
Bytes RaHeaderV4(uint16_t sampleRate, uint16_t sampleSize, uint16_t channels, const std::string& fourcc);
Bytes RaHeaderV5(uint16_t sampleRate, uint16_t sampleSize, uint16_t channels, const std::string& fourcc);
// Video type data: a 32-bit size, "VIDO", FourCC, size, 16.16 frame rate.
Bytes RvHeader(const std::string& fourcc, uint16_t width, uint16_t height, uint16_t fps);
// "MLTI" with the given rule count wrapped around one substream's data.
Bytes RmMulti(uint16_t rules, const Bytes& substream);

// A file: ".RMF" (header count = chunks + 2), "PROP", the chunks, then a DATA chunk.
std::vector<uint8_t> RmFile(const RmProps& props, const std::vector<Bytes>& chunks, size_t dataBytes = 64);

}  // namespace testing_support
