// ASF metadata objects: Content Description, Content Branding, Extended
// Content Description, and the Metadata and Metadata Library Objects of the
// Header Extension.
#pragma once

#include <cstdint>

#include "metainfo/records.h"

namespace metainfo {

// Pictures up to this size are read whenever the allowance is non-zero.
constexpr uint32_t kAsfPictureCeiling = 0x80000;

// 0, or -1 for a null record.
int32_t ASF_InitMetaInfo(_MMMetaInfo* meta);

// Each starts with the file just after the object's GUID (ASF_ParseMetaDataObj:
// just after the object's size). 0, or -1 on a short read, a failed seek or a
// broken descriptor; the branding object also MM_E_OUTOFMEMORY.
int32_t ASF_ParseContentDescriptionObj(int h, _MMMetaInfo* meta);
int32_t ASF_ParseContentBrandingObj(int h, _MMMetaInfo* meta, uint32_t allowance);
int32_t ASF_ParseExtContentDescriptionObj(int h, _MMMetaInfo* meta, uint32_t allowance);
int32_t ASF_ParseHdrExtensionObj(int h, _MMMetaInfo* meta, uint32_t allowance);
int32_t ASF_ParseMetaDataObj(int h, _MMMetaInfo* meta, uint32_t allowance);

// A whole WM/Picture value held in memory: 0, or MM_E_OUTOFMEMORY.
int32_t ASF_ParseWMPicturObj(const uint8_t* value, _MMMetaInfo* meta, uint32_t length, uint32_t allowance);

// Rating word from the Content Description's Rating text (rewritten in place).
void ASF_ConvertRating(uint16_t length, uint8_t* text, _MMMetaInfo* meta);

}  // namespace metainfo
