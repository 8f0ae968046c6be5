// User data: the 3GPP boxes of "udta", the iTunes-style item list
// "meta/ilst" and the embedded ID3 tag "meta/ID32".
#include <cstdio>
#include <cstring>
#include <new>

#include "core/byte_reader.h"
#include "core/file_access.h"
#include "core/thread_state.h"
#include "mp4/mp4_id3_bridge.h"
#include "mp4/mp4_internal.h"

namespace metainfo {
namespace {

// The ID3 genre names, a copy kept by this format.
const char* const kGenreNames[148] = {"Blues",
                                      "Classic Rock",
                                      "Country",
                                      "Dance",
                                      "Disco",
                                      "Funk",
                                      "Grunge",
                                      "Hip-Hop",
                                      "Jazz",
                                      "Metal",
                                      "New Age",
                                      "Oldies",
                                      "Other",
                                      "Pop",
                                      "R&B",
                                      "Rap",
                                      "Reggae",
                                      "Rock",
                                      "Techno",
                                      "Industrial",
                                      "Alternative",
                                      "Ska",
                                      "Death Metal",
                                      "Pranks",
                                      "Soundtrack",
                                      "Euro-Techno",
                                      "Ambient",
                                      "Trip-Hop",
                                      "Vocal",
                                      "Jazz+Funk",
                                      "Fusion",
                                      "Trance",
                                      "Classical",
                                      "Instrumental",
                                      "Acid",
                                      "House",
                                      "Game",
                                      "Sound Clip",
                                      "Gospel",
                                      "Noise",
                                      "AlternRock",
                                      "Bass",
                                      "Soul",
                                      "Punk",
                                      "Space",
                                      "Meditative",
                                      "Instrumental Pop",
                                      "Instrumental Rock",
                                      "Ethnic",
                                      "Gothic",
                                      "Darkwave",
                                      "Techno-Industrial",
                                      "Electronic",
                                      "Pop-Folk",
                                      "Eurodance",
                                      "Dream",
                                      "Southern Rock",
                                      "Comedy",
                                      "Cult",
                                      "Gangsta",
                                      "Top 40",
                                      "Christian Rap",
                                      "Pop/Funk",
                                      "Jungle",
                                      "Native American",
                                      "Cabaret",
                                      "New Wave",
                                      "Psychadelic",
                                      "Rave",
                                      "Showtunes",
                                      "Trailer",
                                      "Lo-Fi",
                                      "Tribal",
                                      "Acid Punk",
                                      "Acid Jazz",
                                      "Polka",
                                      "Retro",
                                      "Musical",
                                      "Rock & Roll",
                                      "Hard Rock",
                                      "Folk",
                                      "Folk-Rock",
                                      "National Folk",
                                      "Swing",
                                      "Fast Fusion",
                                      "Bebob",
                                      "Latin",
                                      "Revival",
                                      "Celtic",
                                      "Bluegrass",
                                      "Avantgarde",
                                      "Gothic Rock",
                                      "Progressive Rock",
                                      "Psychedelic Rock",
                                      "Symphonic Rock",
                                      "Slow Rock",
                                      "Big Band",
                                      "Chorus",
                                      "Easy Listening",
                                      "Acoustic",
                                      "Humour",
                                      "Speech",
                                      "Chanson",
                                      "Opera",
                                      "Chamber Music",
                                      "Sonata",
                                      "Symphony",
                                      "Booty Bass",
                                      "Primus",
                                      "Porn Groove",
                                      "Satire",
                                      "Slow Jam",
                                      "Club",
                                      "Tango",
                                      "Samba",
                                      "Folklore",
                                      "Ballad",
                                      "Power Ballad",
                                      "Rhythmic Soul",
                                      "Freestyle",
                                      "Duet",
                                      "Punk Rock",
                                      "Drum Solo",
                                      "A capella",
                                      "Euro-House",
                                      "Dance Hall",
                                      "Goa",
                                      "Drum & Bass",
                                      "Club-House",
                                      "Hardcore",
                                      "Terror",
                                      "Indie",
                                      "BritPop",
                                      "Negerpunk",
                                      "Polsk Punk",
                                      "Beat",
                                      "Christian Gangsta Rap",
                                      "Heavy Metal",
                                      "Black Metal",
                                      "Crossover",
                                      "Contemporary Christian",
                                      "Christian Rock",
                                      "Merengue",
                                      "Salsa",
                                      "Thrash Metal",
                                      "Anime",
                                      "JPop",
                                      "Synthpop"};

// A text box of "udta" ("titl", "perf", "albm", ...): owns its text.
struct _INFOBOX {
    _MP4FULLBOX header;
    uint16_t language;
    uint8_t* text;
    uint32_t textLength;
    uint8_t trackNumber;  // "albm" only
    bool present;

