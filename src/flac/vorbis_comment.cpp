#include "flac/vorbis_comment.h"

#include <algorithm>
#include <cctype>
#include <cstring>
#include <string>

#include "core/byte_reader.h"
#include "core/text.h"
#include "probe/contract_facts.h"

namespace metainfo {
namespace {

constexpr uint32_t kMaxEntries = 65536;

std::string Upper(std::string s) {
    std::transform(s.begin(), s.end(), s.begin(), [](char c) { return static_cast<char>(std::toupper(c & 0xFF)); });
    return s;
}

// A second value of the same key is kept beside the first, as ffprobe shows it.
void Append(std::string* field, const std::string& value) {
    if (value.empty()) return;
    *field = field->empty() ? value : *field + ";" + value;
}

uint32_t Number(const std::string& value) {
    uint32_t n = 0, unused = 0;
    SplitNumberPair(value, &n, &unused);
    return n;
}

void TakeEntry(const std::string& key, const std::string& value, TagFacts* t) {
    static const struct {
        const char* key;
        std::string TagFacts::*field;
    } kNamed[] = {{"TITLE", &TagFacts::title},
                  {"ARTIST", &TagFacts::artist},
                  {"ALBUM", &TagFacts::album},
                  {"ALBUMARTIST", &TagFacts::albumArtist},
                  {"ALBUM ARTIST", &TagFacts::albumArtist},
                  {"GENRE", &TagFacts::genre},
                  {"DATE", &TagFacts::date},
                  {"COMMENT", &TagFacts::comment},
                  {"DESCRIPTION", &TagFacts::comment},
                  {"COMPOSER", &TagFacts::composer}};
    for (const auto& k : kNamed) {
        if (key == k.key) return Append(&(t->*k.field), value);
    }
    if (key == "TRACKNUMBER") {
        uint32_t total = 0;
        SplitNumberPair(value, &t->track, &total);
        if (total != 0) t->trackTotal = total;
    } else if (key == "TRACKTOTAL" || key == "TOTALTRACKS") {
        t->trackTotal = Number(value);
    } else if (key == "DISCNUMBER") {
        uint32_t total = 0;
        SplitNumberPair(value, &t->disc, &total);
        if (total != 0) t->discTotal = total;
    } else if (key == "DISCTOTAL" || key == "TOTALDISCS") {
        t->discTotal = Number(value);
    } else if (!value.empty() && key != "METADATA_BLOCK_PICTURE") {
        // A picture in base64 has no bytes to point at in the file: not a tag.
        t->extra.emplace_back(key, value);
    }
}

}  // namespace

void ReadVorbisComments(const uint8_t* b, size_t n, TagFacts* t) {
    ByteReader r(b, n);
    uint32_t vendor = 0, count = 0;
    if (!r.LE32(&vendor) || !r.Skip(vendor) || !r.LE32(&count)) return;
    for (uint32_t i = 0; i < count && i < kMaxEntries; ++i) {
        uint32_t size = 0;
        if (!r.LE32(&size)) break;
        const uint8_t* p = r.Peek(size);
        if (p == nullptr) break;
        r.Skip(size);
        const auto* eq = static_cast<const uint8_t*>(std::memchr(p, '=', size));
        if (eq == nullptr || eq == p) continue;
        const std::string key = Upper(std::string(reinterpret_cast<const char*>(p), static_cast<size_t>(eq - p)));
        const size_t keyLen = static_cast<size_t>(eq - p) + 1;
        TakeEntry(key, TrimText(Utf8ToUtf8(eq + 1, size - keyLen)), t);
    }
    if (t->date.size() >= 4) {
        const std::string year = t->date.substr(0, 4);
        if (year.find_first_not_of("0123456789") == std::string::npos) t->year = std::stoi(year);
    }
}

}  // namespace metainfo
