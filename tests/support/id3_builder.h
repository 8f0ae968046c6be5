// ID3 frames and tags for the ID3 tests.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

#include "support/bytes.h"

namespace testing_support {

// A v2.3 (plain 32-bit size) or v2.4 (syncsafe size) frame.
std::vector<uint8_t> Id3Frame(int version, const std::string& id, const std::vector<uint8_t>& body, uint8_t flags2 = 0);
// A v2.2 frame: three-letter id, 24-bit size.
std::vector<uint8_t> Id3Frame22(const std::string& id, const std::vector<uint8_t>& body);
// An APIC body: Latin-1 encoding, MIME type, picture type 3, description, then the picture.
std::vector<uint8_t> ApicBody(const std::string& mime, const std::vector<uint8_t>& picture,
                              const std::string& description = "");
// Encoding byte then text.
std::vector<uint8_t> TextBytes(uint8_t encoding, const std::vector<uint8_t>& text);
std::vector<uint8_t> TextBody(uint8_t encoding, const std::string& text);
// A tag of the frames, with `padding` zero bytes after them (the reader counts
// ten more bytes than the frames take).
std::vector<uint8_t> Id3Tag(int version, const std::vector<std::vector<uint8_t>>& frames, size_t padding = 16,
                            uint8_t flags = 0);

struct Id3v1Fields {
    std::string title, artist, album, year, comment;
    int track = -1;  // v1.1 track byte when >= 0
    uint8_t genre = 255;
};
std::vector<uint8_t> Id3v1(const Id3v1Fields& shape);
// A v1 tag with only a title.
std::vector<uint8_t> Id3v1Titled(const std::string& title);

// ID3 unsynchronisation: a 00 after every FF.
std::vector<uint8_t> Unsynchronise(const std::vector<uint8_t>& data);

}  // namespace testing_support
