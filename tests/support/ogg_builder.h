// Ogg pages with their checksums, and the header packets of the codecs Ogg
// carries, for the accurate interface's Ogg tests.
#pragma once

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "support/bytes.h"

namespace testing_support {

// The packets of one logical stream laid out in pages of at most
// segmentsPerPage lacing values each (a packet runs on over as many pages as
// it needs). Every page that ends a packet has granule position 0 except the
// last, which has lastGranule; a page that ends none has -1.
Bytes OggStreamPages(uint32_t serial, const std::vector<Bytes>& packets, size_t segmentsPerPage, uint64_t lastGranule);

Bytes VorbisIdPacket(uint32_t channels, uint32_t rate, uint32_t nominalBitRate);
// gain: the output gain in dB, Q7.8.
Bytes OpusHeadPacket(uint32_t channels, uint32_t preSkip, uint32_t inputRate, int16_t gain = 0);
// The mapping header with STREAMINFO (not the last metadata block).
Bytes FlacMappingPacket(uint32_t rate, uint32_t channels, uint32_t bitsPerSample);

// A FLAC PICTURE block's body, base64 as METADATA_BLOCK_PICTURE holds it.
std::string Base64Picture(uint32_t type, const std::string& mime, const std::string& description,
                          const std::vector<uint8_t>& data);

}  // namespace testing_support
