#include "ogg/ogg_facts.h"

#include <algorithm>
#include <cstdio>
#include <new>
#include <utility>
#include <vector>

#include "core/file_access.h"
#include "metainfo/metainfo.h"
#include "ogg/ogg_codecs.h"
#include "ogg/ogg_last_granule.h"
#include "ogg/ogg_page.h"

namespace metainfo {
namespace {

// Header packets larger than this (pictures in comments) end the walk.
constexpr size_t kMaxHeaderBytes = 64u << 20;
constexpr size_t kMaxStreams = 16;
// Pages in a row that carry no header bytes before the walk gives up on a
// stream whose headers never come.
constexpr int kMaxIdlePages = 64;

struct Walk {
    std::vector<OggStream> streams;
    TagFacts tags;
    PictureSink pictures;
    size_t headerBytes = 0;
};

OggStream* StreamOf(Walk* w, uint32_t serial) {
    for (OggStream& s : w->streams) {
        if (s.serial == serial) return &s;
    }
    return nullptr;
}

bool AllDone(const Walk& w) {
    for (const OggStream& s : w.streams) {
        if (!s.done) return false;
    }
    return true;
}

// Splits the page's body into packets of its stream by the lacing values; a
// packet that runs on past the page waits in the stream's partial bytes.
void TakePackets(const OggPage& page, const uint8_t* body, OggStream* s, Walk* w) {
    if ((page.flags & 1) == 0) s->partial.clear();
    size_t at = 0;
    for (size_t i = 0; i < page.segmentCount && !s->done; ++i) {
        const size_t lace = page.lacing[i];
        s->partial.insert(s->partial.end(), body + at, body + at + lace);
        at += lace;
        w->headerBytes += lace;
        if (lace == 255) continue;
        ReadHeaderPacket(s->partial.data(), s->partial.size(), s, &w->tags, &w->pictures);
        s->partial.clear();
    }
    if (s->done) s->partial = std::vector<uint8_t>();
}

// Reads pages from the start until every stream's headers are in.
void WalkHeaders(int h, uint64_t fileSize, Walk* w) {
    std::vector<uint8_t> page(kOggMaxPage);
    uint64_t pos = 0;
    bool pastFirstPages = false;
    int idle = 0;
    while (pos < fileSize && w->headerBytes <= kMaxHeaderBytes) {
        // The header and segment table first, so that only the page's own bytes are read.
        const size_t got = ReadSomeAt(h, pos, page.data(), kOggHeaderSize + 255);
        OggPage p;
        if (!ParseOggPage(page.data(), got, &p)) return;
        const size_t rest = p.headerSize + p.bodySize - std::min(got, p.headerSize + p.bodySize);
        if (rest > 0 && ReadSomeAt(h, pos + got, page.data() + got, rest) != rest) return;
        pos += p.headerSize + p.bodySize;
        OggStream* s = StreamOf(w, p.serial);
        if ((p.flags & 2) != 0 && s == nullptr && !pastFirstPages && w->streams.size() < kMaxStreams) {
            w->streams.emplace_back();
            s = &w->streams.back();
            s->serial = p.serial;
        } else if ((p.flags & 2) == 0) {
            pastFirstPages = true;
        }
        if (s != nullptr && !s->done) {
            TakePackets(p, page.data() + p.headerSize, s, w);
            idle = 0;
        } else if (++idle > kMaxIdlePages) {
            return;
        }
        if (pastFirstPages && AllDone(*w)) return;
    }
}

// The stream's play time in microseconds from its last granule; -1 when it
// has none or its granules count no time.
int64_t StreamDuration(int h, uint64_t fileSize, const OggStream& s) {
    uint64_t granule = 0;
    if (!FindLastGranule(h, fileSize, s.serial, &granule) || granule >= (uint64_t(1) << 62)) return -1;
    long double seconds = -1;
    if (s.codec == OggStream::kTheora && s.facts.frameRateNum != 0 && s.facts.frameRateDen != 0) {
        const uint64_t frames = (granule >> s.granuleShift) + (granule & ((uint64_t(1) << s.granuleShift) - 1)) +
                                (s.granuleFromZero ? 1 : 0);
        seconds = static_cast<long double>(frames) * s.facts.frameRateDen / s.facts.frameRateNum;
    } else if (s.granuleRate != 0) {
        const uint64_t samples = granule > s.preSkip ? granule - s.preSkip : 0;
        seconds = static_cast<long double>(samples) / s.granuleRate;
    }
    // A low rate puts a large granule's length past what a count of microseconds holds.
    const long double us = seconds * 1e6L + 0.5L;
    return seconds < 0 || us >= 9.2e18L ? -1 : static_cast<int64_t>(us);
}

// The file plays as long as its longest stream.
void FillFacts(int h, uint64_t fileSize, Walk* w, MediaFacts* facts) {
    facts->format = "ogg";
    facts->mime = "audio/ogg";
    int64_t longest = -1;
    for (OggStream& s : w->streams) {
        if (s.codec == OggStream::kUnknown) continue;
        if (s.facts.kind == StreamFacts::kVideo) facts->mime = "video/ogg";
        facts->streams.push_back(s.facts);
        longest = std::max(longest, StreamDuration(h, fileSize, s));
    }
    facts->tags = w->tags;
    facts->pictures = w->pictures.list;
    for (const OggStream& s : w->streams) {
        // A gain the decoder applies changes what is heard: worth telling beside the tags.
        if (s.codec == OggStream::kOpus && s.outputGain != 0) {
            char gain[32];
            if (std::snprintf(gain, sizeof gain, "%.2f dB", s.outputGain / 256.0) > 0)
                facts->tags.extra.emplace_back("output_gain", gain);
        }
    }
    if (longest >= 0) {
        facts->durationUs = longest;
        facts->durationExact = true;
    }
}

int32_t ReadOgg(const char* path, MediaFacts* facts) {
    const OpenedFile file(path);
    if (!file.ok()) return MM_E_FAIL;
    const int h = file.handle();
    const uint64_t fileSize = file.size();
    Walk w;
    WalkHeaders(h, fileSize, &w);
    bool any = false;
    for (const OggStream& s : w.streams) any = any || s.codec != OggStream::kUnknown;
    if (!any) return MM_E_FAIL;
    FillFacts(h, fileSize, &w, facts);
    return MM_OK;
}

}  // namespace

bool OggPictureBytes(const char* path, uint32_t ordinal, std::vector<uint8_t>* bytes) {
    try {
        const OpenedFile file(path);
        if (!file.ok()) return false;
        Walk w;
        w.pictures.want = ordinal;
        WalkHeaders(file.handle(), file.size(), &w);
        if (ordinal >= w.pictures.list.size()) return false;
        *bytes = std::move(w.pictures.bytes);
        return true;
    } catch (const std::bad_alloc&) {
        return false;
    }
}

bool LooksLikeOgg(const char* /*path*/, const uint8_t* head, size_t n) {
    OggPage page;
    return ParseOggPage(head, n, &page) && (page.flags & 2) != 0;
}

int32_t OggFacts(const char* path, int /*type*/, MediaFacts* facts) {
    try {
        return ReadOgg(path, facts);
    } catch (const std::bad_alloc&) {
        return MM_E_OUTOFMEMORY;
    }
}

}  // namespace metainfo
