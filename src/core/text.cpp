#include "core/text.h"

namespace metainfo {
namespace {

const uint32_t kReplacement = 0xFFFD;

void AppendUtf8(std::string* out, uint32_t cp) {
    if (cp > 0x10FFFF || (cp >= 0xD800 && cp <= 0xDFFF)) cp = kReplacement;
    if (cp < 0x80) {
        out->push_back(static_cast<char>(cp));
    } else if (cp < 0x800) {
        out->push_back(static_cast<char>(0xC0 | cp >> 6));
        out->push_back(static_cast<char>(0x80 | (cp & 0x3F)));
    } else if (cp < 0x10000) {
        out->push_back(static_cast<char>(0xE0 | cp >> 12));
        out->push_back(static_cast<char>(0x80 | ((cp >> 6) & 0x3F)));
        out->push_back(static_cast<char>(0x80 | (cp & 0x3F)));
    } else {
        out->push_back(static_cast<char>(0xF0 | cp >> 18));
        out->push_back(static_cast<char>(0x80 | ((cp >> 12) & 0x3F)));
        out->push_back(static_cast<char>(0x80 | ((cp >> 6) & 0x3F)));
        out->push_back(static_cast<char>(0x80 | (cp & 0x3F)));
    }
}

}  // namespace

std::string Latin1ToUtf8(const uint8_t* p, size_t n) {
    std::string out;
    for (size_t i = 0; i < n && p[i] != 0; ++i) AppendUtf8(&out, p[i]);
    return out;
}

std::string Utf16ToUtf8(const uint8_t* p, size_t n, bool bigEndian) {
    size_t i = 0;
    if (n >= 2) {
        // A byte-order mark states the order of what follows.
        if (p[0] == 0xFE && p[1] == 0xFF) {
            bigEndian = true;
            i = 2;
        } else if (p[0] == 0xFF && p[1] == 0xFE) {
            bigEndian = false;
            i = 2;
        }
    }
    auto unit = [&](size_t at) -> uint32_t {
        return bigEndian ? (uint32_t(p[at]) << 8 | p[at + 1]) : (uint32_t(p[at + 1]) << 8 | p[at]);
    };
    std::string out;
    for (; i + 1 < n; i += 2) {
        uint32_t u = unit(i);
        if (u == 0) break;
        if (u >= 0xD800 && u <= 0xDBFF && i + 3 < n) {
            uint32_t low = unit(i + 2);
            if (low >= 0xDC00 && low <= 0xDFFF) {
                AppendUtf8(&out, 0x10000 + ((u - 0xD800) << 10) + (low - 0xDC00));
                i += 2;
                continue;
            }
        }
        AppendUtf8(&out, u);
    }
    return out;
}

namespace {

// Length of a valid UTF-8 sequence at p (at most n bytes), or 0.
size_t Utf8SequenceLength(const uint8_t* p, size_t n, uint32_t* cp) {
    uint8_t b = p[0];
    size_t len;
    uint32_t min;
    if (b < 0x80) {
        *cp = b;
        return 1;
    }
    if ((b & 0xE0) == 0xC0) {
        len = 2;
        *cp = b & 0x1F;
        min = 0x80;
    } else if ((b & 0xF0) == 0xE0) {
        len = 3;
        *cp = b & 0x0F;
        min = 0x800;
    } else if ((b & 0xF8) == 0xF0) {
        len = 4;
        *cp = b & 0x07;
        min = 0x10000;
    } else
        return 0;
    if (len > n) return 0;
    for (size_t k = 1; k < len; ++k) {
        if ((p[k] & 0xC0) != 0x80) return 0;
        *cp = *cp << 6 | (p[k] & 0x3F);
    }
    if (*cp < min || *cp > 0x10FFFF || (*cp >= 0xD800 && *cp <= 0xDFFF)) return 0;
    return len;
}

}  // namespace

std::string Utf8ToUtf8(const uint8_t* p, size_t n) {
    size_t i = (n >= 3 && p[0] == 0xEF && p[1] == 0xBB && p[2] == 0xBF) ? 3 : 0;
    std::string out;
    while (i < n && p[i] != 0) {
        uint32_t cp = 0;
        size_t len = Utf8SequenceLength(p + i, n - i, &cp);
        if (len == 0) {
            AppendUtf8(&out, kReplacement);
            ++i;
        } else {
            AppendUtf8(&out, cp);
            i += len;
        }
    }
    return out;
}

std::string Utf8OrLatin1(const uint8_t* p, size_t n) {
    size_t i = 0;
    uint32_t cp = 0;
    while (i < n && p[i] != 0) {
        const size_t len = Utf8SequenceLength(p + i, n - i, &cp);
        if (len == 0) return Latin1ToUtf8(p, n);
        i += len;
    }
    return Utf8ToUtf8(p, n);
}

std::string TrimText(const std::string& s) {
    std::string out;
    for (char c : s) {
        const auto u = static_cast<unsigned char>(c);
        if (u >= 0x20 && u != 0x7F) out.push_back(c);
    }
    const size_t first = out.find_first_not_of(' ');
    if (first == std::string::npos) return std::string();
    return out.substr(first, out.find_last_not_of(' ') - first + 1);
}

}  // namespace metainfo
