// ID3 tags and pictures as the accurate interface reads them, beside the MM_
// answers the same tags keep.
#include <gtest/gtest.h>

#include <algorithm>
#include <string>

#include "metainfo/metainfo.h"
#include "metainfo/probe.h"
#include "mp3/id3.h"
#include "mp3/id3_facts.h"
#include "probe/item_text.h"
#include "support/bytes.h"
#include "support/id3_accurate_builder.h"
#include "support/id3_builder.h"
#include "support/media.h"
#include "support/mp3_builder.h"

using namespace testing_support;
using metainfo::TagFacts;
using Data = std::vector<uint8_t>;

namespace {

Data Str(const std::string& s) { return Data(s.begin(), s.end()); }
Data Frame3(const std::string& id, const Data& body) { return Id3Frame(3, id, body); }
Data Frame4(const std::string& id, const Data& body) { return Id3Frame(4, id, body); }

struct Accurate {
    TagFacts tags;
    std::vector<metainfo::PictureFacts> pictures;
    uint64_t tagEnd = 0;
};

Accurate ReadAccurate(const Data& file) {
    TempDir dir;
    Accurate a;
    EXPECT_TRUE(metainfo::ReadId3Facts(dir.Write("a.mp3", file).c_str(), &a.tags, &a.pictures, &a.tagEnd));
    return a;
}

// A field by name ("title", "track" as "3/12", ...) or an extra key; "-" when absent.
std::string FieldOf(const TagFacts& t, const std::string& name) {
    const std::pair<const char*, std::string> named[] = {
        {"title", t.title},
        {"artist", t.artist},
        {"album", t.album},
        {"albumArtist", t.albumArtist},
        {"genre", t.genre},
        {"date", t.date},
        {"comment", t.comment},
        {"composer", t.composer},
        {"year", std::to_string(t.year)},
        {"track", std::to_string(t.track) + "/" + std::to_string(t.trackTotal)},
        {"disc", std::to_string(t.disc) + "/" + std::to_string(t.discTotal)},
    };
    for (const auto& field : named) {
        if (name == field.first) return field.second;
    }
    for (const auto& e : t.extra) {
        if (e.first == name) return e.second;
    }
    return "-";
}

// The MM_ answer: an item's text, or "no tag" when the query finds none.
std::string ContractItem(const Data& file, int kind) {
    TempDir dir;
    _MMMetaInfo meta{};
    const int32_t result = MM_MediaExtractor_GetMetaInfo(dir.Write("c.mp3", file).c_str(), MEDIA_TYPE_MP3, &meta);
    const _MMMetaItem& item = meta.aItems[kind];
    const std::string text = result != MM_OK ? "no tag" : item.nLength != 0 ? metainfo::DecodeItemText(item) : "";
    MM_MediaExtractor_FreeMetaInfo(&meta);
    return text;
}

const Data kPlainTag = Id3Tag(4, {Frame4("TIT2", TextBody(0, "T"))});

}  // namespace

