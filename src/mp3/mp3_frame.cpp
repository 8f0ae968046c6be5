#include "mp3/mp3_frame.h"

#include <cstdio>
#include <cstring>
#include <vector>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "metainfo/records.h"
#include "mp3/mp3_tables.h"

namespace metainfo {
namespace {

constexpr unsigned kID3ProbeSize = 1024;
constexpr unsigned kSyncWindow = 4096;
constexpr int kID3HeaderSize = 10;
constexpr int kMaxID3Rounds = 4;

// Offset of "ID3" within the first n bytes, searched where a whole tag header fits.
int FindID3(const uint8_t* block, int n, bool atStartOnly) {
    if (atStartOnly) return BytesEqual(block, "ID3", 3) ? 0 : -1;
    for (int k = 0; k < n - kID3HeaderSize; ++k) {
        if (BytesEqual(block + k, "ID3", 3)) return k;
    }
    return -1;
}

}  // namespace

bool IsMP3SyncCandidate(const uint8_t* p) {
    return p[0] == 0xFF && (p[1] & 0xE0) == 0xE0 && p[1] != 0xFF && p[2] != 0xFF && p[3] != 0xFF;
}

int32_t MP3GetFrameSize(const uint8_t* header, uint32_t* signature, _FrameHeader_Info* info) {
    const uint8_t b1 = header[1];
    const uint8_t b2 = header[2];
    if (header[0] != 0xFF || (b1 & 0xE0) != 0xE0) return MM_E_FAIL;
    const uint32_t version = (b1 >> 3) & 3;
    const uint32_t layerIndex = (~(b1 >> 1)) & 3;
    const uint32_t bitrateIndex = b2 >> 4;
    const uint32_t samplingIndex = (b2 >> 2) & 3;
    if (version == 1 || layerIndex == 3 || bitrateIndex == 15 || samplingIndex == 3) return MM_E_FAIL;
    const uint32_t lsf = lsfIndex[version];
    const uint32_t id = idIndex[version];
    if (lsf > 1 || id > 2) return MM_E_FAIL;

    const uint32_t bitRate = static_cast<uint32_t>(bitrateTab[lsf * 45 + layerIndex * 15 + bitrateIndex]) * 1000;
    if (bitRate == 0) return MM_E_FAIL;  // free format is not supported
    const uint32_t sampleRate = samplerateTab[id * 3 + samplingIndex];
    const uint32_t samples = samplesPerFrameTab[lsf * 3 + layerIndex];

    if (signature != nullptr) *signature = layerIndex << 4 | version << 6 | samplingIndex << 2;
    const uint32_t padding = (b2 >> 1) & 1;
    const uint32_t frameSize =
        (bitRate * dwCoefficients[lsf * 3 + layerIndex] / sampleRate + padding) * dwSlotSizes[layerIndex];

    if (info != nullptr) {
        info->versionId = static_cast<uint8_t>(version);
        info->layerIndex = static_cast<uint8_t>(layerIndex);
        info->protectionBit = b1 & 1;
        info->channelMode = header[3] >> 6;
        info->bitRate = bitRate;
        info->sampleRate = sampleRate;
        info->frameSize = frameSize;
        info->samplesPerFrame = samples;
    }
    return static_cast<int32_t>(frameSize);
}

int32_t CheckID3Header(int h) {
    if (MEx_fseek(h, 0, SEEK_SET) != 0) return MM_E_FAIL;
    uint8_t block[kID3ProbeSize];
    for (int round = 1; round <= kMaxID3Rounds; ++round) {
        const int64_t start = MEx_ftell(h);
        const int n = MEx_fread(block, 1, kID3ProbeSize, h);
        if (n <= 9) return MM_E_FAIL;
        if (n == kID3HeaderSize) {
            MEx_fseek(h, start, SEEK_SET);
            return MM_OK;
        }
        const int k = FindID3(block, n, round == 1);
        if (k < 0) {
            MEx_fseek(h, round == 1 ? 0 : start, SEEK_SET);
            return MM_OK;
        }
        const uint32_t size = ReadSyncsafe32(block + k + 6);
        if (size > 0) {
            int64_t skip = static_cast<int64_t>(k) + kID3HeaderSize + static_cast<int64_t>(size);
            if (block[k + 5] & 0x10) skip += kID3HeaderSize;  // footer
            MEx_fseek(h, start + skip, SEEK_SET);
        }
        // At most three chained tags are skipped; a fourth is left in place.
        if (round == kMaxID3Rounds) MEx_fseek(h, start, SEEK_SET);
    }
    return MM_OK;
}

int32_t VerifyMP3(int h, const uint8_t* /*probe*/, _FrameHeader_Info* info) {
    int32_t result = CheckID3Header(h);
    if (result != MM_OK) return result;
    const int64_t start = MEx_ftell(h);
    std::vector<uint8_t> buf(kSyncWindow);
    const int n = MEx_fread(buf.data(), 1, kSyncWindow, h);
    if (n < 4) return MM_E_FAIL;

    const uint8_t* b = buf.data();
    uint32_t firstSignature = 0;
    uint32_t secondSignature = 0;
    bool accepted = false;
    for (int i = 0; i <= n - 4; ++i) {
        // Every candidate starts with 0xFF: jump to the next one.
        const void* ff = std::memchr(b + i, 0xFF, static_cast<size_t>(n - 3 - i));
        if (ff == nullptr) break;
        i = static_cast<int>(static_cast<const uint8_t*>(ff) - b);
        if (!IsMP3SyncCandidate(b + i)) continue;
        _FrameHeader_Info frame;
        std::memset(&frame, 0, sizeof frame);
        const int32_t size = MP3GetFrameSize(b + i, &firstSignature, &frame);
        if (size <= 0) {
            i += 4;  // a header that does not decode: skip past it
            continue;
        }
        frame.firstFrameOffset = static_cast<uint32_t>(start + i);
        if (info != nullptr) *info = frame;
        // The next header must lie inside what was read.
        if (static_cast<int64_t>(i) + size >= n - 3) return MM_E_UNSUPPORTED;
        if (MP3GetFrameSize(b + i + size, &secondSignature, nullptr) > 0) {
            accepted = true;
            break;
        }
    }
    if (!accepted || firstSignature != secondSignature) return MM_E_UNSUPPORTED;
    return MM_OK;
}

}  // namespace metainfo
