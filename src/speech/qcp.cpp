#include "speech/qcp.h"

#include <sys/stat.h>

#include <cstring>

#include "core/file_access.h"
#include "core/thread_state.h"
#include "speech/qcp_format.h"

namespace metainfo {
namespace {

constexpr uint32_t FourCC(const char (&s)[5]) {
    return uint32_t(uint8_t(s[0])) << 24 | uint32_t(uint8_t(s[1])) << 16 | uint32_t(uint8_t(s[2])) << 8 | uint8_t(s[3]);
}

constexpr uint32_t kCodecQcelp = 1;
constexpr uint32_t kCodecEvrc = 2;

// Whole seconds from the file size and the "fmt " average bit rate. The
// product is taken in signed 32 bits, as callers have always seen it.
uint32_t DurationFromBitrate(uint32_t fileSize, uint32_t avgBitrate) {
    int64_t bits = static_cast<int32_t>(fileSize * 8u);
    return static_cast<uint32_t>(bits / static_cast<int32_t>(avgBitrate));
}

void RememberCodec(QcpCodec codec) {
    // SMV and unknown codecs leave the previous file's codec in place.
    if (codec == QcpCodec::kQcelp) s_codectype = kCodecQcelp;
    if (codec == QcpCodec::kEvrc) s_codectype = kCodecEvrc;
}

int32_t parseFmt(int h, int request, void* out, uint64_t chunkStart, uint64_t fileSize) {
    if (!SeekToOffset(h, chunkStart)) return MM_E_FAIL;
    uint32_t id = GetUINT32(h, false);
    uint32_t size = GetUINT32(h, true);
    if (id != FourCC("fmt ")) return MM_E_FAIL;
    // A chunk that runs past the end of the file is a short read; only the
    // bytes that carry fields are read.
    if (chunkStart + 8 + size > fileSize) return MM_E_FAIL;
    uint8_t chunk[kQcpFmtChunkBytes];
    uint64_t wanted = 8 + static_cast<uint64_t>(size);
    size_t length = wanted < sizeof chunk ? static_cast<size_t>(wanted) : sizeof chunk;
    if (!SeekToOffset(h, chunkStart)) return MM_E_FAIL;
    if (MEx_fread(chunk, 1, static_cast<unsigned>(length), h) != static_cast<int>(length)) return MM_E_FAIL;
    _QCPFMT fmt;
    parseFMTInfo(chunk, length, &fmt);
    QcpCodec codec = CodecOfGuid(fmt.codecGuid);
    RememberCodec(codec);
    if (request == INFO_CLIPINFO) {
        _MMClipInfo* clip = static_cast<_MMClipInfo*>(out);
        clip->nAudioBitrate = fmt.nAvgBitrate;
        clip->nSampleRate = fmt.nSamplingRate;
        clip->nBitsPerSample = fmt.nSampleSize;
        clip->nSamplesPerFrame = fmt.nBlockSize;
        if (fmt.nAvgBitrate != 0) clip->nDuration = DurationFromBitrate(clip->nFileSize, fmt.nAvgBitrate);
    } else {
        static_cast<_MM_CODECTYPE*>(out)->nAudioCodec = CodecCodeOf(codec);
    }
    return MM_OK;
}

int32_t parseVrat(int h, _MMClipInfo* clip, uint64_t chunkStart) {
    if (!SeekToOffset(h, chunkStart)) return MM_E_FAIL;
    uint32_t id = GetUINT32(h, false);
    GetUINT32(h, true);  // size
    if (id != FourCC("vrat")) return MM_E_FAIL;
    GetUINT32(h, true);  // variable-rate flag, not used
    int32_t packets = static_cast<int32_t>(GetUINT32(h, true));
    clip->nDuration = static_cast<uint32_t>(packets / 50);
    return MM_OK;
}

int QcelpPayload(uint8_t rate) { return rate > 7 ? -1 : QCELP_Rate_Table[rate]; }
int EvrcInQcpPayload(uint8_t rate) { return rate > 5 ? -1 : EVRC_Rate_Table[rate]; }

int32_t parseData(int h, _MMClipInfo* clip, uint64_t chunkStart, uint64_t fileSize) {
    if (!SeekToOffset(h, chunkStart)) return MM_E_FAIL;
    uint32_t id = GetUINT32(h, false);
    GetUINT32(h, true);  // size: the walk runs to the end of the file
    if (id != FourCC("data")) return MM_E_FAIL;
    if (clip->nDuration != 0) return MM_OK;
    PacketPayloadFn payloadOf = nullptr;
    if (s_codectype == kCodecQcelp) payloadOf = QcelpPayload;
    if (s_codectype == kCodecEvrc) payloadOf = EvrcInQcpPayload;
    // Without a codec from this or an earlier file the packets cannot be sized.
    if (payloadOf == nullptr) return MM_E_FAIL;
    uint64_t packets = 0;
    int32_t result = CountSpeechPackets(h, chunkStart + 8, fileSize, payloadOf, &packets);
    if (result != MM_OK) return result;
    clip->nDuration = static_cast<uint32_t>(packets / 50);
    return MM_OK;
}

}  // namespace

int32_t QCP_GetMediaInfo(const char* path, int request, void* out) {
    if (path == nullptr || out == nullptr) return MM_E_INVALIDARG;
    if (request != INFO_CLIPINFO && request != INFO_CODECTYPE) return MM_E_FAIL;
    int h = MEx_fopen(path, "rb");
    if (h == 0) return -1;
    FileCloser closer(h);
    struct stat st;
    if (MEx_stat(path, &st) != 0) return MM_E_FAIL;
    uint64_t fileSize = st.st_size > 0 ? static_cast<uint64_t>(st.st_size) : 0;
    _MMClipInfo* clip = request == INFO_CLIPINFO ? static_cast<_MMClipInfo*>(out) : nullptr;
    if (clip != nullptr) clip->nFileSize = SaturateU32(fileSize);

    uint32_t riff = GetUINT32(h, false);
    GetUINT32(h, true);  // RIFF size
    GetUINT32(h, false);  // form type, not checked
    if (riff != FourCC("RIFF")) return MM_E_FAIL;

    uint64_t next = 12;
    do {
        uint64_t chunkPos = next;
        uint32_t id = GetUINT32(h, false);
        uint32_t size = GetUINT32(h, true);
        if (size > fileSize) return MM_E_FAIL;
        int64_t after = MEx_ftell(h);
        if (after < 0) return MM_E_FAIL;
        // Only a header read in full can name a chunk that is dispatched.
        uint64_t chunkStart = after >= 8 ? static_cast<uint64_t>(after) - 8 : 0;
        int32_t result = MM_OK;
        if (id == FourCC("fmt ")) {
            result = parseFmt(h, request, out, chunkStart, fileSize);
        } else if (id == FourCC("vrat") && clip != nullptr) {
            result = parseVrat(h, clip, chunkStart);
        } else if (id == FourCC("data") && clip != nullptr) {
            result = parseData(h, clip, chunkStart, fileSize);
        }
        if (result != MM_OK) return result;
        // Odd sizes get no pad byte.
        next = static_cast<uint64_t>(after) + size;
        // A file shorter than its reported size yields no header bytes: stop
        // rather than read the same place again.
        if (next <= chunkPos || !SeekToOffset(h, next)) break;
    } while (next < fileSize && !MEx_feof(h));

    if (clip == nullptr) return MM_OK;
    if (clip->nDuration == 0 && clip->nAudioBitrate != 0) {
        clip->nDuration = DurationFromBitrate(SaturateU32(fileSize), clip->nAudioBitrate);
    }
    clip->nBitrate = clip->nAudioBitrate;
    clip->nFileSize = SaturateU32(fileSize);
    clip->bHasAudio = 1;
    return CopyExtensionAsFormat(path, clip->szFormat);
}

int32_t QCP_GetClipInfo(const char* path, _MMClipInfo* clip) {
    if (path == nullptr || clip == nullptr) return MM_E_INVALIDARG;
    return QCP_GetMediaInfo(path, INFO_CLIPINFO, clip);
}

int32_t QCP_GetCodecType(const char* path, _MM_CODECTYPE* codec) {
    if (path == nullptr || codec == nullptr) return MM_E_INVALIDARG;
    std::memset(codec, 0, sizeof *codec);
    return QCP_GetMediaInfo(path, INFO_CODECTYPE, codec);
}

int32_t QCP_GetTrackType(const char* /*path*/, int* mask) {
    if (mask == nullptr) return MM_E_INVALIDARG;
    *mask = TRACK_AUDIO;
    return MM_OK;
}

}  // namespace metainfo
