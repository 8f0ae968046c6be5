// The maker box "@mkr" of files recorded on the phone: phone model ("modl"),
// thumbnail ("thub") and smart-album text ("salb").
#include <cstring>
#include <new>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/thread_state.h"
#include "mp4/mp4_internal.h"

namespace metainfo {
namespace {

// A maker child's payload, handed to the caller once the whole box was read.
struct Payload {
    uint8_t* data = nullptr;
    uint32_t size = 0;
    Payload() = default;
    Payload(const Payload&) = delete;
    Payload& operator=(const Payload&) = delete;
    ~Payload() { delete[] data; }
    void Reset() {
        delete[] data;
        data = nullptr;
        size = 0;
    }
    uint8_t* Release() {
        uint8_t* p = data;
        data = nullptr;
        return p;
    }
};

struct _PHONEMODEL {
    _MP4FULLBOX header;
    Payload body;
};

struct _THUMBNAIL {
    _MP4FULLBOX header;
    uint32_t leadWord = 0;  // meaning unknown; kept, not passed on
    Payload image;
};

struct _SMARTALBUM {
    _MP4FULLBOX header;
    uint16_t language = 0;
    Payload text;
};

// Reads the child box at the current position whole; its full-box header
// length goes to *at.
int32_t ReadMakerChild(int h, uint32_t type, BoxBuffer* buf, _MP4FULLBOX* full, size_t* at, uint32_t* size) {
    const int32_t result = ReadWholeBox(h, type, kMp4BadIlst, MM_E_OUTOFMEMORY, buf, size);
    if (result != MM_OK) return result;
    *at = static_cast<size_t>(AnaFullBox(buf->data, buf->size, full));
    return *at == 0 ? MM_E_FAIL : MM_OK;
}

// Copies n bytes at offset of buf into payload; false when the buffer cannot hold them.
bool TakeBytes(const BoxBuffer& buf, uint64_t offset, uint64_t n, Payload* payload) {
    if (offset > buf.size || n > buf.size - offset) return false;
    payload->Reset();
    const auto bytes = static_cast<size_t>(n);  // within the buffer, so it fits
    payload->size = static_cast<uint32_t>(n);
    payload->data = new (std::nothrow) uint8_t[bytes != 0 ? bytes : 1];
    if (payload->data != nullptr && bytes != 0) std::memcpy(payload->data, buf.data + offset, bytes);
    return true;
}

int32_t AnaModl(int h, _PHONEMODEL* modl) {
    BoxBuffer buf;
    size_t at = 0;
    uint32_t size = 0;
    int32_t result = ReadMakerChild(h, FourCC("modl"), &buf, &modl->header, &at, &size);
    if (result != MM_OK) return result;
    if (static_cast<uint32_t>(at) >= size || size >= s_mp4FileSize) return MM_E_FAIL;
    if (!TakeBytes(buf, at, size - at, &modl->body)) return MM_E_FAIL;
    // Without memory the record keeps a null body and its size.
    return modl->body.data != nullptr ? MM_OK : MM_E_OUTOFMEMORY;
}

int32_t AnaThub(int h, _THUMBNAIL* thub) {
    BoxBuffer buf;
    size_t at = 0;
    uint32_t size = 0;
    int32_t result = ReadMakerChild(h, FourCC("thub"), &buf, &thub->header, &at, &size);
    if (result != MM_OK) return result;
    if (buf.size < static_cast<size_t>(at) + 8) return MM_E_FAIL;
    thub->leadWord = ReadBE32(buf.data + at);
    const uint32_t imageSize = ReadBE32(buf.data + at + 4);
    // The image must lie inside the box, not merely inside the file.
    const uint64_t room = size > static_cast<uint32_t>(at) + 8 ? size - (static_cast<uint64_t>(at) + 8) : 0;
    if (imageSize >= s_mp4FileSize || imageSize > room) return MM_E_FAIL;
    if (!TakeBytes(buf, static_cast<uint64_t>(at) + 8, imageSize, &thub->image)) return MM_E_FAIL;
    if (thub->image.data == nullptr) {
        thub->image.size = 0;
        return MM_E_OUTOFMEMORY;
    }
    return MM_OK;
}

int32_t AnaSalb(int h, _SMARTALBUM* salb) {
    BoxBuffer buf;
    size_t at = 0;
    uint32_t size = 0;
    int32_t result = ReadMakerChild(h, FourCC("salb"), &buf, &salb->header, &at, &size);
    if (result != MM_OK) return result;
    if (static_cast<uint64_t>(at) + 2 >= size || size >= s_mp4FileSize) return MM_E_FAIL;
    if (buf.size < static_cast<size_t>(at) + 2) return MM_E_FAIL;
    salb->language = ReadBE16(buf.data + at);
    if (!TakeBytes(buf, static_cast<uint64_t>(at) + 2, size - (at + 2), &salb->text)) return MM_E_FAIL;
    if (salb->text.data == nullptr) {
        salb->text.size = 0;
        return MM_E_OUTOFMEMORY;
    }
    return MM_OK;
}

}  // namespace

void FreeMakerBuffers(_MAKERINFO* maker) {
    delete[] maker->pSmartAlbum;
    delete[] maker->pThumbnail;
    delete[] maker->pPhoneModel;
    maker->pSmartAlbum = maker->pThumbnail = maker->pPhoneModel = nullptr;
    maker->nSmartAlbumSize = maker->nThumbnailSize = maker->nPhoneModelSize = 0;
}

int32_t AnaMaker(int h, _MAKERINFO* maker) {
    const int64_t start = Tell(h);
    _BOXHEADER header{};
    getBoxHeader(h, &header);
    if (header.type != FourCC("@mkr") || BadBoxSize(header.size)) return kMp4BadIlst;
    _PHONEMODEL modl;
    _THUMBNAIL thub;
    _SMARTALBUM salb;
    const int64_t end = start + header.size;
    SeekTo(h, start + 12);  // after the version/flags word
    for (int64_t childStart = Tell(h); childStart >= 0 && childStart < end && !MEx_feof(h); childStart = Tell(h)) {
        _BOXHEADER child{};
        if (getBoxHeader(h, &child) == 0 || BadBoxSize(child.size)) return MM_E_FAIL;
        SeekTo(h, childStart);
        switch (child.type) {
            case FourCC("salb"): AnaSalb(h, &salb); break;
            case FourCC("thub"): AnaThub(h, &thub); break;
            case FourCC("modl"): AnaModl(h, &modl); break;
            // Anything else spoils the whole box: the caller's record stays as it was.
            default: return kMp4BadEntry;
        }
        SeekTo(h, childStart + child.size);
    }
    // A later maker box replaces an earlier one.
    FreeMakerBuffers(maker);
    maker->nValid = 1;
    maker->nSmartAlbumSize = salb.text.size;
    maker->pSmartAlbum = salb.text.Release();
    maker->nThumbnailSize = thub.image.size;
    maker->pThumbnail = thub.image.Release();
    maker->nPhoneModelSize = modl.body.size;
    maker->pPhoneModel = modl.body.Release();
    return MM_OK;
}

}  // namespace metainfo
