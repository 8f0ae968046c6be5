// ID3 pieces the accurate-interface tests need beyond id3_builder.h.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace testing_support {

// ASCII text as UTF-16 code units: big- or little-endian, with or without a byte-order mark.
std::vector<uint8_t> Utf16(const std::string& ascii, bool bigEndian, bool mark);
// A picture frame body: encoding, MIME type (v2.3/2.4) or three-letter format (v2.2), type, description.
std::vector<uint8_t> PictureBody(int version, uint8_t encoding, const std::string& format, uint8_t type,
                                 const std::vector<uint8_t>& description, const std::vector<uint8_t>& picture);
// A picture of the given size whose bytes need unsynchronisation (FF E0, FF 00 pairs).
std::vector<uint8_t> PictureBytes(size_t size);

}  // namespace testing_support
