#include "probe/item_text.h"

#include "core/text.h"

namespace metainfo {
namespace {

std::string DecodeInteger(const uint8_t* p, size_t n) {
    unsigned long long value = 0;
    for (size_t i = n < 8 ? n : 8; i > 0; --i) value = value << 8 | p[i - 1];
    return std::to_string(value);
}

}  // namespace

std::string DecodeItemText(const _MMMetaItem& item) {
    size_t n = item.nLength <= MM_META_DATA_SIZE ? item.nLength : MM_META_DATA_SIZE;
    const uint8_t* p = item.szData;
    switch (item.nEncoding) {
        case ENCODING_BINARY: return DecodeInteger(p, n);
        case ENCODING_UTF16BE: return Utf16ToUtf8(p, n, true);
        case ENCODING_UTF16LE: return Utf16ToUtf8(p, n, false);
        case ENCODING_UTF8: return Utf8ToUtf8(p, n);
        default: return Latin1ToUtf8(p, n);
    }
}

}  // namespace metainfo
