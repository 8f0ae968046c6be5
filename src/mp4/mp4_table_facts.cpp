// Track tables the accurate reader needs beside the sample sizes: the edit
// list (what of the media is presented) and the decoding times (how many
// samples over how long).
#include <cstdio>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "mp4/mp4_internal.h"
#include "mp4/mp4_truth.h"

namespace metainfo {
namespace {

// The version/flags word and entry count of a table at start; false when the
// box cannot hold them.
bool TableHead(int h, int64_t start, uint32_t size, uint8_t* version, uint32_t* count) {
    if (BytesHeld(start, size) < 16) return false;
    uint8_t head[8] = {};
    SeekTo(h, start + 8);
    if (MEx_fread(head, 1, sizeof head, h) != static_cast<int>(sizeof head)) return false;
    *version = head[0];
    *count = ReadBE32(head + 4);
    return true;
}

}  // namespace

void EditListFacts(int h, int64_t start, uint32_t size, Mp4TrackTruth* track) {
    if (track == nullptr) return;
    SeekTo(h, start + 8);
    WalkChildren(h, start + size, [&](uint32_t type, int64_t at, uint32_t elstSize) {
        uint8_t version = 0;
        uint32_t count = 0;
        if (type != FourCC("elst") || !TableHead(h, at, elstSize, &version, &count)) return;
        const uint64_t entrySize = version == 1 ? 20 : 12;
        const uint64_t held = (BytesHeld(at, elstSize) - 16) / entrySize;
        uint64_t total = 0;
        for (uint64_t i = 0; i < count && i < held; ++i) {
            uint8_t entry[20] = {};
            if (MEx_fread(entry, 1, static_cast<unsigned>(entrySize), h) != static_cast<int>(entrySize)) break;
            total += version == 1 ? ReadBE64(entry) : ReadBE32(entry);
        }
        track->hasEdit = true;
        track->editDuration = total;
    });
}

void SttsFacts(int h, int64_t start, uint32_t size, Mp4TrackTruth* track) {
    uint8_t version = 0;
    uint32_t count = 0;
    if (!TableHead(h, start, size, &version, &count)) return;
    uint64_t left = (BytesHeld(start, size) - 16) / 8;
    if (count < left) left = count;
    uint64_t samples = 0, duration = 0;
    uint8_t block[8 * 1024];
    while (left > 0) {
        const uint64_t want = left < sizeof block / 8 ? left : sizeof block / 8;
        const int got = MEx_fread(block, 1, static_cast<unsigned>(want * 8), h);
        const uint64_t entries = got > 0 ? static_cast<uint64_t>(got) / 8 : 0;
        for (uint64_t i = 0; i < entries; ++i) {
            const uint32_t n = ReadBE32(block + 8 * i);
            samples += n;
            duration += uint64_t(n) * ReadBE32(block + 8 * i + 4);
        }
        left -= entries;
        if (entries < want) break;
    }
    track->sampleCount = samples;
    track->sttsDuration = duration;
}

void ChunkOffsetFacts(int h, int64_t start, uint32_t size, bool wide, Mp4TrackTruth* track) {
    uint8_t version = 0;
    uint32_t count = 0;
    uint8_t first[8] = {};
    const uint64_t need = wide ? 8 : 4;
    if (!TableHead(h, start, size, &version, &count) || count == 0 || BytesHeld(start, size) < 16 + need) return;
    if (MEx_fread(first, 1, static_cast<unsigned>(need), h) != static_cast<int>(need)) return;
    track->firstChunk = wide ? ReadBE64(first) : ReadBE32(first);
}

}  // namespace metainfo
