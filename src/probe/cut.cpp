// mi_cut: a time range of compressed audio copied frame by frame.
#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <cstring>
#include <new>
#include <vector>

#include "aac/aac_facts.h"
#include "core/audio_frames.h"
#include "metainfo/metainfo.h"
#include "metainfo/probe.h"
#include "mp3/mp3_frames.h"
#include "probe/facts_readers.h"
#include "speech/amr.h"
#include "speech/wave_facts.h"

namespace metainfo {
namespace {

constexpr size_t kCopyChunk = size_t{64} << 10;

// A byte range of the source to copy as it is.
struct Span {
    uint64_t offset, length;
};

// Samples played in `us` microseconds at `rate`, without overflow for any
// time mi_cut accepts.
uint64_t SamplesIn(int64_t us, uint32_t rate) {
    const auto u = static_cast<uint64_t>(us);
    return u / 1000000 * rate + u % 1000000 * rate / 1000000;
}

// Frames that play within [start, end) (in samples, at the rate the walk
// states before its first frame), neighbours joined into one span.
class RangePicker {
public:
    RangePicker(int64_t startUs, int64_t endUs, const uint32_t* rate) : startUs_(startUs), endUs_(endUs), rate_(rate) {}

    bool Visit(const AudioFrame& f) {
        const uint64_t from = played_;
        played_ += f.samples;
        if (from >= SamplesIn(endUs_, *rate_)) return false;
        if (played_ <= SamplesIn(startUs_, *rate_)) return true;
        if (!spans.empty() && spans.back().offset + spans.back().length == f.offset) {
            spans.back().length += f.length;
        } else {
            spans.push_back(Span{f.offset, f.length});
        }
        return true;
    }

