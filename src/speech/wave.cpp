#include "speech/wave.h"

#include <climits>
#include <cstring>
#include <memory>
#include <new>

#include "core/byte_reader.h"
#include "core/codes.h"
#include "core/file_access.h"
#include "metainfo/extract.h"

namespace metainfo {
namespace {

constexpr size_t kWaveProbeBytes = 4096;
constexpr size_t kWaveCopyChunk = 4096;

const char* const szWAVEMimeType[] = {"audio/L8", "audio/L16", "audio/pcma", "audio/pcmu", "audio/wav"};

bool KnownFormatTag(uint16_t tag) { return tag == 1 || tag == 2 || tag == 6 || tag == 7; }

bool WriteAll(int out, const void* bytes, size_t n) {
    return n == 0 || MEx_fwrite(bytes, 1, static_cast<unsigned>(n), out) == static_cast<int>(n);
}

// Copies up to count bytes of the source from its current position; stops
// early at the end of the source. False only when writing fails.
bool CopyBytes(int source, int out, uint64_t count, uint8_t* chunk) {
    while (count > 0) {
        size_t want = count < kWaveCopyChunk ? static_cast<size_t>(count) : kWaveCopyChunk;
        int got = MEx_fread(chunk, 1, static_cast<unsigned>(want), source);
        if (got <= 0) break;
        if (!WriteAll(out, chunk, static_cast<size_t>(got))) return false;
        count -= static_cast<uint64_t>(got);
    }
    return true;
}

uint32_t DurationSeconds(uint64_t fileSize, const _FormatChunk& fmt) {
    // A data offset beyond the end of the file (chunks before "fmt " are
    // counted twice) or a zero byte rate leaves no playable time.
    if (fmt.nAvgBytesPerSec == 0 || fileSize <= fmt.nDataOffset) return 0;
    double seconds = static_cast<double>(fileSize - fmt.nDataOffset) / fmt.nAvgBytesPerSec;
    return seconds < 4294967295.0 ? static_cast<uint32_t>(seconds) : 0xFFFFFFFFu;
}

int32_t SetMimeType(_MM_MIMETYPE* mime, const _FormatChunk& fmt) {
    delete[] mime->pszMimeType;
    mime->pszMimeType = nullptr;
    mime->nMimeLength = 0;
    const char* text = nullptr;
    if (fmt.wFormatTag == 6 && fmt.wBitsPerSample == 8) text = szWAVEMimeType[2];
    if (fmt.wFormatTag == 7 && fmt.wBitsPerSample == 8) text = szWAVEMimeType[3];
    if (fmt.wFormatTag == 1 && fmt.wBitsPerSample == 8) text = szWAVEMimeType[0];
    if (fmt.wFormatTag == 1 && fmt.wBitsPerSample == 16) text = szWAVEMimeType[1];
    size_t length = 0;
    if (text != nullptr) {
        length = std::strlen(text);
    } else {
        // Every other format answers the text "audio/L16" with the length of
        // "audio/wav" (9); callers have always received exactly that.
        text = szWAVEMimeType[1];
        length = std::strlen(szWAVEMimeType[4]);
    }
    size_t copied = std::strlen(text) + 1;
    char* s = new (std::nothrow) char[copied];
    if (s == nullptr) return MM_E_OUTOFMEMORY;
    std::memcpy(s, text, copied);
    mime->pszMimeType = s;
    mime->nMimeLength = static_cast<uint32_t>(length);
    return MM_OK;
}

uint32_t CodecOfTag(uint16_t tag) {
    switch (tag) {
        case 1: return CODEC_WAVE_PCM;
        case 2: return CODEC_WAVE_ADPCM;
        case 6: return CODEC_WAVE_ALAW;
        case 7: return CODEC_WAVE_MULAW;
        default: return 0;
    }
}

}  // namespace

int32_t ParseFormatChunk(const uint8_t* buffer, size_t length, _FormatChunk* format) {
    std::memset(format, 0, sizeof *format);
    ByteReader r(buffer, length);
    if (!r.Tag("RIFF", 4) || !r.Seek(8) || !r.Tag("WAVE", 4)) return MM_E_UNSUPPORTED;
    r.Seek(12);
    uint64_t skipped = 0;
    uint32_t size = 0;
    while (!r.Tag("fmt ", 4)) {
        if (!r.Skip(4) || !r.LE32(&size) || !r.Skip(size)) return MM_E_UNSUPPORTED;
        skipped += size;
    }
    size_t fmtStart = r.position();
    if (!r.BE32(&format->nChunkId) || !r.LE32(&format->nChunkSize) || !r.LE16(&format->wFormatTag) ||
        !r.LE16(&format->nChannels) || !r.LE32(&format->nSamplesPerSec) || !r.LE32(&format->nAvgBytesPerSec) ||
        !r.LE16(&format->nBlockAlign) || !r.LE16(&format->wBitsPerSample)) {
        return MM_E_UNSUPPORTED;
    }
    if (!KnownFormatTag(format->wFormatTag)) return MM_E_UNSUPPORTED;
    if (!r.Seek(fmtStart + 8) || !r.Skip(format->nChunkSize)) return MM_E_UNSUPPORTED;
    while (!r.Tag("data", 4)) {
        if (!r.Skip(4) || !r.LE32(&size) || !r.Skip(size)) return MM_E_UNSUPPORTED;
    }
    // Both quirks are what extraction has always been computed from: the
    // offset names the "data" id, and chunks before "fmt " count twice.
    format->nDataOffset = static_cast<uint32_t>(r.position() + skipped);
    return MM_OK;
}

int32_t GetMediaInfo_WAVE(const char* path, void* out, int request) {
    if (path == nullptr || out == nullptr) return MM_E_INVALIDARG;
    int h = MEx_fopen(path, "rb");
    if (h == 0) return 1;
    FileCloser closer(h);
    std::unique_ptr<uint8_t[]> buffer(new (std::nothrow) uint8_t[kWaveProbeBytes]);
    if (!buffer) return 1;
    int got = MEx_fread(buffer.get(), 1, kWaveProbeBytes, h);
    if (got < 44) return MM_E_FAIL;
    _FormatChunk fmt;
    int32_t result = ParseFormatChunk(buffer.get(), static_cast<size_t>(got), &fmt);
    if (result != MM_OK) return result;
    if (MEx_fseek(h, 0, 2) != 0) return MM_E_FAIL;
    int64_t end = MEx_ftell(h);
    uint64_t fileSize = end > 0 ? static_cast<uint64_t>(end) : 0;

    switch (request) {
        case INFO_CLIPINFO: {
            _MMClipInfo* clip = static_cast<_MMClipInfo*>(out);
            std::memset(clip, 0, sizeof *clip);
            std::strcpy(clip->szFormat, "wav");
            clip->nFileSize = SaturateU32(fileSize);
            // 32-bit products, as callers have always seen them.
            clip->nAudioBitrate = fmt.nAvgBytesPerSec * 8u;
            clip->nBitrate = clip->nAudioBitrate;
            clip->nChannels = fmt.nChannels;
            clip->nSampleRate = fmt.nSamplesPerSec;
            clip->nBitsPerSample = fmt.wBitsPerSample;
            clip->nSamplesPerFrame = fmt.nSamplesPerSec * 40u * fmt.nChannels / 1000u;
            clip->bHasAudio = 1;
            clip->bHasVideo = 0;
            clip->nDuration = DurationSeconds(fileSize, fmt);
            return MM_OK;
        }
        case INFO_MIMETYPE: return SetMimeType(static_cast<_MM_MIMETYPE*>(out), fmt);
        case INFO_CODECTYPE: static_cast<_MM_CODECTYPE*>(out)->nAudioCodec = CodecOfTag(fmt.wFormatTag); return MM_OK;
        case INFO_WAVE_AUDIO: {
            _WaveAudioInfo* info = static_cast<_WaveAudioInfo*>(out);
            info->nDuration = DurationSeconds(fileSize, fmt);
            info->nChunkId = fmt.nChunkId;
            info->nChunkSize = fmt.nChunkSize;
            info->wFormatTag = fmt.wFormatTag;
            info->nChannels = fmt.nChannels;
            info->nSamplesPerSec = fmt.nSamplesPerSec;
            info->nBlockAlign = fmt.nBlockAlign;
            info->wBitsPerSample = fmt.wBitsPerSample;
            info->nDataOffset = fmt.nDataOffset;
            info->nAvgBytesPerSec = fmt.nAvgBytesPerSec;
            return MM_OK;
        }
        default: return MM_E_FAIL;
    }
}

int32_t GetAudioData_WAVE(const char* path, int startSec, int endSec, unsigned char** data, int* size, int mode) {
    if (startSec < 0 || path == nullptr || data == nullptr || size == nullptr || startSec >= endSec) {
        return MM_E_INVALIDARG;
    }
    _WaveAudioInfo info = {};
    int32_t result = GetMediaInfo_WAVE(path, &info, INFO_WAVE_AUDIO);
    if (result != MM_OK) return result;
    int source = MEx_fopen(path, "rb");
    if (source == 0) return MM_E_FAIL;
    FileCloser sourceCloser(source);
    if (static_cast<uint32_t>(startSec) > info.nDuration) return MM_E_INVALIDARG;
    uint64_t last = static_cast<uint32_t>(endSec) < info.nDuration ? static_cast<uint32_t>(endSec) : info.nDuration;
    uint64_t begin = static_cast<uint64_t>(startSec) * info.nAvgBytesPerSec + info.nDataOffset;
    uint64_t end = last * info.nAvgBytesPerSec + info.nDataOffset;
    uint64_t length = end - begin;
    if (length > static_cast<uint64_t>(INT_MAX)) return MM_E_FAIL;
    *size = static_cast<int>(length);

    if (mode == kWaveToBuffer) {
        // Zero-filled, so that a source shorter than its header claims hands
        // out zeros rather than stale memory.
        unsigned char* buffer = new (std::nothrow) unsigned char[length]();
        if (buffer == nullptr) return MM_E_FAIL;
        *data = buffer;
        if (SeekToOffset(source, begin)) MEx_fread(buffer, 1, static_cast<unsigned>(length), source);
        return MM_OK;
    }
    if (mode != kWaveToFile) return MM_E_FAIL;

    const char* outPath = reinterpret_cast<const char*>(*data);
    if (outPath == nullptr) return MM_E_INVALIDARG;
    int out = MEx_fopen(outPath, "wb");
    if (out == 0) return MM_E_FAIL;
    FileCloser outCloser(out);
    std::unique_ptr<uint8_t[]> chunk(new (std::nothrow) uint8_t[kWaveCopyChunk]);
    if (!chunk) return MM_E_FAIL;
    uint8_t word[4];
    uint32_t riffSize = static_cast<uint32_t>(length) + info.nDataOffset - 8;
    word[0] = uint8_t(riffSize);
    word[1] = uint8_t(riffSize >> 8);
    word[2] = uint8_t(riffSize >> 16);
    word[3] = uint8_t(riffSize >> 24);
    if (!WriteAll(out, "RIFF", 4) || !WriteAll(out, word, 4)) return MM_E_FAIL;
    if (info.nDataOffset >= 9) {
        if (!SeekToOffset(source, 8) || !CopyBytes(source, out, info.nDataOffset - 8u, chunk.get())) return MM_E_FAIL;
    }
    uint32_t dataSize = static_cast<uint32_t>(length);
    word[0] = uint8_t(dataSize);
    word[1] = uint8_t(dataSize >> 8);
    word[2] = uint8_t(dataSize >> 16);
    word[3] = uint8_t(dataSize >> 24);
    if (!WriteAll(out, "data", 4) || !WriteAll(out, word, 4)) return MM_E_FAIL;
    if (!SeekToOffset(source, begin) || !CopyBytes(source, out, length, chunk.get())) return MM_E_FAIL;
    return MM_OK;
}

int32_t WAVE_GetClipInfo(const char* path, _MMClipInfo* clip) { return GetMediaInfo_WAVE(path, clip, INFO_CLIPINFO); }

int32_t WAVE_GetMIMEType(const char* path, _MM_MIMETYPE* mime) { return GetMediaInfo_WAVE(path, mime, INFO_MIMETYPE); }

int32_t WAVE_GetCodecType(const char* path, _MM_CODECTYPE* codec) {
    return GetMediaInfo_WAVE(path, codec, INFO_CODECTYPE);
}

int32_t WAVE_GetTrackType(const char* /*path*/, int* mask) {
    if (mask == nullptr) return MM_E_INVALIDARG;
    *mask = TRACK_AUDIO;
    return MM_OK;
}

int32_t WAVE_GetAudioData2Buf(const char* path, int startSec, int endSec, unsigned char** data, int* size) {
    return GetAudioData_WAVE(path, startSec, endSec, data, size, kWaveToBuffer);
}

}  // namespace metainfo

extern "C" int32_t WAVE_GetAudioData2File(const char* path, int startSec, int endSec, const char* outPath) {
    unsigned char* target = reinterpret_cast<unsigned char*>(const_cast<char*>(outPath));
    int size = 0;
    return metainfo::GetAudioData_WAVE(path, startSec, endSec, &target, &size, metainfo::kWaveToFile);
}
