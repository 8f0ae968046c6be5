#include "aac/aac_facts.h"

#include <cstring>
#include <vector>

#include "aac/aac_clip.h"
#include "core/byte_reader.h"
#include "core/file_access.h"
#include "metainfo/metainfo.h"

namespace metainfo {
namespace {

constexpr uint64_t kAdtsHeader = 7;
constexpr uint64_t kId3Header = 10;
constexpr uint64_t kSyncWindow = uint64_t{64} << 10;  // where the first frame must start
constexpr uint64_t kCountLimit = uint64_t{16} << 20;  // frames counted; past it the rest is estimated
constexpr int kFramesToAccept = 3;
constexpr uint64_t kMaxFrame = 8192;  // 13-bit frame length
constexpr uint32_t kSamplesPerBlock = 1024;

struct AdtsHeader {
    uint32_t profile = 0, rateIndex = 0, channelConfig = 0, length = 0, blocks = 0;
};

bool ParseAdts(const uint8_t* p, AdtsHeader* h) {
    if (p[0] != 0xFF || (p[1] & 0xF6) != 0xF0) return false;  // sync, layer 0
    h->profile = p[2] >> 6;
    h->rateIndex = (p[2] >> 2) & 0x0F;
    h->channelConfig = (p[2] & 1u) << 2 | p[3] >> 6;
    h->length = (p[3] & 3u) << 11 | static_cast<uint32_t>(p[4]) << 3 | p[5] >> 5;
    h->blocks = (p[6] & 3u) + 1;
    return h->rateIndex < 12 && h->length >= kAdtsHeader;
}

// Bytes of an ID3v2 tag at p (header, body and footer), or 0.
uint64_t Id3TagBytes(const uint8_t* p) {
    if (!BytesEqual(p, "ID3", 3) || p[3] == 0xFF || p[4] == 0xFF) return 0;
    if (((p[6] | p[7] | p[8] | p[9]) & 0x80) != 0) return 0;
    return kId3Header + ReadSyncsafe32(p + 6) + ((p[5] & 0x10) != 0 ? kId3Header : 0);
}

struct Walk {
    uint64_t frames = 0, samples = 0, frameBytes = 0;
    uint64_t start = 0, end = 0;  // of the stream; end: where counting stopped
    AdtsHeader first;
    bool complete = false;  // reached the end of the stream
};

// Steps over frames and ID3 tags from `at`, showing each frame to visit;
// stops at anything else, the end of the file, `limit` or when visit says so.
void WalkFrames(int h, uint64_t size, uint64_t at, uint64_t limit, Walk* w, const FrameVisitor& visit = nullptr) {
    uint8_t p[kId3Header];
    while (at + kAdtsHeader <= size) {
        if (at >= limit) return;
        if (!SeekToOffset(h, at)) break;
        const int got = MEx_fread(p, 1, sizeof p, h);
        if (got < static_cast<int>(kAdtsHeader)) break;
        AdtsHeader frame;
        if (ParseAdts(p, &frame) && at + frame.length <= size) {
            if (w->frames == 0) w->first = frame;
            const uint32_t samples = frame.blocks * kSamplesPerBlock;
            ++w->frames;
            w->samples += samples;
            w->frameBytes += frame.length;
            if (visit && !visit(AudioFrame{at, frame.length, samples})) return;
            at += frame.length;
            continue;
        }
        const uint64_t tag = got == static_cast<int>(kId3Header) ? Id3TagBytes(p) : 0;
        if (tag == 0) break;
        at += tag;
    }
    w->end = at;
    w->complete = true;
}

// Where the ID3v2 tags at `at` (one after another) end.
uint64_t SkipTags(int h, uint64_t size, uint64_t at) {
    constexpr int kMostTags = 64;
    uint8_t p[kId3Header];
    for (int i = 0; i < kMostTags && at + kId3Header <= size; ++i) {
        if (!SeekToOffset(h, at) || MEx_fread(p, 1, sizeof p, h) != static_cast<int>(sizeof p)) break;
        const uint64_t tag = Id3TagBytes(p);
        if (tag == 0) break;
        at += tag;
    }
    return at;
}

// The first offset in the sync window after the leading tags where
// kFramesToAccept frames follow each other (ID3 tags between them allowed).
bool FindStream(int h, uint64_t size, uint64_t* start) {
    const uint64_t from = SkipTags(h, size, 0);
    std::vector<uint8_t> window(kSyncWindow);
    if (from >= size || !SeekToOffset(h, from)) return false;
    const int got = MEx_fread(window.data(), 1, kSyncWindow, h);
    if (got < static_cast<int>(kAdtsHeader)) return false;
    const auto n = static_cast<uint64_t>(got);
    for (uint64_t i = 0; i + kAdtsHeader <= n; ++i) {
        AdtsHeader frame;
        if (!ParseAdts(window.data() + i, &frame)) continue;
        Walk probe;
        WalkFrames(h, size, from + i, from + i + kFramesToAccept * kMaxFrame, &probe);
        // A short walk stops at the file's end only for a short file.
        if (probe.frames >= kFramesToAccept || (probe.frames > 0 && probe.end + kAdtsHeader > size)) {
            *start = from + i;
            return true;
        }
    }
    return false;
}

const char* ProfileName(uint32_t profile) {
    static const char* const kNames[4] = {"Main", "LC", "SSR", "LTP"};
    return kNames[profile & 3];
}

// SBR and PS as the frame walker finds them in the stream's fill elements.
void AddSbr(const char* path, const Quirks& quirks, StreamFacts* s) {
    _MM_CODECTYPE codec{};
    if (AAC_GetCodecType(path, &codec) != MM_OK) return;
    const bool ps = codec.nAudioCodec == CODEC_AAC_PLUS_V2_ADTS;
    const bool sbr = ps || codec.nAudioCodec == CODEC_AAC_PLUS_V1_ADTS;
    // SBR doubles a core rate of at most 48 kHz; above it, what looked like
    // SBR data is not.
    if (!sbr || (!quirks.aacHighRateIsSbr && s->sampleRate > 48000)) return;
    s->profile = ps ? "HE-AACv2" : "HE-AAC";
    s->sampleRate *= 2;
    if (ps) s->channels = 2;
}

// A file opened and its ADTS stream looked for.
class AdtsFile {
public:
    explicit AdtsFile(const char* path) : h_(MEx_fopen(path, "rb")) {
        found_ = h_ != 0 && OpenedFileSize(h_, path, &size_) && FindStream(h_, size_, &start_);
    }
    ~AdtsFile() {
        if (h_ != 0) MEx_fclose(h_);
    }
    AdtsFile(const AdtsFile&) = delete;
    AdtsFile& operator=(const AdtsFile&) = delete;

