// Byte builders for speech and PCM files: RIFF chunks (WAVE, QCP), AMR
// storage files and EVRC storage files.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "support/bytes.h"

namespace testing_support {

// id, little-endian size of the body, body. No pad byte: the speech readers
// never skip one.
Bytes SpeechChunk(const std::string& id, const Bytes& body);
// "RIFF", size of what follows, form type, chunks.
std::vector<uint8_t> RiffForm(const std::string& form, const std::vector<Bytes>& chunks);

// WAVE "fmt " body of 16 bytes; byte rate and block align follow from the rest
// unless avgBytesPerSec is given.
Bytes WaveFmtBody(uint16_t tag, uint16_t channels, uint32_t rate, uint16_t bits, uint32_t avgBytesPerSec = 0);
// The canonical 44-byte header ("fmt " at 12, "data" at 36) and dataBytes of samples.
std::vector<uint8_t> CanonicalWave(uint16_t tag, uint16_t channels, uint32_t rate, uint16_t bits, uint32_t dataBytes);

// AMR frame sizes of RFC 4867 (header byte included), by frame type.
uint32_t AmrFrameBytes(bool wideBand, int frameType);
// One frame: header byte (quality bit as given) and a zero payload.
Bytes AmrFrame(bool wideBand, int frameType, bool quality = true);
// "#!AMR\n" or "#!AMR-WB\n" and n frames of one type.
std::vector<uint8_t> AmrFile(bool wideBand, int frameType, uint32_t frames);

// QCP codec GUIDs of RFC 3625, as stored (little-endian fields).
extern const std::vector<uint8_t> kQcelpGuid1;
extern const std::vector<uint8_t> kQcelpGuid2;
extern const std::vector<uint8_t> kEvrcGuid;
extern const std::vector<uint8_t> kSmvGuid;
// A full QCP "fmt " chunk (150-byte body).
Bytes QcpFmtChunk(const std::vector<uint8_t>& guid, uint16_t avgBitrate, uint16_t blockSize = 160,
                  uint16_t samplingRate = 8000, uint16_t sampleSize = 16);
Bytes QcpVratChunk(uint32_t packets);
// Packets of one rate octet each followed by payloadBytes zeros.
Bytes SpeechPackets(uint8_t rate, uint32_t payloadBytes, uint32_t count);

// "#!EVRC\n" followed by the given packets.
std::vector<uint8_t> EvrcFile(const Bytes& packets);

}  // namespace testing_support