    std::vector<Span> spans;

private:
    int64_t startUs_, endUs_;
    const uint32_t* rate_;
    uint64_t played_ = 0;
};

bool WriteAll(int fd, const uint8_t* p, size_t n) {
    while (n > 0) {
        const ssize_t put = ::write(fd, p, n);
        if (put <= 0) return false;
        p += put;
        n -= static_cast<size_t>(put);
    }
    return true;
}

bool CopySpan(int in, int out, Span span, std::vector<uint8_t>* buf) {
    while (span.length > 0) {
        const size_t want = span.length < buf->size() ? static_cast<size_t>(span.length) : buf->size();
        const ssize_t got = ::pread(in, buf->data(), want, static_cast<off_t>(span.offset));
        if (got <= 0 || !WriteAll(out, buf->data(), static_cast<size_t>(got))) return false;
        span.offset += static_cast<uint64_t>(got);
        span.length -= static_cast<uint64_t>(got);
    }
    return true;
}

// Writes `header` then the spans of path to outPath; removes it on failure.
int WriteCut(const char* path, const char* outPath, const std::vector<uint8_t>& header, const std::vector<Span>& spans,
             const std::vector<uint8_t>& trailer) {
    const int in = ::open(path, O_RDONLY | O_CLOEXEC);
    if (in < 0) return MI_E_IO;
    const int out = ::open(outPath, O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0666);
    if (out < 0) {
        ::close(in);
        return MI_E_IO;
    }
    std::vector<uint8_t> buf(kCopyChunk);
    bool ok = WriteAll(out, header.data(), header.size());
    for (size_t i = 0; ok && i < spans.size(); ++i) ok = CopySpan(in, out, spans[i], &buf);
    ok = ok && WriteAll(out, trailer.data(), trailer.size());
    ok = ::close(out) == 0 && ok;
    ::close(in);
    if (!ok) (void)std::remove(outPath);
    return ok ? MI_OK : MI_E_IO;
}

void PutLE32(std::vector<uint8_t>* v, uint64_t x) {
    for (int i = 0; i < 4; ++i) v->push_back(static_cast<uint8_t>(x >> (8 * i)));
}
void PutTag(std::vector<uint8_t>* v, const char* tag) { v->insert(v->end(), tag, tag + 4); }

// A RIFF WAVE header for `blocks` whole blocks of the layout's format.
std::vector<uint8_t> WaveHeader(const WaveLayout& w, uint64_t dataBytes, uint64_t samples) {
    std::vector<uint8_t> h;
    const uint64_t fmt = w.format.size() + (w.format.size() & 1);
    const uint64_t fact = w.pcm ? 0 : 12;
    PutTag(&h, "RIFF");
    PutLE32(&h, 4 + 8 + fmt + fact + 8 + dataBytes + (dataBytes & 1));
    PutTag(&h, "WAVE");
    PutTag(&h, "fmt ");
    PutLE32(&h, w.format.size());
    h.insert(h.end(), w.format.begin(), w.format.end());
    if (w.format.size() & 1) h.push_back(0);
    if (!w.pcm) {
        PutTag(&h, "fact");
        PutLE32(&h, 4);
        PutLE32(&h, samples);
    }
    PutTag(&h, "data");
    PutLE32(&h, dataBytes);
    return h;
}

int CutWave(const char* path, int64_t startUs, int64_t endUs, const char* outPath) {
    WaveLayout w;
    if (!ReadWaveLayout(path, &w)) return MI_E_NOT_MEDIA;
    const uint64_t blocks = w.dataSize / w.blockAlign;
    const auto blockAt = [&](int64_t us, bool up) {
        const uint64_t samples = SamplesIn(us, w.rate);
        const uint64_t b = (samples + (up ? w.samplesPerBlock - 1 : 0)) / w.samplesPerBlock;
        return b < blocks ? b : blocks;
    };
    const uint64_t first = blockAt(startUs, false);
    const uint64_t last = blockAt(endUs, true);
    if (first >= last) return MI_E_ARGUMENT;
    const uint64_t bytes = (last - first) * w.blockAlign;
    // A RIFF size holds 32 bits; larger ranges would need RF64.
    if (bytes > 0xFFFFFF00u) return MI_E_ARGUMENT;
    const std::vector<Span> spans = {Span{w.dataOffset + first * w.blockAlign, bytes}};
    const std::vector<uint8_t> header = WaveHeader(w, bytes, (last - first) * w.samplesPerBlock);
    // A chunk of odd size is followed by a pad byte.
    return WriteCut(path, outPath, header, spans, std::vector<uint8_t>(bytes & 1, 0));
}

int CutFrames(const char* path, int type, int64_t startUs, int64_t endUs, const char* outPath) {
    uint32_t rate = 0;
    uint64_t prefix = 0;
    RangePicker picker(startUs, endUs, &rate);
    const FrameVisitor visit = [&](const AudioFrame& f) { return rate != 0 && picker.Visit(f); };
    bool walked = false;
    if (type == MEDIA_TYPE_MP3) {
        walked = WalkMp3Frames(path, &rate, visit);
    } else if (type == MEDIA_TYPE_AAC) {
        walked = WalkAdtsFrames(path, &rate, visit);
    } else {
        walked = WalkAmrFrames(path, &rate, &prefix, visit);
    }
    const std::vector<Span>& spans = picker.spans;
    if (!walked) return MI_E_NOT_MEDIA;
    if (spans.empty()) return MI_E_ARGUMENT;
    std::vector<uint8_t> header;
    if (prefix != 0) {
        // The AMR magic (and channel description) before the first frame.
        header.resize(static_cast<size_t>(prefix));
        const int in = ::open(path, O_RDONLY | O_CLOEXEC);
        const bool ok = in >= 0 && ::pread(in, header.data(), header.size(), 0) == static_cast<ssize_t>(prefix);
        if (in >= 0) ::close(in);
        if (!ok) return MI_E_IO;
    }
    return WriteCut(path, outPath, header, spans, {});
}

int Cut(const char* path, int64_t startMs, int64_t endMs, const char* outPath) {
    const int type = AccurateMediaType(path);
    const int64_t startUs = startMs * 1000;
    const int64_t endUs = endMs * 1000;
    switch (type) {
        case MEDIA_TYPE_WAVE: return CutWave(path, startUs, endUs, outPath);
        case MEDIA_TYPE_MP3:
        case MEDIA_TYPE_AAC:
        case MEDIA_TYPE_AMR_NB:
        case MEDIA_TYPE_AMR_WB: return CutFrames(path, type, startUs, endUs, outPath);
        default: return MI_E_NOT_MEDIA;
    }
}

}  // namespace
}  // namespace metainfo

extern "C" int mi_cut(const char* path, int64_t start_ms, int64_t end_ms, const char* out_path) {
    if (path == nullptr || out_path == nullptr || *path == '\0' || *out_path == '\0') return MI_E_ARGUMENT;
    // Up to about 290 years: the microseconds stay well within 63 bits.
    constexpr int64_t kLongest = INT64_MAX / 1000000 / 1000;
    if (start_ms < 0 || end_ms <= start_ms || end_ms > kLongest) return MI_E_ARGUMENT;
    try {
        return metainfo::Cut(path, start_ms, end_ms, out_path);
    } catch (const std::bad_alloc&) {
        return MI_E_NO_MEMORY;
    }
}
