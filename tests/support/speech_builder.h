// Byte builders for speech and PCM files: RIFF chunks (WAVE, QCP), AMR
// storage files and EVRC storage files; a scratch directory and ffprobe's
// view of a cut file.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "metainfo/records.h"
#include "support/bytes.h"

namespace testing_support {

// id, little-endian size of the body, body. No pad byte: the speech readers
// never skip one.
Bytes SpeechChunk(const std::string& id, const Bytes& body);
// "RIFF", size of what follows, form type, chunks.
std::vector<uint8_t> RiffForm(const std::string& form, const std::vector<Bytes>& chunks);

// WAVE "fmt " body of 16 bytes; byte rate and block align follow from the rest.
Bytes WaveFmtBody(uint16_t tag, uint16_t channels, uint32_t rate, uint16_t bits);
// The canonical 44-byte header ("fmt " at 12, "data" at 36) and dataBytes of samples.
std::vector<uint8_t> CanonicalWave(uint16_t tag, uint16_t channels, uint32_t rate, uint16_t bits, uint32_t dataBytes);

// One AMR frame of RFC 4867's size for its type: header byte and a zero payload.
Bytes AmrFrame(bool wideBand, int frameType, bool quality = true);
// The magic and n frames of one type; with channels > 0 the multi-channel
// magic and its 4-byte channel description come first.
std::vector<uint8_t> AmrFile(bool wideBand, int frameType, uint32_t frames, uint32_t channels = 0);

// QCP codec GUIDs of RFC 3625, as stored (little-endian fields).
extern const std::vector<uint8_t> kQcelpGuid1;
extern const std::vector<uint8_t> kQcelpGuid2;
extern const std::vector<uint8_t> kEvrcGuid;
extern const std::vector<uint8_t> kSmvGuid;
// A full QCP "fmt " chunk (150-byte body): 8000 Hz, 16 bits, 160 samples a packet.
Bytes QcpFmtChunk(const std::vector<uint8_t>& guid, uint16_t avgBitrate);
Bytes QcpVratChunk(uint32_t packets);
// Packets of one rate octet each followed by payloadBytes zeros.
Bytes SpeechPackets(uint8_t rate, uint32_t payloadBytes, uint32_t count);
// "#!EVRC\n" followed by the given packets.
std::vector<uint8_t> EvrcFile(const Bytes& packets);

// Writes bytes to name in a directory that lasts as long as the test program;
// returns the path.
std::string SpeechFile(const std::string& name, const std::vector<uint8_t>& bytes);

// Play time as ffprobe's demuxer reads it: the end of the last packet, or -1.
// (Its container duration is only an estimate from the bit rate.)
double FfprobePlayTime(const std::string& file);

}  // namespace testing_support