TEST(AccurateId3, TextOfEveryEncodingAndFrameKind) {
    const Data hiLE = Utf16("Hi", false, true), hiBE = Utf16("Hi", true, true), zero2 = {0, 0};
    const struct {
        int version;
        Data frames;
        const char* field;
        const char* expected;
    } rows[] = {
        {3, Frame3("TIT2", TextBytes(0, {'C', 0xE7, 'a'})), "title",
         "C\xC3\xA7"
         "a"},
        {3, Frame3("TIT2", TextBytes(1, hiLE)), "title", "Hi"},
        {3, Frame3("TIT2", TextBytes(1, hiBE)), "title", "Hi"},
        {3, Frame3("TIT2", TextBytes(1, Utf16("Hi", false, false))), "title", "Hi"},  // no mark: little-endian
        {4, Frame4("TIT2", TextBytes(2, Utf16("Hi", true, false))), "title", "Hi"},
        {4,
         Frame4("TIT2", TextBody(3,
                                 "\xC3\x9C"
                                 "ber  ")),
         "title",
         "\xC3\x9C"
         "ber"},
        {4, Frame4("TPE1", TextBody(3, std::string("A\0B", 3))), "artist", "A"},
        {4, Frame4("TPUB", TextBytes(1, testing_support::Join({hiBE, zero2, hiLE}))), "TPUB",
         "Hi; Hi"},  // a mark per value
        {3, Frame3("TPE2", TextBody(0, "AA")), "albumArtist", "AA"},
        {3, Frame3("TCOM", TextBody(0, "C")), "composer", "C"},
        {4, Frame4("TALB", TextBody(3, "Al")), "album", "Al"},
        {3, Frame3("COMM", testing_support::Join({{1}, Str("eng"), hiLE, zero2, Utf16("Text", true, true)})), "comment",
         "Text"},
        {3,
         testing_support::Join({Frame3("COMM", TextBody(0, std::string("xxxiTunNORM\0 0001", 17))),
                                Frame3("COMM", TextBody(0, std::string("engdesc\0Described", 17))),
                                Frame3("COMM", TextBody(0, std::string("deu\0Plain", 9)))}),
         "comment", "Plain"},
        {3, Frame3("COMM", TextBody(0, std::string("engdesc\0Described", 17))), "comment", "Described"},
        {4, Frame4("TXXX", TextBody(3, std::string("MOOD\0Calm", 9))), "TXXX:MOOD", "Calm"},
        {3, Frame3("WXXX", TextBody(0, std::string("home\0http://h/", 14))), "WXXX:home", "http://h/"},
        {3, Frame3("WOAR", Str("http://a/")), "WOAR", "http://a/"},
        {3, Frame3("USLT", TextBody(0, std::string("eng\0la\nla", 9))), "USLT", "la\nla"},
        {3, Frame3("TCON", TextBody(0, "(13)")), "genre", "Pop"},
        {3, Frame3("TCON", TextBody(0, "17")), "genre", "Rock"},
        {3, Frame3("TCON", TextBody(0, "(13)Rock")), "genre", "Pop"},
        {3, Frame3("TCON", TextBody(0, "((Weird)")), "genre", "(Weird)"},
        {3, Frame3("TCON", TextBody(0, "RX")), "genre", "Remix"},
        {3, Frame3("TCON", TextBody(0, "(CR)")), "genre", "Cover"},
        {4, Frame4("TCON", TextBody(3, std::string("Jazz\0Pop", 8))), "genre", "Jazz"},
        {3, testing_support::Join({Frame3("TYER", TextBody(0, "2021")), Frame3("TDAT", TextBody(0, "0504"))}), "date",
         "2021-04-05"},
        {3, Frame3("TYER", TextBody(0, "2021")), "year", "2021"},
        {4, Frame4("TDRC", TextBody(3, "2021-04-05T10:00")), "date", "2021-04-05T10:00"},
        {3, Frame3("TRCK", TextBody(0, "3/12")), "track", "3/12"},
        {3, Frame3("TPOS", TextBody(0, "1/2")), "disc", "1/2"},
        {2, Id3Frame22("TT2", TextBytes(1, hiLE)), "title", "Hi"},
        {2, Id3Frame22("TCO", TextBody(0, "(8)")), "genre", "Jazz"},
        {2, Id3Frame22("TEN", TextBody(0, "Enc")), "TENC", "Enc"},
    };
    for (const auto& row : rows) {
        const Accurate a = ReadAccurate(Id3Tag(row.version, {row.frames}));
        EXPECT_EQ(FieldOf(a.tags, row.field), row.expected) << row.field << " in v2." << row.version;
    }
}

