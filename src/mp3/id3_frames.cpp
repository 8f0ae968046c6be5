#include "mp3/id3_frames.h"

#include <algorithm>
#include <cstring>

#include "core/byte_reader.h"
#include "mp3/id3.h"

namespace metainfo {
namespace {

constexpr uint32_t kEncodingLatin1 = ENCODING_LATIN1;
constexpr uint32_t kEncodingUtf16BE = ENCODING_UTF16BE;
constexpr uint32_t kEncodingUtf8 = ENCODING_UTF8;
constexpr uint8_t kId3Utf16 = 1;
constexpr uint8_t kId3Utf16BE = 2;
constexpr int kAlbumArtist = -1;

enum class FrameKind { kText, kComment, kGenre, kTimeStamp, kPlayCount, kRating };

struct FrameRule {
    uint32_t id4;
    uint32_t id3;  // 0: no v2.2 form
    FrameKind kind;
    int item;  // MetaItemKind, or kAlbumArtist
    bool v24Text;  // encoding byte decides the item's code in v2.4
};

constexpr FrameRule kFrameRules[] = {
    {FrameId("TIT2"), FrameId("TT2"), FrameKind::kText, META_TITLE, true},
    {FrameId("TPE1"), FrameId("TP1"), FrameKind::kText, META_ARTIST, true},
    {FrameId("TALB"), FrameId("TAL"), FrameKind::kText, META_ALBUM, true},
    {FrameId("TCON"), FrameId("TCO"), FrameKind::kGenre, META_GENRE, false},
    {FrameId("TYER"), FrameId("TYE"), FrameKind::kText, META_YEAR, true},
    {FrameId("TDRC"), 0, FrameKind::kTimeStamp, META_YEAR, false},
    {FrameId("TCOP"), FrameId("TCR"), FrameKind::kText, META_COPYRIGHT, true},
    {FrameId("TCOM"), FrameId("TCM"), FrameKind::kText, META_COMPOSER, true},
    {FrameId("TRCK"), FrameId("TRK"), FrameKind::kText, META_TRACKNUMBER, true},
    {FrameId("TLAN"), FrameId("TLA"), FrameKind::kText, META_LANGUAGE, true},
    {FrameId("COMM"), FrameId("COM"), FrameKind::kComment, META_COMMENT, true},
    {FrameId("TFLT"), FrameId("TFT"), FrameKind::kText, META_FILETYPE, true},
    {FrameId("TPE3"), FrameId("TP3"), FrameKind::kText, META_CONDUCTOR, true},
    {FrameId("TPUB"), FrameId("TPB"), FrameKind::kText, META_PUBLISHER, true},
    {FrameId("TDAT"), FrameId("TDA"), FrameKind::kText, META_DATE, true},
    {FrameId("TIME"), FrameId("TIM"), FrameKind::kText, META_TIME, true},
    {FrameId("TPE2"), FrameId("TP2"), FrameKind::kText, kAlbumArtist, true},
    {FrameId("PCNT"), FrameId("CNT"), FrameKind::kPlayCount, 0, false},
    {FrameId("POPM"), FrameId("POP"), FrameKind::kRating, 0, false},
};

const FrameRule* RuleFor(uint32_t id) {
    for (const FrameRule& rule : kFrameRules) {
        if (rule.id4 == id || (rule.id3 != 0 && rule.id3 == id)) return &rule;
    }
    return nullptr;
}

_MMMetaItem* ItemOf(const FrameRule& rule, _MMMetaInfo* meta) {
    return rule.item == kAlbumArtist ? &meta->stAlbumArtist : &meta->aItems[rule.item];
}

bool StartsWithUtf8Mark(const uint8_t* text, uint32_t length) {
    return length >= 3 && text[0] == 0xEF && text[1] == 0xBB && text[2] == 0xBF;
}

void CopyInto(_MMMetaItem* item, const uint8_t* text, uint32_t length, uint32_t encoding) {
    const uint32_t n = std::min<uint32_t>(length, MM_META_DATA_SIZE);
    if (n != 0) std::memcpy(item->szData, text, n);
    item->nLength = n;
    item->nEncoding = encoding;
}

// Encoding code of a text: UTF-16 is delivered big-endian, a UTF-8 mark keeps it as UTF-8.
int32_t TextEncodingOf(uint8_t id3Encoding, uint8_t* text, uint32_t length, uint32_t* encoding, const Quirks& quirks) {
    if (id3Encoding == kId3Utf16BE && !quirks.id3Utf16BeEmpty) {
        *encoding = kEncodingUtf16BE;
        return MM_OK;
    }
    if (id3Encoding != kId3Utf16) {
        *encoding = kEncodingLatin1;
        return MM_OK;
    }
    if (StartsWithUtf8Mark(text, length)) {
        *encoding = kEncodingUtf8;
        return MM_OK;
    }
    if (AdjustByteOrder(text, length) != MM_OK) return MM_E_FAIL;
    *encoding = kEncodingUtf16BE;
    return MM_OK;
}

// "(%d)" at p as a C scanf reads it: blanks, a sign, digits; ")" not required.
bool ReadGenreNumber(const uint8_t* p, const uint8_t* end, long* value) {
    if (p >= end || *p != '(') return false;
    ++p;
    while (p < end && (*p == ' ' || (*p >= '\t' && *p <= '\r'))) ++p;
    bool negative = false;
    if (p < end && (*p == '+' || *p == '-')) negative = *p++ == '-';
    if (p >= end || *p < '0' || *p > '9') return false;
    long n = 0;
    while (p < end && *p >= '0' && *p <= '9') {
        if (n < 1000000) n = n * 10 + (*p - '0');  // any large value is simply out of the list
        ++p;
    }
    *value = negative ? -n : n;
    return true;
}

void CopyDigits(_MMMetaItem* item, const uint8_t* text, uint32_t length) {
    std::memset(item->szData, 0, sizeof item->szData);
    CopyInto(item, text, length, kEncodingLatin1);
}

}  // namespace

int32_t AdjustByteOrder(uint8_t* text, uint32_t length) {
    if (text == nullptr || length < 2 || text[0] != 0xFF || text[1] != 0xFE) return MM_OK;
    if (length & 1) return MM_E_INVALIDARG;
    for (uint32_t i = 0; i + 1 < length; i += 2) std::swap(text[i], text[i + 1]);
    return MM_OK;
}

uint32_t RemoveDataLengthIndicator(uint8_t* body, uint32_t length) {
    if (length < 4) return length;
    std::memmove(body, body + 4, length - 4);
    return length - 4;
}

void ReshapeV1Item(_MMMetaItem* item, uint32_t fieldLength) {
    uint32_t n = std::min<uint32_t>(fieldLength, MM_META_DATA_SIZE);
    while (n > 0 && item->szData[n - 1] < 33) item->szData[--n] = 0;
    const void* zero = std::memchr(item->szData, 0, n);
    item->nLength = zero != nullptr ? static_cast<uint32_t>(static_cast<const uint8_t*>(zero) - item->szData) : n;
}

int32_t FillTextFrame(uint8_t* body, uint32_t size, _MMMetaItem* item, const Quirks& quirks) {
    if (item->nLength != 0) return MM_E_FAIL;  // the first frame wins
    if (body == nullptr || size < 1) return MM_E_FAIL;
    uint8_t* text = body + 1;
    const uint32_t length = size - 1;
    uint32_t encoding = kEncodingLatin1;
    if (TextEncodingOf(body[0], text, length, &encoding, quirks) != MM_OK) return MM_E_FAIL;
    CopyInto(item, text, length, encoding);
    return MM_OK;
}

int32_t FillCommentsFrame(uint8_t* body, uint32_t size, _MMMetaItem* item, const Quirks& quirks) {
    if (item->nLength != 0) return MM_E_FAIL;
    if (body == nullptr || size < 1) return MM_E_FAIL;
    const uint8_t encoding = body[0];
    const bool utf16BE = encoding == kId3Utf16BE && !quirks.id3Utf16BeEmpty;
    // The short description (after encoding byte and language) ends at its terminator.
    uint32_t textStart = size;
    if (encoding == kId3Utf16 || utf16BE) {
        for (uint32_t k = 4; k + 1 < size; ++k) {
            if (body[k] == 0 && body[k + 1] == 0) {
                textStart = k + 2;
                break;
            }
        }
    } else {
        for (uint32_t k = 4; k < size; ++k) {
            if (body[k] == 0) {
                textStart = k + 1;
                break;
            }
        }
    }
    const uint32_t length = size > textStart ? size - textStart : 0;
    uint8_t* text = body + std::min(textStart, size);
    uint32_t code = utf16BE ? kEncodingUtf16BE : kEncodingLatin1;
    if (encoding == kId3Utf16) {
        if (AdjustByteOrder(text, length) != MM_OK) return MM_E_FAIL;
        code = StartsWithUtf8Mark(text, length) ? kEncodingUtf8 : kEncodingUtf16BE;
    }
    CopyInto(item, text, length, code);
    return MM_OK;
}

int32_t FillGenreFrame(uint8_t* body, uint32_t size, _MMMetaItem* item, const Quirks& quirks) {
    const int32_t filled = FillTextFrame(body, size, item, quirks);
    if (filled != MM_OK) return filled;
    const uint8_t* open = static_cast<const uint8_t*>(std::memchr(body, '(', size));
    const uint8_t* close = static_cast<const uint8_t*>(std::memchr(body, ')', size));
    if (open == nullptr || close == nullptr || close - open < 2) return MM_OK;
    const uint32_t from = static_cast<uint32_t>(open - body);
    uint32_t end = size;
    if (size > 1 && body[0] == kId3Utf16 && (body[1] == 0xFE || body[1] == 0xFF)) {
        // UTF-16: keep one byte of each character from "(" on.
        uint32_t j = 0;
        while (from + 2 * j < size) {
            body[from + j] = body[from + 2 * j];
            ++j;
        }
        end = from + j;
    }
    long number = 0;
    if (!ReadGenreNumber(body + from, body + end, &number) || number < 0 || number >= kGenreCount) return MM_OK;
    const char* name = id3_strGenre[number];
    std::memset(item->szData, 0, sizeof item->szData);
    const uint32_t length = static_cast<uint32_t>(std::min<size_t>(std::strlen(name), MM_META_DATA_SIZE - 1));
    CopyInto(item, reinterpret_cast<const uint8_t*>(name), length, kEncodingLatin1);
    return MM_OK;
}

int32_t FillTimeStamp(const uint8_t* body, uint32_t size, _MMMetaInfo* meta, const Quirks& quirks) {
    _MMMetaItem* year = &meta->aItems[META_YEAR];
    _MMMetaItem* date = &meta->aItems[META_DATE];
    _MMMetaItem* time = &meta->aItems[META_TIME];
    if (year->nLength != 0 || date->nLength != 0 || time->nLength != 0) return MM_E_FAIL;
    // The contract's offsets count the encoding byte.
    if (!quirks.id3YearKeepsEncodingByte && size > 0) {
        ++body;
        --size;
    }
    switch (size) {
        case 4: break;
        case 7:
        case 10: CopyDigits(date, body + 5, size - 5); break;
        case 13:
        case 16:
        case 19:
            CopyDigits(time, body + 11, size - 11);
            CopyDigits(date, body + 5, 5);
            break;
        default: return MM_E_INVALIDARG;
    }
    CopyDigits(year, body, 4);
    return MM_OK;
}

bool IsTableFrame(uint32_t id) { return RuleFor(id) != nullptr; }

_MMMetaItem* V24TextItem(uint32_t id, _MMMetaInfo* meta) {
    const FrameRule* rule = RuleFor(id);
    return rule != nullptr && rule->v24Text ? ItemOf(*rule, meta) : nullptr;
}

int32_t GetMetaData(uint32_t id, uint8_t* body, uint32_t size, _MMMetaInfo* meta, const Quirks& quirks) {
    const FrameRule* rule = RuleFor(id);
    if (rule == nullptr || meta == nullptr || body == nullptr) return MM_OK;
    switch (rule->kind) {
        case FrameKind::kText: FillTextFrame(body, size, ItemOf(*rule, meta), quirks); return MM_OK;
        case FrameKind::kComment: FillCommentsFrame(body, size, ItemOf(*rule, meta), quirks); return MM_OK;
        case FrameKind::kGenre: FillGenreFrame(body, size, ItemOf(*rule, meta), quirks); return MM_OK;
        case FrameKind::kTimeStamp: FillTimeStamp(body, size, meta, quirks); return MM_OK;
        case FrameKind::kPlayCount:
            if (size < 4) return MM_E_FAIL;
            meta->nPlayCount = ReadBE32(body);
            return MM_OK;
        case FrameKind::kRating: {
            const uint8_t* zero = static_cast<const uint8_t*>(std::memchr(body, 0, size));
            if (zero == nullptr || zero + 1 >= body + size) return MM_E_FAIL;
            meta->nRating = zero[1];
            return MM_OK;
        }
    }
    return MM_OK;
}

}  // namespace metainfo
