#include "support/id3_accurate_builder.h"

#include "support/bytes.h"

namespace testing_support {

std::vector<uint8_t> Utf16(const std::string& ascii, bool bigEndian, bool mark) {
    Bytes b;
    if (mark) bigEndian ? b.be16(0xFEFF) : b.le16(0xFEFF);
    for (char c : ascii) bigEndian ? b.be16(static_cast<uint8_t>(c)) : b.le16(static_cast<uint8_t>(c));
    return b.data();
}

std::vector<uint8_t> PictureBody(int version, uint8_t encoding, const std::string& format, uint8_t type,
                                 const std::vector<uint8_t>& description, const std::vector<uint8_t>& picture) {
    Bytes b;
    b.u8(encoding).str(format);
    if (version != 2) b.u8(0);
    b.u8(type).raw(description).zeros(encoding == 1 || encoding == 2 ? 2 : 1);
    return b.raw(picture).data();
}

std::vector<uint8_t> PictureBytes(size_t size) {
    std::vector<uint8_t> p(size);
    for (size_t i = 0; i < size; ++i) p[i] = i % 3 == 0 ? 0xFF : static_cast<uint8_t>(i % 2 == 0 ? 0xE0 : 0);
    return p;
}

}  // namespace testing_support