TEST(AccurateId3, V1FillsWhatV2LacksAndTagEndCountsEveryLeadingTag) {
    Id3v1Fields v1;
    v1.title = "V1 title";
    v1.artist = "V1 artist";
    v1.year = "1999";
    v1.track = 7;
    v1.genre = 17;
    const Accurate a = ReadAccurate(testing_support::Join({kPlainTag, Mp3Frames(2), Id3v1(v1)}));
    EXPECT_EQ(a.tags.title, "T");
    EXPECT_EQ(a.tags.artist, "V1 artist");
    EXPECT_EQ(a.tags.date, "1999");
    EXPECT_EQ(a.tags.year, 1999);
    EXPECT_EQ(a.tags.track, 7u);
    EXPECT_EQ(a.tags.genre, "Rock");

    Data footer = kPlainTag;
    footer[5] = 0x10;
    const Data footed = testing_support::Join({footer, Str("3DI"), Data(footer.begin() + 3, footer.begin() + 10)});
    const struct {
        Data file;
        uint64_t tagEnd;
    } ends[] = {
        {testing_support::Join({kPlainTag, Mp3Frames(1)}), kPlainTag.size()},
        {testing_support::Join({footed, Mp3Frames(1)}), footed.size()},
        {testing_support::Join({kPlainTag, kPlainTag, Mp3Frames(1)}), 2 * kPlainTag.size()},
        {Mp3Frames(1), 0},
    };
    for (const auto& row : ends) EXPECT_EQ(ReadAccurate(row.file).tagEnd, row.tagEnd);
}

// Each switch: a tag the MM_ answer reads its way, and what the tag holds.
TEST(AccurateId3, QuirkSwitchesKeepTheContractAndTellTheTruth) {
    const Data cover = Frame3("APIC", ApicBody("image/png", PictureBytes(40)));
    const Data extended =
        Id3v2Tag(4, testing_support::Join({{0, 0, 0, 6, 1, 0}, Frame4("TIT2", TextBody(0, "T")), Data(16, 0)}), 0x40);
    Data syncsafeSized = Id3Frame(4, "TXXX", TextBody(0, std::string(200, 'x')));
    syncsafeSized[3] = 'X';  // a v2.3 frame written with a v2.4 size
    const Data stuffed = Frame3("TXXX", {0, 0xFF, 0xE0, 'x'});
    const struct {
        const char* quirk;
        Data tag;
        int item;
        const char* contract;
        const char* field;
        const char* accurate;
    } rows[] = {
        {"id3NeedsPadding", Id3Tag(3, {Frame3("TIT2", TextBody(0, "T")), cover}, 0), META_TITLE, "no tag", "title",
         "T"},
        {"id3YearKeepsEncodingByte", Id3Tag(4, {Frame4("TDRC", TextBody(0, "2024"))}), META_YEAR, "", "year", "2024"},
        {"id3Utf16BeEmpty",
         Id3Tag(4, {Frame4("COMM", testing_support::Join({{2}, Str("eng"), {0, 0}, Utf16("Hi", true, false)}))}),
         META_COMMENT, "", "comment", "Hi"},
        {"id3Utf16BeEmpty", Id3Tag(4, {Frame4("TCON", TextBytes(2, Utf16("Rock", true, false)))}), META_GENRE, "",
         "genre", "Rock"},
        {"id3V24ExtendedHeaderAsFrames", extended, META_TITLE, "no tag", "title", "T"},
        {"id3FrameSizeAsStated", Id3Tag(3, {Frame3("TIT2", TextBody(0, "T")), syncsafeSized}, 4), META_TITLE, "no tag",
         "title", "T"},
        {"id3UnsyncSizeIsStored",
         Id3v2Tag(3, Unsynchronise(testing_support::Join({stuffed, Frame3("TPE1", TextBody(0, "After")), Data(16, 0)})),
                  0x80),
         META_ARTIST, "no tag", "artist", "After"},
    };
    for (const auto& row : rows) {
        const Data file = testing_support::Join({row.tag, Mp3Frames(2)});
        EXPECT_EQ(ContractItem(file, row.item), row.contract) << row.quirk;
        EXPECT_EQ(FieldOf(ReadAccurate(file).tags, row.field), row.accurate) << row.quirk;
    }
}

