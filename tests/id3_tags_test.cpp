// ID3 tags: frame table, first-frame-wins, encodings, genres, time stamps,
// pictures, unsynchronisation, v1 and the fallback between them.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

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

std::vector<uint8_t> Audio() { return Mp3Frames(Mp3FrameSpec{}, 6); }

struct Meta {
    _MMMetaInfo meta;
    int32_t result = 0;
    Meta() { std::memset(&meta, 0, sizeof meta); }
    ~Meta() { delete[] meta.pPicture; }
    std::string Text(int kind) const {
        const _MMMetaItem& item = meta.aItems[kind];
        return std::string(reinterpret_cast<const char*>(item.szData), item.nLength);
    }
    std::vector<uint8_t> Raw(const _MMMetaItem& item) const {
        return std::vector<uint8_t>(item.szData, item.szData + item.nLength);
    }
};

void Read(const std::vector<uint8_t>& file, Meta* m, int pictureLimit = 1) {
    TempDir dir;
    m->result = ID3_GetMetaInfo(dir.Write("t.mp3", file).c_str(), &m->meta, pictureLimit);
}

std::vector<uint8_t> WithAudio(const std::vector<uint8_t>& tag) {
    Bytes b;
    b.raw(tag).raw(Audio());
    return b.data();
}

}  // namespace

TEST(Id3Tags, FrameTableFillsItemsAndFirstFrameWins) {
    const int v = 3;
    Meta m;
    Read(WithAudio(Id3Tag(v, {Id3Frame(v, "TIT2", TextBody(0, "First")), Id3Frame(v, "TIT2", TextBody(0, "Second")),
                              Id3Frame(v, "TPE1", TextBody(0, "Artist")), Id3Frame(v, "TALB", TextBody(0, "Album")),
                              Id3Frame(v, "TYER", TextBody(0, "1999")), Id3Frame(v, "TCOP", TextBody(0, "(c)")),
                              Id3Frame(v, "TCOM", TextBody(0, "Composer")), Id3Frame(v, "TRCK", TextBody(0, "3/9")),
                              Id3Frame(v, "TLAN", TextBody(0, "eng")), Id3Frame(v, "TFLT", TextBody(0, "MPG/3")),
                              Id3Frame(v, "TPE3", TextBody(0, "Cond")), Id3Frame(v, "TPUB", TextBody(0, "Pub")),
                              Id3Frame(v, "TDAT", TextBody(0, "0102")), Id3Frame(v, "TIME", TextBody(0, "1234")),
                              Id3Frame(v, "TPE2", TextBody(0, "Band")), Id3Frame(v, "TXXX", TextBody(0, "skip")),
                              Id3Frame(v, "PCNT", {0, 0, 1, 2}), Id3Frame(v, "POPM", {'a', '@', 'b', 0, 196, 0, 0, 0, 9})})),
         &m);
    ASSERT_EQ(m.result, MM_OK);
    EXPECT_EQ(m.Text(META_TITLE), "First");
    EXPECT_EQ(m.meta.aItems[META_TITLE].nEncoding, 3u);
    EXPECT_EQ(m.Text(META_ARTIST), "Artist");
    EXPECT_EQ(m.Text(META_ALBUM), "Album");
    EXPECT_EQ(m.Text(META_YEAR), "1999");
    EXPECT_EQ(m.Text(META_COPYRIGHT), "(c)");
    EXPECT_EQ(m.Text(META_COMPOSER), "Composer");
    EXPECT_EQ(m.Text(META_TRACKNUMBER), "3/9");
    EXPECT_EQ(m.Text(META_LANGUAGE), "eng");
    EXPECT_EQ(m.Text(META_FILETYPE), "MPG/3");
    EXPECT_EQ(m.Text(META_CONDUCTOR), "Cond");
    EXPECT_EQ(m.Text(META_PUBLISHER), "Pub");
    EXPECT_EQ(m.Text(META_DATE), "0102");
    EXPECT_EQ(m.Text(META_TIME), "1234");
    EXPECT_EQ(m.meta.aItems[META_RESERVED6].nLength, 0u);
    EXPECT_EQ(std::string(reinterpret_cast<const char*>(m.meta.stAlbumArtist.szData), m.meta.stAlbumArtist.nLength),
              "Band");
    EXPECT_EQ(m.meta.nPlayCount, 0x102u);
    EXPECT_EQ(m.meta.nRating, 196u);
}

