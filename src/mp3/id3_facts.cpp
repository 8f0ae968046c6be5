#include "mp3/id3_facts.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <new>
#include <string>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/text.h"
#include "metainfo/records.h"
#include "mp3/id3.h"
#include "mp3/id3_frame_facts.h"
#include "mp3/id3_text.h"

namespace metainfo {
namespace {

constexpr uint32_t kTagHeaderSize = 10;
constexpr uint32_t kV1TagSize = 128;
constexpr int kMostRepeatedTags = 64;

// The v2 tag header at `at`: the bytes the tag takes (footer included), or 0.
uint64_t TagLengthAt(int h, uint64_t at, uint64_t fileSize) {
    uint8_t header[kTagHeaderSize];
    if (!SeekToOffset(h, at) || MEx_fread(header, 1, kTagHeaderSize, h) != static_cast<int>(kTagHeaderSize)) return 0;
    if (!BytesEqual(header, "ID3", 3) || header[3] < 2 || header[3] > 4 || header[4] == 0xFF) return 0;
    if (((header[6] | header[7] | header[8] | header[9]) & 0x80) != 0) return 0;
    const bool footer = header[3] == 4 && (header[5] & 0x10) != 0;
    const uint64_t length = kTagHeaderSize + uint64_t(ReadSyncsafe32(header + 6)) + (footer ? kTagHeaderSize : 0);
    return std::min(length, fileSize - at);  // a tag the file cuts short ends with the file
}

// The v2 tags at the start: the first, then any written straight after it.
uint64_t TagsEnd(int h, uint64_t fileSize) {
    uint64_t end = 0;
    for (int i = 0; i < kMostRepeatedTags; ++i) {
        const uint64_t length = TagLengthAt(h, end, fileSize);
        if (length == 0) break;
        end += length;
    }
    return end;
}

// The v1 tag in the last 128 bytes fills what the v2 tag left empty.
void ReadV1(int h, uint64_t fileSize, uint64_t tagEnd, TagFacts* t) {
    uint8_t tag[kV1TagSize];
    if (fileSize < tagEnd + kV1TagSize || !SeekToOffset(h, fileSize - kV1TagSize) ||
        MEx_fread(tag, 1, kV1TagSize, h) != static_cast<int>(kV1TagSize) || !BytesEqual(tag, "TAG", 3)) {
        return;
    }
    const auto field = [&](size_t at, size_t n) { return TrimText(Latin1ToUtf8(tag + at, n)); };
    const bool v11 = tag[125] == 0 && tag[126] != 0;
    const auto fill = [](std::string* to, const std::string& value) {
        if (to->empty()) *to = value;
    };
    fill(&t->title, field(3, 30));
    fill(&t->artist, field(33, 30));
    fill(&t->album, field(63, 30));
    fill(&t->comment, field(97, v11 ? 28 : 30));
    if (StartsWithYear(field(93, 4))) fill(&t->date, field(93, 4));
    if (v11 && t->track == 0) t->track = tag[126];
    if (tag[127] < kGenreCount) fill(&t->genre, id3_strGenre[tag[127]]);
}

void YearFromDate(TagFacts* t) {
    if (t->year != 0 || !StartsWithYear(t->date)) return;
    t->year = std::stoi(t->date.substr(0, 4));
}

}  // namespace

bool ReadId3Facts(const char* path, TagFacts* tags, std::vector<PictureFacts>* pictures, uint64_t* tagEnd,
                  const TagFacts* beforeV1) {
    *tagEnd = 0;
    const OpenedFile file(path);
    if (!file.ok()) return true;
    const int h = file.handle();
    const uint64_t fileSize = file.size();
    *tagEnd = TagsEnd(h, fileSize);
    bool memory = true;
    try {
        if (*tagEnd > 0) memory = ReadId3V2Facts(h, fileSize, 0, tags, pictures);
        if (beforeV1 != nullptr) {
            YearFromDate(tags);
            tags->FillFrom(*beforeV1);
        }
        ReadV1(h, fileSize, *tagEnd, tags);
        YearFromDate(tags);
    } catch (const std::bad_alloc&) {
        return false;
    }
    return memory;
}

bool ReadId3FactsAt(const char* path, uint64_t offset, TagFacts* tags, std::vector<PictureFacts>* pictures) {
    const OpenedFile file(path);
    const int h = file.handle();
    const uint64_t fileSize = file.size();
    if (!file.ok() || offset >= fileSize || TagLengthAt(h, offset, fileSize) == 0) return true;
    try {
        const bool memory = ReadId3V2Facts(h, fileSize, offset, tags, pictures);
        YearFromDate(tags);
        return memory;
    } catch (const std::bad_alloc&) {
        return false;
    }
}

}  // namespace metainfo
