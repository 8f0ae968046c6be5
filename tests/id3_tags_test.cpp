// ID3 tags: frame table, first-frame-wins, encodings, genres, time stamps,
// pictures, unsynchronisation, v1 and the fallback between them.
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <tuple>

#include "core/file_access.h"
#include "metainfo/metainfo.h"
#include "mp3/id3.h"
#include "mp3/id3_frames.h"
#include "support/bytes.h"
#include "support/id3_builder.h"
#include "support/mp3_builder.h"

using namespace testing_support;
using namespace metainfo;

namespace {

using Data = std::vector<uint8_t>;
using Frames = std::vector<Data>;

std::string Item(const _MMMetaItem& item) { return std::string(reinterpret_cast<const char*>(item.szData), item.nLength); }

struct Meta {
    _MMMetaInfo meta;
    int32_t result = 0;
    Meta() { std::memset(&meta, 0, sizeof meta); }
    explicit Meta(const Data& file, int pictureLimit = 1) : Meta() {
        TempDir dir;
        result = ID3_GetMetaInfo(dir.Write("t.mp3", file).c_str(), &meta, pictureLimit);
    }
    Meta(const Meta&) = delete;
    ~Meta() { delete[] meta.pPicture; }
    std::string Text(int kind) const { return Item(meta.aItems[kind]); }
    Data Raw(int kind) const {
        const _MMMetaItem& item = meta.aItems[kind];
        return Data(item.szData, item.szData + item.nLength);
    }
    uint32_t Code(int kind) const { return meta.aItems[kind].nEncoding; }
    Data Picture() const { return Data(meta.pPicture, meta.pPicture + meta.nPictureSize); }
};

Data Text3(const std::string& id, const std::string& text) { return Id3Frame(3, id, TextBody(0, text)); }

// A v2 tag of the frames, then a few audio frames.
Data Tagged(int version, const Frames& frames, size_t padding = 16, uint8_t flags = 0) {
    return Bytes().raw(Id3Tag(version, frames, padding, flags)).raw(Mp3Frames(6)).data();
}

// Runs one step of the v2 parser on the tag at `offset`, with the bound an embedding box gives it.
int32_t ParseAt(const Data& file, long offset, uint32_t bound, Meta* m,
                int32_t (*parse)(int, ID3_MetaInfo*) = ParseID3V2) {
    TempDir dir;
    const int h = MEx_fopen(dir.Write("box.bin", file).c_str(), "rb");
    if (h == 0 || MEx_fseek(h, offset, SEEK_SET) != 0) return -1;
    ID3_MetaInfo ctx = {&m->meta, bound, 0, 1, 0, 0};
    const int32_t result = parse(h, &ctx);
    MEx_fclose(h);
    return result;
}

}  // namespace

TEST(Id3Tags, FrameTableFillsItemsFirstFrameWinsAndTextIsCutTo128Bytes) {
    const struct {
        const char* id;
        int item;
    } table[] = {{"TPE1", META_ARTIST},   {"TALB", META_ALBUM},    {"TYER", META_YEAR},         {"TCOP", META_COPYRIGHT},
                 {"TCOM", META_COMPOSER}, {"TRCK", META_TRACKNUMBER}, {"TLAN", META_LANGUAGE}, {"TFLT", META_FILETYPE},
                 {"TPE3", META_CONDUCTOR}, {"TPUB", META_PUBLISHER}, {"TDAT", META_DATE},      {"TIME", META_TIME}};
    Frames frames = {Text3("TIT2", std::string(300, 'x')), Text3("TIT2", "Second"), Text3("TXXX", "skipped"),
                     Text3("TPE2", "Band"), Id3Frame(3, "PCNT", {0, 0, 1, 2}),
                     Id3Frame(3, "POPM", {'a', '@', 'b', 0, 196, 0})};
    for (const auto& row : table) frames.push_back(Text3(row.id, row.id));
    const Meta m(Tagged(3, frames));
    ASSERT_EQ(m.result, MM_OK);
    EXPECT_EQ(m.Text(META_TITLE), std::string(128, 'x'));
    EXPECT_EQ(m.Code(META_TITLE), 3u);
    for (const auto& row : table) EXPECT_EQ(m.Text(row.item), row.id);
    EXPECT_EQ(m.meta.aItems[META_RESERVED6].nLength, 0u);
    EXPECT_EQ(Item(m.meta.stAlbumArtist), "Band");
    EXPECT_EQ(m.meta.nPlayCount, 0x102u);
    EXPECT_EQ(m.meta.nRating, 196u);
}

