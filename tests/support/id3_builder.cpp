#include "support/id3_builder.h"

#include <algorithm>

#include "support/media.h"

namespace testing_support {

std::vector<uint8_t> Id3Frame(int version, const std::string& id, const std::vector<uint8_t>& body, uint8_t flags2) {
    Bytes b;
    b.str(id);
    if (version == 4)
        b.syncsafe32(static_cast<uint32_t>(body.size()));
    else
        b.be32(static_cast<uint32_t>(body.size()));
    return b.u8(0).u8(flags2).raw(body).data();
}

std::vector<uint8_t> Id3Frame22(const std::string& id, const std::vector<uint8_t>& body) {
    return Bytes().str(id).be24(static_cast<uint32_t>(body.size())).raw(body).data();
}

std::vector<uint8_t> ApicBody(const std::string& mime, const std::vector<uint8_t>& picture,
                              const std::string& description) {
    return Bytes().u8(0).str(mime).u8(0).u8(3).str(description).u8(0).raw(picture).data();
}

std::vector<uint8_t> TextBytes(uint8_t encoding, const std::vector<uint8_t>& text) {
    return Bytes().u8(encoding).raw(text).data();
}

std::vector<uint8_t> TextBody(uint8_t encoding, const std::string& text) {
    return Bytes().u8(encoding).str(text).data();
}

std::vector<uint8_t> Id3Tag(int version, const std::vector<std::vector<uint8_t>>& frames, size_t padding,
                            uint8_t flags) {
    Bytes body;
    for (const auto& f : frames) body.raw(f);
    return Id3v2Tag(version, body.zeros(padding).data(), flags);
}

std::vector<uint8_t> Id3v1(const Id3v1Fields& s) {
    std::vector<uint8_t> tag(128, 0);
    auto put = [&](size_t at, const std::string& text, size_t n) {
        std::copy_n(text.begin(), std::min(text.size(), n), tag.begin() + static_cast<long>(at));
    };
    put(0, "TAG", 3);
    put(3, s.title, 30);
    put(33, s.artist, 30);
    put(63, s.album, 30);
    put(93, s.year, 4);
    put(97, s.comment, s.track >= 0 ? 28 : 30);
    if (s.track >= 0) tag[126] = static_cast<uint8_t>(s.track);
    tag[127] = s.genre;
    return tag;
}

std::vector<uint8_t> Id3v1Titled(const std::string& title) {
    Id3v1Fields fields;
    fields.title = title;
    return Id3v1(fields);
}

std::vector<uint8_t> Unsynchronise(const std::vector<uint8_t>& data) {
    Bytes out;
    for (uint8_t c : data) c == 0xFF ? out.u8(c).u8(0) : out.u8(c);
    return out.data();
}

}  // namespace testing_support
