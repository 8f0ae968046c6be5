#include "mp3/mp3_info.h"

#include <sys/stat.h>

#include <cstdio>
#include <cstring>
#include <new>

#include "core/byte_reader.h"
#include "core/codes.h"
#include "core/file_access.h"
#include "mp3/mp3_tables.h"

namespace metainfo {
namespace {

constexpr unsigned kScanWindow = 4096;
constexpr int kMaxBitrateSamples = 50;
constexpr unsigned kMinProbe = 16;
constexpr size_t kMinVbrScan = 40;  // bytes that must be read before a VBR tag is looked for
constexpr size_t kVbriOffset = 36;
constexpr uint32_t kV1TagSize = 128;
constexpr size_t kTocSize = 100;

enum HeaderKind : uint8_t { kConstantBitRate = 1, kXingHeader = 2, kVbriHeader = 3 };

// A 32-bit field of a VBR header; bytes the read did not deliver count as 0.
uint32_t FieldBE32(const uint8_t* tag, size_t available, size_t offset) {
    return offset + 4 <= available ? ReadBE32(tag + offset) : 0;
}
// VBRI keeps its 16-bit fields in the opposite order to its 32-bit ones.
uint16_t FieldLE16(const uint8_t* tag, size_t available, size_t offset) {
    return offset + 2 <= available ? ReadLE16(tag + offset) : 0;
}

// The caller sees these divisions as signed; a zero divisor answers 0.
int32_t SignedQuotient(uint32_t numerator, uint32_t divisor) {
    const int32_t n = static_cast<int32_t>(numerator);
    const int32_t d = static_cast<int32_t>(divisor);
    if (d == 0 || (d == -1 && n == INT32_MIN)) return 0;
    return n / d;
}
uint32_t UnsignedQuotient(uint32_t numerator, uint32_t divisor) { return divisor == 0 ? 0 : numerator / divisor; }

// Seconds of a frame count; the product wraps in 32 bits as callers expect.
uint32_t FramesToSeconds(uint32_t frames, uint32_t samplesPerFrame, uint32_t sampleRate) {
    return UnsignedQuotient(frames * samplesPerFrame, sampleRate);
}

uint32_t AudioBytes(uint32_t fileSize, uint32_t firstFrameOffset, uint32_t tagBytes) {
    return fileSize - firstFrameOffset - tagBytes;  // 32-bit, as reported
}

uint32_t TrailingTagBytes(int h) {
    if (MEx_fseek(h, -static_cast<int64_t>(kV1TagSize), SEEK_END) != 0) return 0;
    uint8_t tag[3];
    if (MEx_fread(tag, 1, 3, h) != 3) return 0;
    return BytesEqual(tag, "TAG", 3) ? kV1TagSize : 0;
}

void ReadVbri(const uint8_t* tag, size_t available, _MP3AudioInfo* info) {
    info->totalBytes = FieldBE32(tag, available, 10);
    info->totalFrames = FieldBE32(tag, available, 14);
    info->vbriVersion = FieldLE16(tag, available, 4);
    info->vbriDelay = FieldLE16(tag, available, 6);
    info->vbriQuality = FieldLE16(tag, available, 8);
    info->vbriTocEntries = FieldLE16(tag, available, 18);
    info->quality = FieldLE16(tag, available, 20);
    info->vbriTocEntrySize = FieldLE16(tag, available, 22);
    info->vbriFramesPerEntry = FieldLE16(tag, available, 24);
}

int32_t FillMimeType(_MM_MIMETYPE* mime) {
    delete[] mime->pszMimeType;
    mime->pszMimeType = nullptr;
    mime->nMimeLength = 0;
    const char* name = szMP3MimeType[0];
    const size_t length = std::strlen(name);
    char* copy = new (std::nothrow) char[length + 1];
    if (copy == nullptr) return MM_E_OUTOFMEMORY;
    std::memcpy(copy, name, length + 1);
    mime->pszMimeType = copy;
    mime->nMimeLength = static_cast<uint32_t>(length);
    return MM_OK;
}

int32_t FillCodecType(_MM_CODECTYPE* codec, const _FrameHeader_Info& header) {
    static const uint32_t kLayerCodecs[3] = {CODEC_MP3_LAYER1, CODEC_MP3_LAYER2, CODEC_MP3_LAYER3};
    if (header.layerIndex > 2) return MM_E_FAIL;
    codec->nAudioCodec = kLayerCodecs[header.layerIndex];
    return MM_OK;
}

}  // namespace

uint32_t XingDistance(const _FrameHeader_Info& header) {
    const bool mono = header.channelMode == 3;
    if (header.versionId == 3) return mono ? 21 : 36;
    return mono ? 13 : 21;
}

int32_t GetAvBitrate(int h, uint32_t start, int /*unused*/) {
    if (MEx_fseek(h, static_cast<int64_t>(start), SEEK_SET) != 0) return 0;
    uint8_t buf[kScanWindow];
    const int got = MEx_fread(buf, 1, kScanWindow, h);
    const int n = got - 4;  // a header needs four bytes
    if (n < 1) return 0;

    int count = 0;
    int32_t sum = 0;
    int32_t largest = 0;
    int32_t smallest = 0;
    const uint8_t* ff = static_cast<const uint8_t*>(std::memchr(buf, 0xFF, static_cast<size_t>(n)));
    int i = ff != nullptr ? static_cast<int>(ff - buf) : n;
    while (i < n && count < kMaxBitrateSamples) {
        if (IsMP3SyncCandidate(buf + i)) {
            _FrameHeader_Info frame;
            std::memset(&frame, 0, sizeof frame);
            uint32_t signature = 0;
            const int32_t size = MP3GetFrameSize(buf + i, &signature, &frame);
            if (size > 0) {
                const int32_t rate = static_cast<int32_t>(frame.bitRate);
                if (count == 0 || rate > largest) largest = rate;
                if (count == 0 || rate < smallest) smallest = rate;
                sum += rate;
                ++count;
                i += size;
                continue;
            }
        }
        const int from = i + 1;
        if (from >= n) break;
        ff = static_cast<const uint8_t*>(std::memchr(buf + from, 0xFF, static_cast<size_t>(n - from)));
        i = ff != nullptr ? static_cast<int>(ff - buf) : n;
    }
    if (count == 0) return 0;
    if (count < 3) return sum / count;
    return (sum - largest - smallest) / (count - 2);
}

uint32_t ParseXingHeader(const uint8_t* tag, size_t available, _MP3AudioInfo* info, int mode) {
    if (tag == nullptr) return static_cast<uint32_t>(MM_E_INVALIDARG);
    const uint32_t flags = FieldBE32(tag, available, 4);
    size_t at = 8;
    uint32_t frames = 0;
    if (flags & 1) {
        frames = FieldBE32(tag, available, at);
        at += 4;
        if (mode == kXingFramesOnly) return frames;
    }
    if (info == nullptr) return 0xFFFFFFFFu;
    info->xingFlags = flags;
    info->totalFrames = frames;
    if (flags & 2) {
        info->totalBytes = FieldBE32(tag, available, at);
        at += 4;
    }
    if (flags & 4) {
        // A table the read did not deliver whole is not kept; nor one that
        // cannot be allocated: the stream is then positioned by its bit rate.
        if (at + kTocSize <= available) {
            uint8_t* toc = new (std::nothrow) uint8_t[kTocSize];
            if (toc != nullptr) std::memcpy(toc, tag + at, kTocSize);
            info->xingToc = toc;
        }
        at += kTocSize;
    }
    info->quality = (flags & 8) ? static_cast<int32_t>(FieldBE32(tag, available, at)) : -1;
    return frames;
}

int32_t GetAudioInfo_MP3(int h, const uint8_t* vbrTag, size_t available, _MP3AudioInfo* info,
                         const _FrameHeader_Info* header, uint32_t tagBytes) {
    if (info == nullptr || header == nullptr) return MM_E_INVALIDARG;
    const uint32_t fileSize = info->fileSize;
    std::memset(info, 0, sizeof *info);
    info->fileSize = fileSize;
    info->headerKind = header->headerKind;
    info->tagBytes = tagBytes;
    info->firstFrameOffset = header->firstFrameOffset;
    info->sampleRate = header->sampleRate;
    info->samplesPerFrame = header->samplesPerFrame;
    info->frameSize = header->frameSize;
    info->xingOffset = header->xingOffset;
    info->avgBitRate = static_cast<uint32_t>(GetAvBitrate(h, header->firstFrameOffset, 0));
    const uint32_t audioBytes = AudioBytes(fileSize, header->firstFrameOffset, tagBytes);

    if (header->headerKind == kXingHeader && vbrTag != nullptr) {
        const uint32_t frames = ParseXingHeader(vbrTag, available, info, kXingWholeRecord);
        info->duration = FramesToSeconds(frames, info->samplesPerFrame, info->sampleRate);
        if (info->xingToc == nullptr) info->avgBitRate = UnsignedQuotient(audioBytes * 8, info->duration);
    } else if (header->headerKind == kVbriHeader && vbrTag != nullptr) {
        ReadVbri(vbrTag, available, info);
        info->duration = FramesToSeconds(info->totalFrames, info->samplesPerFrame, info->sampleRate);
    } else {
        info->duration = UnsignedQuotient(audioBytes * 8, info->avgBitRate);
    }
    return MM_OK;
}

int32_t GetClipInfo_MP3(int h, const uint8_t* vbrTag, size_t available, _MMClipInfo* clip,
                        const _FrameHeader_Info* header, uint32_t tagBytes) {
    if (clip == nullptr || header == nullptr) return MM_E_INVALIDARG;
    const uint32_t audioBytes = AudioBytes(clip->nFileSize, header->firstFrameOffset, tagBytes);
    uint32_t duration = 0;
    uint32_t bitrate = 0;
    if ((header->headerKind == kXingHeader || header->headerKind == kVbriHeader) && vbrTag != nullptr) {
        const uint32_t frames = header->headerKind == kXingHeader
                                    ? ParseXingHeader(vbrTag, available, nullptr, kXingFramesOnly)
                                    : FieldBE32(vbrTag, available, 14);
        duration = FramesToSeconds(frames, header->samplesPerFrame, header->sampleRate);
        bitrate = static_cast<uint32_t>(SignedQuotient(audioBytes * 8, duration));
    } else {
        bitrate = static_cast<uint32_t>(GetAvBitrate(h, header->firstFrameOffset, 0));
        duration = static_cast<uint32_t>(SignedQuotient(audioBytes * 8, bitrate));
    }
    std::memcpy(clip->szFormat, "mp3", 4);
    clip->nDuration = duration;
    clip->nBitrate = bitrate;
    clip->nAudioBitrate = bitrate;
    clip->bHasAudio = 1;
    clip->bHasVideo = 0;
    clip->nSampleRate = header->sampleRate;
    clip->nChannels = header->channelMode == 3 ? 1 : 2;
    clip->nBitsPerSample = 16;
    // MPEG-2.5 has always been reported as 1152 shifted by the channel count.
    clip->nSamplesPerFrame = header->versionId != 0 ? clip->nChannels * 1152 : 1152u >> clip->nChannels;
    return MM_OK;
}

int32_t GetMediaInfo_MP3(const char* path, void* out, int request) {
    if (path == nullptr || out == nullptr) return MM_E_INVALIDARG;
    _FrameHeader_Info header;
    std::memset(&header, 0, sizeof header);
    const int h = MEx_fopen(path, "rb");
    if (h == 0) return MM_E_FAIL;
    FileCloser closer(h);

    uint64_t size = 0;
    const uint32_t fileSize = OpenedFileSize(h, path, &size) ? SaturateU32(size) : 0;
    uint8_t probe[128];
    const int probed = MEx_fread(probe, 1, sizeof probe, h);
    if (probed < static_cast<int>(kMinProbe)) return MM_E_FAIL;
    int32_t result = VerifyMP3(h, probe, &header);
    if (result != MM_OK) return result;
    const uint32_t tagBytes = TrailingTagBytes(h);
    if (MEx_fseek(h, static_cast<int64_t>(header.firstFrameOffset), SEEK_SET) != 0) return MM_E_FAIL;

    uint8_t* frame = new (std::nothrow) uint8_t[kScanWindow];
    if (frame == nullptr) return MM_E_OUTOFMEMORY;
    const int got = MEx_fread(frame, 1, kScanWindow, h);
    const size_t read = got > 0 ? static_cast<size_t>(got) : 0;
    const uint8_t* vbrTag = nullptr;
    size_t available = 0;
    header.headerKind = kConstantBitRate;
    if (read >= kMinVbrScan) {
        const uint32_t distance = XingDistance(header);
        if (BytesEqual(frame + distance, "Xing", 4)) {
            header.headerKind = kXingHeader;
            header.xingOffset = distance;
            vbrTag = frame + distance;
            available = read - distance;
        } else if (BytesEqual(frame + kVbriOffset, "VBRI", 4)) {
            header.headerKind = kVbriHeader;
            vbrTag = frame + kVbriOffset;
            available = read - kVbriOffset;
        }
    }

    switch (request) {
        case INFO_CLIPINFO: {
            _MMClipInfo* clip = static_cast<_MMClipInfo*>(out);
            std::memset(clip, 0, sizeof *clip);
            clip->nFileSize = fileSize;
            result = GetClipInfo_MP3(h, vbrTag, available, clip, &header, tagBytes);
            break;
        }
        case INFO_MIMETYPE: result = FillMimeType(static_cast<_MM_MIMETYPE*>(out)); break;
        case INFO_CODECTYPE: result = FillCodecType(static_cast<_MM_CODECTYPE*>(out), header); break;
        case INFO_MP3_AUDIO: {
            _MP3AudioInfo* info = static_cast<_MP3AudioInfo*>(out);
            info->fileSize = fileSize;
            result = GetAudioInfo_MP3(h, vbrTag, available, info, &header, tagBytes);
            break;
        }
        default: result = MM_E_FAIL; break;
    }
    delete[] frame;
    return result;
}

int32_t MP3_GetClipInfo(const char* path, _MMClipInfo* clip) { return GetMediaInfo_MP3(path, clip, INFO_CLIPINFO); }
int32_t MP3_GetMIMEType(const char* path, _MM_MIMETYPE* mime) { return GetMediaInfo_MP3(path, mime, INFO_MIMETYPE); }
int32_t MP3_GetCodecType(const char* path, _MM_CODECTYPE* codec) {
    return GetMediaInfo_MP3(path, codec, INFO_CODECTYPE);
}

int32_t MP3_GetTrackType(const char* /*path*/, int* mask) {
    if (mask == nullptr) return MM_E_INVALIDARG;
    *mask = TRACK_AUDIO;
    return MM_OK;
}

}  // namespace metainfo
