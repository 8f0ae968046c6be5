#include "ogg/vorbis_comment.h"

#include <string>

#include "core/byte_reader.h"
#include "core/text.h"
#include "probe/contract_facts.h"

namespace metainfo {
namespace {

int Base64Value(char c) {
    if (c >= 'A' && c <= 'Z') return c - 'A';
    if (c >= 'a' && c <= 'z') return c - 'a' + 26;
    if (c >= '0' && c <= '9') return c - '0' + 52;
    if (c == '+') return 62;
    if (c == '/') return 63;
    return -1;
}

// Decodes until padding or the first byte that is not base64.
std::vector<uint8_t> Base64Decode(const std::string& text) {
    std::vector<uint8_t> out;
    out.reserve(text.size() / 4 * 3);
    uint32_t bits = 0;
    int count = 0;
    for (const char c : text) {
        const int v = Base64Value(c);
        if (v < 0) break;
        bits = bits << 6 | static_cast<uint32_t>(v);
        count += 6;
        if (count >= 8) {
            count -= 8;
            out.push_back(static_cast<uint8_t>(bits >> count));
        }
    }
    return out;
}

std::string Upper(std::string s) {
    for (char& c : s) {
        if (c >= 'a' && c <= 'z') c = static_cast<char>(c - 'a' + 'A');
    }
    return s;
}

uint32_t Number(const std::string& s) {
    uint32_t n = 0, total = 0;
    SplitNumberPair(s, &n, &total);
    return n;
}

void SetOnce(std::string* field, const std::string& value) {
    if (field->empty()) *field = value;
}

// A comment the tag fields name; false for one kept as an extra.
bool Assign(const std::string& key, const std::string& value, TagFacts* t) {
    if (key == "TITLE") {
        SetOnce(&t->title, value);
    } else if (key == "ARTIST") {
        SetOnce(&t->artist, value);
    } else if (key == "ALBUM") {
        SetOnce(&t->album, value);
    } else if (key == "ALBUMARTIST" || key == "ALBUM ARTIST") {
        SetOnce(&t->albumArtist, value);
    } else if (key == "GENRE") {
        SetOnce(&t->genre, value);
    } else if (key == "COMPOSER") {
        SetOnce(&t->composer, value);
    } else if (key == "COMMENT" || key == "DESCRIPTION") {
        SetOnce(&t->comment, value);
    } else if (key == "DATE") {
        if (!t->date.empty()) return true;
        t->date = value;
        bool digits = value.size() >= 4;
        for (size_t i = 0; digits && i < 4; ++i) digits = value[i] >= '0' && value[i] <= '9';
        if (digits) t->year = std::stoi(value.substr(0, 4));
    } else if (key == "TRACKNUMBER") {
        if (t->track == 0) SplitNumberPair(value, &t->track, &t->trackTotal);
    } else if (key == "DISCNUMBER") {
        if (t->disc == 0) SplitNumberPair(value, &t->disc, &t->discTotal);
    } else if (key == "TRACKTOTAL" || key == "TOTALTRACKS") {
        t->trackTotal = Number(value);
    } else if (key == "DISCTOTAL" || key == "TOTALDISCS") {
        t->discTotal = Number(value);
    } else {
        return false;
    }
    return true;
}

void AddPicture(const std::string& base64, PictureSink* pictures) {
    const std::vector<uint8_t> block = Base64Decode(base64);
    PictureFacts picture;
    size_t dataOffset = 0;
    if (ReadPictureBlock(block.data(), block.size(), &picture, &dataOffset)) {
        pictures->Add(picture, block.data() + dataOffset);
    }
}

}  // namespace

void PictureSink::Add(PictureFacts picture, const uint8_t* data) {
    picture.inOggHeaders = true;
    picture.ordinal = static_cast<uint32_t>(list.size());
    if (want == static_cast<int64_t>(list.size())) bytes.assign(data, data + picture.size);
    list.push_back(picture);
}

bool ReadPictureBlock(const uint8_t* p, size_t n, PictureFacts* picture, size_t* dataOffset) {
    ByteReader r(p, n);
    uint32_t type = 0, mimeSize = 0, descSize = 0, dataSize = 0;
    if (!r.BE32(&type) || !r.BE32(&mimeSize) || r.Peek(mimeSize) == nullptr) return false;
    picture->mime = TrimText(Latin1ToUtf8(r.Peek(mimeSize), mimeSize));
    r.Skip(mimeSize);
    if (!r.BE32(&descSize) || r.Peek(descSize) == nullptr) return false;
    picture->description = TrimText(Utf8ToUtf8(r.Peek(descSize), descSize));
    // Width, height, depth and colour count.
    if (!r.Skip(descSize) || !r.Skip(16) || !r.BE32(&dataSize) || dataSize > r.remaining()) return false;
    picture->type = type <= 20 ? static_cast<int32_t>(type) : -1;
    picture->size = dataSize;
    *dataOffset = r.position();
    return true;
}

bool ReadVorbisComments(const uint8_t* p, size_t n, TagFacts* tags, PictureSink* pictures) {
    ByteReader r(p, n);
    uint32_t vendorSize = 0, count = 0;
    if (!r.LE32(&vendorSize) || !r.Skip(vendorSize) || !r.LE32(&count)) return false;
    for (uint32_t i = 0; i < count; ++i) {
        uint32_t size = 0;
        if (!r.LE32(&size) || r.Peek(size) == nullptr) return false;
        const std::string comment(reinterpret_cast<const char*>(r.Peek(size)), size);
        r.Skip(size);
        const size_t eq = comment.find('=');
        if (eq == std::string::npos || eq == 0) continue;
        const std::string key = Upper(comment.substr(0, eq));
        const std::string raw = comment.substr(eq + 1);
        if (key == "METADATA_BLOCK_PICTURE") {
            AddPicture(raw, pictures);
            continue;
        }
        const std::string value = TrimText(Utf8ToUtf8(reinterpret_cast<const uint8_t*>(raw.data()), raw.size()));
        if (value.empty() || Assign(key, value, tags)) continue;
        tags->extra.emplace_back(key, value);
    }
    return true;
}

}  // namespace metainfo
