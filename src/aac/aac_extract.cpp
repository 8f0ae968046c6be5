// Copies of a time range of a raw AAC file, cut at ADTS frame starts.
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <memory>
#include <new>

#include "aac/aac_clip.h"
#include "aac/aac_frame.h"
#include "core/byte_reader.h"
#include "core/file_access.h"
#include "metainfo/aac.h"

namespace metainfo {
namespace {

constexpr int kChunkSize = 8192;
// A sync word is looked for only this far before the end of what was read.
constexpr int kSyncMargin = 100;
constexpr int64_t kTrailingTagSize = 128;

// value x fileSize / duration, with the product a signed 32-bit value as the
// offsets have always been computed. Where the true product does not fit, the
// wrapped one would name a wrong place in the file: false, and no offset.
bool Proportional(int32_t value, uint32_t fileSize, int32_t duration, int32_t* offset) {
    const int64_t product = static_cast<int64_t>(value) * static_cast<int64_t>(fileSize);
    if (product > INT32_MAX || product < INT32_MIN) return false;
    *offset = static_cast<int32_t>(product / duration);
    return true;
}

// The byte offsets of a time range; 1 when the clip info fails or the range
// is rejected, MM_E_UNSUPPORTED when its offsets do not fit the arithmetic.
int32_t MapRange(const char* path, int startSec, int endSec, int32_t* startOffset, int32_t* endOffset,
                 uint32_t* fileSize) {
    _MMClipInfo clip;
    std::memset(&clip, 0, sizeof clip);
    if (AAC_GetClipInfo(path, &clip) != MM_OK) return 1;
    const int32_t duration = static_cast<int32_t>(clip.nDuration);
    if (startSec >= endSec || duration <= startSec || std::strcmp(clip.szFormat, "aac") != 0) return 1;
    // Only a negative start reaches here with a zero duration: nothing to map.
    if (duration == 0) return 1;
    if (!Proportional(startSec, clip.nFileSize, duration, startOffset) ||
        !Proportional(endSec < duration ? endSec : duration, clip.nFileSize, duration, endOffset)) {
        return MM_E_UNSUPPORTED;
    }
    *fileSize = clip.nFileSize;
    return MM_OK;
}

// Index of the first sync word among the first (n - 100) bytes, (n - 100)
// when there is none, 0 when no more than 100 bytes were read.
int SyncShift(const uint8_t* buf, int n) {
    if (n <= kSyncMargin) return 0;
    const int limit = n - kSyncMargin;
    int i = 0;
    while (i < limit && !IsADTSSync(buf + i)) ++i;
    return i;
}

// Reads from offset and gives the distance to the next sync word as SyncShift does.
int32_t ShiftAt(int in, int64_t offset, uint8_t* buf, int* shift) {
    if (offset < 0 || MEx_fseek(in, static_cast<int64_t>(offset), SEEK_SET) != 0) return MM_E_FAIL;
    const int n = MEx_fread(buf, 1, kChunkSize, in);
    *shift = SyncShift(buf, n);
    return MM_OK;
}

// Copies count bytes from in's position to out in chunks, writing what each
// read returns; stops early at the end of the input.
void CopyBytes(int in, int out, int64_t count, uint8_t* buf) {
    while (count > 0) {
        const int chunk = count > kChunkSize ? kChunkSize : static_cast<int>(count);
        const int got = MEx_fread(buf, 1, static_cast<unsigned>(chunk), in);
        if (got <= 0) break;
        MEx_fwrite(buf, 1, static_cast<unsigned>(got), out);
        count -= chunk;
    }
}

int32_t WriteRange(int in, int out, int32_t startOffset, int32_t endOffset, uint8_t* buf) {
    uint8_t probe[128] = {};
    if (MEx_fseek(in, 0, SEEK_SET) != 0 || MEx_fread(probe, 1, sizeof probe, in) < 16) return MM_E_FAIL;

    // The leading tag: the size field (not masked to seven bits), plus 20 when
    // the footer flag is set, copied from where the first read stopped. So the
    // cut file gets the bytes after the first 128, without the 10-byte tag
    // header: this is how cut files have always been built.
    int64_t tagBytes = BytesEqual(probe, "ID3", 3) ? ReadSyncsafe32(probe + 6) : 0;
    if (probe[5] & 0x10) tagBytes += 20;
    if (tagBytes > 0) CopyBytes(in, out, tagBytes, buf);

    int startShift = 0;
    int endShift = 0;
    if (ShiftAt(in, startOffset, buf, &startShift) != MM_OK) return MM_E_FAIL;
    if (ShiftAt(in, endOffset, buf, &endShift) != MM_OK) return MM_E_FAIL;
    const int64_t from = static_cast<int64_t>(startOffset) + startShift;
    const int64_t to = static_cast<int64_t>(endOffset) + endShift;
    if (MEx_fseek(in, static_cast<int64_t>(from), SEEK_SET) != 0) return MM_E_FAIL;
    CopyBytes(in, out, to - from, buf);

    uint8_t tail[kTrailingTagSize] = {};
    if (MEx_fseek(in, -kTrailingTagSize, SEEK_END) != 0) return MM_E_FAIL;
    MEx_fread(tail, 1, 3, in);
    if (BytesEqual(tail, "TAG", 3)) {
        if (MEx_fseek(in, -kTrailingTagSize, SEEK_END) != 0) return MM_E_FAIL;
        const int got = MEx_fread(tail, 1, sizeof tail, in);
        if (got > 0) MEx_fwrite(tail, 1, static_cast<unsigned>(got), out);
    }
    return MM_OK;
}

}  // namespace
}  // namespace metainfo