TEST(Id3Tags, TenBytesBeyondTheFramesAreNeededForTheLastFrame) {
    // The reader counts the header's ten bytes against the tag size: a tag
    // without padding loses its last frame and the v2 parse fails.
    Meta m;
    Read(WithAudio(Id3Tag(3, {Id3Frame(3, "TIT2", TextBody(0, "A")), Id3Frame(3, "TPE1", TextBody(0, "Artist name"))}, 0)),
         &m);
    EXPECT_EQ(m.result, 1);
    EXPECT_EQ(m.Text(META_TITLE), "A");  // items filled before the failure stay
    EXPECT_EQ(m.meta.aItems[META_ARTIST].nLength, 0u);
}

TEST(Id3Tags, V24EncodingByteDecidesTheCode) {
    Meta v4;
    Read(WithAudio(Id3Tag(4, {Id3Frame(4, "TIT2", TextBody(3, "T\xC3\xA9")), Id3Frame(4, "TPE1", TextBytes(2, {0, 'A'})),
                              Id3Frame(4, "TALB", TextBody(7, "x"))})),
         &v4);
    ASSERT_EQ(v4.result, MM_OK);
    EXPECT_EQ(v4.meta.aItems[META_TITLE].nEncoding, 5u);
    EXPECT_EQ(v4.meta.aItems[META_ARTIST].nEncoding, 4u);
    EXPECT_EQ(v4.meta.aItems[META_ALBUM].nEncoding, 3u);
    Meta v3;
    Read(WithAudio(Id3Tag(3, {Id3Frame(3, "TIT2", TextBody(3, "T\xC3\xA9"))})), &v3);
    EXPECT_EQ(v3.meta.aItems[META_TITLE].nEncoding, 3u);
}

TEST(Id3Tags, Utf16LittleEndianIsDeliveredBigEndian) {
    Meta m;
    Read(WithAudio(Id3Tag(3, {Id3Frame(3, "TIT2", TextBytes(1, {0xFF, 0xFE, 'H', 0, 'i', 0})),
                              Id3Frame(3, "TPE1", TextBytes(1, {0xFF, 0xFE, 'H', 0, 'i'})),
                              Id3Frame(3, "TALB", TextBytes(1, {0xEF, 0xBB, 0xBF, 'U'}))})),
         &m);
    ASSERT_EQ(m.result, MM_OK);
    EXPECT_EQ(m.Raw(m.meta.aItems[META_TITLE]), (std::vector<uint8_t>{0xFE, 0xFF, 0, 'H', 0, 'i'}));
    EXPECT_EQ(m.meta.aItems[META_TITLE].nEncoding, 4u);
    EXPECT_EQ(m.meta.aItems[META_ARTIST].nLength, 0u);  // odd length: left empty
    EXPECT_EQ(m.meta.aItems[META_ALBUM].nEncoding, 5u);
    EXPECT_EQ(m.Raw(m.meta.aItems[META_ALBUM]), (std::vector<uint8_t>{0xEF, 0xBB, 0xBF, 'U'}));
}

TEST(Id3Tags, LongTextIsCutTo128Bytes) {
    Meta m;
    Read(WithAudio(Id3Tag(3, {Id3Frame(3, "TIT2", TextBody(0, std::string(300, 'x')))})), &m);
    EXPECT_EQ(m.meta.aItems[META_TITLE].nLength, 128u);
}

