#include "asf/asf_io.h"

#include <cstdio>
#include <cstring>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/thread_state.h"

namespace metainfo {
namespace asf {

const char* const kLogTag = "ASF_LEVEL";

bool ReadExact(int h, void* buf, uint32_t n) {
    if (n == 0) return true;
    // Item size 1, so plain and protected handles both count bytes.
    int got = MEx_fread(buf, 1, n, h);
    return got >= 0 && static_cast<uint32_t>(got) == n;
}

void ReadOrZero(int h, void* buf, uint32_t n) {
    std::memset(buf, 0, n);
    if (n != 0) MEx_fread(buf, 1, n, h);
}

bool Read16(int h, uint16_t* v) {
    uint8_t b[2];
    if (!ReadExact(h, b, 2)) return false;
    *v = ReadLE16(b);
    return true;
}

bool Read32(int h, uint32_t* v) {
    uint8_t b[4];
    if (!ReadExact(h, b, 4)) return false;
    *v = ReadLE32(b);
    return true;
}

bool ReadSize(int h, uint32_t* v) {
    uint8_t b[8];
    if (!ReadExact(h, b, 8)) return false;
    *v = ReadLE32(b);
    return true;
}

uint16_t Get16(int h) {
    uint8_t b[2];
    ReadOrZero(h, b, 2);
    return ReadLE16(b);
}

uint32_t Get32(int h) {
    uint8_t b[4];
    ReadOrZero(h, b, 4);
    return ReadLE32(b);
}

uint64_t Get64(int h) {
    uint8_t b[8];
    ReadOrZero(h, b, 8);
    return ReadLE64(b);
}

bool SeekBy(int h, int64_t delta) { return delta == 0 || MEx_fseek(h, delta, SEEK_CUR) == 0; }

bool SeekTo(int h, int64_t position) { return position >= 0 && MEx_fseek(h, position, SEEK_SET) == 0; }

uint64_t BytesLeft(int h) {
    const int64_t pos = MEx_ftell(h);
    if (pos < 0 || static_cast<uint64_t>(pos) >= s_asfFileSize) return 0;
    return s_asfFileSize - static_cast<uint64_t>(pos);
}

bool SameGuid(const uint8_t* read, const uint8_t* guid) { return std::memcmp(read, guid, 16) == 0; }

}  // namespace asf
}  // namespace metainfo
