// The walk of a Matroska file: the EBML header, then the Segment's elements
// up to the first Cluster, and those the SeekHead places after it.
#include "matroska/matroska_facts.h"

#include <cmath>
#include <new>
#include <string>
#include <vector>

#include "core/file_access.h"
#include "matroska/ebml.h"
#include "matroska/matroska_internal.h"
#include "metainfo/metainfo.h"

namespace metainfo {
namespace {

constexpr uint32_t kEbmlMagic = 0x1A45DFA3;
constexpr uint32_t kSegment = 0x18538067;
constexpr uint64_t kMaxBody = uint64_t{64} << 10;  // of SeekHead, Info, Tracks
constexpr uint64_t kMaxTags = uint64_t{1} << 20;  // of Tags and Cues
constexpr int kMaxTopElements = 4096;
constexpr int kMaxSeeks = 64;

struct Walk {
    int h = 0;
    uint64_t fileSize = 0;
    uint64_t segment = 0, segmentEnd = 0;  // the Segment's body
    std::vector<uint64_t> seen;  // level-1 elements read
    std::vector<uint64_t> seeks;  // places the SeekHead names
    uint64_t timecodeScale = 1000000;
    double duration = -1;
    bool haveInfo = false, haveTracks = false;
    std::string title;  // Info's own
    uint64_t lastTime = 0;  // timecode of the latest frame found without Duration
    bool haveLastTime = false;
    uint64_t firstCluster = 0, cueCluster = 0;  // file positions, 0 when none
    std::vector<uint64_t> trackNumbers;  // of facts->streams, in order
    std::string docType;
};

// The EBML header's DocType, when it is one of Matroska's.
bool DocType(const uint8_t* p, size_t n, size_t* headerEnd, std::string* docType) {
    EbmlElement e;
    if (!ParseEbmlHeader(p, n, &e) || e.id != kEbmlMagic || e.unknownSize || e.size > n - e.headerSize) return false;
    EbmlChildren children(p + e.headerSize, static_cast<size_t>(e.size));
    EbmlElement c;
    const uint8_t* body = nullptr;
    while (children.Next(&c, &body)) {
        if (c.id == 0x4282) *docType = std::string(reinterpret_cast<const char*>(body), c.size).c_str();
    }
    *headerEnd = e.headerSize + static_cast<size_t>(e.size);
    return *docType == "matroska" || *docType == "webm";
}

void ReadSeekHead(const std::vector<uint8_t>& b, Walk* w) {
    EbmlChildren seeks(b.data(), b.size());
    EbmlElement seek;
    const uint8_t* body = nullptr;
    while (seeks.Next(&seek, &body) && w->seeks.size() < kMaxSeeks) {
        if (seek.id != 0x4DBB) continue;
        EbmlChildren children(body, static_cast<size_t>(seek.size));
        EbmlElement e;
        const uint8_t* p = nullptr;
        uint64_t id = 0, position = UINT64_MAX;
        while (children.Next(&e, &p)) {
            if (e.id == 0x53AB) id = EbmlUnsigned(p, e.size);
            if (e.id == 0x53AC) position = EbmlUnsigned(p, e.size);
        }
        const bool wanted = id == kMkvInfo || id == kMkvTracks || id == kMkvTags || id == kMkvAttachments ||
                            id == kMkvCues || id == kMkvSeekHead;
        if (wanted && position < w->segmentEnd - w->segment) w->seeks.push_back(w->segment + position);
    }
}

void ReadInfo(const std::vector<uint8_t>& b, Walk* w) {
    EbmlChildren children(b.data(), b.size());
    EbmlElement e;
    const uint8_t* p = nullptr;
    w->haveInfo = true;
    while (children.Next(&e, &p)) {
        if (e.id == 0x2AD7B1 && EbmlUnsigned(p, e.size) != 0) w->timecodeScale = EbmlUnsigned(p, e.size);
        if (e.id == 0x4489) EbmlFloat(p, e.size, &w->duration);
        if (e.id == 0x7BA9) w->title = EbmlText(p, e.size);
    }
}

void LatestTime(uint64_t t, Walk* w) {
    if (!w->haveLastTime || t > w->lastTime) w->lastTime = t;
    w->haveLastTime = true;
}

// The CueClusterPosition of a CueTrackPositions.
uint64_t CueCluster(const uint8_t* body, size_t size) {
    EbmlChildren children(body, size);
    EbmlElement e;
    const uint8_t* p = nullptr;
    while (children.Next(&e, &p)) {
        if (e.id == 0xF1) return EbmlUnsigned(p, e.size);
    }
    return UINT64_MAX;
}

// The latest CueTime (a keyframe near the end) and where its Cluster lies.
void ReadCues(const std::vector<uint8_t>& b, Walk* w) {
    EbmlChildren points(b.data(), b.size());
    EbmlElement point;
    const uint8_t* body = nullptr;
    while (points.Next(&point, &body)) {
        EbmlChildren children(body, static_cast<size_t>(point.size));
        EbmlElement e;
        const uint8_t* p = nullptr;
        uint64_t time = 0, cluster = UINT64_MAX;
        while (point.id == 0xBB && children.Next(&e, &p)) {
            if (e.id == 0xB3) time = EbmlUnsigned(p, e.size);
            if (e.id == 0xB7) cluster = CueCluster(p, static_cast<size_t>(e.size));
        }
        if (point.id != 0xBB || (w->haveLastTime && time < w->lastTime)) continue;
        LatestTime(time, w);
        if (cluster < w->segmentEnd - w->segment) w->cueCluster = w->segment + cluster;
    }
}

// One level-1 element, once however often the walk and the SeekHead name it.
void ReadTopElement(const EbmlElement& e, uint64_t pos, Walk* w, MediaFacts* facts) {
    const bool known = e.id == kMkvSeekHead || e.id == kMkvInfo || e.id == kMkvTracks || e.id == kMkvTags ||
                       e.id == kMkvAttachments || e.id == kMkvCues;
    if (!known) return;
    for (uint64_t s : w->seen) {
        if (s == pos) return;
    }
    w->seen.push_back(pos);
    const uint64_t body = pos + e.headerSize;
    std::vector<uint8_t> b;
    if (e.id == kMkvAttachments) {
        MkvAttachmentsFacts(w->h, body, e.size, &facts->pictures);
        return;
    }
    const bool large = e.id == kMkvTags || e.id == kMkvCues;
    if (e.id == kMkvCues && w->duration >= 0) return;
    if (!EbmlReadBody(w->h, body, e.size, large ? kMaxTags : kMaxBody, &b)) return;
    if (e.id == kMkvSeekHead) ReadSeekHead(b, w);
    if (e.id == kMkvInfo) ReadInfo(b, w);
    if (e.id == kMkvTracks) {
        w->haveTracks = true;
        MkvTracksFacts(b.data(), b.size(), facts, &w->trackNumbers);
    }
    if (e.id == kMkvTags) MkvTagsFacts(b.data(), b.size(), &facts->tags);
    if (e.id == kMkvCues) ReadCues(b, w);
}

// Without Duration: the latest frame of the last Cluster, walking on from
// the Cluster of the latest cue (or the first Cluster).
void LastFrameTime(Walk* w) {
    const uint64_t from = w->cueCluster != 0 ? w->cueCluster : w->firstCluster;
    uint64_t ticks = 0;
    if (from != 0 && MkvLastFrameTime(w->h, from, w->segment, w->segmentEnd, &ticks)) LatestTime(ticks, w);
}

void Finish(const Walk& w, MediaFacts* facts) {
    const bool webm = w.docType == "webm";
    const bool video = facts->FirstStream(StreamFacts::kVideo) != nullptr;
    facts->format = webm ? "webm" : "matroska";
    facts->mime = std::string(video ? "video/" : "audio/") + (webm ? "webm" : "x-matroska");
    const double scale = static_cast<double>(w.timecodeScale) / 1000.0;  // µs per tick
    double us = -1;
    if (w.duration >= 0 && std::isfinite(w.duration)) {
        us = w.duration * scale;
        facts->durationExact = true;
    } else if (w.haveLastTime) {
        us = static_cast<double>(w.lastTime) * scale;
    }
    if (us >= 0 && us < 9.2e18) facts->durationUs = std::llround(us);
    if (facts->durationUs > 0) {
        facts->bitRate =
            static_cast<uint64_t>(static_cast<double>(w.fileSize) * 8e6 / static_cast<double>(facts->durationUs));
    }
    if (facts->tags.title.empty()) facts->tags.title = w.title;
}

int32_t ReadMatroska(const char* path, MediaFacts* facts) {
    Walk w;
    w.h = MEx_fopen(path, "rb");
    if (w.h == 0) return MM_E_FAIL;
    FileCloser closer(w.h);
    if (!OpenedFileSize(w.h, path, &w.fileSize)) return MM_E_FAIL;
    std::vector<uint8_t> head;
    size_t headerEnd = 0;
    if (!EbmlReadBody(w.h, 0, w.fileSize, 1024, &head) || !DocType(head.data(), head.size(), &headerEnd, &w.docType))
        return MM_E_FAIL;
    EbmlElement segment;
    const uint64_t end = UINT64_MAX;
    if (!EbmlHeaderAt(w.h, headerEnd, end, &segment) || segment.id != kSegment) return MM_E_FAIL;
    w.segment = headerEnd + segment.headerSize;
    w.segmentEnd = segment.unknownSize || w.segment + segment.size > w.fileSize ? w.fileSize : w.segment + segment.size;
    uint64_t pos = w.segment;
    EbmlElement e;
    for (int i = 0; i < kMaxTopElements && EbmlHeaderAt(w.h, pos, w.segmentEnd, &e); ++i) {
        if (e.id == kMkvCluster) {
            w.firstCluster = pos;
            break;
        }
        ReadTopElement(e, pos, &w, facts);
        if (e.unknownSize) break;  // no telling where the next one starts
        pos += e.headerSize + e.size;
    }
    for (size_t i = 0; i < w.seeks.size() && i < kMaxSeeks; ++i) {
        const uint64_t at = w.seeks[i];
        if (EbmlHeaderAt(w.h, at, w.segmentEnd, &e) && e.id != kMkvCluster) ReadTopElement(e, at, &w, facts);
    }
    if (!w.haveInfo && !w.haveTracks) return MM_E_FAIL;
    if (w.duration < 0) LastFrameTime(&w);
    if (w.firstCluster != 0) MkvFrameProfiles(w.h, w.firstCluster, w.segmentEnd, w.trackNumbers, facts);
    Finish(w, facts);
    return MM_OK;
}

}  // namespace

bool LooksLikeMatroska(const char* /*path*/, const uint8_t* head, size_t n) {
    size_t headerEnd = 0;
    std::string docType;
    return DocType(head, n, &headerEnd, &docType);
}

int32_t MatroskaFacts(const char* path, int /*type*/, MediaFacts* facts) {
    try {
        return ReadMatroska(path, facts);
    } catch (const std::bad_alloc&) {
        return MM_E_OUTOFMEMORY;
    }
}

}  // namespace metainfo
