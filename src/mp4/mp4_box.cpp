// Box headers and whole-box reads, shared by every MP4 box reader.
#include <cstdio>
#include <cstring>
#include <new>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/thread_state.h"
#include "mp4/mp4_internal.h"

namespace metainfo {

int64_t Tell(int h) { return MEx_ftell(h); }

void SeekTo(int h, int64_t pos) {
    // Past the end of the file nothing more can be read.
    if (pos > static_cast<int64_t>(s_mp4FileSize)) pos = s_mp4FileSize;
    if (pos < 0) pos = 0;
    MEx_fseek(h, pos, SEEK_SET);
}

bool BadBoxSize(uint32_t size) { return size == 0 || size >= s_mp4FileSize; }

uint64_t BytesHeld(int64_t start, uint64_t size) {
    const uint64_t left =
        start >= 0 && start < static_cast<int64_t>(s_mp4FileSize) ? s_mp4FileSize - static_cast<uint64_t>(start) : 0;
    return size < left ? size : left;
}

bool ReadBoxBuffer(int h, uint32_t size, BoxBuffer* out) {
    delete[] out->data;
    out->data = nullptr;
    out->size = 0;
    const uint64_t want = BytesHeld(Tell(h), size);
    out->data = new (std::nothrow) uint8_t[want != 0 ? want : 1];
    if (out->data == nullptr) return false;
    if (want != 0) {
        int got = MEx_fread(out->data, 1, static_cast<unsigned>(want), h);
        out->size = got > 0 ? static_cast<size_t>(got) : 0;
    }
    return true;
}

int32_t ReadWholeBox(int h, uint32_t type, int32_t badBox, int32_t noMemory, BoxBuffer* buf, uint32_t* size) {
    const int64_t start = Tell(h);
    _BOXHEADER header{};
    getBoxHeader(h, &header);
    if (header.type != type || BadBoxSize(header.size)) return badBox;
    SeekTo(h, start);
    if (!ReadBoxBuffer(h, header.size, buf)) return noMemory;
    *size = header.size;
    return MM_OK;
}

int getBoxHeader(int h, _BOXHEADER* header) {
    uint8_t b[8] = {};
    const bool whole = MEx_fread(b, 1, sizeof b, h) == static_cast<int>(sizeof b);
    header->size = ReadBE32(b);
    header->type = ReadBE32(b + 4);
    if (header->size == 1) {
        uint8_t large[8] = {};
        const int got = MEx_fread(large, 1, sizeof large, h);
        header->largeSizeHigh = ReadBE32(large);
        header->largeSizeLow = ReadBE32(large + 4);
        // Only the lower word counts: files of 4 GiB and more are refused anyway.
        header->size = header->largeSizeLow;
        if (got > 0) MEx_fseek(h, -got, SEEK_CUR);
        if (got != static_cast<int>(sizeof large)) return 0;
    }
    return whole ? 8 : 0;
}

int AnaBox(const uint8_t* buf, size_t avail, _MP4BOX* box) {
    std::memset(box, 0, sizeof *box);
    if (buf == nullptr || avail < 8) return 0;
    box->size = ReadBE32(buf);
    if (box->size == 0) return 1;
    box->type = ReadBE32(buf + 4);
    int length = 8;
    if (box->size == 1) {
        if (avail < 16) return 0;
        box->largeSizeHigh = ReadBE32(buf + 8);
        box->largeSizeLow = ReadBE32(buf + 12);
        box->size = box->largeSizeLow;
        length = 16;
    }
    if (box->type == FourCC("uuid")) {
        if (avail < static_cast<size_t>(length) + 16) return 0;
        std::memcpy(box->userType, buf + length, 16);
        // The user type is 16 bytes, yet callers have always been told 4.
        return length + 4;
    }
    return length;
}

int AnaFullBox(const uint8_t* buf, size_t avail, _MP4FULLBOX* box) {
    std::memset(box, 0, sizeof *box);
    const int length = AnaBox(buf, avail, &box->box);
    if (length == 0 || avail < static_cast<size_t>(length) + 4) return 0;
    const uint32_t word = ReadBE32(buf + length);
    box->version = static_cast<uint8_t>(word >> 24);
    box->flags = word & 0xFFFFFF;
    return length + 4;
}

int32_t AnaFileType(const uint8_t* buf, size_t avail, _FILETYPEBOX* ftyp) {
    const int length = AnaBox(buf, avail, &ftyp->box);
    if (length == 0) return MM_E_FAIL;
    const uint64_t fields = static_cast<uint64_t>(length) + 8;
    if (fields >= ftyp->box.size || ftyp->box.size >= s_mp4FileSize || avail < fields) return MM_E_FAIL;
    ftyp->majorBrand = ReadBE32(buf + length);
    ftyp->minorVersion = ReadBE32(buf + length + 4);
    uint64_t count = (ftyp->box.size - fields) / 4;
    const uint64_t held = (avail - fields) / 4;
    if (count > held) count = held;
    delete[] ftyp->compatibleBrands;
    ftyp->compatibleBrands = new (std::nothrow) uint32_t[count != 0 ? count : 1];
    ftyp->brandCount = 0;
    if (ftyp->compatibleBrands == nullptr) return kMp4BadEntry;
    for (uint64_t i = 0; i < count; ++i) ftyp->compatibleBrands[i] = ReadBE32(buf + fields + 4 * i);
    ftyp->brandCount = static_cast<uint32_t>(count);
    return MM_OK;
}

}  // namespace metainfo