TEST(Id3Tags, GenreNumbersAreTranslated) {
    const struct {
        std::vector<uint8_t> body;
        std::string expected;
    } cases[] = {
        {TextBody(0, "(17)Rock"), "Rock"},
        {TextBody(0, "(17)"), "Rock"},
        {TextBody(0, "(7)"), "Hip-Hop"},
        {TextBody(0, "Rock"), "Rock"},
        {TextBody(0, "(255)"), "(255)"},
        {TextBody(0, "(-1)"), "(-1)"},
        {TextBody(0, "(147)"), "Synthpop"},
        {TextBody(0, "(67)"), "Psychadelic"},
        {TextBytes(1, {0xFF, 0xFE, '(', 0, '1', 0, '7', 0, ')', 0}), "Rock"},
        {TextBytes(1, {0xFE, 0xFF, 0, '(', 0, '8', 0, ')'}), "Jazz"},
    };
    for (const auto& c : cases) {
        Meta m;
        Read(WithAudio(Id3Tag(3, {Id3Frame(3, "TCON", c.body)})), &m);
        ASSERT_EQ(m.result, MM_OK);
        EXPECT_EQ(m.Text(META_GENRE), c.expected);
        if (c.body[0] == 1) {
            EXPECT_EQ(m.meta.aItems[META_GENRE].nEncoding, 3u);
        }
    }
}

TEST(Id3Tags, RecordingTimeIsSplitByBodySize) {
    // Offsets count the encoding byte.
    Meta m10;
    Read(WithAudio(Id3Tag(4, {Id3Frame(4, "TDRC", TextBody(0, "2004-05-0"))})), &m10);
    EXPECT_EQ(m10.Raw(m10.meta.aItems[META_YEAR]), (std::vector<uint8_t>{0, '2', '0', '0'}));
    EXPECT_EQ(m10.Text(META_DATE), "-05-0");
    EXPECT_EQ(m10.meta.aItems[META_TIME].nLength, 0u);

    Meta m13;
    Read(WithAudio(Id3Tag(4, {Id3Frame(4, "TDRC", {'2', '0', '0', '4', '-', '0', '5', '-', '0', '6', 'T', '1', '2'})})),
         &m13);
    EXPECT_EQ(m13.Text(META_YEAR), "2004");
    EXPECT_EQ(m13.Text(META_DATE), "05-06");
    EXPECT_EQ(m13.Text(META_TIME), "12");
    EXPECT_EQ(m13.meta.aItems[META_TIME].nEncoding, 3u);

    Meta other;  // a size outside the list fills nothing
    Read(WithAudio(Id3Tag(4, {Id3Frame(4, "TDRC", TextBody(0, "2004"))})), &other);
    EXPECT_EQ(other.meta.aItems[META_YEAR].nLength, 0u);

    Meta after;  // a year already read keeps TDRC out
    Read(WithAudio(Id3Tag(3, {Id3Frame(3, "TYER", TextBody(0, "1999")), Id3Frame(3, "TDRC", {'2', '0', '0', '4'})})),
         &after);
    EXPECT_EQ(after.Text(META_YEAR), "1999");
}

TEST(Id3Tags, CommentsSkipLanguageAndDescription) {
    Bytes latin;
    latin.u8(0).str("eng").str("desc").u8(0).str("Comment text");
    Bytes utf16;
    utf16.u8(1).str("eng").raw(std::vector<uint8_t>{0xFF, 0xFE, 0, 0}).raw(std::vector<uint8_t>{0xFF, 0xFE, 'O', 0, 'K', 0});
    // The terminator is the first zero pair at any offset, so a description
    // ending in a character with a zero high byte ends one byte early.
    Bytes early;
    early.u8(1).str("eng").raw(std::vector<uint8_t>{0xFF, 0xFE, 'd', 0, 0, 0}).raw(std::vector<uint8_t>{0xFF, 0xFE, 'O', 0});
    Meta a;
    Read(WithAudio(Id3Tag(3, {Id3Frame(3, "COMM", latin.data())})), &a);
    EXPECT_EQ(a.Text(META_COMMENT), "Comment text");
    EXPECT_EQ(a.meta.aItems[META_COMMENT].nEncoding, 3u);
    Meta b;
    Read(WithAudio(Id3Tag(3, {Id3Frame(3, "COMM", utf16.data())})), &b);
    EXPECT_EQ(b.Raw(b.meta.aItems[META_COMMENT]), (std::vector<uint8_t>{0xFE, 0xFF, 0, 'O', 0, 'K'}));
    EXPECT_EQ(b.meta.aItems[META_COMMENT].nEncoding, 4u);
    Meta c;
    Read(WithAudio(Id3Tag(3, {Id3Frame(3, "COMM", early.data())})), &c);
    EXPECT_EQ(c.Raw(c.meta.aItems[META_COMMENT]), (std::vector<uint8_t>{0, 0xFF, 0xFE, 'O', 0}));
}

