// What the accurate reader gathers from the same box walk as the clip
// information: exact times, every track's sample entry, edit lists and the
// item list, kept beside the MM_ record (which the walk fills as ever).
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "core/facts.h"

namespace metainfo {

struct Mp4TrackTruth {
    uint32_t handler = 0;
    uint32_t trackId = 0;  // "tkhd"
    uint32_t timescale = 0;  // "mdhd"
    uint64_t duration = 0;
    bool hasEdit = false;
    uint64_t editDuration = 0;  // movie timescale, empty edits included
    uint32_t tkhdWidth = 0, tkhdHeight = 0;
    uint64_t sampleCount = 0;  // "stts"
    uint64_t sttsDuration = 0;
    uint64_t sampleBytes = 0;  // "stsz"
    bool bytesKnown = false;
    uint64_t firstChunk = 0;  // "stco" / "co64": where the first sample lies
    bool hasEntry = false;
    uint64_t declaredBitrate = 0;  // a codec box that states the rate outright
    StreamFacts stream;
};

struct Mp4Truth {
    uint32_t majorBrand = 0;
    std::vector<uint32_t> brands;
    uint32_t movieTimescale = 0;
    uint64_t movieDuration = 0;
    bool fragmented = false;  // "mvex": samples in movie fragments
    std::vector<Mp4TrackTruth> tracks;
    TagFacts tags;
    std::vector<PictureFacts> pictures;

    Mp4TrackTruth* Track() { return tracks.empty() ? nullptr : &tracks.back(); }
};

// The first sample entry of a track (its box bytes; avail runs to the end of
// "stsd") into the track's stream facts.
void SampleEntryFacts(const uint8_t* entry, size_t avail, Mp4TrackTruth* track);

// Tables of a track read at the current position of the walk (a box of the
// given size at start).
void EditListFacts(int h, int64_t start, uint32_t size, Mp4TrackTruth* track);
void SttsFacts(int h, int64_t start, uint32_t size, Mp4TrackTruth* track);
void ChunkOffsetFacts(int h, int64_t start, uint32_t size, bool wide, Mp4TrackTruth* track);

// "meta" (its "ilst") and "udta" (its "meta" and 3GPP text boxes) into tags
// and pictures.
void MetaFacts(int h, int64_t start, uint32_t size, Mp4Truth* truth);
void UdtaFacts(int h, int64_t start, uint32_t size, Mp4Truth* truth);

// Ticks of a timescale in microseconds, rounded; -1 past a hundred years or
// without a timescale.
int64_t Micros(uint64_t ticks, uint32_t timescale);

// A fragmented file's play time in µs, from the last fragment its random
// access box ("mfra") names or from its segment index ("sidx"); -1 when
// neither tells.
int64_t FragmentedDurationUs(const char* path, uint64_t fileSize, const Mp4Truth& truth);

}  // namespace metainfo
