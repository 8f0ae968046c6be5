// Profiles and levels from the decoder configuration records that MP4 boxes
// and Matroska's CodecPrivate hold alike, in ffprobe's names.
#pragma once

#include <cstddef>
#include <cstdint>

#include "core/facts.h"
#include "mp4/mp4_internal.h"

namespace metainfo {

// avcC, hvcC and av1C record bodies; each needs only its first bytes.
void AvcRecordFacts(const uint8_t* p, size_t n, StreamFacts* s);
void HevcRecordFacts(const uint8_t* p, size_t n, StreamFacts* s);
void Av1RecordFacts(const uint8_t* p, size_t n, StreamFacts* s);

// MPEG-4 Visual: a visual object sequence start code carries profile and level.
void Mpeg4VisualFacts(const uint8_t* p, size_t n, StreamFacts* s);

// The AAC profile an AudioSpecificConfig states, with SBR and PS as signalled;
// null for an object type without a name.
const char* AacProfileName(const mp4AudioSpecificConfig& asc);

}  // namespace metainfo
