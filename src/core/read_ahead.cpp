#include "core/read_ahead.h"

#include <cstring>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "metainfo/records.h"

namespace metainfo {
namespace {

// Past these the later queries read in pieces anyway, and what a file over
// 1 MiB costs stays within 64 KiB plus its tags.
constexpr size_t kBoxAhead = size_t{32} * 1024;
constexpr size_t kTagAhead = size_t{64} * 1024;
// The frames the clip and codec walks of an AAC or AMR file read from its start.
constexpr size_t kAacAhead = size_t{16} * 1024;
constexpr size_t kAmrAhead = size_t{32} * 1024;
// Top-level boxes or chunks looked at before giving up on finding the index.
constexpr int kMaxTopLevel = 16;
// Box headers looked at inside a large movie box, and how deep.
constexpr int kMaxBoxHeaders = 64;
constexpr int kMaxBoxDepth = 6;
// A box the walks read whole, or the part of a larger one they read first.
constexpr size_t kSmallBox = 4096;

size_t Capped(uint64_t size, size_t cap) { return size < cap ? static_cast<size_t>(size) : cap; }

// Boxes the walks descend into; a "meta" box has a version and flags first.
bool IsContainer(const uint8_t* type) {
    static const char* const kContainers[] = {"trak", "mdia", "minf", "stbl", "edts", "udta", "meta", "dinf"};
    for (const char* c : kContainers) {
        if (BytesEqual(type, c, 4)) return true;
    }
    return false;
}

struct BoxHead {
    uint64_t size = 0;
    uint64_t header = 8;
    uint8_t type[4] = {};
};

// The header of the box at pos; false when it cannot be read or the box
// declares less than its header.
bool ReadBoxHead(int h, uint64_t pos, BoxHead* box) {
    uint8_t b[16] = {};
    if (ReadSomeAt(h, pos, b, sizeof b) < 8) return false;
    box->size = ReadBE32(b);
    box->header = 8;
    if (box->size == 1) {
        box->size = ReadBE64(b + 8);
        box->header = 16;
    }
    std::memcpy(box->type, b + 4, sizeof box->type);
    return box->size >= box->header;
}

// The boxes in [pos, end), and their children, as the walks visit them: each
// header (reading one brings in the bytes after it) and the whole of each
// small box, which the walks read whole. At most *budget boxes.
void WalkBoxesAhead(int h, uint64_t pos, uint64_t end, int depth, int* budget) {
    BoxHead box;
    while (end - pos >= 8 && *budget > 0) {
        --*budget;
        if (!ReadBoxHead(h, pos, &box) || box.size > end - pos) return;
        if (!IsContainer(box.type)) {
            ReadAhead(h, pos, Capped(box.size, kSmallBox), kSmallBox);
        } else if (depth < kMaxBoxDepth) {
            const uint64_t first = pos + box.header + (BytesEqual(box.type, "meta", 4) ? 4 : 0);
            if (first <= pos + box.size) WalkBoxesAhead(h, first, pos + box.size, depth + 1, budget);
        }
        pos += box.size;
    }
}

// The movie box, wherever it lies: the clip, tag and codec walks all start
// there. A small one is read whole with the next box's header, which the walks
// look at too; a large one (long sample tables) box by box.
void MoovAhead(int h) {
    uint64_t pos = 0;
    BoxHead box;
    for (int i = 0; i < kMaxTopLevel; ++i) {
        // A size of 0 (to the end of the file) has nothing after it.
        if (!ReadBoxHead(h, pos, &box) || box.size > UINT64_MAX - pos - 16) return;
        if (BytesEqual(box.type, "moov", 4)) {
            if (box.size + 16 <= kBoxAhead) {
                ReadAhead(h, pos, static_cast<size_t>(box.size + 16));
            } else {
                int budget = kMaxBoxHeaders;
                WalkBoxesAhead(h, pos + box.header, pos + box.size, 0, &budget);
                ReadAhead(h, pos + box.size, 16);
            }
            return;
        }
        pos += box.size;
    }
}

// The header list in full, and the start of the index after the movie data
// (reading a chunk's header brings in the bytes after it).
void AviAhead(int h) {
    uint64_t pos = 12;
    for (int i = 0; i < kMaxTopLevel; ++i) {
        uint8_t b[12] = {};
        if (ReadSomeAt(h, pos, b, sizeof b) < 8) return;
        const uint64_t size = ReadLE32(b + 4);
        if (BytesEqual(b, "LIST", 4) && BytesEqual(b + 8, "hdrl", 4)) ReadAhead(h, pos, Capped(size + 8, kBoxAhead));
        if (BytesEqual(b, "idx1", 4)) return;
        pos += 8 + size + (size & 1);
    }
}

// An ID3v2 tag at the start, when it is small enough to read whole.
void Id3Ahead(int h, const uint8_t* head, size_t n) {
    if (n < 10 || !BytesEqual(head, "ID3", 3)) return;
    const uint64_t end = uint64_t{10} + ReadSyncsafe32(head + 6) + ((head[5] & 0x10) != 0 ? 10 : 0);
    if (end <= kTagAhead) ReadAhead(h, 0, static_cast<size_t>(end));
}

}  // namespace

void ReadAheadForType(int h, int type, const uint8_t* head, size_t n) {
    if (!CanReadAhead(h)) return;
    switch (type) {
        case MEDIA_TYPE_MP4: MoovAhead(h); return;
        case MEDIA_TYPE_AVI: AviAhead(h); return;
        case MEDIA_TYPE_MP3: Id3Ahead(h, head, n); return;
        case MEDIA_TYPE_AAC: ReadAhead(h, 0, kAacAhead); return;
        case MEDIA_TYPE_AMR_NB:
        case MEDIA_TYPE_AMR_WB: ReadAhead(h, 0, kAmrAhead); return;
        default: return;
    }
}

}  // namespace metainfo
