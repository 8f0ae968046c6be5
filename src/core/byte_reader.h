// Explicit byte-order reads and a bounded cursor over a buffer.
//
// Every parser reads file bytes through these: a read that would pass the end
// of what was read fails (returns false) and leaves the cursor where it was.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

namespace metainfo {

inline uint16_t ReadBE16(const uint8_t* p) { return uint16_t(p[0] << 8 | p[1]); }
inline uint32_t ReadBE32(const uint8_t* p) {
    return uint32_t(p[0]) << 24 | uint32_t(p[1]) << 16 | uint32_t(p[2]) << 8 | p[3];
}
inline uint64_t ReadBE64(const uint8_t* p) { return uint64_t(ReadBE32(p)) << 32 | ReadBE32(p + 4); }
inline uint16_t ReadLE16(const uint8_t* p) { return uint16_t(p[1] << 8 | p[0]); }
inline uint32_t ReadLE32(const uint8_t* p) {
    return uint32_t(p[3]) << 24 | uint32_t(p[2]) << 16 | uint32_t(p[1]) << 8 | p[0];
}
inline uint64_t ReadLE64(const uint8_t* p) { return uint64_t(ReadLE32(p + 4)) << 32 | ReadLE32(p); }

// ID3's 28-bit size: four bytes of seven bits each. The bytes are not masked,
// as every reader of the library has always done.
inline uint32_t ReadSyncsafe32(const uint8_t* p) {
    return uint32_t(p[0]) << 21 | uint32_t(p[1]) << 14 | uint32_t(p[2]) << 7 | p[3];
}

inline bool BytesEqual(const uint8_t* p, const char* tag, size_t n) { return std::memcmp(p, tag, n) == 0; }

class ByteReader {
public:
    ByteReader(const uint8_t* data, size_t size) : data_(data), size_(data ? size : 0) {}

    size_t size() const { return size_; }
    size_t position() const { return pos_; }
    size_t remaining() const { return size_ - pos_; }
    bool empty() const { return pos_ >= size_; }

    bool Seek(size_t pos) {
        if (pos > size_) return false;
        pos_ = pos;
        return true;
    }
    bool Skip(size_t n) {
        if (n > remaining()) return false;
        pos_ += n;
        return true;
    }
    // Pointer to the next n bytes without consuming them, or null.
    const uint8_t* Peek(size_t n) const { return n <= remaining() ? data_ + pos_ : nullptr; }
    bool Bytes(void* out, size_t n) {
        const uint8_t* p = Peek(n);
        if (p == nullptr) return false;
        if (n != 0) std::memcpy(out, p, n);
        pos_ += n;
        return true;
    }
    bool Tag(const char* tag, size_t n) const {
        const uint8_t* p = Peek(n);
        return p != nullptr && BytesEqual(p, tag, n);
    }

    bool U8(uint8_t* v) {
        return Read(v, 1, [](const uint8_t* p) { return p[0]; });
    }
    bool BE16(uint16_t* v) { return Read(v, 2, ReadBE16); }
    bool BE32(uint32_t* v) { return Read(v, 4, ReadBE32); }
    bool BE64(uint64_t* v) { return Read(v, 8, ReadBE64); }
    bool LE16(uint16_t* v) { return Read(v, 2, ReadLE16); }
    bool LE32(uint32_t* v) { return Read(v, 4, ReadLE32); }
    bool LE64(uint64_t* v) { return Read(v, 8, ReadLE64); }

private:
    template <typename T, typename F>
    bool Read(T* v, size_t n, F decode) {
        const uint8_t* p = Peek(n);
        if (p == nullptr) return false;
        *v = static_cast<T>(decode(p));
        pos_ += n;
        return true;
    }

    const uint8_t* data_;
    size_t size_;
    size_t pos_ = 0;
};

}  // namespace metainfo
