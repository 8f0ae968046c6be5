#include "matroska/ebml.h"

#include <cstring>

#include "core/file_access.h"
#include "core/text.h"

namespace metainfo {
namespace {

// Length of a variable-length integer by its first byte's leading zeros; 0
// when the byte has no marker (nine bytes or more).
size_t VintLength(uint8_t first) {
    for (size_t len = 1; len <= 8; ++len) {
        if ((first & (0x80u >> (len - 1))) != 0) return len;
    }
    return 0;
}

}  // namespace

bool ParseEbmlHeader(const uint8_t* p, size_t n, EbmlElement* e) {
    if (n == 0) return false;
    const size_t idLen = VintLength(p[0]);
    if (idLen == 0 || idLen > 4 || idLen >= n) return false;
    uint32_t id = 0;
    for (size_t i = 0; i < idLen; ++i) id = id << 8 | p[i];
    const uint8_t first = p[idLen];
    const size_t sizeLen = VintLength(first);
    if (sizeLen == 0 || sizeLen > n - idLen) return false;
    uint64_t size = first & (0xFFu >> sizeLen);
    bool allOnes = size == (0xFFu >> sizeLen);
    for (size_t i = 1; i < sizeLen; ++i) {
        size = size << 8 | p[idLen + i];
        allOnes = allOnes && p[idLen + i] == 0xFF;
    }
    e->id = id;
    e->unknownSize = allOnes;
    e->size = allOnes ? 0 : size;
    e->headerSize = idLen + sizeLen;
    return true;
}

bool EbmlChildren::Next(EbmlElement* e, const uint8_t** body) {
    if (pos_ >= size_) return false;
    if (!ParseEbmlHeader(data_ + pos_, size_ - pos_, e)) return false;
    const size_t start = pos_ + e->headerSize;
    const size_t room = size_ - start;
    if (e->unknownSize) e->size = room;
    if (e->size > room) {
        pos_ = size_;
        return false;
    }
    *body = data_ + start;
    pos_ = start + static_cast<size_t>(e->size);
    return true;
}

uint64_t EbmlUnsigned(const uint8_t* p, uint64_t n) {
    uint64_t v = 0;
    for (uint64_t i = 0; i < n && i < 8; ++i) v = v << 8 | p[i];
    return v;
}

bool EbmlFloat(const uint8_t* p, uint64_t n, double* v) {
    if (n == 4) {
        const uint32_t bits = static_cast<uint32_t>(EbmlUnsigned(p, 4));
        float f = 0;
        std::memcpy(&f, &bits, sizeof f);
        *v = static_cast<double>(f);
        return true;
    }
    if (n == 8) {
        const uint64_t bits = EbmlUnsigned(p, 8);
        std::memcpy(v, &bits, sizeof *v);
        return true;
    }
    return false;
}

std::string EbmlText(const uint8_t* p, uint64_t n) { return TrimText(Utf8ToUtf8(p, static_cast<size_t>(n))); }

bool EbmlHeaderAt(int h, uint64_t pos, uint64_t end, EbmlElement* e) {
    if (pos >= end) return false;
    uint8_t head[kEbmlMaxHeader];
    const uint64_t want = end - pos < kEbmlMaxHeader ? end - pos : kEbmlMaxHeader;
    const size_t got = ReadSomeAt(h, pos, head, static_cast<size_t>(want));
    if (got == 0 || !ParseEbmlHeader(head, got, e)) return false;
    if (e->headerSize > end - pos) return false;
    const uint64_t room = end - pos - e->headerSize;
    if (e->unknownSize) e->size = room;
    return e->size <= room;
}

bool EbmlReadBody(int h, uint64_t pos, uint64_t size, uint64_t cap, std::vector<uint8_t>* out) {
    const uint64_t want = size < cap ? size : cap;
    if (!SeekToOffset(h, pos)) return false;
    out->resize(static_cast<size_t>(want));
    out->resize(ReadSomeAt(h, pos, out->data(), out->size()));
    return true;
}

}  // namespace metainfo
