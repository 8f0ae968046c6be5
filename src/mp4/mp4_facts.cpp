// The accurate reader of MP4, 3GPP and QuickTime files: one clip walk that
// also fills the truth record, told in ffprobe's terms.
#include "mp4/mp4_facts.h"

#include <cstring>
#include <new>

#include "aac/aac_bits.h"
#include "aac/aac_clip.h"
#include "aac/aac_walker.h"
#include "core/file_access.h"
#include "core/thread_state.h"
#include "metainfo/metainfo.h"
#include "mp4/mp4_internal.h"
#include "mp4/mp4_truth.h"

namespace metainfo {

int64_t Micros(uint64_t ticks, uint32_t timescale) {
    if (timescale == 0) return -1;
    const uint64_t whole = ticks / timescale, part = ticks % timescale;
    if (whole > (uint64_t{1} << 42)) return -1;  // past a hundred years: no length a file has
    return static_cast<int64_t>(whole * 1000000 + (part * 1000000 + timescale / 2) / timescale);
}

namespace {

// value * mul / div without overflow for the sizes and times of a file.
uint64_t MulDiv(uint64_t value, uint64_t mul, uint64_t div) {
    if (div == 0) return 0;
    const long double q = static_cast<long double>(value) * mul / div;
    // A hostile file's times can make any rate; no answer beyond 2^63 is one.
    return q < 9.2e18L ? static_cast<uint64_t>(q) : 0;
}

uint64_t Gcd(uint64_t a, uint64_t b) {
    while (b != 0) {
        const uint64_t r = a % b;
        a = b;
        b = r;
    }
    return a;
}

// Frames per second as a reduced fraction that fits 32 bits.
void FrameRate(const Mp4TrackTruth& t, StreamFacts* s) {
    if (t.sampleCount == 0 || t.sttsDuration == 0 || t.timescale == 0) return;
    uint64_t num = t.sampleCount * t.timescale, den = t.sttsDuration;
    const uint64_t g = Gcd(num, den);
    num /= g;
    den /= g;
    while (num > 0xFFFFFFFFu || den > 0xFFFFFFFFu) {
        num >>= 1;
        den >>= 1;
    }
    if (num == 0 || den == 0) return;
    s->frameRateNum = static_cast<uint32_t>(num);
    s->frameRateDen = static_cast<uint32_t>(den);
}

// The presented length of a track in microseconds (-1 unknown): its edit
// list where it has one, else its media.
int64_t TrackMicros(const Mp4Truth& truth, const Mp4TrackTruth& t) {
    if (t.hasEdit && truth.movieTimescale != 0 && t.editDuration != 0)
        return Micros(t.editDuration, truth.movieTimescale);
    return t.timescale != 0 && t.duration != 0 ? Micros(t.duration, t.timescale) : -1;
}

// A 3GPP brand: "3gp4", "3gp6", ... and 3GPP2's "3g2a" (*second).
bool Is3gpBrand(uint32_t brand, bool* second) {
    if ((brand >> 16) != (FourCC("3g  ") >> 16)) return false;
    *second = (brand >> 8) == (FourCC("3g2a") >> 8);
    return true;
}

// 3GPP by the major brand, or by a compatible one under a maker's own major
// brand ("kddi").
bool Is3gpFile(const Mp4Truth& truth, bool* second) {
    if (Is3gpBrand(truth.majorBrand, second)) return true;
    static const uint32_t kMp4Brands[] = {FourCC("isom"), FourCC("iso2"), FourCC("mp41"), FourCC("mp42"),
                                          FourCC("M4A "), FourCC("M4B "), FourCC("M4V "), FourCC("qt  ")};
    for (uint32_t b : kMp4Brands) {
        if (b == truth.majorBrand) return false;
    }
    for (uint32_t b : truth.brands) {
        if (Is3gpBrand(b, second)) return true;
    }
    return false;
}

std::string MimeOf(const Mp4Truth& truth, bool hasVideo) {
    bool second = false;
    if (Is3gpFile(truth, &second)) return std::string(hasVideo ? "video/" : "audio/") + (second ? "3gpp2" : "3gpp");
    if (truth.majorBrand == FourCC("qt  ")) return "video/quicktime";
    return hasVideo ? "video/mp4" : "audio/mp4";
}

void AddStream(const Mp4TrackTruth& t, uint64_t fileSize, MediaFacts* f) {
    StreamFacts s = t.stream;
    if (s.kind == StreamFacts::kVideo) {
        if (s.width == 0) s.width = t.tkhdWidth;
        if (s.height == 0) s.height = t.tkhdHeight;
        FrameRate(t, &s);
    }
    // The media's bytes over the media's length, as ffprobe tells a stream's
    // rate; a rate the codec box states where the samples are not counted.
    // AC-3 frames carry padding and a nominal rate, which ffprobe tells.
    const bool nominal = t.declaredBitrate != 0 && (s.codec == "ac3" || s.codec == "eac3");
    const uint64_t duration = t.duration != 0 ? t.duration : t.sttsDuration;
    // A sample table that sums to more than the file holds says nothing.
    if (!nominal && t.bytesKnown && t.sampleBytes != 0 && t.sampleBytes <= fileSize && duration != 0) {
        s.bitRate = MulDiv(t.sampleBytes * 8, t.timescale, duration);
    } else {
        s.bitRate = t.declaredBitrate;
    }
    f->streams.push_back(s);
}

// An MP3 sample entry states two channels whatever the stream holds: the
// first frame's header tells.
void Mp3Channels(const char* path, Mp4Truth* truth) {
    for (Mp4TrackTruth& t : truth->tracks) {
        if (t.stream.codec != "mp3" || t.firstChunk == 0) continue;
        const int h = MEx_fopen(path, "rb");
        if (h == 0) return;
        FileCloser closer(h);
        uint8_t header[4] = {};
        if (!SeekToOffset(h, t.firstChunk) || MEx_fread(header, 1, sizeof header, h) != 4) continue;
        if (header[0] == 0xFF && (header[1] & 0xE0) == 0xE0) t.stream.channels = (header[3] >> 6) == 3 ? 1 : 2;
    }
}

// An AAC configuration of 24 kHz or less that says nothing of SBR may still
// carry it (implicit signalling): the first frame's fill elements tell, read
// by the walker that finds SBR in ADTS streams.
void ImplicitSbr(const char* path, Mp4Truth* truth) {
    constexpr int kFirstFrameBytes = 2048;
    for (Mp4TrackTruth& t : truth->tracks) {
        StreamFacts& s = t.stream;
        if (s.codec != "aac" || s.profile != "LC" || s.sampleRate > 24000 || t.firstChunk == 0) continue;
        int index = 0;
        while (index < 12 && g_uSamplingFrequencyTable[index] != s.sampleRate) ++index;
        const int h = index < 12 ? MEx_fopen(path, "rb") : 0;
        if (h == 0) continue;
        FileCloser closer(h);
        uint8_t frame[kFirstFrameBytes];
        const int got = SeekToOffset(h, t.firstChunk) ? MEx_fread(frame, 1, sizeof frame, h) : 0;
        if (got <= 0) continue;
        AacBitReader r = MakeAacBitReader(frame, got, 0);
        uint32_t state = kWalkPlain;
        RawDataStream(&r, &state, index);
        if (state != kWalkSbrFound) continue;
        s.profile = "HE-AAC";
        s.sampleRate *= 2;
    }
}

void Assemble(const char* path, const Mp4Truth& truth, uint64_t fileSize, MediaFacts* f) {
    f->format = "mp4";  // the MM_ name of every file of the family
    bool hasVideo = false;
    int64_t longest = -1;
    for (const Mp4TrackTruth& t : truth.tracks) {
        if (t.handler != FourCC("soun") && t.handler != FourCC("vide")) continue;
        if (t.hasEntry) {
            AddStream(t, fileSize, f);
            hasVideo = hasVideo || t.handler == FourCC("vide");
        }
        const int64_t us = TrackMicros(truth, t);
        if (us > longest) longest = us;
    }
    f->mime = MimeOf(truth, hasVideo);
    f->durationUs = truth.movieTimescale != 0 && truth.movieDuration != 0
                        ? Micros(truth.movieDuration, truth.movieTimescale)
                        : longest;
    if (f->durationUs <= 0 && truth.fragmented) f->durationUs = FragmentedDurationUs(path, fileSize, truth);
    f->durationExact = f->durationUs > 0;
    if (f->durationUs > 0) f->bitRate = MulDiv(fileSize * 8, 1000000, static_cast<uint64_t>(f->durationUs));
    f->tags = truth.tags;
    f->pictures = truth.pictures;
}

}  // namespace

int32_t Mp4Facts(const char* path, int /*type*/, MediaFacts* facts) {
    _ME_ClipInfoEx info;
    std::memset(&info, 0, sizeof info);
    int32_t result = MM_OK;
    try {
        Mp4Truth truth;
        info.truth = &truth;
        result = MP4_GetMediaInfo(path, kModeClip, &info);
        FreeTrackList(&info);
        const uint64_t fileSize = s_mp4FileSize;
        if (result == MM_OK) {
            Mp3Channels(path, &truth);
            ImplicitSbr(path, &truth);
        }
        if (result == MM_OK) Assemble(path, truth, fileSize, facts);
    } catch (const std::bad_alloc&) {
        FreeTrackList(&info);
        return MM_E_OUTOFMEMORY;
    }
    if (result == MM_E_OUTOFMEMORY) return result;
    return result == MM_OK ? MM_OK : MM_E_FAIL;
}

}  // namespace metainfo