TEST(Id3Tags, PictureFrameFillsFormatAndData) {
    Bytes apic;
    apic.u8(0).str("image/jpeg").u8(0).u8(3).str("cover").u8(0).raw(std::vector<uint8_t>{0xFF, 0xD8, 0xFF, 0xE0, 1, 2, 3});
    const auto file = WithAudio(Id3Tag(3, {Id3Frame(3, "APIC", apic.data())}));
    Meta m;
    Read(file, &m);
    ASSERT_EQ(m.result, MM_OK);
    EXPECT_EQ(m.Text(META_PICTURE_FORMAT), "image/jpeg");
    EXPECT_EQ(m.meta.aItems[META_PICTURE_FORMAT].nEncoding, 3u);
    ASSERT_EQ(m.meta.nPictureSize, 7u);
    EXPECT_EQ(std::vector<uint8_t>(m.meta.pPicture, m.meta.pPicture + 7),
              (std::vector<uint8_t>{0xFF, 0xD8, 0xFF, 0xE0, 1, 2, 3}));

    Meta none;
    Read(file, &none, 0);  // limit 0: pictures are never read
    EXPECT_EQ(none.meta.pPicture, nullptr);
    EXPECT_EQ(none.meta.aItems[META_PICTURE_FORMAT].nLength, 0u);
}

TEST(Id3Tags, V22PictureKeepsItsThreeLetterFormat) {
    Bytes pic;
    pic.u8(0).str("PNG").u8(0).str("d").u8(0).raw(std::vector<uint8_t>{9, 8, 7});
    Meta m;
    Read(WithAudio(Id3Tag(2, {Id3Frame22("TT2", TextBody(0, "Two")), Id3Frame22("PIC", pic.data()),
                              Id3Frame22("TCO", TextBody(0, "(0)"))})),
         &m);
    ASSERT_EQ(m.result, MM_OK);
    EXPECT_EQ(m.Text(META_TITLE), "Two");
    EXPECT_EQ(m.Text(META_GENRE), "Blues");
    EXPECT_EQ(m.Text(META_PICTURE_FORMAT), "PNG");
    EXPECT_EQ(m.meta.nPictureSize, 3u);
}

TEST(Id3Tags, LargePicturesNeedALimitThatCoversThem) {
    Bytes apic;
    apic.u8(0).str("image/png").u8(0).u8(3).u8(0).zeros(600000 - 13);
    const auto file = WithAudio(Id3Tag(3, {Id3Frame(3, "APIC", apic.data())}));
    Meta small;
    Read(file, &small, 1);
    EXPECT_EQ(small.meta.pPicture, nullptr);
    Meta large;
    Read(file, &large, 600000);
    EXPECT_EQ(large.meta.nPictureSize, 600000u - 13);
}

