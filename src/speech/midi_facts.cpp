#include "speech/midi_facts.h"

#include <algorithm>
#include <new>
#include <string>
#include <utility>
#include <vector>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/text.h"
#include "metainfo/metainfo.h"

namespace metainfo {
namespace {

// Every event must be walked for the play time: files past this are left
// to the MM_ answers.
constexpr uint64_t kMaxFile = uint64_t{4} << 20;
constexpr uint32_t kDefaultTempo = 500000;  // µs per quarter note
constexpr int kMaxChunks = 65536;

struct Song {
    uint16_t division = 0;
    std::vector<std::pair<uint64_t, uint32_t>> tempos;  // tick, µs per quarter note
    uint64_t lastTick = 0;
    bool firstTrack = true;
};

// A variable-length quantity: at most four bytes of seven bits.
bool Vlq(ByteReader* r, uint32_t* v) {
    *v = 0;
    for (int i = 0; i < 4; ++i) {
        uint8_t b = 0;
        if (!r->U8(&b)) return false;
        *v = *v << 7 | (b & 0x7Fu);
        if ((b & 0x80) == 0) return true;
    }
    return false;
}

void MetaEvent(uint8_t type, const uint8_t* p, uint32_t n, uint64_t tick, Song* song, MediaFacts* facts) {
    if (type == 0x51 && n == 3) song->tempos.emplace_back(tick, uint32_t{p[0]} << 16 | uint32_t{p[1]} << 8 | p[2]);
    // The first track's name names the sequence.
    if (type == 0x03 && song->firstTrack && facts->tags.title.empty()) facts->tags.title = TrimText(Utf8OrLatin1(p, n));
    if (type == 0x02 && n > 0) facts->tags.extra.emplace_back("copyright", TrimText(Utf8OrLatin1(p, n)));
}

// One track's events; the walk ends at End of Track or where the bytes do.
void WalkTrack(const uint8_t* p, size_t n, Song* song, MediaFacts* facts) {
    ByteReader r(p, n);
    uint64_t tick = 0;
    uint8_t running = 0;
    uint32_t delta = 0;
    while (Vlq(&r, &delta)) {
        tick += delta;
        uint8_t status = 0;
        if (!r.U8(&status)) break;
        if (status < 0x80) {
            // Running status: the byte was the first data byte.
            if (running == 0) break;
            r.Seek(r.position() - 1);
            status = running;
        }
        uint32_t length = 0;
        if (status == 0xFF) {
            uint8_t type = 0;
            if (!r.U8(&type) || !Vlq(&r, &length) || r.Peek(length) == nullptr) break;
            if (type == 0x2F) break;
            MetaEvent(type, r.Peek(length), length, tick, song, facts);
        } else if (status == 0xF0 || status == 0xF7) {
            if (!Vlq(&r, &length)) break;
        } else if (status >= 0xF0) {
            break;  // system messages other than SysEx do not stand in files
        } else {
            running = status;
            length = (status & 0xF0) == 0xC0 || (status & 0xF0) == 0xD0 ? 1 : 2;
        }
        if (!r.Skip(length)) break;
    }
    song->lastTick = std::max(song->lastTick, tick);
    song->firstTrack = false;
}

// Ticks to microseconds through the tempo changes of every track.
int64_t PlayTimeUs(Song* song) {
    if ((song->division & 0x8000) != 0) {
        // SMPTE: frames per second (29 stands for 29.97) times ticks per frame.
        const int fps = -static_cast<int8_t>(song->division >> 8);
        const double perSecond = (fps == 29 ? 29.97 : fps) * (song->division & 0xFF);
        return perSecond > 0 ? static_cast<int64_t>(static_cast<double>(song->lastTick) * 1e6 / perSecond) : -1;
    }
    if (song->division == 0) return -1;
    std::stable_sort(song->tempos.begin(), song->tempos.end(),
                     [](const auto& a, const auto& b) { return a.first < b.first; });
    double us = 0;
    uint64_t at = 0;
    uint32_t tempo = kDefaultTempo;
    for (const auto& change : song->tempos) {
        if (change.first >= song->lastTick) break;
        us += static_cast<double>(change.first - at) * tempo / song->division;
        at = change.first;
        tempo = change.second;
    }
    us += static_cast<double>(song->lastTick - at) * tempo / song->division;
    return static_cast<int64_t>(us);
}

int32_t ReadSong(const std::vector<uint8_t>& b, MediaFacts* facts) {
    ByteReader r(b.data(), b.size());
    uint32_t headerSize = 0;
    uint16_t format = 0, tracks = 0;
    Song song;
    if (!r.Tag("MThd", 4) || !r.Skip(4) || !r.BE32(&headerSize) || headerSize < 6 || !r.BE16(&format) ||
        !r.BE16(&tracks) || !r.BE16(&song.division) || !r.Skip(headerSize - 6))
        return MM_E_FAIL;
    for (int i = 0; i < kMaxChunks && r.remaining() >= 8; ++i) {
        const bool track = r.Tag("MTrk", 4);
        uint32_t size = 0;
        r.Skip(4);
        r.BE32(&size);
        const size_t inFile = std::min<size_t>(size, r.remaining());
        if (track) WalkTrack(r.Peek(inFile), inFile, &song, facts);
        r.Skip(inFile);
    }
    facts->format = "midi";
    facts->mime = "audio/midi";
    StreamFacts s;
    s.codec = "midi";
    facts->streams.push_back(s);
    facts->durationUs = PlayTimeUs(&song);
    facts->durationExact = facts->durationUs >= 0;
    return MM_OK;
}

}  // namespace

int32_t MidiFacts(const char* path, MediaFacts* facts) {
    const OpenedFile file(path);
    std::vector<uint8_t> b;
    try {
        if (!file.ok() || file.size() > kMaxFile ||
            !ReadExactAt(file.handle(), 0, static_cast<size_t>(file.size()), &b))
            return MM_E_FAIL;
        return ReadSong(b, facts);
    } catch (const std::bad_alloc&) {
        return MM_E_OUTOFMEMORY;
    }
}

}  // namespace metainfo
