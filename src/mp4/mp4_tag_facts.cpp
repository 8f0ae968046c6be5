// Tags as the accurate reader tells them: every item of "ilst" (iTunes
// style), the cover pictures where their bytes lie, and the 3GPP text boxes
// of "udta", all as UTF-8.
#include <cstdio>
#include <new>
#include <string>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/text.h"
#include "mp3/id3.h"
#include "mp4/mp4_internal.h"
#include "mp4/mp4_truth.h"

namespace metainfo {
namespace {

// Values longer than this are no text a tag keeps; pictures are not read.
constexpr uint32_t kValueLimit = 1u << 16;

bool ReadAt(int h, int64_t pos, uint32_t n, std::string* out) {
    out->clear();
    if (n == 0) return true;
    try {
        out->resize(n);
    } catch (const std::bad_alloc&) {
        return false;
    }
    SeekTo(h, pos);
    const int got = MEx_fread(&(*out)[0], 1, n, h);
    out->resize(got > 0 ? static_cast<size_t>(got) : 0);
    return out->size() == n;
}

const uint8_t* Bytes(const std::string& s) { return reinterpret_cast<const uint8_t*>(s.data()); }

// The atom's name as a key: "\xA9nam" reads "©nam".
std::string AtomKey(uint32_t type) {
    const uint8_t name[4] = {uint8_t(type >> 24), uint8_t(type >> 16), uint8_t(type >> 8), uint8_t(type)};
    return Latin1ToUtf8(name, 4);
}

struct Item {
    uint32_t type = 0;
    std::string name;  // "----": the freeform name
    uint32_t dataType = 0;
    std::string value;
};

// Big-endian numbers of the integer data types as decimal text.
std::string NumberText(const std::string& v) {
    if (v.empty() || v.size() > 8) return std::string();
    uint64_t n = 0;
    for (char c : v) n = n << 8 | static_cast<uint8_t>(c);
    return std::to_string(n);
}

void SetNumberPair(const std::string& v, uint32_t* number, uint32_t* total) {
    if (v.size() < 6) return;
    *number = ReadBE16(Bytes(v) + 2);
    *total = ReadBE16(Bytes(v) + 4);
}

void SetText(std::string* field, const std::string& text) {
    if (field->empty()) *field = text;
}

void ApplyItem(const Item& item, TagFacts* t) {
    std::string text;
    if (item.dataType == 1) text = TrimText(Utf8ToUtf8(Bytes(item.value), item.value.size()));
    if (item.dataType == 2) text = TrimText(Utf16ToUtf8(Bytes(item.value), item.value.size(), true));
    if (item.dataType == 0 || item.dataType == 21 || item.dataType == 22) text = NumberText(item.value);
    switch (item.type) {
        case 0xA96E616D: SetText(&t->title, text); return;  // "\xA9nam"
        case 0xA9415254: SetText(&t->artist, text); return;  // "\xA9ART"
        case 0xA9616C62: SetText(&t->album, text); return;  // "\xA9alb"
        case FourCC("aART"): SetText(&t->albumArtist, text); return;
        case 0xA967656E: SetText(&t->genre, text); return;  // "\xA9gen"
        case 0xA9636D74: SetText(&t->comment, text); return;  // "\xA9cmt"
        case 0xA9777274: SetText(&t->composer, text); return;  // "\xA9wrt"
        case 0xA9646179:  // "\xA9day"
            SetText(&t->date, text);
            if (t->year == 0 && text.size() >= 4 && text.find_first_not_of("0123456789") >= 4)
                t->year = std::stoi(text.substr(0, 4));
            return;
        case FourCC("trkn"): SetNumberPair(item.value, &t->track, &t->trackTotal); return;
        case FourCC("disk"): SetNumberPair(item.value, &t->disc, &t->discTotal); return;
        case FourCC("gnre"): {
            // The ID3v1 genre index plus one.
            const uint32_t n = item.value.size() >= 2 ? ReadBE16(Bytes(item.value)) : 0;
            if (n >= 1 && n <= static_cast<uint32_t>(kGenreCount)) SetText(&t->genre, id3_strGenre[n - 1]);
            return;
        }
        default: break;
    }
    if (text.empty()) return;
    try {
        t->extra.emplace_back(item.type == FourCC("----") ? item.name : AtomKey(item.type), text);
    } catch (const std::bad_alloc&) {
    }
}

void AddPicture(uint32_t dataType, int64_t at, uint32_t size, Mp4Truth* truth) {
    PictureFacts p;
    p.mime = dataType == 14 ? "image/png" : dataType == 27 ? "image/bmp" : "image/jpeg";
    p.type = 3;  // front cover
    p.offset = static_cast<uint64_t>(at);
    p.size = size;
    try {
        truth->pictures.push_back(p);
    } catch (const std::bad_alloc&) {
    }
}

// One item of "ilst": its "mean", "name" and "data" children.
void ItemFacts(int h, uint32_t type, int64_t start, uint32_t size, Mp4Truth* truth) {
    Item item;
    item.type = type;
    bool haveValue = false;
    SeekTo(h, start + 8);
    WalkChildren(h, start + size, [&](uint32_t child, int64_t at, uint32_t childSize) {
        std::string head;
        if (child == FourCC("name") && childSize >= 12 && childSize < kValueLimit &&
            ReadAt(h, at + 12, childSize - 12, &head)) {
            item.name = TrimText(Utf8ToUtf8(Bytes(head), head.size()));
        }
        if (child != FourCC("data") || childSize < 16 || !ReadAt(h, at + 8, 8, &head)) return;
        const uint32_t payload = childSize - 16;
        const uint32_t dataType = ReadBE32(Bytes(head)) & 0xFFFFFF;
        if (type == FourCC("covr")) {
            if (payload != 0 && BytesHeld(at + 16, payload) == payload) AddPicture(dataType, at + 16, payload, truth);
            return;
        }
        if (haveValue || payload > kValueLimit || !ReadAt(h, at + 16, payload, &item.value)) return;
        haveValue = true;
        item.dataType = dataType;
    });
    if (haveValue) ApplyItem(item, &truth->tags);
}

// A 3GPP text box's text: UTF-16 after a byte-order mark, else UTF-8.
std::string GppText(const uint8_t* text, size_t length) {
    if (length >= 2 && ((text[0] == 0xFE && text[1] == 0xFF) || (text[0] == 0xFF && text[1] == 0xFE)))
        return TrimText(Utf16ToUtf8(text, length, true));
    return TrimText(Utf8ToUtf8(text, length));
}

void GppBoxFacts(uint32_t type, const uint8_t* buf, size_t avail, TagFacts* t) {
    if (type == FourCC("yrrc")) {
        uint16_t year = 0;
        if (Read3gppYear(buf, avail, &year) && year != 0 && t->year == 0) t->year = year;
        if (year != 0) SetText(&t->date, std::to_string(year));
        return;
    }
    const uint8_t* text = nullptr;
    size_t length = 0;
    if (!Read3gppText(buf, avail, type == FourCC("albm"), &text, &length)) return;
    const std::string value = GppText(text, length);
    if (value.empty()) return;
    switch (type) {
        case FourCC("titl"): SetText(&t->title, value); break;
        case FourCC("perf"): SetText(&t->artist, value); break;
        case FourCC("albm"): SetText(&t->album, value); break;
        case FourCC("gnre"): SetText(&t->genre, value); break;
        case FourCC("dscp"): SetText(&t->comment, value); break;
        case FourCC("auth"): t->extra.emplace_back("author", value); break;
        case FourCC("cprt"): t->extra.emplace_back("copyright", value); break;
        default: break;
    }
}

}  // namespace

void MetaFacts(int h, int64_t start, uint32_t size, Mp4Truth* truth) {
    // An ISO "meta" is a full box; QuickTime's has no version word, its
    // first child follows the header right away.
    std::string head;
    const bool quickTime = ReadAt(h, start + 8, 8, &head) && ReadBE32(Bytes(head) + 4) == FourCC("hdlr");
    SeekTo(h, start + (quickTime ? 8 : 12));
    WalkChildren(h, start + size, [&](uint32_t type, int64_t listStart, uint32_t listSize) {
        if (type != FourCC("ilst")) return;
        SeekTo(h, listStart + 8);
        WalkChildren(h, listStart + listSize,
                     [&](uint32_t item, int64_t at, uint32_t itemSize) { ItemFacts(h, item, at, itemSize, truth); });
    });
}

void UdtaFacts(int h, int64_t start, uint32_t size, Mp4Truth* truth) {
    SeekTo(h, start + 8);
    WalkChildren(h, start + size, [&](uint32_t type, int64_t at, uint32_t childSize) {
        if (type == FourCC("meta")) {
            MetaFacts(h, at, childSize, truth);
            return;
        }
        static const uint32_t kText[] = {FourCC("titl"), FourCC("perf"), FourCC("auth"), FourCC("albm"),
                                         FourCC("yrrc"), FourCC("gnre"), FourCC("dscp"), FourCC("cprt")};
        bool known = false;
        for (uint32_t t : kText) known = known || t == type;
        std::string box;
        if (!known || childSize > kValueLimit || !ReadAt(h, at, childSize, &box)) return;
        try {
            GppBoxFacts(type, Bytes(box), box.size(), &truth->tags);
        } catch (const std::bad_alloc&) {
        }
    });
}

}  // namespace metainfo
