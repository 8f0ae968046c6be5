#include "mp3/mp3_extract.h"

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <new>

#include "core/file_access.h"
#include "metainfo/extract.h"

namespace metainfo {
namespace {

constexpr uint32_t kBlockSize = 4096;
constexpr size_t kTocSize = 100;
constexpr int kXingKind = 2;
constexpr int kConstantKind = 1;

// First frame sync at or after offset within one 4096-byte window; without
// one the offset moves past what was read.
uint32_t NextFrameSync(int h, uint32_t offset) {
    if (MEx_fseek(h, static_cast<int64_t>(offset), SEEK_SET) != 0) return offset;
    uint8_t buf[kBlockSize];
    const int got = MEx_fread(buf, 1, kBlockSize, h);
    if (got <= 0) return offset;
    for (int i = 0; i + 3 < got; ++i) {
        if (IsMP3SyncCandidate(buf + i)) return offset + static_cast<uint32_t>(i);
    }
    return offset + static_cast<uint32_t>(got);
}

uint64_t TocByte(const _MP3AudioInfo* info, int seconds) {
    const double position = static_cast<double>(seconds) / info->duration * 100.0;
    const long index = std::lrint(position);
    // The end of the stream stands one past the table's last entry.
    if (index >= static_cast<long>(kTocSize)) return info->totalBytes;
    const uint8_t entry = info->xingToc[std::max(index, 0L)];
    return static_cast<uint64_t>(entry * 0.00390625 * static_cast<double>(info->totalBytes));
}

bool WriteAll(int out, const uint8_t* bytes, uint32_t n) {
    return n == 0 || MEx_fwrite(bytes, 1, n, out) == static_cast<int>(n);
}

// Copies n bytes of the source from offset to the output, in blocks.
bool CopyBytes(int h, int out, uint32_t offset, uint32_t n, uint8_t* block) {
    if (MEx_fseek(h, static_cast<int64_t>(offset), SEEK_SET) != 0) return false;
    uint32_t copied = 0;
    while (copied < n) {
        const uint32_t want = std::min(kBlockSize, n - copied);
        const int got = MEx_fread(block, 1, want, h);
        if (got <= 0) break;  // the source ends
        if (!WriteAll(out, block, static_cast<uint32_t>(got))) return false;
        copied += static_cast<uint32_t>(got);
    }
    return true;
}

int32_t WriteTrailingTag(int h, int out, const _MP3AudioInfo* info, uint8_t* block) {
    if (info->tagBytes < 1) return MM_OK;
    if (MEx_fseek(h, -static_cast<int64_t>(info->tagBytes), SEEK_END) != 0) return MM_E_FAIL;
    const int got = MEx_fread(block, 1, kBlockSize, h);
    if (got != 128) return MM_E_FAIL;
    return WriteAll(out, block, 128) ? MM_OK : MM_E_FAIL;
}

}  // namespace

void Int2Str(uint8_t* out, uint32_t value) {
    out[0] = static_cast<uint8_t>(value >> 24);
    out[1] = static_cast<uint8_t>(value >> 16);
    out[2] = static_cast<uint8_t>(value >> 8);
    out[3] = static_cast<uint8_t>(value);
}

int32_t GetMP3DataPos(int h, const _MP3AudioInfo* info, int startSec, int* endSec, _DataRange* range) {
    if (info == nullptr || endSec == nullptr || range == nullptr) return MM_E_INVALIDARG;
    if (startSec < 0 || *endSec <= startSec || static_cast<uint32_t>(startSec) > info->duration) {
        return MM_E_INVALIDARG;
    }
    if (static_cast<uint32_t>(*endSec) > info->duration) *endSec = static_cast<int>(info->duration);

    uint64_t start = 0;
    uint64_t end = 0;
    if (info->headerKind == kConstantKind || (info->headerKind == kXingKind && info->xingToc == nullptr)) {
        const uint64_t bytesPerSecond = info->avgBitRate >> 3;
        start = uint64_t(startSec) * bytesPerSecond + info->firstFrameOffset;
        end = uint64_t(*endSec) * bytesPerSecond + info->firstFrameOffset;
    } else if (info->headerKind == kXingKind) {
        if (info->duration == 0) return MM_E_FAIL;
        // Table positions count from the start of the file, as they always have.
        start = TocByte(info, startSec);
        end = TocByte(info, *endSec);
    } else {
        return MM_E_FAIL;  // VBRI streams cannot be cut
    }
    // Offsets stay within the audio: a hostile rate or table cannot reach past it.
    const uint64_t audioEnd =
        info->fileSize > info->tagBytes ? uint64_t(info->fileSize) - info->tagBytes : uint64_t(info->fileSize);
    const uint32_t limit = static_cast<uint32_t>(audioEnd);
    range->start = std::min<uint32_t>(NextFrameSync(h, static_cast<uint32_t>(std::min(start, audioEnd))), limit);
    range->end = std::min<uint32_t>(NextFrameSync(h, static_cast<uint32_t>(std::min(end, audioEnd))), limit);
    // A range without a frame (no sampled bit rate, or both cuts on one sync) is refused.
    if (range->end <= range->start) return MM_E_FAIL;
    return MM_OK;
}

void WriteXingHeader(int h, int out, const _MP3AudioInfo* info, uint8_t* scratch, uint32_t timeSpan,
                     uint32_t byteSpan) {
    const uint32_t head = std::min<uint32_t>(info->xingOffset + 4, kBlockSize);
    uint32_t written = 0;
    if (MEx_fseek(h, static_cast<int64_t>(info->firstFrameOffset), SEEK_SET) == 0) {
        const int got = MEx_fread(scratch, 1, head, h);
        if (got > 0 && WriteAll(out, scratch, static_cast<uint32_t>(got))) written = static_cast<uint32_t>(got);
    }
    uint8_t field[4];
    Int2Str(field, info->xingFlags);
    WriteAll(out, field, 4);
    written += 4;
    if (info->xingFlags & 1) {
        const uint32_t samples = timeSpan * info->sampleRate;  // 32-bit, as written by the handset
        const double frames = info->samplesPerFrame != 0 ? static_cast<double>(samples) / info->samplesPerFrame : 0;
        Int2Str(field, static_cast<uint32_t>(std::lrint(frames)));
        WriteAll(out, field, 4);
        written += 4;
    }
    if (info->xingFlags & 2) {
        Int2Str(field, byteSpan);
        WriteAll(out, field, 4);
        written += 4;
    }
    if (info->xingFlags & 4) {
        // The whole source's table, not one for the range.
        uint8_t toc[kTocSize] = {};
        if (info->xingToc != nullptr) std::memcpy(toc, info->xingToc, kTocSize);
        WriteAll(out, toc, kTocSize);
        written += kTocSize;
    }
    if (info->xingFlags & 8) {
        Int2Str(field, static_cast<uint32_t>(info->quality));
        WriteAll(out, field, 4);
        written += 4;
    }
    // The new frame keeps the size of the source's first frame.
    if (written < info->frameSize) {
        std::memset(scratch, 0, kBlockSize);
        uint32_t pad = info->frameSize - written;
        while (pad > 0) {
            const uint32_t n = std::min(pad, kBlockSize);
            if (!WriteAll(out, scratch, n)) break;
            pad -= n;
        }
    }
}

int32_t WriteDataToFile(int h, const char* outPath, const _MP3AudioInfo* info, const _DataRange* range,
                        uint32_t timeSpan) {
    if (outPath == nullptr || info == nullptr || range == nullptr) return MM_E_INVALIDARG;
    const int out = MEx_fopen(outPath, "wb");
    if (out == 0) return MM_E_FAIL;
    FileCloser closer(out);
    uint8_t* block = new (std::nothrow) uint8_t[kBlockSize];
    if (block == nullptr) return MM_E_FAIL;

    int32_t result = MM_OK;
    const uint32_t byteSpan = range->end - range->start;
    if (!CopyBytes(h, out, 0, info->firstFrameOffset, block)) result = MM_E_FAIL;
    if (result == MM_OK && info->headerKind == kXingKind) WriteXingHeader(h, out, info, block, timeSpan, byteSpan);
    if (result == MM_OK && !CopyBytes(h, out, range->start, byteSpan, block)) result = MM_E_FAIL;
    if (result == MM_OK) result = WriteTrailingTag(h, out, info, block);
    delete[] block;
    return result;
}

int32_t GetAudioData_MP3(const char* path, int startSec, int endSec, void* target, int* size, int mode) {
    if (startSec < 0 || endSec <= startSec || path == nullptr || size == nullptr || target == nullptr) {
        return MM_E_INVALIDARG;
    }
    _MP3AudioInfo info;
    std::memset(&info, 0, sizeof info);
    int32_t result = GetMediaInfo_MP3(path, &info, INFO_MP3_AUDIO);
    if (result != MM_OK) {
        delete[] info.xingToc;
        return result;
    }
    const int h = MEx_fopen(path, "rb");
    if (h == 0) {
        delete[] info.xingToc;
        return MM_E_FAIL;
    }
    _DataRange range = {0, 0};
    result = GetMP3DataPos(h, &info, startSec, &endSec, &range);
    if (result == MM_OK) {
        const uint32_t bytes = range.end - range.start;
        *size = static_cast<int>(bytes);
        if (mode == kMP3ToBuffer) {
            unsigned char* data = new (std::nothrow) unsigned char[bytes];
            if (data == nullptr) {
                result = MM_E_FAIL;
            } else if (MEx_fseek(h, static_cast<int64_t>(range.start), SEEK_SET) != 0 ||
                       MEx_fread(data, 1, bytes, h) != static_cast<int>(bytes)) {
                delete[] data;
                result = MM_E_FAIL;
            } else {
                *static_cast<unsigned char**>(target) = data;
            }
        } else if (mode == kMP3ToFile) {
            result = WriteDataToFile(h, static_cast<const char*>(target), &info, &range,
                                     static_cast<uint32_t>(endSec - startSec));
        } else {
            result = MM_E_FAIL;
        }
    }
    MEx_fclose(h);
    delete[] info.xingToc;
    return result;
}

int32_t MP3_GetAudioData2Buf(const char* path, int startSec, int endSec, unsigned char** data, int* size) {
    return GetAudioData_MP3(path, startSec, endSec, data, size, kMP3ToBuffer);
}

}  // namespace metainfo

extern "C" int32_t MP3_GetAudioData2File(const char* path, int startSec, int endSec, const char* outPath) {
    int size = 0;
    return metainfo::GetAudioData_MP3(path, startSec, endSec, const_cast<char*>(outPath), &size, metainfo::kMP3ToFile);
}
