#include "speech/evrc.h"

#include <sys/stat.h>

#include <cstring>

#include "core/codes.h"
#include "core/file_access.h"
#include "speech/qcp.h"
#include "speech/qcp_format.h"

namespace metainfo {
namespace {

constexpr uint64_t kEvrcHeaderLength = 7;  // "#!EVRC\n"

// Quarter rate (2) and rates from 6 on are refused in storage files.
int EvrcFilePayload(uint8_t rate) { return (rate >= 6 || rate == 2) ? -1 : EVRC_Rate_Table[rate]; }

}  // namespace

int32_t EVRC_GetClipInfo(const char* path, _MMClipInfo* clip) {
    if (path == nullptr || clip == nullptr) return MM_E_INVALIDARG;
    int h = MEx_fopen(path, "rb");
    if (h == 0) return -1;
    FileCloser closer(h);
    struct stat st;
    if (MEx_stat(path, &st) != 0) return MM_E_FAIL;
    uint64_t fileSize = st.st_size > 0 ? static_cast<uint64_t>(st.st_size) : 0;
    uint64_t packets = 0;
    int32_t result = CountSpeechPackets(h, kEvrcHeaderLength, fileSize, EvrcFilePayload, &packets);
    if (result != MM_OK) return result;
    uint32_t duration = static_cast<uint32_t>(packets / 50);
    // The bit rate is taken in signed 32 bits, as callers have always seen it;
    // a clip under one second has none.
    int64_t bits = static_cast<int32_t>(SaturateU32(fileSize) * 8u);
    uint32_t bitrate = duration != 0 ? static_cast<uint32_t>(bits / static_cast<int32_t>(duration)) : 0;
    clip->nAudioBitrate = bitrate;
    clip->nBitrate = bitrate;
    clip->nDuration = duration;
    clip->nFileSize = SaturateU32(fileSize);
    clip->nSampleRate = 8000;
    clip->bHasAudio = 1;
    return CopyExtensionAsFormat(path, clip->szFormat);
}

int32_t EVRC_GetCodecType(const char* path, _MM_CODECTYPE* codec) {
    if (path == nullptr || codec == nullptr) return MM_E_INVALIDARG;
    std::memset(codec, 0, sizeof *codec);
    codec->nAudioCodec = CODEC_EVRC;
    return MM_OK;
}

int32_t EVRC_GetTrackType(const char* /*path*/, int* mask) {
    if (mask == nullptr) return MM_E_INVALIDARG;
    *mask = TRACK_AUDIO;
    return MM_OK;
}

}  // namespace metainfo