TEST(Id3Tags, UnsynchronisedTagIsRestored) {
    Bytes apic;
    apic.u8(0).str("image/jpeg").u8(0).u8(3).u8(0).raw(std::vector<uint8_t>{0xFF, 0xD8, 0xFF, 0x00, 0xFF});
    Bytes frames;
    frames.raw(Id3Frame(3, "TIT2", TextBytes(0, {'a', 0xFF, 'b'})));
    // Frame sizes count the bytes as stored, after unsynchronisation.
    const std::vector<uint8_t> stored = Unsynchronise(apic.data());
    Bytes picFrame;
    picFrame.str("APIC").be32(static_cast<uint32_t>(stored.size())).u8(0).u8(0).raw(stored);
    const std::vector<uint8_t> title = Unsynchronise(TextBytes(0, {'a', 0xFF, 'b'}));
    Bytes titleFrame;
    titleFrame.str("TIT2").be32(static_cast<uint32_t>(title.size())).u8(0).u8(0).raw(title);
    Meta m;
    Read(WithAudio(Id3Tag(3, {titleFrame.data(), picFrame.data()}, 16, 0x80)), &m);
    ASSERT_EQ(m.result, MM_OK);
    EXPECT_EQ(m.Raw(m.meta.aItems[META_TITLE]), (std::vector<uint8_t>{'a', 0xFF, 'b'}));
    EXPECT_EQ(m.meta.aItems[META_PICTURE_FORMAT].nLength, 11u);  // the zero is counted here
    ASSERT_EQ(m.meta.nPictureSize, 5u);
    EXPECT_EQ(std::vector<uint8_t>(m.meta.pPicture, m.meta.pPicture + 5),
              (std::vector<uint8_t>{0xFF, 0xD8, 0xFF, 0x00, 0xFF}));
}

TEST(Id3Tags, V24FrameUnsyncAndDataLengthIndicator) {
    const std::vector<uint8_t> body = Unsynchronise(TextBytes(0, {'x', 0xFF, 0x00, 'y'}));
    Bytes withLength;
    withLength.syncsafe32(5).raw(body);
    Meta m;
    Read(WithAudio(Id3Tag(4, {Id3Frame(4, "TIT2", withLength.data(), 0x03)})), &m);
    ASSERT_EQ(m.result, MM_OK);
    EXPECT_EQ(m.Raw(m.meta.aItems[META_TITLE]), (std::vector<uint8_t>{'x', 0xFF, 0x00, 'y'}));
}

TEST(Id3Tags, V23ExtendedHeaderIsSkipped) {
    Bytes body;
    body.be32(6).zeros(6).raw(Id3Frame(3, "TIT2", TextBody(0, "Ext"))).zeros(30);
    Meta m;
    Read(WithAudio(Id3v2Tag(3, body.data(), 0x40)), &m);
    ASSERT_EQ(m.result, MM_OK);
    EXPECT_EQ(m.Text(META_TITLE), "Ext");

    Bytes unsync;
    unsync.be32(6).zeros(6).raw(Unsynchronise(Id3Frame(3, "TIT2", TextBody(0, "Ext")))).zeros(30);
    Meta u;
    Read(WithAudio(Id3v2Tag(3, unsync.data(), 0xC0)), &u);
    ASSERT_EQ(u.result, MM_OK);
    EXPECT_EQ(u.Text(META_TITLE), "Ext");
}

TEST(Id3Tags, Version1FieldsAndTrack) {
    Id3v1Spec shape;
    shape.title = "Title  \t";
    shape.artist = "Artist";
    shape.album = "Album";
    shape.year = "2001";
    shape.comment = "Note";
    shape.track = 200;
    shape.genre = 17;
    Meta m;
    Bytes file;
    file.raw(Audio()).raw(Id3v1(shape));
    Read(file.data(), &m);
    ASSERT_EQ(m.result, MM_OK);
    EXPECT_EQ(m.Text(META_TITLE), "Title");
    EXPECT_EQ(m.Text(META_ARTIST), "Artist");
    EXPECT_EQ(m.Text(META_ALBUM), "Album");
    EXPECT_EQ(m.Text(META_YEAR), "2001");
    EXPECT_EQ(m.Text(META_COMMENT), "Note");
    EXPECT_EQ(m.Text(META_TRACKNUMBER), "-56");  // the track byte is signed
    EXPECT_EQ(m.Text(META_GENRE), "Rock");
    EXPECT_EQ(m.meta.aItems[META_TITLE].nEncoding, 3u);

    shape.track = 0;
    shape.genre = 148;
    Meta n;
    Bytes other;
    other.raw(Audio()).raw(Id3v1(shape));
    Read(other.data(), &n);
    EXPECT_EQ(n.meta.aItems[META_TRACKNUMBER].nLength, 0u);
    EXPECT_EQ(n.meta.aItems[META_GENRE].nLength, 0u);
}

