#include "speech/amr.h"

#include <climits>
#include <cstring>
#include <memory>
#include <new>

#include "core/codes.h"
#include "core/file_access.h"
#include "metainfo/extract.h"

namespace metainfo {
namespace {

constexpr size_t kAmrProbeBytes = 32768;
// The longest magic and channel description, and the first frame header.
constexpr size_t kAmrHeadBytes = 32;
constexpr size_t kAmrCopyChunk = 32768;
constexpr int kAmrMaxBlocks = 4096;

struct AmrKind {
    const char* magic;
    uint32_t headerLen;
    uint32_t firstFrame;  // position of the first frame header byte
};

// Multi-channel kinds keep a 4-byte channel description between the magic and
// the first frame; its last byte holds the channel count.
const AmrKind kAmrKinds[] = {
    {"#!AMR\n", 6, 6},
    {"#!AMR-WB\n", 9, 9},
    {"#!AMR_MC1.0\n", 12, 16},
    {"#!AMR-WB_MC1.0\n", 15, 19},
};

const uint32_t kNbBitrate[16] = {4750, 5150, 5900, 6700, 7400, 7950, 10200, 12200, 1750, 0, 0, 0, 0, 0, 0, 40};
const uint32_t kNbFrameSize[16] = {13, 14, 16, 18, 20, 21, 27, 32, 6, 0, 0, 0, 0, 0, 0, 1};
const uint32_t kWbBitrate[16] = {6600, 8850, 12650, 14250, 15850, 18250, 19850, 23050, 23850, 1750, 0, 0, 0, 0, 0, 40};
const uint32_t kWbFrameSize[16] = {18, 24, 33, 37, 41, 47, 51, 59, 61, 6, 0, 0, 0, 0, 0, 1};

// Frame-type sub-codes 0x1010..0x1023; a wide-band frame type ft answers entry ft + 9.
const uint32_t kAmrSubCodes[20] = {0x1010, 0x1011, 0x1012, 0x1013, 0x1014, 0x1015, 0x1016, 0x1017, 0x1018, 0x1019,
                                   0x101A, 0x101B, 0x101C, 0x101D, 0x101E, 0x101F, 0x1020, 0x1021, 0x1022, 0x1023};

bool IsWideBand(int kind) { return kind == kAmrWideBand || kind == kAmrWideBandMulti; }
bool IsMultiChannel(int kind) { return kind == kAmrNarrowBandMulti || kind == kAmrWideBandMulti; }
int FrameTypeOf(uint8_t header) { return (header >> 3) & 0x0F; }
uint32_t FrameSizeOf(int kind, int frameType) {
    return IsWideBand(kind) ? kWbFrameSize[frameType] : kNbFrameSize[frameType];
}

// The magic and the first frame header of what was read from the file.
int32_t ParseAmrHead(const uint8_t* buf, size_t length, _AMR_FrameInfo* info) {
    std::memset(info, 0, sizeof *info);
    int kind = -1;
    for (int k = 0; k < 4; ++k) {
        size_t n = std::strlen(kAmrKinds[k].magic);
        if (length >= n && std::memcmp(buf, kAmrKinds[k].magic, n) == 0) {
            kind = k;
            break;
        }
    }
    if (kind < 0) return MM_E_UNSUPPORTED;
    const AmrKind& k = kAmrKinds[kind];
    if (k.firstFrame >= length) return MM_E_FAIL;
    uint8_t header = buf[k.firstFrame];
    // Padding bits 0, quality bit 1.
    if ((header & 0x87) != 0x04) return MM_E_FAIL;
    int frameType = FrameTypeOf(header);
    bool reserved = IsWideBand(kind) ? (frameType >= 10 && frameType <= 14) : (frameType >= 9 && frameType <= 14);
    if (reserved) return MM_E_FAIL;
    info->nFileType = kind;
    info->nFrameType = frameType;
    info->nHeaderLen = k.headerLen;
    info->nFrameSize = FrameSizeOf(kind, frameType);
    info->nChannels = IsMultiChannel(kind) ? (buf[k.firstFrame - 1] & 0x0F) : 1;
    info->nQuality = 1;
    info->nBitrate = IsWideBand(kind) ? kWbBitrate[frameType] : kNbBitrate[frameType];
    return MM_OK;
}

int32_t SetMimeType(_MM_MIMETYPE* mime, int kind) {
    delete[] mime->pszMimeType;
    mime->pszMimeType = nullptr;
    mime->nMimeLength = 0;
    const char* text = IsWideBand(kind) ? "audio/AMR-WB" : "audio/AMR";
    size_t length = std::strlen(text);
    char* s = new (std::nothrow) char[length + 1];
    if (s == nullptr) return MM_E_OUTOFMEMORY;
    std::memcpy(s, text, length + 1);
    mime->pszMimeType = s;
    mime->nMimeLength = static_cast<uint32_t>(length);
    return MM_OK;
}

}  // namespace

int Get_avBlockSize(const uint8_t* data, int kind, size_t length, uint32_t channels) {
    if (data == nullptr || kind < 0 || kind > 3) return 0;
    uint64_t offset = 0;
    uint64_t sum = 0;
    uint64_t largest = 0;
    uint64_t smallest = UINT64_MAX;
    int count = 0;
    while (count < kAmrMaxBlocks && offset < length) {
        uint64_t block = 0;
        if (!IsMultiChannel(kind)) {
            block = FrameSizeOf(kind, FrameTypeOf(data[offset]));
        } else {
            // Each channel's frame header stands 4 bytes after the frame's start.
            uint64_t at = offset;
            bool complete = true;
            for (uint32_t ch = 0; ch < channels; ++ch) {
                if (at + 4 >= length) {
                    complete = false;
                    break;
                }
                uint32_t frame = FrameSizeOf(kind, FrameTypeOf(data[at + 4]));
                block += frame;
                at += frame;
            }
            if (!complete) break;
        }
        ++count;
        sum += block;
        if (block > largest) largest = block;
        if (block < smallest) smallest = block;
        offset += block;
    }
    if (count == 0) return 0;
    // One outlier at either end does not skew the average.
    if (count > 2) return static_cast<int>((sum - largest - smallest) / static_cast<uint64_t>(count - 2));
    return static_cast<int>(sum / static_cast<uint64_t>(count));
}

int32_t GetMediaInfo_AMR(const char* path, void* out, int request) {
    if (path == nullptr || out == nullptr) return MM_E_INVALIDARG;
    // Only the clip's average block needs the frames; the other answers come
    // from the magic and the first frame header.
    const bool frames = request == INFO_CLIPINFO || request == INFO_AMR_AUDIO;
    const size_t want = frames ? kAmrProbeBytes : kAmrHeadBytes;
    std::unique_ptr<uint8_t[]> buffer(new (std::nothrow) uint8_t[want]);
    if (!buffer) return MM_E_FAIL;
    int h = MEx_fopen(path, "rb");
    if (h == 0) return MM_E_FAIL;
    FileCloser closer(h);
    int got = MEx_fread(buffer.get(), 1, static_cast<unsigned>(want), h);
    if (got < 16) return MM_E_FAIL;
    _AMR_FrameInfo frame;
    int32_t result = ParseAmrHead(buffer.get(), static_cast<size_t>(got), &frame);
    if (result != MM_OK) return result;
    if (MEx_fseek(h, 0, 2) != 0) return MM_E_FAIL;
    int64_t end = MEx_ftell(h);
    uint64_t fileSize = end > 0 ? static_cast<uint64_t>(end) : 0;
    uint64_t payload = fileSize > frame.nHeaderLen ? fileSize - frame.nHeaderLen : 0;

    switch (request) {
        case INFO_MIMETYPE: return SetMimeType(static_cast<_MM_MIMETYPE*>(out), frame.nFileType);
        case INFO_CODECTYPE: {
            // A narrow-band file has no codec answer.
            if (!IsWideBand(frame.nFileType)) return MM_E_UNSUPPORTED;
            _MM_CODECTYPE* codec = static_cast<_MM_CODECTYPE*>(out);
            codec->nAudioCodec = CODEC_AMR_WB;
            int entry = frame.nFrameType + 9;
            // A first frame without data (15) has no sub-code.
            codec->nAudioSubType = entry < 20 ? kAmrSubCodes[entry] : 0;
            return MM_OK;
        }
        case INFO_CLIPINFO: {
            _MMClipInfo* clip = static_cast<_MMClipInfo*>(out);
            std::memset(clip, 0, sizeof *clip);
            clip->nFileSize = SaturateU32(fileSize);
            bool wide = IsWideBand(frame.nFileType);
            std::strcpy(clip->szFormat, wide ? "awb" : "amr");
            clip->nSampleRate = wide ? 16000 : 8000;
            clip->nSamplesPerFrame = wide ? 320 : 160;
            int block = Get_avBlockSize(buffer.get() + frame.nHeaderLen, frame.nFileType,
                                        static_cast<size_t>(got) - frame.nHeaderLen, frame.nChannels);
            if (block < 1) return MM_E_FAIL;
            // 50 blocks of 20 ms make a second.
            clip->nDuration = static_cast<uint32_t>(payload / static_cast<uint64_t>(block) / 50);
            clip->nAudioBitrate = frame.nBitrate;
            clip->nBitrate = frame.nBitrate;
            clip->nBitsPerSample = 16;
            clip->nChannels = frame.nChannels;
            clip->bHasAudio = 1;
            clip->bHasVideo = 0;
            return MM_OK;
        }
        case INFO_AMR_AUDIO: {
            int block = Get_avBlockSize(buffer.get() + frame.nHeaderLen, frame.nFileType,
                                        static_cast<size_t>(got) - frame.nHeaderLen, frame.nChannels);
            if (block < 1) return MM_E_FAIL;
            _AMR_AudioInfo* info = static_cast<_AMR_AudioInfo*>(out);
            info->nDuration = static_cast<uint32_t>(payload / static_cast<uint64_t>(block) / 50);
            info->nFileType = frame.nFileType;
            info->nFrameType = frame.nFrameType;
            info->nHeaderLen = frame.nHeaderLen;
            info->nFrameSize = frame.nFrameSize;
            info->nChannels = frame.nChannels;
            info->nBlockSize = static_cast<uint32_t>(block);
            return MM_OK;
        }
        default: return MM_E_FAIL;
    }
}

int32_t GetAudioData_AMR(const char* path, int startSec, int endSec, unsigned char** data, int* size, int mode) {
    if (startSec < 0 || path == nullptr || data == nullptr || size == nullptr || startSec >= endSec) {
        return MM_E_INVALIDARG;
    }
    _AMR_AudioInfo info = {};
    int32_t result = GetMediaInfo_AMR(path, &info, INFO_AMR_AUDIO);
    if (result != MM_OK) return result;
    if (static_cast<uint32_t>(startSec) > info.nDuration) return MM_E_INVALIDARG;
    // Cuts fall on multiples of the average block, not on frame boundaries.
    uint64_t bytesPerSecond = static_cast<uint64_t>(info.nBlockSize) * 50;
    uint64_t last = static_cast<uint32_t>(endSec) < info.nDuration ? static_cast<uint32_t>(endSec) : info.nDuration;
    uint64_t begin = static_cast<uint64_t>(startSec) * bytesPerSecond + info.nHeaderLen;
    uint64_t end = last * bytesPerSecond + info.nHeaderLen;
    uint64_t length = end - begin;
    if (length > static_cast<uint64_t>(INT_MAX)) return MM_E_FAIL;
    *size = static_cast<int>(length);

    int source = MEx_fopen(path, "rb");
    if (source == 0) return MM_E_FAIL;
    FileCloser sourceCloser(source);

    if (mode == kAmrToBuffer) {
        if (!SeekToOffset(source, begin)) return MM_E_FAIL;
        unsigned char* buffer = new (std::nothrow) unsigned char[length];
        if (buffer == nullptr) return MM_E_FAIL;
        *data = buffer;
        // A short read leaves the buffer with the caller and fails.
        if (MEx_fread(buffer, 1, static_cast<unsigned>(length), source) != static_cast<int>(length)) return MM_E_FAIL;
        return MM_OK;
    }
    if (mode != kAmrToFile) return MM_E_FAIL;

    const char* outPath = reinterpret_cast<const char*>(*data);
    if (outPath == nullptr) return MM_E_INVALIDARG;
    if (info.nFileType < 0 || info.nFileType > 3) return MM_E_UNSUPPORTED;
    const char* magic = kAmrKinds[info.nFileType].magic;
    int out = MEx_fopen(outPath, "wb");
    if (out == 0) return MM_E_FAIL;
    FileCloser outCloser(out);
    size_t magicLength = std::strlen(magic);
    if (MEx_fwrite(magic, 1, static_cast<unsigned>(magicLength), out) != static_cast<int>(magicLength)) {
        return MM_E_FAIL;
    }
    std::unique_ptr<uint8_t[]> chunk(new (std::nothrow) uint8_t[kAmrCopyChunk]);
    if (!chunk) return MM_E_FAIL;
    if (!SeekToOffset(source, begin)) return MM_E_FAIL;
    uint64_t left = length;
    while (left > 0) {
        size_t want = left < kAmrCopyChunk ? static_cast<size_t>(left) : kAmrCopyChunk;
        int got = MEx_fread(chunk.get(), 1, static_cast<unsigned>(want), source);
        if (got <= 0) break;
        if (MEx_fwrite(chunk.get(), 1, static_cast<unsigned>(got), out) != got) return MM_E_FAIL;
        left -= static_cast<uint64_t>(got);
    }
    return MM_OK;
}

int32_t AMR_GetClipInfo(const char* path, _MMClipInfo* clip) { return GetMediaInfo_AMR(path, clip, INFO_CLIPINFO); }

int32_t AMR_GetMIMEType(const char* path, _MM_MIMETYPE* mime) { return GetMediaInfo_AMR(path, mime, INFO_MIMETYPE); }

int32_t AMR_GetCodecType(const char* path, _MM_CODECTYPE* codec) {
    return GetMediaInfo_AMR(path, codec, INFO_CODECTYPE);
}

int32_t AMR_GetTrackType(const char* /*path*/, int* mask) {
    if (mask == nullptr) return MM_E_INVALIDARG;
    *mask = TRACK_AUDIO;
    return MM_OK;
}

int32_t AMR_GetAudioData2Buf(const char* path, int startSec, int endSec, unsigned char** data, int* size) {
    return GetAudioData_AMR(path, startSec, endSec, data, size, kAmrToBuffer);
}

}  // namespace metainfo

