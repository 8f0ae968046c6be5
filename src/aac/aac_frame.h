// ADTS frame headers and the AAC acceptance test used by detection.
#pragma once

#include <cstdint>

namespace metainfo {

// aac_frame_length of an ADTS header (at most 4096), 0xFFFFFFFF for a null
// pointer or a longer frame, MM_E_FAIL without a sync word. *frameKind gets
// the profile bits and the MPEG ID bit. Callers take a result that is not
// above zero, as a signed value, as "no frame".
uint32_t AACGetFrameSize(const uint8_t* header, uint32_t* frameKind);

// True where an ADTS sync word (FF, then a byte with high nibble F) starts.
inline bool IsADTSSync(const uint8_t* p) { return p[0] == 0xFF && (p[1] & 0xF0) == 0xF0; }

// Size of a leading ID3v2 tag as the AAC readers skip it: header (and footer)
// included, or 0 when the probe does not start with a tag of non-zero size.
uint32_t AACLeadingTagSkip(const uint8_t* probe);

// 0 when the file holds ADIF or two consecutive matching ADTS frames near the
// start of the data after a leading ID3v2 tag; MM_E_UNSUPPORTED when not.
int32_t VerifyAAC(int h, const uint8_t* probe);

}  // namespace metainfo
