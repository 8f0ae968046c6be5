// Fragmented MP4 (DASH segments, recordings written as they went): the movie
// header states no length, the fragments hold the samples. The length comes
// from the last fragment, which the random access box at the end names, or
// from the segment index at the start; no fragment between is read.
#include <new>
#include <vector>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "mp4/mp4_internal.h"
#include "mp4/mp4_truth.h"

namespace metainfo {
namespace {

constexpr uint64_t kMaxIndexBox = uint64_t{1} << 20;  // sidx, mfra, moof read whole up to this
constexpr int kMaxTopBoxes = 64;  // looked at for a sidx before the first fragment
constexpr uint32_t kMaxBoxes = 4096;  // children walked in one box

// A box's type and where its body lies in b; false past the end.
struct Child {
    uint32_t type = 0;
    size_t body = 0, end = 0;
};

bool NextChild(const std::vector<uint8_t>& b, size_t* at, size_t end, Child* c) {
    if (end - *at < 8) return false;
    uint64_t size = ReadBE32(b.data() + *at);
    size_t header = 8;
    if (size == 1) {
        if (end - *at < 16) return false;
        size = ReadBE64(b.data() + *at + 8);
        header = 16;
    } else if (size == 0) {
        size = end - *at;
    }
    if (size < header || size > end - *at) return false;
    c->type = ReadBE32(b.data() + *at + 4);
    c->body = *at + header;
    c->end = *at + static_cast<size_t>(size);
    *at = c->end;
    return true;
}

// The top-level box at pos: its type and size; false when none is whole.
bool TopBox(int h, uint64_t pos, uint64_t fileSize, uint32_t* type, uint64_t* size) {
    uint8_t head[16];
    if (fileSize - pos < 8 || ReadSomeAt(h, pos, head, sizeof head) < 8) return false;
    *type = ReadBE32(head + 4);
    *size = ReadBE32(head);
    if (*size == 1) *size = fileSize - pos >= 16 ? ReadBE64(head + 8) : 0;
    if (*size == 0) *size = fileSize - pos;
    return *size >= 8 && *size <= fileSize - pos;
}

bool ReadBox(int h, uint64_t pos, uint64_t size, std::vector<uint8_t>* b) {
    return size <= kMaxIndexBox && ReadExactAt(h, pos, static_cast<size_t>(size), b);
}

// The segment index: its references' durations summed.
int64_t SidxUs(const std::vector<uint8_t>& b) {
    ByteReader r(b.data(), b.size());
    uint8_t version = 0;
    uint32_t timescale = 0;
    uint16_t count = 0;
    if (!r.Skip(8) || !r.U8(&version) || !r.Skip(3 + 4) || !r.BE32(&timescale) || timescale == 0 ||
        !r.Skip(version == 0 ? 8 : 16) || !r.Skip(2) || !r.BE16(&count))
        return -1;
    uint64_t total = 0;
    for (uint16_t i = 0; i < count; ++i) {
        uint32_t size = 0, duration = 0, sap = 0;
        if (!r.BE32(&size) || !r.BE32(&duration) || !r.BE32(&sap)) return -1;
        total += duration;
    }
    return Micros(total, timescale);
}

struct LastFragment {
    uint32_t trackId = 0;
    uint64_t time = 0, moof = 0;
};

// The latest entry of each track's random access table.
std::vector<LastFragment> ReadMfra(const std::vector<uint8_t>& b) {
    std::vector<LastFragment> out;
    size_t at = 8;
    Child c;
    for (uint32_t n = 0; n < kMaxBoxes && NextChild(b, &at, b.size(), &c); ++n) {
        if (c.type != FourCC("tfra")) continue;
        ByteReader r(b.data() + c.body, c.end - c.body);
        uint8_t version = 0;
        uint32_t sizes = 0, entries = 0;
        LastFragment last;
        if (!r.U8(&version) || !r.Skip(3) || !r.BE32(&last.trackId) || !r.BE32(&sizes) || !r.BE32(&entries)) continue;
        // traf, trun and sample numbers, each 1 to 4 bytes.
        const size_t numbers = ((sizes >> 4) & 3) + ((sizes >> 2) & 3) + (sizes & 3) + 3;
        bool found = false;
        for (uint32_t i = 0; i < entries; ++i) {
            uint64_t time = 0, moof = 0;
            uint32_t t32 = 0, m32 = 0;
            const bool ok = version == 1 ? r.BE64(&time) && r.BE64(&moof) : r.BE32(&t32) && r.BE32(&m32);
            if (!ok || !r.Skip(numbers)) break;
            if (version != 1) time = t32, moof = m32;
            if (!found || time >= last.time) last.time = time, last.moof = moof, found = true;
        }
        if (found) out.push_back(last);
    }
    return out;
}

// Ticks from the start of the track to the end of the fragment's run of
// samples; 0 when the fragment does not say.
uint64_t FragmentEnd(const std::vector<uint8_t>& b, uint32_t trackId, uint64_t startTime) {
    size_t at = 8;
    Child traf;
    for (uint32_t n = 0; n < kMaxBoxes && NextChild(b, &at, b.size(), &traf); ++n) {
        if (traf.type != FourCC("traf")) continue;
        uint64_t base = startTime, sum = 0;
        uint32_t defaultDuration = 0, id = 0;
        bool mine = false, counted = false;
        size_t in = traf.body;
        Child c;
        for (uint32_t m = 0; m < kMaxBoxes && NextChild(b, &in, traf.end, &c); ++m) {
            ByteReader r(b.data() + c.body, c.end - c.body);
            uint32_t flags = 0;
            if (!r.BE32(&flags)) continue;
            const uint8_t version = static_cast<uint8_t>(flags >> 24);
            if (c.type == FourCC("tfhd") && r.BE32(&id)) {
                mine = id == trackId;
                // Base data offset, sample description index: then the duration.
                if (r.Skip(((flags & 1) != 0 ? 8u : 0u) + ((flags & 2) != 0 ? 4u : 0u)) && (flags & 8) != 0)
                    r.BE32(&defaultDuration);
            } else if (c.type == FourCC("tfdt")) {
                uint32_t t32 = 0;
                if (version == 1) r.BE64(&base);
                if (version != 1 && r.BE32(&t32)) base = t32;
            } else if (c.type == FourCC("trun")) {
                uint32_t count = 0;
                if (!r.BE32(&count) || !r.Skip(((flags & 1) != 0 ? 4u : 0u) + ((flags & 4) != 0 ? 4u : 0u))) continue;
                // Per sample: duration, size, flags, composition offset, as flagged.
                const size_t others = ((flags & 0x200) != 0 ? 4u : 0u) + ((flags & 0x400) != 0 ? 4u : 0u) +
                                      ((flags & 0x800) != 0 ? 4u : 0u);
                for (uint32_t i = 0; i < count; ++i) {
                    uint32_t d = defaultDuration;
                    if ((flags & 0x100) != 0 && !r.BE32(&d)) break;
                    if (!r.Skip(others)) break;
                    sum += d;
                }
                counted = true;
            }
        }
        if (mine && counted && sum != 0) return base + sum;
    }
    return 0;
}

uint32_t TimescaleOf(const Mp4Truth& truth, uint32_t trackId) {
    for (const Mp4TrackTruth& t : truth.tracks) {
        if (t.trackId == trackId) return t.timescale;
    }
    return truth.tracks.size() == 1 ? truth.tracks[0].timescale : 0;
}

// The random access box, found through the "mfro" that ends the file.
int64_t MfraUs(int h, uint64_t fileSize, const Mp4Truth& truth) {
    uint8_t tail[16];
    if (fileSize < 16 || ReadSomeAt(h, fileSize - 16, tail, sizeof tail) != 16 || ReadBE32(tail + 4) != FourCC("mfro"))
        return -1;
    const uint64_t mfraSize = ReadBE32(tail + 12);
    std::vector<uint8_t> b, moof;
    if (mfraSize < 16 || mfraSize > fileSize || !ReadBox(h, fileSize - mfraSize, mfraSize, &b) ||
        ReadBE32(b.data() + 4) != FourCC("mfra"))
        return -1;
    int64_t longest = -1;
    for (const LastFragment& last : ReadMfra(b)) {
        uint32_t type = 0;
        uint64_t size = 0;
        const uint32_t timescale = TimescaleOf(truth, last.trackId);
        if (timescale == 0 || last.moof >= fileSize || !TopBox(h, last.moof, fileSize, &type, &size) ||
            type != FourCC("moof") || !ReadBox(h, last.moof, size, &moof))
            continue;
        const uint64_t end = FragmentEnd(moof, last.trackId, last.time);
        const int64_t us = Micros(end, timescale);
        if (end != 0 && us > longest) longest = us;
    }
    return longest;
}

}  // namespace

int64_t FragmentedDurationUs(const char* path, uint64_t fileSize, const Mp4Truth& truth) {
    const int h = MEx_fopen(path, "rb");
    if (h == 0) return -1;
    FileCloser closer(h);
    try {
        // The last fragment covers every track; an index, often only the first.
        const int64_t us = MfraUs(h, fileSize, truth);
        if (us >= 0) return us;
        uint64_t pos = 0, size = 0;
        uint32_t type = 0;
        std::vector<uint8_t> b;
        for (int i = 0; i < kMaxTopBoxes && TopBox(h, pos, fileSize, &type, &size); ++i, pos += size) {
            if (type == FourCC("moof") || type == FourCC("mdat")) break;
            if (type == FourCC("sidx") && ReadBox(h, pos, size, &b)) return SidxUs(b);
        }
        return -1;
    } catch (const std::bad_alloc&) {
        return -1;
    }
}

}  // namespace metainfo
