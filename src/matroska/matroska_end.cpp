// Where the last frame of a Matroska file lies when Info states no
// Duration: the last Cluster, reached by hopping over Cluster sizes (from the
// latest one the Cues name) or, where a Cluster's size is unknown, looked for
// backwards from the end; then its blocks one header at a time. A Segment over
// 1 MiB is only looked at in its last 60 KiB (64 KiB with the file's first
// 4 KiB): hopping over its Clusters would read a header per Cluster all through
// the file. Without a Cluster there, the latest cue's time stands, or none.
#include <vector>

#include "matroska/ebml.h"
#include "matroska/matroska_internal.h"

namespace metainfo {
namespace {

constexpr int kMaxHops = 1 << 16;
constexpr int kMaxBlocks = 1 << 16;
constexpr int kMaxTailBlocks = 16;
constexpr uint64_t kTailBlock = uint64_t{64} << 10;
constexpr uint64_t kLargeSegment = uint64_t{1} << 20;
constexpr uint64_t kLargeTail = uint64_t{60} << 10;
constexpr size_t kBlockHead = 32;

// The relative timecode of a Block or SimpleBlock: after its track number.
bool BlockTime(const uint8_t* p, size_t n, int64_t* t) {
    size_t len = 1;
    while (n > 0 && len <= 8 && (p[0] & (0x80u >> (len - 1))) == 0) ++len;
    if (n == 0 || len > 8 || n < len + 2) return false;
    *t = static_cast<int16_t>(static_cast<uint16_t>(p[len] << 8 | p[len + 1]));
    return true;
}

// The time of a SimpleBlock, or of a BlockGroup's Block (its first child),
// from the first bytes of the element's body.
bool FrameTime(uint32_t id, const std::vector<uint8_t>& b, int64_t* t) {
    if (id == 0xA3) return BlockTime(b.data(), b.size(), t);
    EbmlElement block;
    return ParseEbmlHeader(b.data(), b.size(), &block) && block.id == 0xA1 &&
           BlockTime(b.data() + block.headerSize, b.size() - block.headerSize, t);
}

// The latest block time of the Cluster at pos; where a Cluster of unknown
// size runs into the next one, that one is read on. False when pos holds no
// Cluster with a Timecode.
bool LastBlockTime(int h, uint64_t pos, uint64_t end, uint64_t* ticks) {
    EbmlElement e;
    if (!EbmlHeaderAt(h, pos, end, &e) || e.id != kMkvCluster) return false;
    bool haveTimecode = false;
    uint64_t timecode = 0;
    int64_t latest = 0;
    std::vector<uint8_t> b;
    uint64_t at = pos + e.headerSize;
    for (int i = 0; i < kMaxBlocks && EbmlHeaderAt(h, at, end, &e); ++i) {
        const uint64_t body = at + e.headerSize;
        at = body + e.size;
        if (e.id == kMkvCluster) {
            if (haveTimecode) *ticks = timecode + static_cast<uint64_t>(latest > 0 ? latest : 0);
            haveTimecode = false;
            latest = 0;
            at = body;  // into the next Cluster
            continue;
        }
        if (e.id != 0xE7 && e.id != 0xA3 && e.id != 0xA0) continue;
        if (!EbmlReadBody(h, body, e.size, kBlockHead, &b)) break;
        int64_t t = 0;
        if (e.id == 0xE7) {
            timecode = EbmlUnsigned(b.data(), b.size());
            haveTimecode = true;
        } else if (FrameTime(e.id, b, &t) && t > latest) {
            latest = t;
        }
    }
    if (!haveTimecode) return false;
    *ticks = timecode + static_cast<uint64_t>(latest > 0 ? latest : 0);
    return true;
}

// The last Cluster ID in the last blocks (at most maxBlocks) that reads as one.
bool TailClusterTime(int h, uint64_t segment, uint64_t end, uint64_t blockSize, int maxBlocks, uint64_t* ticks) {
    std::vector<uint8_t> block;
    uint64_t blockEnd = end;
    for (int i = 0; i < maxBlocks && blockEnd > segment; ++i) {
        const uint64_t start = blockEnd - segment > blockSize ? blockEnd - blockSize : segment;
        if (!EbmlReadBody(h, start, blockEnd - start, blockSize, &block) || block.size() < 4) return false;
        for (size_t at = block.size() - 3; at-- > 0;) {
            const bool id =
                block[at] == 0x1F && block[at + 1] == 0x43 && block[at + 2] == 0xB6 && block[at + 3] == 0x75;
            if (id && LastBlockTime(h, start + at, end, ticks)) return true;
        }
        // Three bytes of overlap, so an ID across two blocks is seen.
        blockEnd = start > segment ? start + 3 : segment;
    }
    return false;
}

}  // namespace

bool MkvLastFrameTime(int h, uint64_t from, uint64_t segment, uint64_t end, uint64_t* ticks) {
    if (end - segment > kLargeSegment) return TailClusterTime(h, segment, end, kLargeTail, 1, ticks);
    uint64_t last = 0, pos = from;
    bool found = false, open = false;
    EbmlElement e;
    for (int i = 0; i < kMaxHops && EbmlHeaderAt(h, pos, end, &e); ++i) {
        if (e.id == kMkvCluster) {
            last = pos;
            found = true;
        }
        if (e.unknownSize) {
            open = true;
            break;
        }
        pos += e.headerSize + e.size;
    }
    if (open && TailClusterTime(h, segment, end, kTailBlock, kMaxTailBlocks, ticks)) return true;
    return found && LastBlockTime(h, last, end, ticks);
}

}  // namespace metainfo
