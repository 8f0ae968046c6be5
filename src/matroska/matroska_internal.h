// What the Matroska reader gathers from the elements before the first
// Cluster, and the readers of the metadata elements into it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "core/facts.h"

namespace metainfo {

// Level-1 element IDs of a Segment.
constexpr uint32_t kMkvSeekHead = 0x114D9B74;
constexpr uint32_t kMkvInfo = 0x1549A966;
constexpr uint32_t kMkvTracks = 0x1654AE6B;
constexpr uint32_t kMkvTags = 0x1254C367;
constexpr uint32_t kMkvAttachments = 0x1941A469;
constexpr uint32_t kMkvCues = 0x1C53BB6B;
constexpr uint32_t kMkvCluster = 0x1F43B675;

// The bodies of Tracks and Tags (in memory) into facts; numbers gets the
// TrackNumber of each stream added.
void MkvTracksFacts(const uint8_t* body, size_t size, MediaFacts* facts, std::vector<uint64_t>* numbers);
void MkvTagsFacts(const uint8_t* body, size_t size, TagFacts* tags);

// The AttachedFile elements of the Attachments body at pos (size bytes):
// pictures with where their bytes lie, read from the file one header at a time.
void MkvAttachmentsFacts(int h, uint64_t pos, uint64_t size, std::vector<PictureFacts>* pictures);

// The timecode (in TimecodeScale ticks) of the latest block of the last
// Cluster, walking on from the element at from (a Cluster) to end.
bool MkvLastFrameTime(int h, uint64_t from, uint64_t segment, uint64_t end, uint64_t* ticks);

// VP8 and VP9 state their profile in each frame only: the first frame of
// each such stream without one, among the first blocks of the Cluster at pos.
void MkvFrameProfiles(int h, uint64_t pos, uint64_t end, const std::vector<uint64_t>& numbers, MediaFacts* facts);

}  // namespace metainfo
