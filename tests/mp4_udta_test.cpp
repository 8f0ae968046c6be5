// User-data metadata: 3GPP text boxes, iTunes items and the order in which
// they overwrite each other.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "metainfo/metainfo.h"
#include "mp4/mp4_file.h"
#include "mp4/mp4_internal.h"
#include "support/id3_builder.h"
#include "support/mp4_builder.h"

using namespace testing_support;
using namespace metainfo;

namespace {

ByteVec Meta(const ByteVec& children) { return FullBox("meta", 0, 0, Join({Hdlr("mdir"), children})); }
ByteVec Ilst(const ByteVec& items) { return Box("ilst", items); }
ByteVec Item(const std::string& type, const std::string& s) { return IlstItem(type, 1, ByteVec(s.begin(), s.end())); }

class Mp4Udta : public ::testing::Test {
protected:
    TempDir dir;
    _MMMetaInfo meta{};

    int32_t Read(const ByteVec& moovChildren, const ByteVec& topLevel = {}) {
        MM_MediaExtractor_FreeMetaInfo(&meta);
        std::memset(&meta, 0, sizeof meta);
        ByteVec file = Movie(Join({Mvhd(0, 1000, 1000), moovChildren}), Join({topLevel, Box("mdat", ByteVec(16, 0))}));
        return MP4_GetMetaInfo(dir.Write("m.m4a", file).c_str(), &meta, 1);
    }
    std::string Text(int kind) const {
        return std::string(reinterpret_cast<const char*>(meta.aItems[kind].szData), meta.aItems[kind].nLength);
    }
    void TearDown() override { MM_MediaExtractor_FreeMetaInfo(&meta); }
};

}  // namespace

TEST_F(Mp4Udta, PerformerBeatsAuthorUnlessEmpty) {
    ASSERT_EQ(Read(Box("udta", Join({TextBox("auth", "Writer"), TextBox("perf", "Singer")}))), MM_OK);
    EXPECT_EQ(Text(META_ARTIST), "Singer");
    ASSERT_EQ(Read(Box("udta", Join({TextBox("perf", ""), TextBox("auth", "Writer")}))), MM_OK);
    EXPECT_EQ(Text(META_ARTIST), "Writer");
}

TEST_F(Mp4Udta, TextBoxesFillTheirItems) {
    ByteVec albm = FullBox("albm", 0, 0, Bytes().be16(0x15C7).str("Record").u8(0).u8(4));
    ByteVec yrrc = FullBox("yrrc", 0, 0, Bytes().be16(2009));
    ASSERT_EQ(Read(Box("udta", Join({TextBox("titl", "Name"), albm, TextBox("gnre", "Jazz"), yrrc,
                                     TextBox("dscp", "dropped"), FullBox("loci", 0, 0, ByteVec(20, 0))}))),
              MM_OK);
    EXPECT_EQ(Text(META_TITLE), "Name");
    EXPECT_EQ(meta.aItems[META_TITLE].nEncoding, 5u);
    EXPECT_EQ(Text(META_ALBUM), std::string("Record\0", 7)) << "the last byte is the track number";
    EXPECT_EQ(Text(META_GENRE), "Jazz");
    EXPECT_EQ(Text(META_YEAR), std::string("\xD9\x07", 2)) << "the 16-bit year as a little-endian value";
    EXPECT_EQ(meta.aItems[META_COMMENT].nLength, 0u);
}

TEST_F(Mp4Udta, ByteOrderMarksChooseTheEncodingAndStay) {
    ASSERT_EQ(Read(Box("udta", Join({FullBox("titl", 0, 0, Bytes().be16(0).u8(0xFE).u8(0xFF).be16('A')),
                                     FullBox("cprt", 0, 0, Bytes().be16(0).u8(0xFF).u8(0xFE).le16('B'))}))),
              MM_OK);
    EXPECT_EQ(meta.aItems[META_TITLE].nEncoding, 4u);
    EXPECT_EQ(meta.aItems[META_TITLE].szData[0], 0xFE);
    EXPECT_EQ(meta.aItems[META_COPYRIGHT].nEncoding, 6u);
}

TEST_F(Mp4Udta, LongTextsAreCutTo128Bytes) {
    ASSERT_EQ(Read(Box("udta", TextBox("titl", std::string(200, 'x')))), MM_OK);
    EXPECT_EQ(meta.aItems[META_TITLE].nLength, 128u);
    ASSERT_EQ(Read(Meta(Ilst(Item("\xA9" "nam", std::string(300, 'y'))))), MM_OK);
    EXPECT_EQ(meta.aItems[META_TITLE].nLength, 128u);
}

