#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

#include "probe_format.h"

namespace {

_MMMetaItem Item(uint32_t encoding, const std::vector<uint8_t>& bytes) {
    _MMMetaItem item;
    std::memset(&item, 0, sizeof item);
    item.nEncoding = encoding;
    std::memcpy(item.szData, bytes.data(), bytes.size());
    item.nLength = static_cast<uint32_t>(bytes.size());
    return item;
}

}  // namespace

TEST(DecodeItemText, TurnsEveryEncodingIntoUtf8) {
    EXPECT_EQ(probe::DecodeItemText(Item(ENCODING_LATIN1, {'C', 'a', 'f', 0xE9})), "Caf\xC3\xA9");
    EXPECT_EQ(probe::DecodeItemText(Item(ENCODING_UTF16BE, {0xFE, 0xFF, 0x00, 'H', 0x00, 0xE9})), "H\xC3\xA9");
    EXPECT_EQ(probe::DecodeItemText(Item(ENCODING_UTF16LE, {'H', 0x00, 0x3D, 0xD8, 0x00, 0xDE, 0, 0})),
              "H\xF0\x9F\x98\x80");
    EXPECT_EQ(probe::DecodeItemText(Item(ENCODING_UTF8, {0xEF, 0xBB, 0xBF, 'o', 'k'})), "ok");
    EXPECT_EQ(probe::DecodeItemText(Item(ENCODING_BINARY, {0x10, 0x27, 0, 0})), "10000");
    EXPECT_EQ(probe::DecodeItemText(Item(ENCODING_RAW, {'i', 'm', 'a', 'g', 'e', 0, 'x'})), "image");
}

TEST(DecodeItemText, InvalidInputBecomesReplacementCharacters) {
    EXPECT_EQ(probe::DecodeItemText(Item(ENCODING_UTF8, {'a', 0xC3, 'b'})),
              "a\xEF\xBF\xBD"
              "b");
    EXPECT_EQ(probe::DecodeItemText(Item(ENCODING_UTF16BE, {0xD8, 0x00, 0x00, 'x'})), "\xEF\xBF\xBDx");
    EXPECT_EQ(probe::DecodeItemText(Item(ENCODING_UTF16LE, {'a', 0x00, 'b'})), "a") << "an odd byte is dropped";
    _MMMetaItem overlong = Item(ENCODING_LATIN1, {'a'});
    overlong.nLength = 5000;
    std::memset(overlong.szData, 'z', sizeof overlong.szData);
    EXPECT_EQ(probe::DecodeItemText(overlong).size(), 128u) << "never past the payload";
}

TEST(ResultText, IsTheCodeInHexadecimal) {
    EXPECT_EQ(probe::ResultText(static_cast<int32_t>(0x80004005u)), "0x80004005");
}