TEST(Id3Tags, FailedV2KeepsItsItemsUnlessV1ReplacesThemWholeAndV2WinsOverV1) {
    // The reader counts the header's ten bytes against the tag size: without
    // padding the last frame overruns the tag and the v2 parse fails.
    const auto broken = Id3Tag(3, {Text3("TCOM", "Composer"), Text3("TPE1", "Artist name")}, 0);
    const auto v1 = Id3v1Titled("V1 title");
    const Meta failed(Bytes().raw(broken).raw(Mp3Frames(6)).data());
    EXPECT_EQ(failed.result, 1);
    EXPECT_EQ(failed.Text(META_COMPOSER), "Composer");
    EXPECT_EQ(failed.meta.aItems[META_ARTIST].nLength, 0u);
    const Meta replaced(Bytes().raw(broken).raw(Mp3Frames(6)).raw(v1).data());
    EXPECT_EQ(replaced.result, MM_OK);
    EXPECT_EQ(replaced.Text(META_TITLE), "V1 title");
    EXPECT_EQ(replaced.meta.aItems[META_COMPOSER].nLength, 0u);
    EXPECT_EQ(Meta(Bytes().raw(Tagged(3, {Text3("TIT2", "V2 title")})).raw(v1).data()).Text(META_TITLE), "V2 title");
    EXPECT_EQ(Meta(Mp3Frames(6)).result, 1);
}

// v2.4's encoding byte decides the code, v2.3 keeps Latin-1 for any but
// UTF-16, whose little-endian text is delivered big-endian; a UTF-8 mark gives UTF-8.
TEST(Id3Tags, EncodingsAndTheirCodes) {
    const struct { int version; Data body, text; uint32_t code; } cases[] = {
        {4, TextBody(3, "T\xC3\xA9"), {'T', 0xC3, 0xA9}, 5}, {4, TextBytes(2, {0, 'A'}), {0, 'A'}, 4},
        {4, TextBody(7, "x"), {'x'}, 3},                     {3, TextBody(3, "T\xC3\xA9"), {'T', 0xC3, 0xA9}, 3},
        {3, TextBytes(1, {0xFF, 0xFE, 'H', 0, 'i', 0}), {0xFE, 0xFF, 0, 'H', 0, 'i'}, 4},
        {3, TextBytes(1, {0xFF, 0xFE, 'H', 0, 'i'}), {}, 0},  // odd length: left empty
        {3, TextBytes(1, {0xEF, 0xBB, 0xBF, 'U'}), {0xEF, 0xBB, 0xBF, 'U'}, 5}};
    for (const auto& c : cases) {
        const Meta m(Tagged(c.version, {Id3Frame(c.version, "TIT2", c.body)}));
        EXPECT_EQ(m.Raw(META_TITLE), c.text) << &c - cases;
        EXPECT_EQ(m.Code(META_TITLE), c.code) << &c - cases;
    }
}

