#include "asf/asf_codec.h"

#include "asf/asf_guids.h"
#include "asf/asf_io.h"
#include "core/byte_reader.h"
#include "core/codes.h"
#include "core/file_access.h"
#include "core/log.h"

namespace metainfo {

using namespace asf;

namespace {

constexpr uint16_t kTagWma2 = 0x0161;
constexpr uint16_t kTagWma3 = 0x0162;

// Stream Properties prefix read by every call: from the object's start to
// the type-specific data.
constexpr int64_t kPrefixSize = 78;
constexpr int64_t kAudioEnd = kPrefixSize + 18;  // WAVEFORMATEX with its extra size
constexpr int64_t kOtherStreamSkip = 40;

constexpr uint32_t FourCC(const char (&s)[5]) {
    return uint32_t(uint8_t(s[0])) | uint32_t(uint8_t(s[1])) << 8 | uint32_t(uint8_t(s[2])) << 16 |
           uint32_t(uint8_t(s[3])) << 24;
}

void AudioStream(int h, uint32_t size, _MM_CODECTYPE* codec) {
    uint8_t w[18];
    ReadOrZero(h, w, sizeof w);
    uint32_t formatTag = ReadLE16(w);
    uint32_t sampleRate = ReadLE32(w + 4);
    // Bits per second in 32 bits, as the comparisons below always took it.
    uint32_t bitrate = ReadLE32(w + 8) * 8u;
    LogPrint(kVerbose, kLogTag, "audio iFormatTag 0x%x, %d\n", formatTag, static_cast<int>(formatTag));
    LogPrint(kVerbose, kLogTag, "audio iSamplesPerSec 0x%x, %d\n", sampleRate, static_cast<int>(sampleRate));
    LogPrint(kVerbose, kLogTag, "audio iAvgBytesPerSec 0x%x, %d\n", bitrate, static_cast<int>(bitrate));
    SeekBy(h, static_cast<int64_t>(size) - kAudioEnd);

    if (formatTag == kTagWma2) {
        if (codec->nAudioCodec == 0) codec->nAudioCodec = CODEC_WMAUDIO2;
    } else if (formatTag == kTagWma3) {
        if (codec->nAudioCodec == 0) codec->nAudioCodec = CODEC_WMAUDIO3;
    } else if (codec->nAudioCodec == 0) {
        return;
    }
    // A later audio stream overwrites the profile of an earlier one.
    if (sampleRate > 49152) return;
    if (bitrate < 193000) {
        codec->nAudioProfile = CODEC_WMAUDIO_PROFILE_BASELINE;
    } else if (bitrate <= 0x60400) {
        codec->nAudioProfile = CODEC_WMAUDIO_PROFILE_FULL;
    }
}

void Wmv3Stream(uint8_t b0, uint8_t b1, int32_t w, int32_t h, _MM_CODECTYPE* codec) {
    codec->nVideoCodec = CODEC_ASFVIDEO_WMV3;
    // STRUCT_C of the sequence header (SMPTE 421M, Annex J).
    uint32_t profile = b0 >> 6;
    bool interlaced = (b0 & 0x10) != 0;
    uint32_t fps = (b0 & 0x0Eu) * 2 + 2;
    uint32_t kbps = ((b0 * 256u + b1) & 0x1F0u) * 4 + 32;
    LogPrint(kVerbose, kLogTag, "video profile = %d\n", static_cast<int>(profile));
    LogPrint(kVerbose, kLogTag, "video interlace = %d\n", interlaced ? 1 : 0);
    LogPrint(kVerbose, kLogTag, "video fps = %d\n", static_cast<int>(fps));
    LogPrint(kVerbose, kLogTag, "video bitrate = %d kbps\n", static_cast<int>(kbps));
    uint32_t level = 0;
    switch (profile) {
        case 0:
            codec->nVideoProfile = CODEC_WMV9_PEOFILE_SIMPLE;
            level = ASF_SimpleProfileLevel(kbps, fps, w, h);
            break;
        case 1:
            codec->nVideoProfile = CODEC_WMV9_PEOFILE_MAIN;
            level = ASF_MainProfileLevel(kbps, fps, interlaced, w, h);
            break;
        case 3:
            codec->nVideoProfile = CODEC_WMV9_PEOFILE_ADVANCED;
            level = ASF_AdvancedProfileLevel(fps, interlaced, w, h);
            break;
        default: LogPrint(kVerbose, kLogTag, "the profile is forbidden \n"); return;
    }
    if (level != 0) codec->nVideoLevel = level;
}

void VideoStream(int h, uint32_t size, _MM_CODECTYPE* codec) {
    const int64_t typeSpecific = MEx_ftell(h);
    // Encoded width and height, reserved flags, format data size, then the
    // BITMAPINFOHEADER.
    uint8_t v[4 + 4 + 1 + 2 + 40];
    ReadOrZero(h, v, sizeof v);
    uint32_t encodedWidth = ReadLE32(v);
    uint32_t encodedHeight = ReadLE32(v + 4);
    int32_t codecDataLength = static_cast<int32_t>(ReadLE16(v + 9)) - 40;
    const uint8_t* bmi = v + 11;
    int32_t width = static_cast<int32_t>(ReadLE32(bmi + 4));
    int32_t height = static_cast<int32_t>(ReadLE32(bmi + 8));
    uint32_t compression = ReadLE32(bmi + 16);
    LogPrint(kVerbose, kLogTag, "video width = %d, height = %d\n", static_cast<int>(encodedWidth),
             static_cast<int>(encodedHeight));
    LogPrint(kVerbose, kLogTag, "video codecSpecDataLen = 0x%x, %d\n", static_cast<unsigned>(codecDataLength),
             static_cast<int>(codecDataLength));
    LogPrint(kVerbose, kLogTag, "video bitmapinfo.iCompression 0x%x\n", compression);

    if (codecDataLength < 2) {
        // These overwrite a codec that an earlier stream set.
        if (compression == FourCC("WMV1")) {
            codec->nVideoCodec = CODEC_ASFVIDEO_WMV1;
        } else if (compression == FourCC("MP42") || compression == FourCC("MP43")) {
            codec->nVideoCodec = CODEC_MP4VIDEO_MP4V;
        } else {
            codec->nVideoCodec = CODEC_NODEFINE;
            LogPrint(kVerbose, kLogTag, "undefined codec type: iCompression = 0x%x\n", compression);
        }
    } else {
        // Only the first two bytes of the codec-specific data are used.
        uint8_t seq[2];
        ReadOrZero(h, seq, sizeof seq);
        if (compression == FourCC("WMV3") && codec->nVideoCodec == 0) {
            Wmv3Stream(seq[0], seq[1], width, height, codec);
        } else if (compression == FourCC("WMV2") && codec->nVideoCodec == 0) {
            codec->nVideoCodec = CODEC_ASFVIDEO_WMV2;
            LogPrint(kVerbose, kLogTag, "in WMV2 type \n");
        } else {
            LogPrint(kVerbose, kLogTag, "non WMV3, WMV2. iCompression = 0x%x\n", compression);
        }
    }
    if (SeekTo(h, typeSpecific)) SeekBy(h, static_cast<int64_t>(size) - kPrefixSize);
}

struct AudioName {
    uint16_t tag;
    const char* name;
    uint32_t bits;  // ffprobe's fixed bits per sample; 0 when it reports none
};

const AudioName kAudioNames[] = {
    {0x0002, "adpcm_ms", 4},      {0x0006, "pcm_alaw", 8}, {0x0007, "pcm_mulaw", 8}, {0x000A, "wmavoice", 0},
    {0x0011, "adpcm_ima_wav", 4}, {0x0050, "mp2", 0},      {0x0055, "mp3", 0},       {0x00FF, "aac", 0},
    {0x0130, "sipr", 0},          {0x0160, "wmav1", 0},    {0x0161, "wmav2", 0},     {0x0162, "wmapro", 0},
    {0x0163, "wmalossless", 0},   {0x1610, "aac", 0},      {0x2000, "ac3", 0},       {0x2001, "dts", 0},
};

const struct {
    char fourcc[5];
    const char* name;
} kVideoNames[] = {
    {"WMV1", "wmv1"},      {"WMV2", "wmv2"},      {"WMV3", "wmv3"},      {"WMVA", "vc1"},   {"WVC1", "vc1"},
    {"WMVP", "wmv3image"}, {"WVP2", "vc1image"},  {"MSS1", "mss1"},      {"MSS2", "mss2"},  {"MP43", "msmpeg4v3"},
    {"DIV3", "msmpeg4v3"}, {"MP42", "msmpeg4v2"}, {"MPG4", "msmpeg4v1"}, {"MP4S", "mpeg4"}, {"M4S2", "mpeg4"},
    {"XVID", "mpeg4"},     {"DIVX", "mpeg4"},     {"DX50", "mpeg4"},     {"FMP4", "mpeg4"}, {"H264", "h264"},
    {"AVC1", "h264"},      {"MJPG", "mjpeg"},
};

}  // namespace

const char* ASF_AudioCodecName(uint16_t formatTag, uint16_t bitsPerSample) {
    if (formatTag == 0x0001) {
        switch (bitsPerSample) {
            case 8: return "pcm_u8";
            case 24: return "pcm_s24le";
            case 32: return "pcm_s32le";
            default: return "pcm_s16le";
        }
    }
    if (formatTag == 0x0003) return bitsPerSample == 64 ? "pcm_f64le" : "pcm_f32le";
    for (const AudioName& a : kAudioNames) {
        if (a.tag == formatTag) return a.name;
    }
    return nullptr;
}

uint32_t ASF_AudioSampleBits(uint16_t formatTag, uint16_t bitsPerSample) {
    if (formatTag == 0x0001 || formatTag == 0x0003) return bitsPerSample;
    for (const AudioName& a : kAudioNames) {
        if (a.tag == formatTag) return a.bits;
    }
    return 0;
}

const char* ASF_VideoCodecName(uint32_t compression) {
    uint32_t upper = 0;
    for (uint32_t shift = 0; shift < 32; shift += 8) {
        uint32_t c = compression >> shift & 0xFFu;
        upper |= (c >= 'a' && c <= 'z' ? c - 32 : c) << shift;
    }
    for (const auto& v : kVideoNames) {
        if (FourCC(v.fourcc) == upper) return v.name;
    }
    return nullptr;
}

const char* ASF_Wmv3ProfileName(uint8_t first) {
    static const char* const kNames[] = {"Simple", "Main", "Complex", "Advanced"};
    return kNames[first >> 6];
}

uint32_t ASF_SimpleProfileLevel(uint32_t kbps, uint32_t fps, int32_t w, int32_t h) {
    bool lowRate = kbps < 97 && fps < 16;
    if (lowRate && w <= 176 && h <= 144) return CODEC_WMV9_LEVEL_LOW;
    if (!lowRate && kbps > 384) return 0;
    if ((w < 241 && h < 177) || (fps < 16 && w <= 352 && h <= 288)) return CODEC_WMV9_LEVEL_MEDIUM;
    return 0;
}

uint32_t ASF_MainProfileLevel(uint32_t /*kbps*/, uint32_t fps, bool interlaced, int32_t w, int32_t h) {
    if (fps < 25 && w < 321 && h < 241) return CODEC_WMV9_LEVEL_LOW;
    if (interlaced) return 0;
    if ((w < 721 && h < 481) || (fps < 27 && w < 721 && h < 577)) return CODEC_WMV9_LEVEL_MEDIUM;
    if (w <= 1920 && h <= 1080) return CODEC_WMV9_LEVEL_HIGH;
    return 0;
}

uint32_t ASF_AdvancedProfileLevel(uint32_t fps, bool interlaced, int32_t w, int32_t h) {
    bool slow = fps < 25;
    if (w <= 352 && h < 289) return CODEC_WMV9_LEVEL_L0;
    if ((w < 721 && h < 481) || (fps < 27 && w < 721 && h < 577)) return CODEC_WMV9_LEVEL_L1;
    if (!interlaced && w < 1281 && h < 721) return CODEC_WMV9_LEVEL_L2;
    if (!interlaced && !slow) {
        if (w <= 1280 && h < 721) return CODEC_WMV9_LEVEL_L3;
        if (w <= 1920 && h <= 1080) return CODEC_WMV9_LEVEL_L4;
    } else {
        if (w < 1921 && h < 1081) return CODEC_WMV9_LEVEL_L3;
        if (!interlaced) {
            if (w <= 1280 && h < 721) return CODEC_WMV9_LEVEL_L3;
            if (w <= 1920 && h < 1081) return CODEC_WMV9_LEVEL_L4;
        }
    }
    if (slow && w <= 2048 && h <= 1536) return CODEC_WMV9_LEVEL_L4;
    return 0;
}

int32_t ASF_GetCodecInfo(int h, _MM_CODECTYPE* codec) {
    if (h == 0 || codec == nullptr) return MM_E_INVALIDARG;
    if (!SeekBy(h, -8)) return MM_E_FAIL;
    // Size, Stream Type, Error Correction Type, Time Offset, Type-Specific
    // Data Length, Error Correction Data Length, Flags, Reserved.
    uint8_t p[kPrefixSize - 16];
    ReadOrZero(h, p, sizeof p);
    uint32_t size = ReadLE32(p);
    const uint8_t* type = p + 8;
    uint32_t typeSpecificLength = ReadLE32(p + 48);
    LogPrint(kVerbose, kLogTag, "the specDataLen = 0x%x, %d\n", typeSpecificLength,
             static_cast<int>(typeSpecificLength));

    if (SameGuid(type, ASF_Audio_Media)) {
        AudioStream(h, size, codec);
    } else if (SameGuid(type, ASF_Video_Media)) {
        VideoStream(h, size, codec);
    } else {
        // Measured from the prefix's end, as the walk has always done: this
        // lands 38 bytes past the object, and the walk reads on from there.
        SeekBy(h, static_cast<int64_t>(size) - kOtherStreamSkip);
    }
    return 0;
}

}  // namespace metainfo
