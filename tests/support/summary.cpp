#include "support/summary.h"

#include <cstdio>
#include <cstring>

namespace testing_support {

std::string ClipSummary(const _MMClipInfo& c) {
    std::string out(c.szFormat, strnlen(c.szFormat, sizeof c.szFormat));
    const struct { const char* name; uint32_t value; } fields[] = {
        {"size", c.nFileSize},   {"dur", c.nDuration},       {"bps", c.nBitrate},       {"c1", c.nReserved1},
        {"c2", c.nReserved2},    {"audio", c.bHasAudio},     {"video", c.bHasVideo},    {"abps", c.nAudioBitrate},
        {"hz", c.nSampleRate},   {"ch", c.nChannels},        {"bits", c.nBitsPerSample}, {"spf", c.nSamplesPerFrame},
        {"vbps", c.nVideoBitrate}, {"w", c.nWidth},          {"h", c.nHeight},          {"fps", c.nFrameRate}};
    for (const auto& f : fields) {
        if (f.value != 0) out += (out.empty() ? "" : " ") + std::string(f.name) + "=" + std::to_string(f.value);
    }
    return out;
}

std::string CodecSummary(const _MM_CODECTYPE& c) {
    char text[96];
    std::snprintf(text, sizeof text, "a=%x/%x/%x v=%x/%x/%x", c.nAudioCodec, c.nAudioProfile, c.nAudioSubType,
                  c.nVideoCodec, c.nVideoProfile, c.nVideoLevel);
    return text;
}

}  // namespace testing_support