TEST(Id3Tags, Version2WinsOverVersion1AndV1ReplacesAFailedV2) {
    Id3v1Spec shape;
    shape.title = "V1 title";
    Bytes both;
    both.raw(Id3Tag(3, {Id3Frame(3, "TIT2", TextBody(0, "V2 title"))})).raw(Audio()).raw(Id3v1(shape));
    Meta m;
    Read(both.data(), &m);
    EXPECT_EQ(m.Text(META_TITLE), "V2 title");

    Bytes broken;  // the second frame overruns the tag
    broken.raw(Id3Tag(3, {Id3Frame(3, "TPE1", TextBody(0, "V2 artist")), Id3Frame(3, "TALB", TextBody(0, "long album name"))}, 0))
        .raw(Audio())
        .raw(Id3v1(shape));
    Meta f;
    Read(broken.data(), &f);
    EXPECT_EQ(f.result, MM_OK);
    EXPECT_EQ(f.Text(META_TITLE), "V1 title");
    EXPECT_EQ(f.meta.aItems[META_ARTIST].nLength, 0u);  // replaced whole

    Meta none;
    Read(Audio(), &none);
    EXPECT_EQ(none.result, 1);
}

TEST(Id3Tags, HostileSizesFailCleanly) {
    Bytes huge;  // tag larger than the file
    huge.str("ID3").u8(3).u8(0).u8(0).raw(std::vector<uint8_t>{0x7F, 0x7F, 0x7F, 0x7F}).raw(Audio());
    Meta a;
    Read(huge.data(), &a);
    EXPECT_EQ(a.result, 1);

    Bytes frame;  // a frame size beyond the tag
    frame.raw(Id3v2Tag(3, Bytes().str("TIT2").be32(0x7FFFFFF0).u8(0).u8(0).zeros(40).data())).raw(Audio());
    Meta b;
    Read(frame.data(), &b);
    EXPECT_EQ(b.result, 1);

    Bytes negative;
    negative.raw(Id3v2Tag(3, Bytes().str("TIT2").be32(0x80000001).u8(0).u8(0).zeros(40).data())).raw(Audio());
    Meta c;
    Read(negative.data(), &c);
    EXPECT_EQ(c.result, 1);

    Bytes truncated;  // tag claims more than the file still holds behind it
    truncated.raw(Id3v2Tag(4, Bytes().raw(Id3Frame(4, "TIT2", TextBody(0, std::string(200, 'a')))).data()));
    truncated.data().resize(100);
    Meta d;
    Read(truncated.data(), &d);
    EXPECT_EQ(d.result, 1);

    Bytes zeroFrames;
    zeroFrames.raw(Id3Tag(3, {Id3Frame(3, "TIT2", {}), Id3Frame(3, "APIC", {}), Id3Frame(3, "TIT2", TextBody(0, "ok"))}));
    Meta e;
    Read(WithAudio(zeroFrames.data()), &e);
    EXPECT_EQ(e.result, MM_OK);
    EXPECT_EQ(e.Text(META_TITLE), "ok");

    Bytes picture;  // a picture frame without a MIME terminator
    picture.raw(Id3Tag(3, {Id3Frame(3, "APIC", Bytes().u8(0).str("image/png").data()),
                           Id3Frame(3, "TIT2", TextBody(0, "after"))}));
    Meta f;
    Read(WithAudio(picture.data()), &f);
    EXPECT_EQ(f.result, MM_OK);
    EXPECT_EQ(f.meta.pPicture, nullptr);
    EXPECT_EQ(f.Text(META_TITLE), "after");
}

