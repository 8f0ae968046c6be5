// Profiles that only the frames of a stream state (VP8, VP9), from the
// first blocks of the first Cluster.
#include <string>
#include <vector>

#include "matroska/ebml.h"
#include "matroska/matroska_internal.h"

namespace metainfo {
namespace {

constexpr int kMaxBlocks = 64;
constexpr size_t kFrameHead = 16;

// The track number and the first frame byte of a Block or SimpleBlock body.
bool FrameStart(const uint8_t* p, size_t n, uint64_t* track, uint8_t* first) {
    size_t len = 1;
    while (n > 0 && len <= 8 && (p[0] & (0x80u >> (len - 1))) == 0) ++len;
    if (n == 0 || len > 8 || n < len + 4) return false;  // number, time (2), flags (1), a frame byte
    *track = p[0] & (0xFFu >> len);
    for (size_t i = 1; i < len; ++i) *track = *track << 8 | p[i];
    *first = p[len + 3];
    return true;
}

void FrameProfile(uint8_t first, StreamFacts* s) {
    if (s->codec == "vp9" && (first >> 6) == 2) {
        // frame marker, then the profile's low and high bits
        s->profile = std::string("Profile ") + char('0' + (((first >> 4) & 1) << 1 | ((first >> 5) & 1)));
    } else if (s->codec == "vp8") {
        s->profile = std::string(1, char('0' + ((first >> 1) & 7)));
    }
}

}  // namespace

void MkvFrameProfiles(int h, uint64_t pos, uint64_t end, const std::vector<uint64_t>& numbers, MediaFacts* facts) {
    size_t wanted = 0;
    for (const StreamFacts& s : facts->streams) wanted += (s.codec == "vp8" || s.codec == "vp9") && s.profile.empty();
    EbmlElement e;
    if (wanted == 0 || numbers.size() != facts->streams.size() || !EbmlHeaderAt(h, pos, end, &e)) return;
    std::vector<uint8_t> b;
    uint64_t at = pos + e.headerSize;
    const uint64_t stop = at + e.size;
    for (int i = 0; i < kMaxBlocks && wanted > 0 && EbmlHeaderAt(h, at, stop, &e); ++i) {
        const uint64_t body = at + e.headerSize;
        at = body + e.size;
        if (e.id == kMkvCluster) break;
        if (e.id != 0xA3 && e.id != 0xA0) continue;
        if (!EbmlReadBody(h, body, e.size, kFrameHead, &b)) break;
        size_t skip = 0;
        EbmlElement block;
        if (e.id == 0xA0) {
            if (!ParseEbmlHeader(b.data(), b.size(), &block) || block.id != 0xA1) continue;
            skip = block.headerSize;
        }
        uint64_t track = 0;
        uint8_t first = 0;
        if (!FrameStart(b.data() + skip, b.size() - skip, &track, &first)) continue;
        for (size_t k = 0; k < numbers.size(); ++k) {
            StreamFacts& s = facts->streams[k];
            if (numbers[k] != track || !s.profile.empty() || (s.codec != "vp8" && s.codec != "vp9")) continue;
            FrameProfile(first, &s);
            if (wanted > 0) --wanted;
        }
    }
}

}  // namespace metainfo
