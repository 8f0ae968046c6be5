// The QCP "fmt " chunk (RIFF form "QLCM") and the speech packet tables that
// QCP, EVRC files and MP4 sample descriptions share.
#pragma once

#include <cstddef>
#include <cstdint>

namespace metainfo {

// One rate-map entry of a "fmt " chunk.
struct _QCPRateMap {
    uint8_t nWordSize;
    uint8_t nRateOctet;
};

// A decoded "fmt " chunk; all multi-byte fields are little-endian in the file.
struct _QCPFMT {
    uint32_t nChunkId;  // read big-endian: compares with "fmt "
    uint32_t nChunkSize;
    uint8_t nMajor;
    uint8_t nMinor;
    uint8_t codecGuid[16];
    uint16_t nCodecVersion;
    char szCodecName[80];
    uint16_t nAvgBitrate;  // bit/s
    uint16_t nPacketSize;
    uint16_t nBlockSize;  // samples per packet
    uint16_t nSamplingRate;
    uint16_t nSampleSize;  // bits
    uint32_t nNumRates;
    _QCPRateMap rateMap[8];
};

// Bytes of a "fmt " chunk that carry fields, header included.
constexpr size_t kQcpFmtChunkBytes = 158;

// Decodes a "fmt " chunk from its first byte (the "fmt " identifier). Fields
// that lie beyond length read as zero. 0, or 0x80070057 for null arguments.
int32_t parseFMTInfo(const uint8_t* chunk, size_t length, _QCPFMT* fmt);

// Speech codec of a chunk's GUID.
enum class QcpCodec { kQcelp, kEvrc, kSmv, kUnknown };
QcpCodec CodecOfGuid(const uint8_t guid[16]);
// The codec code reported for it (0x7001, 0x8001, 0x9001 or 0xFFFF).
uint32_t CodecCodeOf(QcpCodec codec);

// Payload bytes after the rate octet, indexed by the rate octet (0..7).
extern const uint8_t QCELP_Rate_Table[8];
extern const uint8_t EVRC_Rate_Table[8];

// Payload size for a rate octet, or a negative value when the octet is refused.
using PacketPayloadFn = int (*)(uint8_t rateOctet);

// Counts packets (one rate octet, then its payload) from start until the
// position reaches end or the file ends. A refused rate octet fails the walk
// with 0x80004005.
int32_t CountSpeechPackets(int h, uint64_t start, uint64_t end, PacketPayloadFn payloadOf, uint64_t* count);

}  // namespace metainfo