TEST(Id3Tags, GenreNumbersBelow148BecomeNames) {
    const std::pair<Data, std::string> cases[] = {
        {TextBody(0, "(17)Rock"), "Rock"}, {TextBody(0, "(17)"), "Rock"},   {TextBody(0, "Rock"), "Rock"},
        {TextBody(0, "(255)"), "(255)"},   {TextBody(0, "(-1)"), "(-1)"},   {TextBody(0, "(147)"), "Synthpop"},
        {TextBody(0, "(67)"), "Psychadelic"},
        {TextBytes(1, {0xFF, 0xFE, '(', 0, '1', 0, '7', 0, ')', 0}), "Rock"},  // UTF-16 is compacted first
        {TextBytes(1, {0xFE, 0xFF, 0, '(', 0, '8', 0, ')'}), "Jazz"},
    };
    for (const auto& [body, name] : cases) {
        const Meta m(Tagged(3, {Id3Frame(3, "TCON", body)}));
        EXPECT_EQ(m.Text(META_GENRE), name);
        EXPECT_EQ(m.Code(META_GENRE), 3u) << name;
    }
}

// TDRC is split by body size counting the encoding byte; a size outside the
// list fills nothing, and a year already read keeps TDRC out.
TEST(Id3Tags, RecordingTimeIsSplitByBodySize) {
    const struct { int version; Frames frames; std::string year, date, time; } cases[] = {
        {4, {Id3Frame(4, "TDRC", TextBody(0, "2004-05-0"))}, std::string("\0" "200", 4), "-05-0", ""},
        {4, {Id3Frame(4, "TDRC", Bytes().str("2004-05-06T12").data())}, "2004", "05-06", "12"},
        {4, {Id3Frame(4, "TDRC", TextBody(0, "2004"))}, "", "", ""},
        {3, {Text3("TYER", "1999"), Id3Frame(3, "TDRC", {'2', '0', '0', '4'})}, "1999", "", ""}};
    for (const auto& c : cases) {
        const Meta m(Tagged(c.version, c.frames));
        EXPECT_EQ(std::make_tuple(m.Text(META_YEAR), m.Text(META_DATE), m.Text(META_TIME)), std::tie(c.year, c.date, c.time));
    }
    EXPECT_EQ(Meta(Tagged(4, cases[1].frames)).Code(META_TIME), 3u);
}

TEST(Id3Tags, CommentsSkipLanguageAndDescription) {
    const struct {
        uint8_t encoding;
        Data afterLanguage, text;
        uint32_t code;
    } cases[] = {
        {0, Bytes().str("desc").u8(0).str("Comment").data(), Bytes().str("Comment").data(), 3},
        {1, {0xFF, 0xFE, 0, 0, 0xFF, 0xFE, 'O', 0, 'K', 0}, {0xFE, 0xFF, 0, 'O', 0, 'K'}, 4},
        // The terminator is the first zero pair at any offset, so a description
        // ending in a character with a zero high byte ends one byte early.
        {1, {0xFF, 0xFE, 'd', 0, 0, 0, 0xFF, 0xFE, 'O', 0}, {0, 0xFF, 0xFE, 'O', 0}, 4},
    };
    for (const auto& c : cases) {
        const Meta m(Tagged(3, {Id3Frame(3, "COMM", Bytes().u8(c.encoding).str("eng").raw(c.afterLanguage).data())}));
        EXPECT_EQ(m.Raw(META_COMMENT), c.text);
        EXPECT_EQ(m.Code(META_COMMENT), c.code);
    }
}

TEST(Id3Tags, PictureIsReadOnlyWithinTheLimit) {
    const Data jpeg = {0xFF, 0xD8, 0xFF, 0xE0, 1, 2, 3};
    const auto file = Tagged(3, {Id3Frame(3, "APIC", ApicBody("image/jpeg", jpeg, "cover"))});
    const Meta m(file);
    EXPECT_EQ(m.Text(META_PICTURE_FORMAT), "image/jpeg");
    EXPECT_EQ(m.Code(META_PICTURE_FORMAT), 3u);
    EXPECT_EQ(m.Picture(), jpeg);
    const Meta none(file, 0);  // limit 0: pictures are never read
    EXPECT_EQ(none.meta.pPicture, nullptr);
    EXPECT_EQ(none.meta.aItems[META_PICTURE_FORMAT].nLength, 0u);
    const auto large = Tagged(3, {Id3Frame(3, "APIC", ApicBody("image/png", Data(600000 - 13)))});  // a 600,000-byte frame
    EXPECT_EQ(Meta(large, 1).meta.pPicture, nullptr);
    EXPECT_EQ(Meta(large, 600000).meta.nPictureSize, 600000u - 13);
}