TEST(Id3Tags, EmbeddedTagIsParsedOnAnOpenHandleWithItsBound) {
    TempDir dir;
    const std::vector<uint8_t> tag = Id3Tag(4, {Id3Frame(4, "TIT2", TextBody(0, "Inside"))});
    Bytes file;
    file.zeros(100).raw(tag).zeros(50);
    const int h = MEx_fopen(dir.Write("box.bin", file.data()).c_str(), "rb");
    ASSERT_NE(h, 0);
    _MMMetaInfo meta;
    std::memset(&meta, 0, sizeof meta);
    ID3_MetaInfo ctx = {&meta, static_cast<uint32_t>(tag.size()), 0, 1, 0, 0};
    ASSERT_EQ(MEx_fseek(h, 100, SEEK_SET), 0);
    EXPECT_EQ(ParseID3V2(h, &ctx), 0);
    EXPECT_EQ(std::string(reinterpret_cast<const char*>(meta.aItems[META_TITLE].szData), meta.aItems[META_TITLE].nLength),
              "Inside");
    std::memset(&meta, 0, sizeof meta);
    ID3_MetaInfo tight = {&meta, 10, 0, 1, 0, 0};
    ASSERT_EQ(MEx_fseek(h, 100, SEEK_SET), 0);
    EXPECT_EQ(ParseID3V2(h, &tight), 1);
    MEx_fclose(h);
}

TEST(Id3Tags, ShortHeaderHasItsOwnCode) {
    TempDir dir;
    const int h = MEx_fopen(dir.Write("s.bin", {'I', 'D', '3', 3, 0}).c_str(), "rb");
    ASSERT_NE(h, 0);
    _MMMetaInfo meta;
    ID3_MetaInfo ctx = {&meta, 100, 0, 1, 0, 0};
    EXPECT_EQ(ParseV2Header(h, &ctx), kID3ShortHeader);
    MEx_fclose(h);
}

TEST(Id3Tags, AacFilesTakeTheirTagsFromId3) {
    TempDir dir;
    const std::string path = dir.Write("a.aac", WithAudio(Id3Tag(3, {Id3Frame(3, "TIT2", TextBody(0, "AAC"))})));
    _MMMetaInfo meta;
    ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(path.c_str(), MEDIA_TYPE_AAC, &meta), MM_OK);
    EXPECT_EQ(meta.aItems[META_TITLE].nLength, 3u);
    MM_MediaExtractor_FreeMetaInfo(&meta);
}

TEST(Id3Tags, ByteOrderHelpers) {
    uint8_t odd[] = {0xFF, 0xFE, 1};
    EXPECT_EQ(AdjustByteOrder(odd, 3), MM_E_INVALIDARG);
    uint8_t be[] = {0xFE, 0xFF, 0, 1};
    EXPECT_EQ(AdjustByteOrder(be, 4), MM_OK);
    EXPECT_EQ(be[3], 1);
    uint8_t dli[] = {0, 0, 0, 2, 'a', 'b'};
    EXPECT_EQ(RemoveDataLengthIndicator(dli, 6), 2u);
    EXPECT_EQ(dli[0], 'a');
    uint8_t shortBody[] = {1, 2, 3};
    EXPECT_EQ(RemoveDataLengthIndicator(shortBody, 3), 3u);
}

TEST(Id3Tags, ShortFrameBodyEndsAVersion24TagOnly) {
    // An embedded tag whose bound exceeds what the file still holds: a v2.4
    // frame cut short fails the tag, a v2.3 one keeps what was read.
    for (int version : {3, 4}) {
        TempDir dir;
        Bytes tag;
        tag.raw(Id3Frame(version, "TIT2", TextBody(0, "From v2")))
            .raw(Id3Frame(version, "PRIV", std::vector<uint8_t>(400, 1)));
        std::vector<uint8_t> file = Id3Tag(version, {tag.data()});
        file.resize(file.size() - 300);
        const int h = MEx_fopen(dir.Write("cut.bin", file).c_str(), "rb");
        ASSERT_NE(h, 0);
        Meta m;
        ID3_MetaInfo ctx = {&m.meta, 100000, 0, 1, 0, 0};
        EXPECT_EQ(ParseID3V2(h, &ctx), version == 4 ? 1 : 0) << version;
        EXPECT_EQ(m.Text(META_TITLE), "From v2");
        MEx_fclose(h);
    }
}