    bool found() const { return found_; }
    // Frames from the stream's start up to `limit` bytes into the file.
    void WalkTo(uint64_t limit, Walk* w, const FrameVisitor& visit = nullptr) const {
        WalkFrames(h_, size_, start_, limit, w, visit);
    }
    uint64_t size() const { return size_; }
    uint64_t start() const { return start_; }

private:
    int h_;
    bool found_ = false;
    uint64_t size_ = 0, start_ = 0;
};

}  // namespace

bool WalkAdtsFrames(const char* path, uint32_t* rate, const FrameVisitor& visit) {
    const AdtsFile file(path);
    if (!file.found()) return false;
    Walk first;
    file.WalkTo(file.start() + 1, &first);
    *rate = g_uSamplingFrequencyTable[first.first.rateIndex];
    Walk w;
    file.WalkTo(file.size(), &w, visit);
    return *rate != 0;
}

bool LooksLikeAdts(const char* path) { return AdtsFile(path).found(); }

int32_t AacFacts(const char* path, const Quirks& quirks, MediaFacts* f) {
    const AdtsFile file(path);
    if (!file.found()) return MM_E_UNSUPPORTED;
    const uint64_t size = file.size();
    const uint64_t start = file.start();
    Walk w;
    w.start = start;
    file.WalkTo(start + kCountLimit, &w);
    const uint32_t rate = g_uSamplingFrequencyTable[w.first.rateIndex];
    if (w.frames == 0 || rate == 0) return MM_E_UNSUPPORTED;

    f->format = "aac";
    f->mime = "audio/aac";
    StreamFacts s;
    s.codec = "aac";
    s.profile = ProfileName(w.first.profile);
    s.sampleRate = rate;
    s.channels = w.first.channelConfig == 7 ? 8 : w.first.channelConfig;
    uint64_t samples = w.samples;
    f->durationExact = true;
    if (w.end < size && w.end >= start + kCountLimit && w.frameBytes != 0) {
        // Counting stopped at the limit: the rest of the file at the same rate.
        samples = samples * (size - start) / (w.end - start);
        f->durationExact = false;
    }
    f->durationUs = static_cast<int64_t>(samples * 1000000 / rate);
    if (w.samples != 0) s.bitRate = w.frameBytes * 8 * rate / w.samples;
    AddSbr(path, quirks, &s);
    f->bitRate = s.bitRate;
    f->streams.push_back(s);
    return MM_OK;
}

}  // namespace metainfo