TEST(Id3Tags, V22FramesHaveThreeLetterIdsAndPictureFormat) {
    const Meta m(Tagged(2, {Id3Frame22("TT2", TextBody(0, "Two")), Id3Frame22("TCO", TextBody(0, "(0)")),
                            Id3Frame22("PIC", Bytes().u8(0).str("PNG").u8(0).str("d").u8(0).u8(9).data())}));
    ASSERT_EQ(m.result, MM_OK);
    EXPECT_EQ(std::make_tuple(m.Text(META_TITLE), m.Text(META_GENRE), m.Text(META_PICTURE_FORMAT)),
              std::make_tuple("Two", "Blues", "PNG"));
    EXPECT_EQ(m.Picture(), (Data{9}));
}

TEST(Id3Tags, UnsynchronisedTagIsRestoredAndItsPictureFormatCountsTheZero) {
    const Data picture = {0xFF, 0xD8, 0xFF, 0x00, 0xFF};
    // Frame sizes count the bytes as stored, after unsynchronisation.
    const Meta m(Tagged(3, {Id3Frame(3, "TIT2", Unsynchronise(TextBytes(0, {'a', 0xFF, 'b'}))),
                            Id3Frame(3, "APIC", Unsynchronise(ApicBody("image/jpeg", picture)))}, 16, 0x80));
    ASSERT_EQ(m.result, MM_OK);
    EXPECT_EQ(m.Raw(META_TITLE), (Data{'a', 0xFF, 'b'}));
    EXPECT_EQ(m.meta.aItems[META_PICTURE_FORMAT].nLength, 11u);
    EXPECT_EQ(m.Picture(), picture);
}

TEST(Id3Tags, V24FrameUnsyncAndDataLengthIndicator) {
    const auto body = Bytes().syncsafe32(5).raw(Unsynchronise(TextBytes(0, {'x', 0xFF, 0x00, 'y'}))).data();
    const Meta m(Tagged(4, {Id3Frame(4, "TIT2", body, 0x03)}));
    ASSERT_EQ(m.result, MM_OK);
    EXPECT_EQ(m.Raw(META_TITLE), (Data{'x', 0xFF, 0x00, 'y'}));
    uint8_t shortBody[] = {1, 2, 3};  // below four bytes there is no indicator to drop
    EXPECT_EQ(RemoveDataLengthIndicator(shortBody, 3), 3u);
}

TEST(Id3Tags, V23ExtendedHeaderIsSkippedWithOrWithoutUnsync) {
    const auto body = Bytes().be32(6).zeros(6).raw(Text3("TIT2", "Ext")).zeros(30).data();
    for (uint8_t flags : {uint8_t{0x40}, uint8_t{0xC0}}) {
        const Meta m(Bytes().raw(Id3v2Tag(3, body, flags)).raw(Mp3Frames(6)).data());
        EXPECT_EQ(m.result, MM_OK);
        EXPECT_EQ(m.Text(META_TITLE), "Ext") << int{flags};
    }
}

