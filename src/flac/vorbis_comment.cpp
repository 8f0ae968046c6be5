#include "flac/vorbis_comment.h"

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
std::vector<uint8_t> Base64Decode(const uint8_t* p, size_t n) {
    std::vector<uint8_t> out;
    out.reserve(n / 4 * 3);
    uint32_t bits = 0;
    int count = 0;
    for (size_t i = 0; i < n; ++i) {
        const int v = Base64Value(static_cast<char>(p[i]));
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

std::string Upper(const uint8_t* p, size_t n) {
    std::string s(reinterpret_cast<const char*>(p), n);
    for (char& c : s) {
        if (c >= 'a' && c <= 'z') c = static_cast<char>(c - 'a' + 'A');
    }
    return s;
}

// A second value of the same key is kept beside the first, as ffprobe shows it.
void Append(std::string* field, const std::string& value) { *field = field->empty() ? value : *field + ";" + value; }

uint32_t Number(const std::string& value) {
    uint32_t n = 0, unused = 0;
    SplitNumberPair(value, &n, &unused);
    return n;
}

// A number with an optional "/total"; the first of several wins.
void NumberPair(const std::string& value, uint32_t* number, uint32_t* total) {
    if (*number != 0) return;
    uint32_t t = 0;
    SplitNumberPair(value, number, &t);
    if (t != 0) *total = t;
}

// A comment the tag fields name; false for one kept as an extra.
bool Assign(const std::string& key, const std::string& value, TagFacts* t) {
    static const struct {
        const char* key;
        std::string TagFacts::*field;
    } kNamed[] = {{"TITLE", &TagFacts::title},
                  {"ARTIST", &TagFacts::artist},
                  {"ALBUM", &TagFacts::album},
                  {"ALBUMARTIST", &TagFacts::albumArtist},
                  {"ALBUM ARTIST", &TagFacts::albumArtist},
                  {"GENRE", &TagFacts::genre},
                  {"DATE", &TagFacts::date},
                  {"COMMENT", &TagFacts::comment},
                  {"DESCRIPTION", &TagFacts::comment},
                  {"COMPOSER", &TagFacts::composer}};
    for (const auto& k : kNamed) {
        if (key == k.key) {
            Append(&(t->*k.field), value);
            return true;
        }
    }
    if (key == "TRACKNUMBER") {
        NumberPair(value, &t->track, &t->trackTotal);
    } else if (key == "DISCNUMBER") {
        NumberPair(value, &t->disc, &t->discTotal);
    } else if (key == "TRACKTOTAL" || key == "TOTALTRACKS") {
        t->trackTotal = Number(value);
    } else if (key == "DISCTOTAL" || key == "TOTALDISCS") {
        t->discTotal = Number(value);
    } else {
        return false;
    }
    return true;
}

void AddPicture(const uint8_t* p, size_t n, PictureSink* pictures) {
    const std::vector<uint8_t> block = Base64Decode(p, n);
    PictureFacts picture;
    size_t dataOffset = 0;
    if (ReadPictureBlock(block.data(), block.size(), &picture, &dataOffset)) {
        pictures->Add(picture, block.data() + dataOffset);
    }
}

void SetYear(TagFacts* t) {
    bool digits = t->date.size() >= 4;
    for (size_t i = 0; digits && i < 4; ++i) digits = t->date[i] >= '0' && t->date[i] <= '9';
    if (digits) t->year = std::stoi(t->date.substr(0, 4));
}

}  // namespace

void PictureSink::Add(PictureFacts picture, const uint8_t* data) {
    picture.inOggHeaders = true;
    picture.ordinal = static_cast<uint32_t>(list.size());
    if (want == static_cast<int64_t>(list.size())) bytes.assign(data, data + picture.size);
    list.push_back(picture);
}

bool ReadPictureHead(const uint8_t* p, size_t n, PictureFacts* picture, size_t* dataOffset) {
    ByteReader r(p, n);
    uint32_t type = 0, mimeSize = 0, descSize = 0, dataSize = 0;
    if (!r.BE32(&type) || !r.BE32(&mimeSize) || r.Peek(mimeSize) == nullptr) return false;
    picture->mime = TrimText(Latin1ToUtf8(r.Peek(mimeSize), mimeSize));
    r.Skip(mimeSize);
    if (!r.BE32(&descSize) || r.Peek(descSize) == nullptr) return false;
    picture->description = TrimText(Utf8ToUtf8(r.Peek(descSize), descSize));
    // Width, height, depth and colour count.
    if (!r.Skip(descSize) || !r.Skip(16) || !r.BE32(&dataSize)) return false;
    picture->type = type <= 20 ? static_cast<int32_t>(type) : -1;
    picture->size = dataSize;
    *dataOffset = r.position();
    return true;
}

bool ReadPictureBlock(const uint8_t* p, size_t n, PictureFacts* picture, size_t* dataOffset) {
    return ReadPictureHead(p, n, picture, dataOffset) && picture->size <= n - *dataOffset;
}

bool ReadVorbisComments(const uint8_t* p, size_t n, TagFacts* tags, PictureSink* pictures) {
    ByteReader r(p, n);
    uint32_t vendorSize = 0, count = 0;
    if (!r.LE32(&vendorSize) || !r.Skip(vendorSize) || !r.LE32(&count)) return false;
    bool whole = true;
    for (uint32_t i = 0; i < count; ++i) {
        uint32_t size = 0;
        const uint8_t* comment = nullptr;
        if (!r.LE32(&size) || (comment = r.Peek(size)) == nullptr) {
            whole = false;
            break;
        }
        r.Skip(size);
        size_t eq = 0;
        while (eq < size && comment[eq] != '=') ++eq;
        if (eq == size || eq == 0) continue;
        const std::string key = Upper(comment, eq);
        const uint8_t* raw = comment + eq + 1;
        const size_t rawSize = size - eq - 1;
        if (key == "METADATA_BLOCK_PICTURE") {
            // A picture in base64 is no text tag.
            if (pictures != nullptr) AddPicture(raw, rawSize, pictures);
            continue;
        }
        const std::string value = TrimText(Utf8ToUtf8(raw, rawSize));
        if (value.empty() || Assign(key, value, tags)) continue;
        tags->extra.emplace_back(key, value);
    }
    SetYear(tags);
    return whole;
}

}  // namespace metainfo
