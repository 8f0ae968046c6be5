#include "aac/aac_frame.h"

#include <cstdio>
#include <memory>
#include <new>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "metainfo/records.h"

namespace metainfo {
namespace {
constexpr unsigned kVerifyWindow = 4096;
constexpr uint32_t kMaxADTSFrame = 4096;
}  // namespace

uint32_t AACGetFrameSize(const uint8_t* header, uint32_t* frameKind) {
    if (header == nullptr) return 0xFFFFFFFFu;
    if (header[0] != 0xFF || (header[1] & 0xF0) != 0xF0) return static_cast<uint32_t>(MM_E_FAIL);
    *frameKind = static_cast<uint32_t>((header[2] & 0xC0) >> 5) | (header[1] & 0x08);
    const uint32_t length = (header[3] & 3u) * 2048 + header[4] * 8u + (header[5] >> 5);
    return length <= kMaxADTSFrame ? length : 0xFFFFFFFFu;
}

uint32_t AACLeadingTagSkip(const uint8_t* probe) {
    if (!BytesEqual(probe, "ID3", 3)) return 0;
    const uint32_t size = ReadSyncsafe32(probe + 6);
    if (size < 1) return 0;
    return size + ((probe[5] & 0x10) ? 20 : 10);
}

int32_t VerifyAAC(int h, const uint8_t* probe) {
    if (probe == nullptr) return MM_E_INVALIDARG;
    MEx_fseek(h, static_cast<int64_t>(AACLeadingTagSkip(probe)), SEEK_SET);
    std::unique_ptr<uint8_t[]> buf(new (std::nothrow) uint8_t[kVerifyWindow]);
    if (!buf) return MM_E_FAIL;
    const int n = MEx_fread(buf.get(), 1, kVerifyWindow, h);
    if (n < 4) return MM_E_FAIL;
    const int limit = n - 8;
    if (limit <= 0) return MM_E_UNSUPPORTED;

    const uint8_t* b = buf.get();
    int pos = 0;
    while (pos < limit && !IsADTSSync(b + pos) && !BytesEqual(b + pos, "ADIF", 4)) ++pos;
    if (pos >= limit) return MM_E_UNSUPPORTED;
    if (BytesEqual(b + pos, "ADIF", 4)) return MM_OK;

    uint32_t firstKind = 0;
    uint32_t secondKind = 0;
    const int32_t first = static_cast<int32_t>(AACGetFrameSize(b + pos, &firstKind));
    if (first <= 0 || static_cast<int64_t>(pos) + first >= limit) return MM_E_UNSUPPORTED;
    const int32_t second = static_cast<int32_t>(AACGetFrameSize(b + pos + first, &secondKind));
    if (second > 0 && firstKind == secondKind) return MM_OK;
    return MM_E_UNSUPPORTED;
}

}  // namespace metainfo
