#include "probe_format.h"

#include <cstdio>

namespace probe {
namespace {

const char* const kMediaTypeNames[MM_MEDIA_SLOTS] = {
    "none", "mp3",    "realmedia", "mp4", "asf", "midi", "aac",    "wav",
    "amr",  "amr-wb", "imelody",   "avi", "qcp", "evrc", "unused", "snd",
};

const char* const kMetaItemNames[MM_META_ITEMS] = {
    "title",    "artist",  "album",     "genre",     "year",      "copyright", "reserved", "composer",     "track",
    "language", "comment", "file_type", "conductor", "publisher", "date",      "time",     "picture_mime",
};

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

std::string DecodeLatin1(const uint8_t* p, size_t n) {
    std::string out;
    for (size_t i = 0; i < n && p[i] != 0; ++i) AppendUtf8(&out, p[i]);
    return out;
}

std::string DecodeUtf16(const uint8_t* p, size_t n, bool bigEndian) {
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

std::string DecodeUtf8(const uint8_t* p, size_t n) {
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

std::string DecodeInteger(const uint8_t* p, size_t n) {
    unsigned long long value = 0;
    for (size_t i = n < 8 ? n : 8; i > 0; --i) value = value << 8 | p[i - 1];
    return std::to_string(value);
}

}  // namespace

const char* MediaTypeName(int type) {
    if (type >= 0 && type < MM_MEDIA_SLOTS) return kMediaTypeNames[type];
    return "unknown";
}

const char* MetaItemName(int kind) {
    if (kind >= 0 && kind < MM_META_ITEMS) return kMetaItemNames[kind];
    return "item";
}

std::string DecodeItemText(const _MMMetaItem& item) {
    size_t n = item.nLength <= MM_META_DATA_SIZE ? item.nLength : MM_META_DATA_SIZE;
    const uint8_t* p = item.szData;
    switch (item.nEncoding) {
        case ENCODING_BINARY: return DecodeInteger(p, n);
        case ENCODING_UTF16BE: return DecodeUtf16(p, n, true);
        case ENCODING_UTF16LE: return DecodeUtf16(p, n, false);
        case ENCODING_UTF8: return DecodeUtf8(p, n);
        default: return DecodeLatin1(p, n);
    }
}

std::string ResultText(int32_t result) {
    char text[16];
    std::snprintf(text, sizeof text, "0x%08X", static_cast<uint32_t>(result));
    return text;
}

}  // namespace probe
