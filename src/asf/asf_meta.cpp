#include "asf/asf_meta.h"

#include <cstring>
#include <memory>
#include <new>

#include "asf/asf_guids.h"
#include "asf/asf_header.h"
#include "asf/asf_io.h"
#include "core/byte_reader.h"
#include "core/codes.h"
#include "core/thread_state.h"

namespace metainfo {

using namespace asf;

namespace {

constexpr int32_t kBroken = -1;
constexpr uint16_t kMaxDataType = 6;
constexpr uint32_t kUnicodeString = 0;
constexpr uint32_t kGuidType = 6;
constexpr uint32_t kStringEncoding = 6;

using Buffer = std::unique_ptr<uint8_t[]>;

// A buffer for n bytes that the rest of the file can hold, filled from it;
// null when the file is too short (the read would come up short anyway) or
// memory runs out.
Buffer ReadBuffer(int h, uint32_t n) {
    if (n > BytesLeft(h)) return nullptr;
    Buffer buf(new (std::nothrow) uint8_t[n == 0 ? 1 : n]);
    if (buf == nullptr || !ReadExact(h, buf.get(), n)) return nullptr;
    return buf;
}

// Takes the first bytes of a value of `length` into the item, up to the
// item's room, and steps over the rest.
bool FillItem(int h, _MMMetaItem* item, uint32_t length, uint32_t encoding) {
    uint32_t n = length < MM_META_DATA_SIZE ? length : MM_META_DATA_SIZE;
    if (!ReadExact(h, item->szData, n)) return false;
    if (!SeekBy(h, static_cast<int64_t>(length) - n)) return false;
    item->nEncoding = encoding;
    item->nLength = n;
    return true;
}

void DropPicture(_MMMetaInfo* meta) {
    delete[] meta->pPicture;
    meta->pPicture = nullptr;
}

bool WantPicture(uint32_t size, uint32_t allowance) {
    return allowance != 0 && (size <= kAsfPictureCeiling || allowance >= size);
}

// The item a descriptor name fills, or null.
_MMMetaItem* ItemForName(_MMMetaInfo* meta, const uint8_t* name, uint32_t length) {
    struct Target {
        const char* name;
        int item;  // -1: the album artist
    };
    static const Target kTargets[] = {
        {"WM/OriginalArtist", META_ARTIST},
        {"WM/AlbumArtist", -1},
        {"WM/Composer", META_COMPOSER},
        {"WM/AlbumTitle", META_ALBUM},
        {"WM/Year", META_YEAR},
        {"WM/Genre", META_GENRE},
        {"WM/Language", META_LANGUAGE},
        {"WM/TrackNumber", META_TRACKNUMBER},
    };
    for (const Target& t : kTargets) {
        if (ASF_IsEqualName(name, t.name, length, static_cast<uint32_t>(std::strlen(t.name)))) {
            return t.item < 0 ? &meta->stAlbumArtist : &meta->aItems[t.item];
        }
    }
    return nullptr;
}

// A WM/Picture value of `length` bytes at the file position.
int32_t TakePictureValue(int h, _MMMetaInfo* meta, uint32_t length, uint32_t allowance) {
    if (length > BytesLeft(h)) return kBroken;
    // The picture type and data length say whether the picture is wanted;
    // one that is not is stepped over rather than loaded.
    uint8_t head[5] = {};
    if (length >= sizeof head) {
        if (!ReadExact(h, head, sizeof head)) return kBroken;
        if (!WantPicture(ReadLE32(head + 1), allowance)) {
            return SeekBy(h, static_cast<int64_t>(length - sizeof head)) ? 0 : kBroken;
        }
        if (!SeekBy(h, -static_cast<int64_t>(sizeof head))) return kBroken;
    }
    Buffer value = ReadBuffer(h, length);
    if (value == nullptr) return kBroken;
    // An out-of-memory answer for the picture does not stop the descriptors.
    ASF_ParseWMPicturObj(value.get(), meta, length, allowance);
    return 0;
}

// One descriptor's value, with its name already narrowed.
int32_t TakeValue(int h, _MMMetaInfo* meta, const uint8_t* name, uint32_t nameLength, uint16_t type, uint32_t length,
                  uint32_t allowance) {
    _MMMetaItem* item = ItemForName(meta, name, nameLength);
    if (item != nullptr && item->nLength == 0) {
        return FillItem(h, item, length, TTable[type]) ? 0 : kBroken;
    }
    if (ASF_IsEqualName(name, "WM/Picture", nameLength, 10) && meta->pPicture == nullptr) {
        return TakePictureValue(h, meta, length, allowance);
    }
    return SeekBy(h, length) ? 0 : kBroken;
}

// The record's projection of the descriptors: names narrowed to their low
// bytes, the first value of each item kept, the rating as its word.
class MetaSink : public AsfAttributeSink {
public:
    MetaSink(_MMMetaInfo* meta, uint32_t allowance) : meta_(meta), allowance_(allowance) {}