TEST_F(Mp4Udta, ItunesItemsFillArtistYearGenreAndTrackAndLaterOnesReplaceEarlier) {
    ByteVec items = Join({Item("\xA9" "ART", "Band"), Item("\xA9" "day", "2001-02-03"), IlstItem("gnre", 0, {0, 1}),
                          IlstItem("trkn", 0, {0, 0, 0, 7, 0, 12, 0, 0}), Item("\xA9" "cmt", "skipped"),
                          IlstItem("covr", 13, ByteVec(50, 0xFF)), Item("\xA9" "nam", "First longer"),
                          Item("\xA9" "nam", "Second")});
    ASSERT_EQ(Read(Box("udta", Meta(Ilst(items)))), MM_OK);
    EXPECT_EQ(Text(META_ARTIST), "Band");
    EXPECT_EQ(Text(META_YEAR), "2001-02-03");
    EXPECT_EQ(Text(META_GENRE), "Blues");
    EXPECT_EQ(Text(META_TRACKNUMBER), std::string("\x07\0\0\0", 4)) << "a 4-byte binary number";
    EXPECT_EQ(meta.aItems[META_COMMENT].nLength, 0u);
    EXPECT_EQ(meta.pPicture, nullptr);
    EXPECT_EQ(Text(META_TITLE), "Second");
    EXPECT_EQ(meta.aItems[META_TITLE].szData[6], 0) << "nothing of the earlier value is left";
}

TEST_F(Mp4Udta, GenreNumbersOutsideTheTableStayRaw) {
    for (uint8_t n : {uint8_t{0}, uint8_t{148}}) {
        ASSERT_EQ(Read(Meta(Ilst(IlstItem("gnre", 0, {0, n})))), MM_OK);
        EXPECT_EQ(Text(META_GENRE), std::string({'\0', static_cast<char>(n)})) << int(n);
    }
    ASSERT_EQ(Read(Meta(Ilst(IlstItem("gnre", 0, {0, 147})))), MM_OK);
    EXPECT_EQ(Text(META_GENRE), "JPop") << "numbers count from 1: the last name is out of reach";
}

TEST_F(Mp4Udta, UserDataOverwritesItemsReadBeforeIt) {
    ByteVec ilst = Meta(Ilst(Item("\xA9" "nam", "From ilst")));
    ByteVec udta = Box("udta", TextBox("titl", "From titl"));
    ASSERT_EQ(Read(Join({ilst, udta})), MM_OK);
    EXPECT_EQ(Text(META_TITLE), "From titl");
    ASSERT_EQ(Read(Join({udta, ilst})), MM_OK);
    EXPECT_EQ(Text(META_TITLE), "From ilst");
    ASSERT_EQ(Read(ilst, udta), MM_OK);
    EXPECT_EQ(Text(META_TITLE), "From titl") << "a top-level udta counts too";
}

TEST_F(Mp4Udta, EmbeddedId3TagFillsTheItems) {
    ByteVec tag = Id3Tag(4, {Id3Frame(4, "TIT2", TextBody(3, "Embedded")), Id3Frame(4, "TPE1", TextBody(0, "Band"))});
    ASSERT_EQ(Read(Meta(FullBox("ID32", 0, 0, Join({Bytes().be16(0x15C7).data(), tag})))), MM_OK);
    EXPECT_EQ(Text(META_TITLE), "Embedded");
    EXPECT_EQ(meta.aItems[META_TITLE].nEncoding, static_cast<uint32_t>(ENCODING_UTF8));
    EXPECT_EQ(Text(META_ARTIST), "Band");
    // An empty tag or an empty box fails alone: the items beside it stay.
    for (const ByteVec& id32 : {FullBox("ID32", 0, 0, Bytes().be16(0x15C7).str("ID3").u8(4).u8(0).u8(0).syncsafe32(0)),
                                FullBox("ID32", 0, 0, {})}) {
        ASSERT_EQ(Read(Meta(Join({id32, Ilst(Item("\xA9" "ART", "Kept"))}))), MM_OK);
        EXPECT_EQ(Text(META_ARTIST), "Kept");
    }
}

TEST_F(Mp4Udta, ABrokenChildDropsTheUserDataItems) {
    // A child of size 0 ends the udta walk with a failure: nothing is copied.
    ASSERT_EQ(Read(Box("udta", Join({TextBox("titl", "Lost"), Bytes().be32(0).str("junk").data()}))), MM_OK);
    EXPECT_EQ(meta.aItems[META_TITLE].nLength, 0u);
    // Boxes too short for their language field are skipped.
    ASSERT_EQ(Read(Box("udta", Join({FullBox("titl", 0, 0, {}), FullBox("albm", 0, 0, {1}), TextBox("perf", "P")}))),
              MM_OK);
    EXPECT_EQ(meta.aItems[META_ALBUM].nLength, 0u);
    EXPECT_EQ(Text(META_ARTIST), "P");
}

TEST_F(Mp4Udta, HostileItemsAreBounded) {
    // data boxes shorter than their header, trkn without its bytes, an item of
    // size 0, and a data box claiming more than the file.
    ByteVec items = Join({Box("\xA9" "nam", Box("data", {1, 2})), IlstItem("trkn", 0, {0, 0}),
                          Box("\xA9" "alb", Bytes().be32(0x7FFFFF00).str("data").zeros(8)),
                          Bytes().be32(0).str("\xA9" "ART").data()});
    ASSERT_EQ(Read(Meta(Ilst(items))), MM_OK);
    EXPECT_EQ(meta.aItems[META_TRACKNUMBER].nLength, 0u);
    EXPECT_EQ(meta.aItems[META_ALBUM].nLength, 0u);
    // A meta without its version word (QuickTime style) is misread, harmlessly.
    ASSERT_EQ(Read(Box("udta", Box("meta", Join({Hdlr("mdir"), Ilst(Item("\xA9" "nam", "x"))})))), MM_OK);
}
