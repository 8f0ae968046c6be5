#include "speech/qcp_format.h"

#include <cstring>

#include "core/byte_reader.h"
#include "core/codes.h"
#include "core/file_access.h"
#include "metainfo/records.h"

namespace metainfo {
namespace {

// Codec GUIDs of RFC 3625 as they stand in the file (little-endian fields).
const uint8_t QCELP13K_CODEC_1_UUID[16] = {0x41, 0x6D, 0x7F, 0x5E, 0x15, 0xB1, 0xD0, 0x11,
                                           0xBA, 0x91, 0x00, 0x80, 0x5F, 0xB4, 0xB9, 0x7E};
const uint8_t QCELP13K_CODEC_2_UUID[16] = {0x42, 0x6D, 0x7F, 0x5E, 0x15, 0xB1, 0xD0, 0x11,
                                           0xBA, 0x91, 0x00, 0x80, 0x5F, 0xB4, 0xB9, 0x7E};
const uint8_t EVRC_CODEC_UUID[16] = {0x8D, 0xD4, 0x89, 0xE6, 0x76, 0x90, 0xB5, 0x46,
                                     0x91, 0xEF, 0x73, 0x6A, 0x51, 0x00, 0xCE, 0xB4};
const uint8_t SMV_CODEC_UUID[16] = {0x75, 0x2B, 0x7C, 0x8D, 0x97, 0xA7, 0x49, 0xED,
                                    0x98, 0x5E, 0xD5, 0x3C, 0x8C, 0xC7, 0x5F, 0x84};

}  // namespace

const uint8_t QCELP_Rate_Table[8] = {0, 3, 7, 16, 34, 0, 0, 0};
const uint8_t EVRC_Rate_Table[8] = {0, 2, 5, 10, 22, 0, 0, 0};

int32_t parseFMTInfo(const uint8_t* chunk, size_t length, _QCPFMT* fmt) {
    if (chunk == nullptr || fmt == nullptr) return MM_E_INVALIDARG;
    std::memset(fmt, 0, sizeof *fmt);
    // A chunk shorter than its fields leaves the missing ones zero.
    uint8_t b[kQcpFmtChunkBytes] = {};
    std::memcpy(b, chunk, length < sizeof b ? length : sizeof b);
    fmt->nChunkId = ReadBE32(b);
    fmt->nChunkSize = ReadLE32(b + 4);
    fmt->nMajor = b[8];
    fmt->nMinor = b[9];
    std::memcpy(fmt->codecGuid, b + 10, sizeof fmt->codecGuid);
    fmt->nCodecVersion = ReadLE16(b + 26);
    std::memcpy(fmt->szCodecName, b + 28, sizeof fmt->szCodecName);
    fmt->nAvgBitrate = ReadLE16(b + 108);
    fmt->nPacketSize = ReadLE16(b + 110);
    fmt->nBlockSize = ReadLE16(b + 112);
    fmt->nSamplingRate = ReadLE16(b + 114);
    fmt->nSampleSize = ReadLE16(b + 116);
    fmt->nNumRates = ReadLE32(b + 118);
    for (int i = 0; i < 8; ++i) {
        fmt->rateMap[i].nWordSize = b[122 + 2 * i];
        fmt->rateMap[i].nRateOctet = b[123 + 2 * i];
    }
    return MM_OK;
}

QcpCodec CodecOfGuid(const uint8_t guid[16]) {
    if (std::memcmp(guid, QCELP13K_CODEC_1_UUID, 16) == 0 || std::memcmp(guid, QCELP13K_CODEC_2_UUID, 16) == 0) {
        return QcpCodec::kQcelp;
    }
    if (std::memcmp(guid, EVRC_CODEC_UUID, 16) == 0) return QcpCodec::kEvrc;
    if (std::memcmp(guid, SMV_CODEC_UUID, 16) == 0) return QcpCodec::kSmv;
    return QcpCodec::kUnknown;
}

uint32_t CodecCodeOf(QcpCodec codec) {
    switch (codec) {
        case QcpCodec::kQcelp: return CODEC_QCELP;
        case QcpCodec::kEvrc: return CODEC_EVRC;
        case QcpCodec::kSmv: return CODEC_SMV;
        case QcpCodec::kUnknown: break;
    }
    return 0xFFFF;
}

int32_t CountSpeechPackets(int h, uint64_t start, uint64_t end, PacketPayloadFn payloadOf, uint64_t* count) {
    *count = 0;
    // Packets are read through a window of the file so that a walk over small
    // packets does not seek for each one.
    uint8_t window[4096];
    uint64_t windowStart = 0;
    uint64_t windowLength = 0;
    uint64_t pos = start;
    while (pos < end) {
        if (pos < windowStart || pos - windowStart >= windowLength) {
            if (!SeekToOffset(h, pos)) break;
            int n = MEx_fread(window, 1, sizeof window, h);
            if (n <= 0) break;  // the file ends before the size it reported
            windowStart = pos;
            windowLength = static_cast<uint64_t>(n);
        }
        int payload = payloadOf(window[pos - windowStart]);
        if (payload < 0) return MM_E_FAIL;
        ++*count;
        pos += 1 + static_cast<uint64_t>(payload);
    }
    return MM_OK;
}

}  // namespace metainfo
