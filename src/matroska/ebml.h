// EBML, the element coding of Matroska: variable-length IDs and sizes read
// from bytes in memory or from the file, each checked against what holds it.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace metainfo {

// The longest element header: a 4-byte ID and an 8-byte size.
constexpr size_t kEbmlMaxHeader = 12;

struct EbmlElement {
    uint32_t id = 0;  // with its length marker, as IDs are written ("1A45DFA3")
    uint64_t size = 0;  // of the body; what remains of the parent when unknown
    bool unknownSize = false;
    size_t headerSize = 0;
};

// The element header at p (n bytes readable). False when the ID or size is
// malformed (no marker in its first byte, an ID over 4 bytes) or cut short.
bool ParseEbmlHeader(const uint8_t* p, size_t n, EbmlElement* e);

// Children of an element body in memory, in order. A child whose size passes
// the end of the body ends the walk; a child of unknown size runs to the end.
class EbmlChildren {
public:
    EbmlChildren(const uint8_t* data, size_t size) : data_(data), size_(data ? size : 0) {}
    // The next child and its body, or false at the end.
    bool Next(EbmlElement* e, const uint8_t** body);

private:
    const uint8_t* data_;
    size_t size_;
    size_t pos_ = 0;
};

// Values of a body: unsigned (up to 8 bytes), float (4 or 8 bytes; false
// otherwise) and text (UTF-8, trimmed).
uint64_t EbmlUnsigned(const uint8_t* p, uint64_t n);
bool EbmlFloat(const uint8_t* p, uint64_t n, double* v);
std::string EbmlText(const uint8_t* p, uint64_t n);

// The element header at pos of the open file, whose enclosing element ends at
// end: its size must fit there (an unknown size runs to end).
bool EbmlHeaderAt(int h, uint64_t pos, uint64_t end, EbmlElement* e);

// At most cap bytes of the body at pos (fewer where the file ends first).
bool EbmlReadBody(int h, uint64_t pos, uint64_t size, uint64_t cap, std::vector<uint8_t>* out);

}  // namespace metainfo
