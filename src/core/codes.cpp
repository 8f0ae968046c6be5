#include "core/codes.h"

#include <cstring>

extern "C" {

// Names are matched by callers byte for byte, trailing blanks included.
const MM_CodecName codecinfo[MM_CODECINFO_COUNT] = {
    {"CODEC_MP3_LAYER1", 0x1001},
    {"CODEC_MP3_LAYER2", 0x1002},
    {"CODEC_MP3_LAYER3", 0x1003},
    {"CODEC_AMR_NB", 0x1010},
    {"CODEC_AMR_WB", 0x1020},
    {"CODEC_WAVE_PCM  ", 0x1030},
    {"CODEC_WAVE_ADPCM", 0x1031},
    {"CODEC_WAVE_ALAW ", 0x1032},
    {"CODEC_WAVE_MULAW", 0x1033},
    {"CODEC_AAC_ADIF", 0x2001},
    {"CODEC_AAC_PLUS_V1_ADIF", 0x2002},
    {"CODEC_AAC_PLUS_V2_ADIF", 0x2003},
    {"CODEC_AAC_ADTS", 0x2011},
    {"CODEC_AAC_PLUS_V1_ADTS", 0x2012},
    {"CODEC_AAC_PLUS_V2_ADTS", 0x2013},
    {"PROFILE_AAC_MAIN", 0x2101},
    {"PROFILE_AAC_LC", 0x2102},
    {"PROFILE_AAC_SSR", 0x2103},
    {"CODEC_RMAUDIO_SIPR", 0x3001},
    {"CODEC_RMAUDIO_COOK", 0x3002},
    {"CODEC_RMAUDIO_ATRC", 0x3003},
    {"CODEC_RMAUDIO_RAAC", 0x3004},
    {"CODEC_RMVIDEO_RV10", 0x3010},
    {"CODEC_RMVIDEO_RV20", 0x3020},
    {"CODEC_RMVIDEO_RV30", 0x3030},
    {"CODEC_RMVIDEO_RV40", 0x3040},
    {"CODEC_MP4VIDEO_MP4V", 0x4001},
    {"CODEC_MP4AUDIO_MP4A", 0x4002},
    {"CODEC_MP4VIDEO_S263", 0x4003},
    {"CODEC_MP4VIDEO_S264", 0x4004},
    {"CODEC_MP4AUDIO_SAMR", 0x4005},
    {"CODEC_MP4AUDIO_SAWB", 0x4006},
    {"CODEC_MP4AUDIO_SAWP", 0x4007},
    {"CODEC_MP4AUDIO_MP4A_AAC", 0x4008},
    {"CODEC_MP4AUDIO_MP4A_AAC_PLUS_V1", 0x4009},
    {"CODEC_MP4AUDIO_MP4A_AAC_PLUS_V2", 0x400A},
    {"CODEC_ASFVIDEO_WMV1", 0x5001},
    {"CODEC_ASFVIDEO_WMV2", 0x5002},
    {"CODEC_ASFVIDEO_WMV3", 0x5003},
    {"CODEC_ASFVIDEO_VC1", 0x5004},
    {"CODEC_WMV9_PEOFILE_SIMPLE", 0x5010},
    {"CODEC_WMV9_PEOFILE_MAIN", 0x5011},
    {"CODEC_WMV9_PEOFILE_ADVANCED", 0x5012},
    {"CODEC_WMV9_LEVEL_LOW", 0x5020},
    {"CODEC_WMV9_LEVEL_MEDIUM", 0x5021},
    {"CODEC_WMV9_LEVEL_HIGH", 0x5022},
    {"CODEC_WMV9_LEVEL_L0", 0x5023},
    {"CODEC_WMV9_LEVEL_L1", 0x5024},
    {"CODEC_WMV9_LEVEL_L2", 0x5025},
    {"CODEC_WMV9_LEVEL_L3", 0x5026},
    {"CODEC_WMV9_LEVEL_L4", 0x5027},
    {"CODEC_WMAUDIO2", 0x6001},
    {"CODEC_WMAUDIO3", 0x6002},
    {"CODEC_WMAUDIO_PROFILE_BASELINE", 0x6010},
    {"CODEC_WMAUDIO_PROFILE_FULL", 0x6011},
    {"CODEC_QCELP", 0x7001},
    {"CODEC_EVRC", 0x8001},
    {"CODEC_EVRCB", 0x8002},
    {"CODEC_EVRCWB", 0x8003},
    {"CODEC_SMV", 0x9001},
    {"CODEC_NODEFINE", 0xFFFF},
};

}  // extern "C"

namespace metainfo {

const uint32_t TTable[7] = {6, 2, 2, 0, 0, 0, 2};

const char* CodecName(uint32_t code) {
    for (const MM_CodecName& row : codecinfo) {
        if (row.code == code) return row.name;
    }
    return nullptr;
}

}  // namespace metainfo