    _INFOBOX() : header(), language(0), text(nullptr), textLength(0), trackNumber(0), present(false) {}
    _INFOBOX(const _INFOBOX&) = delete;
    _INFOBOX& operator=(const _INFOBOX&) = delete;
    ~_INFOBOX() { delete[] text; }
};

struct _YRRCBOX {
    uint16_t recordingYear = 0;
    bool present = false;
};

void SetTextItem(_MMMetaItem* item, const uint8_t* data, size_t length) {
    std::memset(item->szData, 0, sizeof item->szData);
    if (length > sizeof item->szData) length = sizeof item->szData;
    if (length != 0) std::memcpy(item->szData, data, length);
    item->nLength = static_cast<uint32_t>(length);
    item->nEncoding = judgeLangue(reinterpret_cast<const char*>(item->szData));
}

// Text boxes: language, then the text; "albm" ends with a track-number byte.
int32_t ParseTextBox(const uint8_t* buf, size_t avail, bool album, _INFOBOX* box) {
    const size_t at = static_cast<size_t>(AnaFullBox(buf, avail, &box->header));
    const uint32_t size = box->header.box.size;
    if (at == 0 || static_cast<uint64_t>(at) + 2 >= size || size >= s_mp4FileSize) return MM_E_FAIL;
    if (avail < static_cast<size_t>(at) + 2) return MM_E_FAIL;
    delete[] box->text;
    box->text = nullptr;
    box->textLength = 0;
    box->present = true;
    box->language = ReadBE16(buf + at);
    const uint64_t claimed = size - (at + 2) - (album ? 1 : 0);
    const size_t held = avail - (at + 2);
    const size_t length = claimed < held ? static_cast<size_t>(claimed) : held;
    box->text = new (std::nothrow) uint8_t[length != 0 ? length : 1];
    if (box->text != nullptr) {
        if (length != 0) std::memcpy(box->text, buf + at + 2, length);
        box->textLength = static_cast<uint32_t>(length);
    }
    if (album && static_cast<uint64_t>(at) + 2 + length < avail) box->trackNumber = buf[at + 2 + length];
    return box->text != nullptr || album ? MM_OK : MM_E_OUTOFMEMORY;
}

int32_t AnaInfoBox(const uint8_t* buf, size_t avail, _INFOBOX* box) { return ParseTextBox(buf, avail, false, box); }
int32_t AnaAlbmBox(const uint8_t* buf, size_t avail, _INFOBOX* box) { return ParseTextBox(buf, avail, true, box); }

int32_t AnaYrrcBox(const uint8_t* buf, size_t avail, _YRRCBOX* box) {
    _MP4FULLBOX header;
    const size_t at = static_cast<size_t>(AnaFullBox(buf, avail, &header));
    if (at == 0 || avail < static_cast<size_t>(at) + 2) return MM_E_FAIL;
    box->recordingYear = ReadBE16(buf + at);
    box->present = true;
    return MM_OK;
}

// "loci", "kywd", "clsf", "rtng": their contents are not reported; only the
// shape of each is checked.
int32_t AnaDroppedBox(const uint8_t* buf, size_t avail, size_t fixedBytes) {
    _MP4FULLBOX header;
    const size_t at = static_cast<size_t>(AnaFullBox(buf, avail, &header));
    if (at == 0 || avail < static_cast<size_t>(at) + fixedBytes) return MM_E_FAIL;
    return MM_OK;
}
int32_t AnaLociBox(const uint8_t* buf, size_t avail) { return AnaDroppedBox(buf, avail, 2); }
int32_t AnaKywdBox(const uint8_t* buf, size_t avail) { return AnaDroppedBox(buf, avail, 3); }
int32_t AnaClsfBox(const uint8_t* buf, size_t avail) { return AnaDroppedBox(buf, avail, 8); }
int32_t AnaRtngBox(const uint8_t* buf, size_t avail) { return AnaDroppedBox(buf, avail, 10); }

struct _DATA {
    uint8_t* value = nullptr;
    uint32_t length = 0;
    _DATA() = default;
    _DATA(const _DATA&) = delete;
    _DATA& operator=(const _DATA&) = delete;
    ~_DATA() { delete[] value; }
};

int32_t AnaData(int h, _DATA* data) {
    BoxBuffer buf;
    uint32_t size = 0;
    const int32_t result = ReadWholeBox(h, FourCC("data"), kMp4BadIlst, MM_E_OUTOFMEMORY, &buf, &size);
    if (result != MM_OK) return result;
    _MP4FULLBOX full;
    const size_t at = static_cast<size_t>(AnaFullBox(buf.data, buf.size, &full));
    if (at == 0 || size < 16) return MM_E_FAIL;
    // The value follows the full-box header and the 4-byte locale word.
    const size_t offset = static_cast<size_t>(at) + 4;
    if (buf.size < offset) return MM_E_FAIL;
    const uint64_t claimed = size - 16;
    const size_t length = claimed < buf.size - offset ? static_cast<size_t>(claimed) : buf.size - offset;
    data->value = new (std::nothrow) uint8_t[length != 0 ? length : 1];
    if (data->value == nullptr) return MM_E_OUTOFMEMORY;
    if (length != 0) std::memcpy(data->value, buf.data + offset, length);
    data->length = static_cast<uint32_t>(length);
    return MM_OK;
}

}  // namespace

bool Read3gppText(const uint8_t* buf, size_t avail, bool album, const uint8_t** text, size_t* length) {
    _INFOBOX box;
    if (ParseTextBox(buf, avail, album, &box) != MM_OK || box.text == nullptr) return false;
    // The box's own bytes: the text lies right after the language word.
    const size_t at = static_cast<size_t>(AnaFullBox(buf, avail, &box.header)) + 2;
    *text = buf + at;
    *length = box.textLength;
    return true;
}

bool Read3gppYear(const uint8_t* buf, size_t avail, uint16_t* year) {
    _YRRCBOX box;
    if (AnaYrrcBox(buf, avail, &box) != MM_OK) return false;
    *year = box.recordingYear;
    return true;
}

uint32_t judgeLangue(const char* data) {
    if (data == nullptr) return 0;
    const uint8_t a = static_cast<uint8_t>(data[0]), b = static_cast<uint8_t>(data[1]);
    if (a == 0xFF && b == 0xFE) return ENCODING_UTF16LE;
    if (a == 0xFE && b == 0xFF) return ENCODING_UTF16BE;
    return ENCODING_UTF8;
}

void GenreToString(_MMMetaItem* item) {
    if (item->nEncoding != ENCODING_UTF8) return;
    const uint32_t n = ReadBE16(item->szData);
    if (n < 1 || n > 147) return;
    std::memset(item->szData, 0, sizeof item->szData);
    const char* name = kGenreNames[n - 1];
    const size_t length = strnlen(name, 127);
    std::memcpy(item->szData, name, length);
    item->nLength = static_cast<uint32_t>(length);
}

int32_t AnaID32(int h, _MMMetaInfo* meta) {
    const int64_t start = Tell(h);
    _BOXHEADER header{};
    getBoxHeader(h, &header);
    if (header.type != FourCC("ID32") || BadBoxSize(header.size)) return kMp4BadContainer;
    if (header.size <= 14) return MM_E_FAIL;
    // The tag follows the version/flags word and the 2-byte language.
    SeekTo(h, start + 14);
    return ParseEmbeddedID3(h, header.size - 14, meta) == 0 ? MM_OK : MM_E_FAIL;
}

int32_t AnaIlst(int h, _MMMetaInfo* meta) {
    const int64_t start = Tell(h);
    _BOXHEADER header{};
    getBoxHeader(h, &header);
    if (header.type != FourCC("ilst") || BadBoxSize(header.size)) return kMp4BadIlst;
    return WalkChildren(h, start + header.size, [&](uint32_t type, int64_t itemStart, uint32_t) {
        int kind = -1;
        switch (type) {
            case 0xA96E616D: kind = META_TITLE; break;  // "\xA9nam"
            case 0xA9415254: kind = META_ARTIST; break;  // "\xA9ART"
            case 0xA9616C62: kind = META_ALBUM; break;  // "\xA9alb"
            case FourCC("gnre"): kind = META_GENRE; break;
            case 0xA9646179: kind = META_YEAR; break;  // "\xA9day"
            case FourCC("trkn"): kind = META_TRACKNUMBER; break;
            default: return;
        }
        SeekTo(h, itemStart + 8);
        _DATA data;
        if (AnaData(h, &data) != MM_OK) return;
        _MMMetaItem* item = &meta->aItems[kind];
        if (kind == META_TRACKNUMBER) {
            if (data.length < 4) return;
            const uint32_t track = ReadBE16(data.value + 2);
            std::memset(item->szData, 0, sizeof item->szData);
            item->szData[0] = static_cast<uint8_t>(track);
            item->szData[1] = static_cast<uint8_t>(track >> 8);
            item->nLength = 4;
            item->nEncoding = ENCODING_BINARY;
            return;
        }
        SetTextItem(item, data.value, data.length);
        if (kind == META_GENRE) GenreToString(item);
    });
}

int32_t AnaMeta(int h, _MMMetaInfo* meta) {
    const int64_t start = Tell(h);
    _BOXHEADER header{};
    getBoxHeader(h, &header);
    if (header.type != FourCC("meta") || BadBoxSize(header.size)) return kMp4BadContainer;
    // Skips the version/flags word; a "meta" without one is not told apart.
    SeekTo(h, start + 12);
    return WalkChildren(h, start + header.size, [&](uint32_t type, int64_t, uint32_t) {
        if (type == FourCC("ID32")) AnaID32(h, meta);
        if (type == FourCC("ilst")) AnaIlst(h, meta);
    });
}

int32_t AnaUdta(int h, int mode, void* out) {
    if (mode != kModeMeta && mode != kModeMaker) return kMp4BadMode;
    const int64_t start = Tell(h);
    _BOXHEADER header{};
    getBoxHeader(h, &header);
    if (header.type != FourCC("udta") || BadBoxSize(header.size)) return kMp4BadContainer;
    _INFOBOX title, description, copyright, genre, performer, author, album;
    _YRRCBOX year;
    int32_t failure = MM_OK;
    int32_t result = WalkChildren(h, start + header.size, [&](uint32_t type, int64_t, uint32_t size) {
        if (failure != MM_OK) return;
        if (mode == kModeMaker) {
            if (type == FourCC("@mkr")) AnaMaker(h, static_cast<_MAKERINFO*>(out));
            return;
        }
        if (type == FourCC("meta")) {
            AnaMeta(h, static_cast<_MMMetaInfo*>(out));
            return;
        }
        BoxBuffer buf;
        if (!ReadBoxBuffer(h, size, &buf)) {
            failure = MM_E_OUTOFMEMORY;
            return;
        }
        if (buf.size < size) {
            failure = kMp4ShortRead;
            return;
        }
        switch (type) {
            case FourCC("titl"): AnaInfoBox(buf.data, buf.size, &title); break;
            case FourCC("auth"): AnaInfoBox(buf.data, buf.size, &author); break;
            case FourCC("perf"): AnaInfoBox(buf.data, buf.size, &performer); break;
            case FourCC("gnre"): AnaInfoBox(buf.data, buf.size, &genre); break;
            case FourCC("dscp"): AnaInfoBox(buf.data, buf.size, &description); break;
            case FourCC("cprt"): AnaInfoBox(buf.data, buf.size, &copyright); break;
            case FourCC("albm"): AnaAlbmBox(buf.data, buf.size, &album); break;
            case FourCC("yrrc"): AnaYrrcBox(buf.data, buf.size, &year); break;
            case FourCC("loci"): AnaLociBox(buf.data, buf.size); break;
            case FourCC("kywd"): AnaKywdBox(buf.data, buf.size); break;
            case FourCC("clsf"): AnaClsfBox(buf.data, buf.size); break;
            case FourCC("rtng"): AnaRtngBox(buf.data, buf.size); break;
            default: break;
        }
    });
    if (failure != MM_OK) result = failure;
    // A walk that failed releases what it gathered without reporting it.
    if (result != MM_OK || mode != kModeMeta) return result;
    _MMMetaInfo* meta = static_cast<_MMMetaInfo*>(out);
    // These overwrite what "ilst" or "ID32" put into the same items earlier.
    if (title.present) SetTextItem(&meta->aItems[META_TITLE], title.text, title.textLength);
    if (performer.present && performer.textLength > 0) {
        SetTextItem(&meta->aItems[META_ARTIST], performer.text, performer.textLength);
    } else if (author.present) {
        SetTextItem(&meta->aItems[META_ARTIST], author.text, author.textLength);
    }
    if (album.present) SetTextItem(&meta->aItems[META_ALBUM], album.text, album.textLength);
    if (genre.present) SetTextItem(&meta->aItems[META_GENRE], genre.text, genre.textLength);
    if (year.present) {
        _MMMetaItem* item = &meta->aItems[META_YEAR];
        std::memset(item->szData, 0, sizeof item->szData);
        item->szData[0] = static_cast<uint8_t>(year.recordingYear);
        item->szData[1] = static_cast<uint8_t>(year.recordingYear >> 8);
        item->nLength = 2;
        item->nEncoding = judgeLangue(reinterpret_cast<const char*>(item->szData));
    }
    if (copyright.present) SetTextItem(&meta->aItems[META_COPYRIGHT], copyright.text, copyright.textLength);
    return MM_OK;
}

}  // namespace metainfo