    int32_t Description(int h, uint32_t field, uint16_t length) override {
        static const int kItems[] = {META_TITLE, META_ARTIST, META_COPYRIGHT, META_COMMENT};
        if (field < 4) return FillItem(h, &meta_->aItems[kItems[field]], length, kStringEncoding) ? 0 : kBroken;
        Buffer rating = ReadBuffer(h, length);
        if (rating == nullptr) return kBroken;
        ASF_ConvertRating(length, rating.get(), meta_);
        return 0;
    }

    int32_t Attribute(int h, const AsfAttribute& a) override {
        Buffer name(new (std::nothrow) uint8_t[a.nameLength == 0 ? 1 : a.nameLength]);
        if (name == nullptr) return kBroken;
        if (a.nameLength != 0) std::memcpy(name.get(), a.name, a.nameLength);
        const uint32_t narrowed = ASF_unicode2ascii(name.get(), a.nameLength);
        return TakeValue(h, meta_, name.get(), narrowed, a.type, a.length, allowance_);
    }

private:
    _MMMetaInfo* meta_;
    uint32_t allowance_;
};

}  // namespace

int32_t ASF_WalkContentDescription(int h, AsfAttributeSink* sink) {
    uint8_t b[8 + 10];
    if (!ReadExact(h, b, sizeof b)) return kBroken;
    for (uint32_t field = 0; field < 5; ++field) {
        const int32_t result = sink->Description(h, field, ReadLE16(b + 8 + size_t{2} * field));
        if (result != 0) return result;
    }
    return 0;
}

int32_t ASF_WalkExtContentDescription(int h, AsfAttributeSink* sink) {
    uint8_t b[8 + 2];
    if (!ReadExact(h, b, sizeof b)) return kBroken;
    uint16_t count = ReadLE16(b + 8);
    for (uint32_t i = 0; i < count; ++i) {
        uint16_t nameLength = 0;
        if (!Read16(h, &nameLength)) return kBroken;
        Buffer name = ReadBuffer(h, nameLength);
        if (name == nullptr) return kBroken;
        uint16_t type = 0;
        uint16_t valueLength = 0;
        if (!Read16(h, &type) || type > kMaxDataType) return kBroken;
        if (!Read16(h, &valueLength)) return kBroken;
        const int32_t result = sink->Attribute(h, AsfAttribute{name.get(), nameLength, type, valueLength, true});
        if (result != 0) return result;
    }
    return 0;
}

int32_t ASF_WalkMetaData(int h, AsfAttributeSink* sink) {
    uint16_t count = 0;
    if (!Read16(h, &count)) return kBroken;
    for (uint32_t i = 0; i < count; ++i) {
        // Reserved or Language List Index, Stream Number, Name Length,
        // Data Type, Data Length.
        uint8_t r[12];
        if (!ReadExact(h, r, sizeof r)) return kBroken;
        uint16_t nameLength = ReadLE16(r + 4);
        uint16_t type = ReadLE16(r + 6);
        uint32_t length = ReadLE32(r + 8);
        if (type > kMaxDataType) return kBroken;
        Buffer name = ReadBuffer(h, nameLength);
        if (name == nullptr) return kBroken;
        const int32_t result = sink->Attribute(h, AsfAttribute{name.get(), nameLength, type, length, false});
        if (result != 0) return result;
    }
    return 0;
}

int32_t ASF_InitMetaInfo(_MMMetaInfo* meta) {
    if (meta == nullptr) return -1;
    // The payload bytes are left as they are; an item is empty by its length.
    for (_MMMetaItem& item : meta->aItems) {
        item.nEncoding = 0;
        item.nLength = 0;
    }
    meta->stAlbumArtist.nEncoding = 0;
    meta->stAlbumArtist.nLength = 0;
    meta->pPicture = nullptr;
    meta->nPictureSize = 0;
    meta->nRating = 0;
    meta->nPlayCount = 0;
    meta->nReserved = 0;
    return 0;
}

int32_t ASF_ParseContentDescriptionObj(int h, _MMMetaInfo* meta) {
    MetaSink sink(meta, 0);
    return ASF_WalkContentDescription(h, &sink);
}

void ASF_ConvertRating(uint16_t length, uint8_t* text, _MMMetaInfo* meta) {
    static const struct {
        const char* word;
        uint32_t rating;
    } kRatings[] = {{"high", 5}, {"higher", 4}, {"middle", 3}, {"lower", 2}, {"low", 1}};
    uint32_t n = ASF_unicode2ascii(text, length);
    meta->nRating = 0;
    for (const auto& r : kRatings) {
        if (ASF_IsEqualName(text, r.word, n, static_cast<uint32_t>(std::strlen(r.word)))) {
            meta->nRating = r.rating;
            return;
        }
    }
}

int32_t ASF_ParseContentBrandingObj(int h, _MMMetaInfo* meta, uint32_t allowance) {
    uint8_t b[8 + 4];
    if (!ReadExact(h, b, sizeof b)) return kBroken;
    uint32_t imageType = ReadLE32(b + 8);
    // Type 0 has always returned here, inside the object: the walk reads its
    // next object header from the banner fields.
    if (imageType == 0) return 0;
    static const char* const kMime[] = {"image/bmp", "image/jpeg", "image/gif"};
    _MMMetaItem& mime = meta->aItems[META_PICTURE_FORMAT];
    if (imageType <= 3) {
        const char* text = kMime[imageType - 1];
        uint32_t n = static_cast<uint32_t>(std::strlen(text)) + 1;
        std::memcpy(mime.szData, text, n);
        mime.nLength = n;
    }
    mime.nEncoding = TTable[kGuidType];

    uint32_t size = 0;
    if (!Read32(h, &size)) return kBroken;
    meta->nPictureSize = size;
    // The picture bytes always match the size word: an older picture goes.
    DropPicture(meta);
    if (size != 0 && WantPicture(size, allowance)) {
        if (size > BytesLeft(h)) return kBroken;
        meta->pPicture = new (std::nothrow) unsigned char[size];
        if (meta->pPicture == nullptr) return MM_E_OUTOFMEMORY;
        if (!ReadExact(h, meta->pPicture, size)) {
            DropPicture(meta);
            return kBroken;
        }
    } else if (!SeekBy(h, size)) {
        return kBroken;
    }
    for (int url = 0; url < 2; ++url) {
        uint32_t length = 0;
        if (!Read32(h, &length) || !SeekBy(h, length)) return kBroken;
    }
    return 0;
}

int32_t ASF_ParseExtContentDescriptionObj(int h, _MMMetaInfo* meta, uint32_t allowance) {
    MetaSink sink(meta, allowance);
    return ASF_WalkExtContentDescription(h, &sink);
}

int32_t ASF_ParseMetaDataObj(int h, _MMMetaInfo* meta, uint32_t allowance) {
    MetaSink sink(meta, allowance);
    return ASF_WalkMetaData(h, &sink);
}

int32_t ASF_WalkHdrExtension(int h, AsfExtensionVisitor* visitor) {
    // Size, Reserved Field 1 and 2, then Header Extension Data Size.
    uint8_t b[30];
    if (!ReadExact(h, b, sizeof b)) return kBroken;
    uint32_t dataSize = ReadLE32(b + 26);
    if (dataSize >= s_asfFileSize) return kBroken;
    for (uint64_t total = 0; total < dataSize;) {
        uint8_t head[kObjectHeaderSize];
        if (!ReadExact(h, head, sizeof head)) return kBroken;
        uint32_t size = ReadLE32(head + 16);
        // An object smaller than its own header would never move the walk on.
        if (size < kObjectHeaderSize) return kBroken;
        const int32_t result = visitor->Inner(h, head, ReadLE64(head + 16));
        if (result != 0) return result;
        total += size;
    }
    return 0;
}

int32_t ASF_ParseHdrExtensionObj(int h, _MMMetaInfo* meta, uint32_t allowance) {
    struct : AsfExtensionVisitor {
        _MMMetaInfo* meta;
        uint32_t allowance;
        int32_t Inner(int file, const uint8_t* guid, uint64_t size) override {
            if (SameGuid(guid, ASF_Metadata_Object) || SameGuid(guid, ASF_Metadata_Library_Object)) {
                return ASF_ParseMetaDataObj(file, meta, allowance) != 0 ? kBroken : 0;
            }
            return SeekBy(file, static_cast<int64_t>(static_cast<uint32_t>(size)) - kObjectHeaderSize) ? 0 : kBroken;
        }
    } visitor;
    visitor.meta = meta;
    visitor.allowance = allowance;
    return ASF_WalkHdrExtension(h, &visitor);
}

int32_t ASF_ParseWMPicturObj(const uint8_t* value, _MMMetaInfo* meta, uint32_t length, uint32_t allowance) {
    // Picture type, data length, MIME type and description, picture data.
    if (allowance == 0 || value == nullptr || length < 5) return 0;
    uint32_t dataLength = ReadLE32(value + 1);
    if (!WantPicture(dataLength, allowance)) return 0;
    // A picture that claims more than the value holds cannot be taken.
    if (dataLength > length - 5) return 0;
    uint32_t textLength = length - 5 - dataLength;
    _MMMetaItem& mime = meta->aItems[META_PICTURE_FORMAT];
    uint32_t n = textLength < MM_META_DATA_SIZE ? textLength : MM_META_DATA_SIZE;
    std::memcpy(mime.szData, value + 5, n);
    mime.nEncoding = TTable[kUnicodeString];
    mime.nLength = n;
    unsigned char* picture = new (std::nothrow) unsigned char[dataLength == 0 ? 1 : dataLength];
    if (picture == nullptr) return MM_E_OUTOFMEMORY;
    std::memcpy(picture, value + length - dataLength, dataLength);
    DropPicture(meta);
    meta->pPicture = picture;
    meta->nPictureSize = dataLength;
    return 0;
}

}  // namespace metainfo
