// TrackEntry elements as streams: the codec ID in ffprobe's words, the
// profile and level from the codec's private data, and the stream's shape.
#include <cmath>
#include <cstring>
#include <string>
#include <vector>

#include "core/quirks.h"
#include "matroska/ebml.h"
#include "matroska/matroska_internal.h"
#include "metainfo/metainfo.h"
#include "mp4/codec_records.h"
#include "mp4/mp4_internal.h"

namespace metainfo {
namespace {

struct TrackEntry {
    uint64_t type = 0, number = 0;
    std::string codecId;
    const uint8_t* priv = nullptr;
    size_t privSize = 0;
    uint64_t defaultDuration = 0;  // ns per frame
    uint64_t width = 0, height = 0;
    double rate = 8000, outputRate = 0;
    uint64_t channels = 1, bitDepth = 0;
};

struct CodecName {
    const char* id;  // a codec ID, or its prefix when it ends in '/'
    const char* name;
};

constexpr CodecName kCodecs[] = {
    {"V_MPEG4/ISO/AVC", "h264"},
    {"V_MPEGH/ISO/HEVC", "hevc"},
    {"V_VP8", "vp8"},
    {"V_VP9", "vp9"},
    {"V_AV1", "av1"},
    {"V_MPEG4/ISO/", "mpeg4"},
    {"V_MPEG1", "mpeg1video"},
    {"V_MPEG2", "mpeg2video"},
    {"V_THEORA", "theora"},
    {"V_MJPEG", "mjpeg"},
    {"V_PRORES", "prores"},
    {"V_FFV1", "ffv1"},
    {"A_AAC", "aac"},
    {"A_AAC/", "aac"},
    {"A_OPUS", "opus"},
    {"A_VORBIS", "vorbis"},
    {"A_FLAC", "flac"},
    {"A_AC3", "ac3"},
    {"A_EAC3", "eac3"},
    {"A_DTS", "dts"},
    {"A_MPEG/L3", "mp3"},
    {"A_MPEG/L2", "mp2"},
    {"A_MPEG/L1", "mp1"},
    {"A_TRUEHD", "truehd"},
    {"A_ALAC", "alac"},
    {"A_TTA1", "tta"},
    {"A_WAVPACK4", "wavpack"},
};

std::string CodecFor(const TrackEntry& t) {
    const uint64_t bits = t.bitDepth;
    if (t.codecId == "A_PCM/INT/LIT" || t.codecId == "A_PCM/INT/BIG") {
        if (bits == 8) return "pcm_u8";
        if (bits != 16 && bits != 24 && bits != 32) return std::string();
        return "pcm_s" + std::to_string(bits) + (t.codecId == "A_PCM/INT/LIT" ? "le" : "be");
    }
    if (t.codecId == "A_PCM/FLOAT/IEEE") return bits == 64 ? "pcm_f64le" : bits == 32 ? "pcm_f32le" : "";
    for (const CodecName& c : kCodecs) {
        const size_t n = std::strlen(c.id);
        const bool prefix = c.id[n - 1] == '/';
        if (prefix ? t.codecId.compare(0, n, c.id) == 0 : t.codecId == c.id) return c.name;
    }
    return std::string();
}

// VP9's CodecPrivate: one-byte ID, one-byte length, value; ID 1 the profile.
void Vp9Profile(const uint8_t* p, size_t n, StreamFacts* s) {
    for (size_t at = 0; at + 2 <= n && p[at + 1] <= n - at - 2; at += 2 + size_t{p[at + 1]}) {
        if (p[at] == 1 && p[at + 1] == 1 && p[at + 2] < 4) s->profile = std::string("Profile ") + char('0' + p[at + 2]);
    }
}

// avcC, hvcC and av1C records, as Matroska keeps them in CodecPrivate; for
// MPEG-4 Visual, the headers that start its stream.
void VideoProfile(const TrackEntry& t, StreamFacts* s) {
    const uint8_t* p = t.priv;
    const size_t n = t.privSize;
    if (s->codec == "h264") {
        AvcRecordFacts(p, n, s);
    } else if (s->codec == "hevc") {
        HevcRecordFacts(p, n, s);
    } else if (s->codec == "av1") {
        Av1RecordFacts(p, n, s);
    } else if (s->codec == "vp9") {
        Vp9Profile(p, n, s);
    } else if (s->codec == "mpeg4") {
        Mpeg4VisualFacts(p, n, s);
    }
}

// The AudioSpecificConfig: the profile, and the rate with SBR as it decodes.
void AacProfile(const TrackEntry& t, StreamFacts* s) {
    if (t.priv == nullptr || t.privSize < 2) return;
    uint8_t bits[kAscBufferSize] = {0};
    std::memcpy(bits, t.priv, t.privSize < sizeof bits ? t.privSize : sizeof bits);
    mp4AudioSpecificConfig asc;
    std::memset(&asc, 0, sizeof asc);
    if (AudioSpecificConfig(bits, &asc, kAccurate) != MM_OK && asc.samplingFrequency == 0) return;
    const char* profile = AacProfileName(asc);
    if (profile != nullptr) s->profile = profile;
}

// Frames per second from nanoseconds per frame: the usual rate within 0.01
// of it (29.97 is stored as 33366667 ns), else 1e9/ns reduced.
void FrameRate(uint64_t ns, StreamFacts* s) {
    static const uint32_t kCommon[][2] = {{24000, 1001}, {24, 1},       {25, 1}, {30000, 1001}, {30, 1},  {48, 1},
                                          {50, 1},       {60000, 1001}, {60, 1}, {100, 1},      {120, 1}, {15, 1}};
    if (ns == 0) return;
    const double fps = 1e9 / static_cast<double>(ns);
    for (const auto& c : kCommon) {
        if (std::fabs(fps - double(c[0]) / double(c[1])) < 0.01) {
            s->frameRateNum = c[0];
            s->frameRateDen = c[1];
            return;
        }
    }
    uint64_t a = 1000000000, b = ns;
    while (b != 0) {
        const uint64_t r = a % b;
        a = b;
        b = r;
    }
    const uint64_t num = 1000000000 / a, den = ns / a;
    if (num > 0xFFFFFFFFu || den > 0xFFFFFFFFu) return;
    s->frameRateNum = static_cast<uint32_t>(num);
    s->frameRateDen = static_cast<uint32_t>(den);
}

uint32_t Rate(double hz) { return hz > 0 && hz < 1e7 ? static_cast<uint32_t>(std::lround(hz)) : 0; }

void ReadVideo(const uint8_t* body, size_t size, TrackEntry* t) {
    EbmlChildren children(body, size);
    EbmlElement e;
    const uint8_t* p = nullptr;
    while (children.Next(&e, &p)) {
        if (e.id == 0xB0) t->width = EbmlUnsigned(p, e.size);
        if (e.id == 0xBA) t->height = EbmlUnsigned(p, e.size);
    }
}

void ReadAudio(const uint8_t* body, size_t size, TrackEntry* t) {
    EbmlChildren children(body, size);
    EbmlElement e;
    const uint8_t* p = nullptr;
    while (children.Next(&e, &p)) {
        if (e.id == 0xB5) EbmlFloat(p, e.size, &t->rate);
        if (e.id == 0x78B5) EbmlFloat(p, e.size, &t->outputRate);
        if (e.id == 0x9F) t->channels = EbmlUnsigned(p, e.size);
        if (e.id == 0x6264) t->bitDepth = EbmlUnsigned(p, e.size);
    }
}

void AddTrack(const TrackEntry& t, MediaFacts* facts, std::vector<uint64_t>* numbers) {
    if (t.type != 1 && t.type != 2) return;  // subtitles, buttons, ...
    numbers->push_back(t.number);
    StreamFacts s;
    s.kind = t.type == 1 ? StreamFacts::kVideo : StreamFacts::kAudio;
    s.codec = CodecFor(t);
    if (s.kind == StreamFacts::kVideo) {
        s.width = static_cast<uint32_t>(t.width > 0xFFFFFFFFu ? 0 : t.width);
        s.height = static_cast<uint32_t>(t.height > 0xFFFFFFFFu ? 0 : t.height);
        FrameRate(t.defaultDuration, &s);
        VideoProfile(t, &s);
    } else {
        s.sampleRate = Rate(t.outputRate > 0 ? t.outputRate : t.rate);
        s.channels = static_cast<uint32_t>(t.channels > 255 ? 0 : t.channels);
        const bool lossless = s.codec.compare(0, 4, "pcm_") == 0 || s.codec == "flac" || s.codec == "alac";
        if (lossless && t.bitDepth <= 64) s.bitsPerSample = static_cast<uint32_t>(t.bitDepth);
        if (s.codec == "aac") AacProfile(t, &s);
    }
    facts->streams.push_back(s);
}

}  // namespace

void MkvTracksFacts(const uint8_t* body, size_t size, MediaFacts* facts, std::vector<uint64_t>* numbers) {
    EbmlChildren entries(body, size);
    EbmlElement entry;
    const uint8_t* entryBody = nullptr;
    while (entries.Next(&entry, &entryBody)) {
        if (entry.id != 0xAE) continue;
        TrackEntry t;
        EbmlChildren children(entryBody, static_cast<size_t>(entry.size));
        EbmlElement e;
        const uint8_t* p = nullptr;
        while (children.Next(&e, &p)) {
            const size_t n = static_cast<size_t>(e.size);
            if (e.id == 0x83) t.type = EbmlUnsigned(p, n);
            if (e.id == 0xD7) t.number = EbmlUnsigned(p, n);
            if (e.id == 0x86) t.codecId = std::string(reinterpret_cast<const char*>(p), n).c_str();
            if (e.id == 0x63A2) {
                t.priv = p;
                t.privSize = n;
            }
            if (e.id == 0x23E383) t.defaultDuration = EbmlUnsigned(p, n);
            if (e.id == 0xE0) ReadVideo(p, n, &t);
            if (e.id == 0xE1) ReadAudio(p, n, &t);
        }
        AddTrack(t, facts, numbers);
    }
}

}  // namespace metainfo