using namespace metainfo;

extern "C" int32_t AAC_GetAuidoData_File(const char* path, int startSec, int endSec, const char* outPath) {
    int32_t startOffset = 0;
    int32_t endOffset = 0;
    uint32_t fileSize = 0;
    const int32_t mapped = MapRange(path, startSec, endSec, &startOffset, &endOffset, &fileSize);
    if (mapped != MM_OK) return mapped;

    std::unique_ptr<uint8_t[]> buf(new (std::nothrow) uint8_t[kChunkSize + 1]);
    if (!buf) return MM_E_FAIL;
    FileCloser in(MEx_fopen(path, "rb"));
    FileCloser out(MEx_fopen(outPath, "wb"));
    if (in.get() == 0 || out.get() == 0) return 1;
    return WriteRange(in.get(), out.get(), startOffset, endOffset, buf.get());
}

extern "C" int32_t AAC_GetAuidoData_Buf(const char* path, int startSec, int endSec, unsigned char** data, int* length) {
    if (data == nullptr || length == nullptr) return MM_E_INVALIDARG;
    int32_t startOffset = 0;
    int32_t endOffset = 0;
    uint32_t fileSize = 0;
    const int32_t mapped = MapRange(path, startSec, endSec, &startOffset, &endOffset, &fileSize);
    if (mapped != MM_OK) return mapped;

    FileCloser in(MEx_fopen(path, "rb"));
    if (in.get() == 0) return 1;
    if (startOffset < 0 || MEx_fseek(in.get(), startOffset, SEEK_SET) != 0) return MM_E_FAIL;
    const int64_t size = static_cast<int64_t>(endOffset) - startOffset;
    // A range the file cannot back is rejected before anything is allocated.
    if (size < 0 || size > static_cast<int64_t>(fileSize) - startOffset) return 1;

    std::unique_ptr<uint8_t[]> range(new (std::nothrow) uint8_t[static_cast<size_t>(size) + 1]);
    if (!range) return MM_E_FAIL;
    const int got = MEx_fread(range.get(), 1, static_cast<unsigned>(size), in.get());
    if (got < size) return 1;

    const int n = static_cast<int>(size);
    const int front = SyncShift(range.get(), n);
    // The last sync word ends the copy: the last frame may be cut, so it is dropped.
    int back = front;
    for (int j = n - 1; j > front; --j) {
        if (IsADTSSync(range.get() + j - 1)) {
            back = j;
            break;
        }
    }
    // Without any frame start the copy would have a length of -1.
    const int copyLength = back - front - 1;
    if (copyLength < 0) return 1;

    unsigned char* result = new (std::nothrow) unsigned char[static_cast<size_t>(copyLength) + 1];
    if (result == nullptr) return MM_E_FAIL;
    std::memcpy(result, range.get() + front, static_cast<size_t>(copyLength));
    result[copyLength] = 0;
    *data = result;
    *length = copyLength;
    return MM_OK;
}
