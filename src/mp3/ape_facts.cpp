#include "mp3/ape_facts.h"

#include <algorithm>
#include <cctype>
#include <cstring>
#include <new>
#include <string>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/text.h"
#include "probe/contract_facts.h"

namespace metainfo {
namespace {

constexpr size_t kFooter = 32;
constexpr uint64_t kId3v1 = 128;
constexpr uint64_t kMaxTag = uint64_t{16} << 20;  // items read whole; pictures beyond this are not reached
constexpr uint32_t kMaxItems = 65536;
constexpr uint32_t kBinary = 1;

std::string Lower(std::string s) {
    std::transform(s.begin(), s.end(), s.begin(), [](char c) { return static_cast<char>(std::tolower(c & 0xFF)); });
    return s;
}

void TakeText(const std::string& key, const std::string& value, TagFacts* t) {
    static const struct {
        const char* key;
        std::string TagFacts::*field;
    } kNamed[] = {{"title", &TagFacts::title},
                  {"artist", &TagFacts::artist},
                  {"album", &TagFacts::album},
                  {"album artist", &TagFacts::albumArtist},
                  {"albumartist", &TagFacts::albumArtist},
                  {"genre", &TagFacts::genre},
                  {"year", &TagFacts::date},
                  {"comment", &TagFacts::comment},
                  {"composer", &TagFacts::composer}};
    const std::string lower = Lower(key);
    for (const auto& k : kNamed) {
        if (lower == k.key) {
            t->*k.field = value;
            return;
        }
    }
    if (lower == "track") {
        SplitNumberPair(value, &t->track, &t->trackTotal);
    } else if (lower == "disc") {
        SplitNumberPair(value, &t->disc, &t->discTotal);
    } else {
        t->extra.emplace_back(key, value);
    }
}

const char* ImageMime(const uint8_t* p, size_t n) {
    if (n >= 3 && BytesEqual(p, "\xFF\xD8\xFF", 3)) return "image/jpeg";
    if (n >= 4 && BytesEqual(p, "\x89PNG", 4)) return "image/png";
    if (n >= 4 && BytesEqual(p, "GIF8", 4)) return "image/gif";
    return "";
}

// A "Cover Art (...)" item: a description, a NUL, the image bytes.
void TakePicture(const std::string& key, const uint8_t* v, size_t n, uint64_t at, std::vector<PictureFacts>* out) {
    const auto* nul = static_cast<const uint8_t*>(std::memchr(v, 0, n));
    if (nul == nullptr) return;
    const size_t skip = static_cast<size_t>(nul - v) + 1;
    PictureFacts p;
    p.description = TrimText(Utf8ToUtf8(v, skip - 1));
    p.mime = ImageMime(nul + 1, n - skip);
    const std::string lower = Lower(key);
    p.type = lower == "cover art (front)" ? 3 : lower == "cover art (back)" ? 4 : 0;
    p.offset = at + skip;
    p.size = n - skip;
    out->push_back(p);
}

void ReadItems(const std::vector<uint8_t>& b, uint32_t count, uint64_t base, TagFacts* t,
               std::vector<PictureFacts>* pictures) {
    ByteReader r(b.data(), b.size());
    for (uint32_t i = 0; i < count && i < kMaxItems; ++i) {
        uint32_t size = 0, flags = 0;
        if (!r.LE32(&size) || !r.LE32(&flags)) break;
        const uint8_t* k = r.Peek(r.remaining());
        const auto* end = k == nullptr ? nullptr : static_cast<const uint8_t*>(std::memchr(k, 0, r.remaining()));
        if (end == nullptr) break;
        const std::string key(reinterpret_cast<const char*>(k), static_cast<size_t>(end - k));
        r.Skip(key.size() + 1);
        const uint8_t* v = r.Peek(size);
        if (v == nullptr) break;
        const uint64_t at = base + r.position();
        r.Skip(size);
        if (((flags >> 1) & 3) == kBinary) {
            if (Lower(key).compare(0, 10, "cover art ") == 0) TakePicture(key, v, size, at, pictures);
            continue;
        }
        // Several values of one item are NUL-separated: the first is kept.
        const std::string value = TrimText(Utf8OrLatin1(v, size));
        if (!key.empty() && !value.empty()) TakeText(key, value, t);
    }
    if (t->date.size() >= 4) {
        const std::string year = t->date.substr(0, 4);
        if (year.find_first_not_of("0123456789") == std::string::npos) t->year = std::stoi(year);
    }
}

// The footer at the end of the file or before an ID3v1 tag: where the items
// start and how many there are.
bool FindTag(int h, uint64_t fileSize, uint64_t* itemsAt, uint64_t* itemsSize, uint32_t* count) {
    std::vector<uint8_t> b;
    for (uint64_t back : {uint64_t{0}, kId3v1}) {
        if (fileSize < back + kFooter || !ReadExactAt(h, fileSize - back - kFooter, kFooter, &b)) continue;
        if (!BytesEqual(b.data(), "APETAGEX", 8)) continue;
        const uint64_t size = ReadLE32(b.data() + 12);  // items and footer
        const uint64_t footerAt = fileSize - back - kFooter;
        if (size < kFooter || size - kFooter > footerAt || size > kMaxTag) return false;
        *itemsSize = size - kFooter;
        *itemsAt = footerAt - *itemsSize;
        *count = ReadLE32(b.data() + 16);
        return true;
    }
    return false;
}

}  // namespace

bool ReadApeFacts(const char* path, TagFacts* tags, std::vector<PictureFacts>* pictures) {
    const OpenedFile file(path);
    const int h = file.handle();
    uint64_t itemsAt = 0, itemsSize = 0;
    uint32_t count = 0;
    if (!file.ok() || !FindTag(h, file.size(), &itemsAt, &itemsSize, &count)) return true;
    try {
        std::vector<uint8_t> b;
        if (!ReadExactAt(h, itemsAt, static_cast<size_t>(itemsSize), &b)) return true;
        ReadItems(b, count, itemsAt, tags, pictures);
    } catch (const std::bad_alloc&) {
        return false;
    }
    return true;
}

}  // namespace metainfo
