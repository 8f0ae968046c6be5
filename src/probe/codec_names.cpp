#include "probe/codec_names.h"

#include <cstring>

#include "metainfo/metainfo.h"

namespace metainfo {
namespace {

const char* const kMediaTypeNames[MM_MEDIA_SLOTS] = {
    "none", "mp3",    "realmedia", "mp4", "asf", "midi", "aac",    "wav",
    "amr",  "amr-wb", "imelody",   "avi", "qcp", "evrc", "unused", "snd",
};

struct Row {
    const char* code;
    const char* name;
};

// By the library's code names, which the exported codecinfo table maps to codes.
const Row kCodecs[] = {
    {"CODEC_MP3_LAYER1", "mp1"},
    {"CODEC_MP3_LAYER2", "mp2"},
    {"CODEC_MP3_LAYER3", "mp3"},
    {"CODEC_AMR_NB", "amr_nb"},
    {"CODEC_AMR_WB", "amr_wb"},
    {"CODEC_WAVE_ALAW", "pcm_alaw"},
    {"CODEC_WAVE_MULAW", "pcm_mulaw"},
    {"CODEC_AAC_ADIF", "aac"},
    {"CODEC_AAC_PLUS_V1_ADIF", "aac"},
    {"CODEC_AAC_PLUS_V2_ADIF", "aac"},
    {"CODEC_AAC_ADTS", "aac"},
    {"CODEC_AAC_PLUS_V1_ADTS", "aac"},
    {"CODEC_AAC_PLUS_V2_ADTS", "aac"},
    {"CODEC_RMAUDIO_SIPR", "sipr"},
    {"CODEC_RMAUDIO_COOK", "cook"},
    {"CODEC_RMAUDIO_ATRC", "atrac3"},
    {"CODEC_RMAUDIO_RAAC", "aac"},
    {"CODEC_RMVIDEO_RV10", "rv10"},
    {"CODEC_RMVIDEO_RV20", "rv20"},
    {"CODEC_RMVIDEO_RV30", "rv30"},
    {"CODEC_RMVIDEO_RV40", "rv40"},
    {"CODEC_MP4VIDEO_MP4V", "mpeg4"},
    {"CODEC_MP4AUDIO_MP4A", "aac"},
    {"CODEC_MP4VIDEO_S263", "h263"},
    {"CODEC_MP4VIDEO_S264", "h264"},
    {"CODEC_MP4AUDIO_SAMR", "amr_nb"},
    {"CODEC_MP4AUDIO_SAWB", "amr_wb"},
    {"CODEC_MP4AUDIO_SAWP", "amr_wb"},
    {"CODEC_MP4AUDIO_MP4A_AAC", "aac"},
    {"CODEC_MP4AUDIO_MP4A_AAC_PLUS_V1", "aac"},
    {"CODEC_MP4AUDIO_MP4A_AAC_PLUS_V2", "aac"},
    {"CODEC_ASFVIDEO_WMV1", "wmv1"},
    {"CODEC_ASFVIDEO_WMV2", "wmv2"},
    {"CODEC_ASFVIDEO_WMV3", "wmv3"},
    {"CODEC_ASFVIDEO_VC1", "vc1"},
    {"CODEC_WMAUDIO2", "wmav2"},
    {"CODEC_WMAUDIO3", "wmapro"},
    {"CODEC_QCELP", "qcelp"},
    {"CODEC_EVRC", "evrc"},
    {"CODEC_EVRCB", "evrc"},
    {"CODEC_EVRCWB", "evrc"},
};

// The library's names may carry trailing blanks ("CODEC_WAVE_PCM  ").
bool SameName(const char* own, const char* name) {
    const size_t n = std::strlen(name);
    if (std::strncmp(own, name, n) != 0) return false;
    for (const char* p = own + n; *p != '\0'; ++p) {
        if (*p != ' ') return false;
    }
    return true;
}

const char* Lookup(const Row* rows, size_t count, const char* code) {
    if (code == nullptr) return nullptr;
    for (size_t i = 0; i < count; ++i) {
        if (SameName(code, rows[i].code)) return rows[i].name;
    }
    return nullptr;
}

bool Is(uint32_t code, const char* name) {
    const char* own = CodecCodeName(code);
    return own != nullptr && SameName(own, name);
}

}  // namespace

const char* MediaTypeName(int type) {
    if (type >= 0 && type < MM_MEDIA_SLOTS) return kMediaTypeNames[type];
    return "unknown";
}

const char* CodecCodeName(uint32_t code) {
    if (code == 0) return nullptr;
    for (const MM_CodecName& row : codecinfo) {
        if (row.code == code) return row.name;
    }
    return nullptr;
}

const char* FfprobeCodecName(uint32_t code, uint32_t bitsPerSample) {
    if (Is(code, "CODEC_WAVE_PCM")) {
        switch (bitsPerSample) {
            case 8: return "pcm_u8";
            case 16: return "pcm_s16le";
            case 24: return "pcm_s24le";
            case 32: return "pcm_s32le";
            default: return nullptr;
        }
    }
    return Lookup(kCodecs, sizeof kCodecs / sizeof kCodecs[0], CodecCodeName(code));
}

const char* FfprobeAudioProfile(uint32_t codec, uint32_t subtype) {
    const char* own = CodecCodeName(codec);
    if (own == nullptr) return nullptr;
    if (std::strstr(own, "AAC_PLUS_V2") != nullptr) return "HE-AACv2";
    if (std::strstr(own, "AAC_PLUS_V1") != nullptr) return "HE-AAC";
    if (std::strstr(own, "AAC") == nullptr) return nullptr;
    if (Is(subtype, "PROFILE_AAC_MAIN")) return "Main";
    if (Is(subtype, "PROFILE_AAC_LC")) return "LC";
    if (Is(subtype, "PROFILE_AAC_SSR")) return "SSR";
    return nullptr;
}

const char* VideoProfileName(uint32_t code) {
    if (Is(code, "CODEC_WMV9_PEOFILE_SIMPLE")) return "Simple";
    if (Is(code, "CODEC_WMV9_PEOFILE_MAIN")) return "Main";
    if (Is(code, "CODEC_WMV9_PEOFILE_ADVANCED")) return "Advanced";
    return nullptr;
}

}  // namespace metainfo
