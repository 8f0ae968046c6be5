#include "mp3/id3_text.h"

#include <cstring>

#include "core/text.h"
#include "mp3/id3.h"

namespace metainfo {
namespace {

bool AllDigits(const std::string& s) { return !s.empty() && s.find_first_not_of("0123456789") == std::string::npos; }

// A genre by its number in the v1 list, or "" for one the list does not reach.
std::string NumberedGenre(const std::string& digits) {
    if (digits.size() > 3) return std::string();
    const unsigned long n = std::stoul(digits);
    return n < static_cast<unsigned long>(kGenreCount) ? id3_strGenre[n] : "";
}

std::string CodedGenre(const std::string& code) {
    if (code == "RX") return "Remix";
    if (code == "CR") return "Cover";
    return AllDigits(code) ? NumberedGenre(code) : std::string();
}

}  // namespace

size_t TakeId3Text(uint8_t encoding, const uint8_t* p, size_t n, std::string* out) {
    const bool wide = encoding == 1 || encoding == 2;
    size_t end = n;
    size_t next = n;
    if (wide) {
        for (size_t i = 0; i + 1 < n; i += 2) {
            if (p[i] == 0 && p[i + 1] == 0) {
                end = i;
                next = i + 2;
                break;
            }
        }
    } else if (const void* zero = std::memchr(p, 0, n)) {
        end = static_cast<size_t>(static_cast<const uint8_t*>(zero) - p);
        next = end + 1;
    }
    switch (encoding) {
        case 0: *out = Latin1ToUtf8(p, end); break;
        // Without a byte-order mark UTF-16 is taken as little-endian, as Windows writers meant it.
        case 1: *out = Utf16ToUtf8(p, end, false); break;
        case 2: *out = Utf16ToUtf8(p, end, true); break;
        default: *out = Utf8ToUtf8(p, end); break;
    }
    return next;
}

std::vector<std::string> Id3TextValues(uint8_t encoding, const uint8_t* p, size_t n) {
    std::vector<std::string> values;
    size_t at = 0;
    while (at < n) {
        std::string value;
        at += TakeId3Text(encoding, p + at, n - at, &value);
        values.push_back(TrimText(value));
    }
    return values;
}

std::string Id3GenreName(const std::string& value) {
    if (AllDigits(value)) {
        const std::string name = NumberedGenre(value);
        return name.empty() ? value : name;
    }
    const std::string coded = CodedGenre(value);
    if (!coded.empty()) return coded;
    // Leading "(n)" references, then a name of the writer's own.
    size_t at = 0;
    while (at < value.size() && value[at] == '(') {
        const size_t close = value.find(')', at);
        if (close == std::string::npos) break;
        const std::string name = CodedGenre(value.substr(at + 1, close - at - 1));
        if (!name.empty()) return name;
        if (!AllDigits(value.substr(at + 1, close - at - 1))) break;
        at = close + 1;
    }
    std::string rest = value.substr(at);
    if (rest.compare(0, 2, "((") == 0) rest.erase(0, 1);  // "((" escapes a name that starts with "("
    return rest.empty() ? value : rest;
}

bool StartsWithYear(const std::string& date) { return date.size() >= 4 && date.find_first_not_of("0123456789") >= 4; }

}  // namespace metainfo
