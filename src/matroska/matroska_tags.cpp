// Tags that speak of the whole file, and attached pictures.
#include <string>
#include <vector>

#include "matroska/ebml.h"
#include "matroska/matroska_internal.h"
#include "probe/contract_facts.h"

namespace metainfo {
namespace {

constexpr int kMaxAttachedFiles = 1024;
constexpr int kMaxFileChildren = 64;
constexpr uint64_t kMaxAttachmentText = 4096;

// A Tag speaks of the file when its Targets name no track, edition, chapter
// or attachment and its level is the album's (50) or unset.
bool FileLevel(const uint8_t* body, size_t size) {
    EbmlChildren children(body, size);
    EbmlElement e;
    const uint8_t* p = nullptr;
    while (children.Next(&e, &p)) {
        if (e.id == 0x68CA && EbmlUnsigned(p, e.size) != 50) return false;
        const bool uid = e.id == 0x63C5 || e.id == 0x63C9 || e.id == 0x63C4 || e.id == 0x63C6;
        if (uid && EbmlUnsigned(p, e.size) != 0) return false;
    }
    return true;
}

void AddTag(const std::string& name, const std::string& value, TagFacts* tags) {
    static const struct {
        const char* name;
        std::string TagFacts::*field;
    } kNamed[] = {{"TITLE", &TagFacts::title},       {"ARTIST", &TagFacts::artist},
                  {"ALBUM", &TagFacts::album},       {"ALBUM_ARTIST", &TagFacts::albumArtist},
                  {"GENRE", &TagFacts::genre},       {"COMMENT", &TagFacts::comment},
                  {"COMPOSER", &TagFacts::composer}, {"DATE_RELEASED", &TagFacts::date},
                  {"DATE", &TagFacts::date}};
    if (value.empty()) return;
    for (const auto& k : kNamed) {
        if (name == k.name) {
            if ((tags->*k.field).empty()) tags->*k.field = value;
            return;
        }
    }
    uint32_t total = 0;
    if (name == "PART_NUMBER") {
        SplitNumberPair(value, &tags->track, &total);
        if (total != 0) tags->trackTotal = total;
    } else if (name == "TOTAL_PARTS") {
        SplitNumberPair(value, &tags->trackTotal, &total);
    } else if (name == "DISC") {
        SplitNumberPair(value, &tags->disc, &tags->discTotal);
    } else {
        tags->extra.emplace_back(name, value);
    }
}

void SimpleTag(const uint8_t* body, size_t size, TagFacts* tags) {
    EbmlChildren children(body, size);
    EbmlElement e;
    const uint8_t* p = nullptr;
    std::string name, value;
    while (children.Next(&e, &p)) {
        if (e.id == 0x45A3) name = EbmlText(p, e.size);
        if (e.id == 0x4487) value = EbmlText(p, e.size);
    }
    for (char& c : name) c = c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c;
    AddTag(name, value, tags);
}

int32_t YearOf(const std::string& date) {
    if (date.size() < 4) return 0;
    int32_t year = 0;
    for (size_t i = 0; i < 4; ++i) {
        if (date[i] < '0' || date[i] > '9') return 0;
        year = year * 10 + (date[i] - '0');
    }
    return year;
}

bool IsImage(const std::string& mime) { return mime.compare(0, 6, "image/") == 0; }

// One AttachedFile: its texts read, its data only located.
void AttachedFile(int h, uint64_t pos, uint64_t end, std::vector<PictureFacts>* pictures) {
    PictureFacts picture;
    bool haveData = false;
    std::vector<uint8_t> text;
    EbmlElement e;
    for (int i = 0; i < kMaxFileChildren && EbmlHeaderAt(h, pos, end, &e); ++i) {
        const uint64_t body = pos + e.headerSize;
        if (e.id == 0x465C) {
            picture.offset = body;
            picture.size = e.size;
            haveData = true;
        } else if ((e.id == 0x4660 || e.id == 0x466E) && EbmlReadBody(h, body, e.size, kMaxAttachmentText, &text)) {
            (e.id == 0x4660 ? picture.mime : picture.description) = EbmlText(text.data(), text.size());
        }
        pos = body + e.size;
    }
    if (!haveData || !IsImage(picture.mime)) return;
    // The cover art naming that Matroska players follow.
    if (picture.description.compare(0, 5, "cover") == 0) picture.type = 3;
    pictures->push_back(picture);
}

}  // namespace

void MkvTagsFacts(const uint8_t* body, size_t size, TagFacts* tags) {
    EbmlChildren tagList(body, size);
    EbmlElement tag;
    const uint8_t* tagBody = nullptr;
    while (tagList.Next(&tag, &tagBody)) {
        if (tag.id != 0x7373) continue;
        const size_t tagSize = static_cast<size_t>(tag.size);
        EbmlChildren children(tagBody, tagSize);
        EbmlElement e;
        const uint8_t* p = nullptr;
        bool fileLevel = true;
        while (children.Next(&e, &p)) {
            if (e.id == 0x63C0) fileLevel = FileLevel(p, static_cast<size_t>(e.size));
        }
        if (!fileLevel) continue;
        EbmlChildren simple(tagBody, tagSize);
        while (simple.Next(&e, &p)) {
            if (e.id == 0x67C8) SimpleTag(p, static_cast<size_t>(e.size), tags);
        }
    }
    if (tags->year == 0) tags->year = YearOf(tags->date);
}

void MkvAttachmentsFacts(int h, uint64_t pos, uint64_t size, std::vector<PictureFacts>* pictures) {
    const uint64_t end = pos + size;
    EbmlElement e;
    for (int i = 0; i < kMaxAttachedFiles && EbmlHeaderAt(h, pos, end, &e); ++i) {
        const uint64_t body = pos + e.headerSize;
        if (e.id == 0x61A7) AttachedFile(h, body, body + e.size, pictures);
        pos = body + e.size;
    }
}

}  // namespace metainfo
