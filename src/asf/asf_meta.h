// ASF metadata objects: Content Description, Content Branding, Extended
// Content Description, and the Metadata and Metadata Library Objects of the
// Header Extension.
#pragma once

#include <cstdint>

#include "metainfo/records.h"

namespace metainfo {

// Pictures up to this size are read whenever the allowance is non-zero.
constexpr uint32_t kAsfPictureCeiling = 0x80000;

// One attribute of an Extended Content Description, Metadata or Metadata
// Library Object; the file stands at its value.
struct AsfAttribute {
    const uint8_t* name;  // UTF-16LE as stored
    uint16_t nameLength;
    uint16_t type;  // 0 text, 1 bytes, 2 BOOL, 3 DWORD, 4 QWORD, 5 WORD, 6 GUID
    uint32_t length;
    bool wideBool;  // a BOOL of 32 bits (Extended Content Description) rather than 16
};

// Takes what the descriptor walks meet. Each call leaves the file just past
// what it was given; 0, or non-zero to stop the walk.
class AsfAttributeSink {
public:
    virtual ~AsfAttributeSink() = default;
    // Field 0..4 of the Content Description (Title, Author, Copyright,
    // Description, Rating): `length` bytes of UTF-16LE.
    virtual int32_t Description(int h, uint32_t field, uint16_t length) = 0;
    virtual int32_t Attribute(int h, const AsfAttribute& attribute) = 0;
};

// The descriptor walks, the file just after the object's GUID
// (ASF_WalkMetaData: just after its size). 0, -1 on a broken descriptor, or
// the sink's failure.
int32_t ASF_WalkContentDescription(int h, AsfAttributeSink* sink);
int32_t ASF_WalkExtContentDescription(int h, AsfAttributeSink* sink);
int32_t ASF_WalkMetaData(int h, AsfAttributeSink* sink);

// Takes each object inside a Header Extension Object, the file standing just
// after the inner object's size; it leaves the file at the object's end (the
// record's projection reads on from where its metadata walk stops).
class AsfExtensionVisitor {
public:
    virtual ~AsfExtensionVisitor() = default;
    virtual int32_t Inner(int h, const uint8_t* guid, uint64_t size) = 0;
};

// The walk of a Header Extension Object, the file just after its GUID: 0,
// -1 when broken, or the visitor's failure.
int32_t ASF_WalkHdrExtension(int h, AsfExtensionVisitor* visitor);

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