extern "C" int32_t AMR_GetAudioData2File(const char* path, int startSec, int endSec, const char* outPath) {
    unsigned char* target = reinterpret_cast<unsigned char*>(const_cast<char*>(outPath));
    int size = 0;
    return metainfo::GetAudioData_AMR(path, startSec, endSec, &target, &size, metainfo::kAmrToFile);
}

namespace metainfo {
namespace {

constexpr uint64_t kAmrCountLimit = uint64_t{16} << 20;
constexpr size_t kAmrMaxBlock = size_t{61} * 16 + 16;  // the largest frame of each of 16 channels
                                                       // frames counted; past it the rest is estimated

// Frames (blocks of every channel's frame) from the first frame to the end,
// read in chunks; a block cut off by the end of the file does not count.
struct AmrCount {
    uint64_t blocks = 0, bytes = 0;
    bool stopped = false;  // at the count limit
};

uint64_t BlockSize(const uint8_t* p, size_t n, int kind, uint32_t channels) {
    if (!IsMultiChannel(kind)) return FrameSizeOf(kind, FrameTypeOf(p[0]));
    uint64_t block = 0;
    for (uint32_t ch = 0; ch < channels; ++ch) {
        if (block + 4 >= n) return 0;
        const uint32_t frame = FrameSizeOf(kind, FrameTypeOf(p[block + 4]));
        if (frame == 0) return 0;
        block += frame;
    }
    return block;
}

AmrCount CountBlocks(int h, uint64_t start, uint64_t fileSize, int kind, uint32_t channels) {
    AmrCount c;
    std::unique_ptr<uint8_t[]> chunk(new uint8_t[kAmrProbeBytes]);
    uint64_t at = start;
    while (at < fileSize) {
        if (at - start >= kAmrCountLimit) {
            c.stopped = true;
            break;
        }
        if (!SeekToOffset(h, at)) break;
        const int got = MEx_fread(chunk.get(), 1, kAmrProbeBytes, h);
        if (got <= 0) break;
        const auto n = static_cast<size_t>(got);
        size_t i = 0;
        // Stop a chunk early enough that a block never straddles it unseen.
        while (i < n) {
            const uint64_t block = BlockSize(chunk.get() + i, n - i, kind, channels);
            if (block == 0 || (i + block > n && at + n < fileSize)) break;
            if (at + i + block > fileSize) break;
            ++c.blocks;
            c.bytes += block;
            i += static_cast<size_t>(block);
        }
        if (i == 0) break;
        at += i;
    }
    return c;
}

// The magic and first frame header of an opened file, and its size.
bool ReadStart(int h, const char* path, _AMR_FrameInfo* frame, uint64_t* fileSize) {
    uint8_t head[32];
    const int got = MEx_fread(head, 1, sizeof head, h);
    return got >= 16 && ParseAmrHead(head, static_cast<size_t>(got), frame) == MM_OK &&
           OpenedFileSize(h, path, fileSize);
}

}  // namespace

bool WalkAmrFrames(const char* path, uint32_t* rate, uint64_t* prefix, const FrameVisitor& visit) {
    const int h = MEx_fopen(path, "rb");
    if (h == 0) return false;
    FileCloser closer(h);
    uint64_t fileSize = 0;
    _AMR_FrameInfo frame;
    if (!ReadStart(h, path, &frame, &fileSize)) return false;
    const bool wide = IsWideBand(frame.nFileType);
    *rate = wide ? 16000 : 8000;
    *prefix = kAmrKinds[frame.nFileType].firstFrame;
    uint8_t block[kAmrMaxBlock];
    for (uint64_t at = *prefix; at < fileSize;) {
        if (!SeekToOffset(h, at)) break;
        const int n = MEx_fread(block, 1, sizeof block, h);
        const uint64_t size = n > 0 ? BlockSize(block, static_cast<size_t>(n), frame.nFileType, frame.nChannels) : 0;
        if (size == 0 || size > static_cast<uint64_t>(n) || at + size > fileSize) break;
        if (!visit(AudioFrame{at, static_cast<uint32_t>(size), wide ? 320u : 160u})) break;
        at += size;
    }
    return true;
}

int32_t AmrFacts(const char* path, MediaFacts* f) {
    const int h = MEx_fopen(path, "rb");
    if (h == 0) return MM_E_FAIL;
    FileCloser closer(h);
    uint64_t fileSize = 0;
    _AMR_FrameInfo frame;
    if (!ReadStart(h, path, &frame, &fileSize)) return MM_E_FAIL;
    const bool wide = IsWideBand(frame.nFileType);
    const uint64_t start = kAmrKinds[frame.nFileType].firstFrame;
    const AmrCount count = CountBlocks(h, start, fileSize, frame.nFileType, frame.nChannels);
    if (count.blocks == 0) return MM_E_FAIL;
    uint64_t blocks = count.blocks;
    if (count.stopped) blocks = blocks * (fileSize - start) / count.bytes;

    f->format = wide ? "amr-wb" : "amr";
    f->mime = wide ? "audio/AMR-WB" : "audio/AMR";
    f->durationUs = static_cast<int64_t>(blocks * 20000);  // 20 ms a frame
    f->durationExact = !count.stopped;
    StreamFacts s;
    s.codec = wide ? "amr_wb" : "amr_nb";
    s.sampleRate = wide ? 16000 : 8000;
    s.channels = frame.nChannels;
    // Speech bits only, as ffprobe counts them: each frame's header byte left out.
    const uint64_t headers = count.blocks * frame.nChannels;
    s.bitRate = count.bytes > headers ? (count.bytes - headers) * 8 * 50 / count.blocks : 0;
    f->bitRate = s.bitRate;
    f->streams.push_back(s);
    return MM_OK;
}

}  // namespace metainfo