TEST(Id3Tags, Version1FieldsAreTrimmedAndTheTrackByteIsSigned) {
    const Meta m(Bytes().raw(Mp3Frames(6)).raw(Id3v1({"Title  \t", "Artist", "Album", "2001", "Note", 200, 17})).data());
    ASSERT_EQ(m.result, MM_OK);
    EXPECT_EQ(std::make_tuple(m.Text(META_TITLE), m.Text(META_ARTIST), m.Text(META_ALBUM), m.Text(META_YEAR),
                              m.Text(META_COMMENT)), std::make_tuple("Title", "Artist", "Album", "2001", "Note"));
    EXPECT_EQ(m.Text(META_TRACKNUMBER), "-56");
    EXPECT_EQ(m.Text(META_GENRE), "Rock");
    EXPECT_EQ(m.Code(META_TITLE), 3u);
    const Meta n(Bytes().raw(Mp3Frames(6)).raw(Id3v1({"T", "", "", "", "", 0, 148})).data());
    EXPECT_EQ(n.meta.aItems[META_TRACKNUMBER].nLength, 0u);
    EXPECT_EQ(n.meta.aItems[META_GENRE].nLength, 0u);
}

TEST(Id3Tags, HostileSizesFailTheTagCleanly) {
    Data truncated = Id3v2Tag(4, Id3Frame(4, "TIT2", TextBody(0, std::string(200, 'a'))));
    truncated.resize(100);  // the tag claims more than the file holds
    Frames files = {truncated, Bytes().str("ID3").u8(3).zeros(2).syncsafe32(0x0FFFFFFF).raw(Mp3Frames(6)).data()};
    for (uint32_t size : {0x7FFFFFF0u, 0x80000001u}) {  // beyond the tag, and negative
        files.push_back(Bytes().raw(Id3v2Tag(3, Bytes().str("TIT2").be32(size).zeros(42).data())).raw(Mp3Frames(6)).data());
    }
    for (const auto& file : files) EXPECT_EQ(Meta(file).result, 1);

    // Zero-size frames cost only their header; a picture without a MIME terminator is dropped.
    const Meta m(Tagged(3, {Id3Frame(3, "TIT2", {}), Id3Frame(3, "APIC", {}), Id3Frame(3, "APIC", TextBody(0, "image/png")),
                            Text3("TIT2", "ok")}));
    EXPECT_EQ(m.result, MM_OK);
    EXPECT_EQ(m.meta.pPicture, nullptr);
    EXPECT_EQ(m.Text(META_TITLE), "ok");
}

TEST(Id3Tags, EmbeddedTagIsParsedOnAnOpenHandleWithinItsBound) {
    const Data tag = Id3Tag(4, {Id3Frame(4, "TIT2", TextBody(0, "Inside"))});
    const auto file = Bytes().zeros(100).raw(tag).zeros(50).data();
    Meta m, tight, shortHeader;
    EXPECT_EQ(ParseAt(file, 100, static_cast<uint32_t>(tag.size()), &m), 0);
    EXPECT_EQ(m.Text(META_TITLE), "Inside");
    EXPECT_EQ(ParseAt(file, 100, 10, &tight), 1);
    EXPECT_EQ(ParseAt({'I', 'D', '3', 3, 0}, 0, 100, &shortHeader, ParseV2Header), kID3ShortHeader);
}

TEST(Id3Tags, ShortFrameBodyEndsAVersion24TagOnly) {
    // A bound beyond what the file still holds: a v2.4 frame cut short fails
    // the tag, a v2.3 one keeps what was read.
    for (int version : {3, 4}) {
        Data file = Id3Tag(version, {Id3Frame(version, "TIT2", TextBody(0, "From v2")),
                                                     Id3Frame(version, "PRIV", Data(400, 1))});
        file.resize(file.size() - 300);
        Meta m;
        EXPECT_EQ(ParseAt(file, 0, 100000, &m), version == 4 ? 1 : 0) << version;
        EXPECT_EQ(m.Text(META_TITLE), "From v2");
    }
}

TEST(Id3Tags, AacFilesTakeTheirTagsFromId3) {
    TempDir dir;
    const std::string path = dir.Write("a.aac", Tagged(3, {Text3("TIT2", "AAC")}));
    _MMMetaInfo meta;
    ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(path.c_str(), MEDIA_TYPE_AAC, &meta), MM_OK);
    EXPECT_EQ(Item(meta.aItems[META_TITLE]), "AAC");
    MM_MediaExtractor_FreeMetaInfo(&meta);
}