TEST(AccurateId3, PicturesLieWhereTheFileKeepsThemAndCopyWhole) {
    const Data picture = PictureBytes(300);
    const Data apic = PictureBody(3, 0, "image/png", 3, Str("Front"), picture);
    const Data dataLength = Bytes().syncsafe32(static_cast<uint32_t>(apic.size())).raw(Unsynchronise(apic)).data();
    const struct {
        const char* name;
        Data tag;
        const char* mime;
        int type;
        const char* description;
        bool unsynchronised;
    } rows[] = {
        {"v2.3", Id3Tag(3, {Frame3("APIC", apic)}), "image/png", 3, "Front", false},
        {"v2.4 UTF-16", Id3Tag(4, {Frame4("APIC", PictureBody(4, 1, "image/jpeg", 4, Utf16("Back", 0, 1), picture))}),
         "image/jpeg", 4, "Back", false},
        {"v2.2", Id3Tag(2, {Id3Frame22("PIC", PictureBody(2, 0, "JPG", 3, Str("d"), picture))}), "image/jpeg", 3, "d",
         false},
        {"v2.3 tag unsync", Id3v2Tag(3, Unsynchronise(testing_support::Join({Frame3("APIC", apic), Data(8, 0)})), 0x80),
         "image/png", 3, "Front", true},
        {"v2.2 tag unsync",
         Id3v2Tag(2,
                  Unsynchronise(
                      testing_support::Join({Id3Frame22("PIC", PictureBody(2, 0, "PNG", 0, {}, picture)), Data(8, 0)})),
                  0x80),
         "image/png", 0, "", true},
        {"v2.4 frame unsync", Id3Tag(4, {Id3Frame(4, "APIC", dataLength, 0x03)}), "image/png", 3, "Front", true},
    };
    TempDir dir;
    for (const auto& row : rows) {
        const Data file = testing_support::Join({row.tag, Mp3Frames(4)});
        const std::string path = dir.Write("p.mp3", file);
        mi_info* info = nullptr;
        ASSERT_EQ(mi_probe(path.c_str(), &info), MI_OK) << row.name;
        ASSERT_EQ(info->picture_count, 1u) << row.name;
        const mi_picture& p = info->pictures[0];
        EXPECT_STREQ(p.mime, row.mime) << row.name;
        EXPECT_EQ(p.type, row.type) << row.name;
        EXPECT_EQ(std::string(p.description != nullptr ? p.description : ""), row.description) << row.name;
        EXPECT_EQ(p.flags, row.unsynchronised ? MI_PICTURE_UNSYNCHRONISED : 0u) << row.name;
        EXPECT_EQ(p.size, picture.size()) << row.name;
        if (!row.unsynchronised) {
            EXPECT_TRUE(std::equal(picture.begin(), picture.end(), file.begin() + static_cast<long>(p.offset)));
        }
        Data copy(picture.size());
        size_t size = 0;
        EXPECT_EQ(mi_picture_copy(path.c_str(), info, 0, copy.data(), copy.size(), &size), MI_OK) << row.name;
        EXPECT_EQ(copy, picture) << row.name;
        mi_info_free(info);
    }
}

// Sizes past the tag, tags past the file: what fits is read, nothing more.
TEST(AccurateId3, BrokenSizesStayInsideTheTag) {
    Data pastTag = Id3Tag(4, {Frame4("TIT2", TextBody(0, "T")), Frame4("TPE1", TextBody(0, "A"))}, 0);
    pastTag[pastTag.size() - 7] = 0x7F;  // TPE1 claims more than the tag holds
    Data pastFile = kPlainTag;
    pastFile[6] = 0x7F;
    const Data hugeFrame =
        testing_support::Join({Str("ID3"), {3, 0, 0, 0, 0, 0, 20}, Str("TIT2"), {0xFF, 0xFF, 0xFF, 0xF0, 0, 0}});
    const struct {
        Data file;
        const char* title;
        const char* artist;
    } rows[] = {{pastTag, "T", "A"}, {pastFile, "-", "-"}, {hugeFrame, "-", "-"}, {Str("ID3"), "-", "-"}};
    for (const auto& row : rows) {
        const Accurate a = ReadAccurate(testing_support::Join({row.file, Mp3Frames(1)}));
        EXPECT_EQ(a.tags.title.empty() ? "-" : a.tags.title, row.title);
        EXPECT_EQ(a.tags.artist.empty() ? "-" : a.tags.artist, row.artist);
    }
}
