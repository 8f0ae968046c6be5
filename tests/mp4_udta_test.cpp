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
ByteVec Text(const std::string& s) { return ByteVec(s.begin(), s.end()); }

std::string ItemText(const _MMMetaItem& item) { return std::string(reinterpret_cast<const char*>(item.szData), item.nLength); }

class Mp4Udta : public ::testing::Test {
protected:
    TempDir dir;
    _MMMetaInfo meta{};

    int32_t Read(const ByteVec& moovChildren, const ByteVec& topLevel = {}) {
        ByteVec file = Join({Ftyp(), Box("moov", Join({Mvhd(0, 1000, 1000), moovChildren})), topLevel,
                             Box("mdat", ByteVec(16, 0))});
        std::memset(&meta, 0, sizeof meta);
        return MP4_GetMetaInfo(dir.Write("m.m4a", file).c_str(), &meta, 1);
    }
    void TearDown() override { MM_MediaExtractor_FreeMetaInfo(&meta); }
};

}  // namespace

TEST_F(Mp4Udta, PerformerBeatsAuthorUnlessEmpty) {
    ASSERT_EQ(Read(Box("udta", Join({TextBox("auth", "Writer"), TextBox("perf", "Singer")}))), MM_OK);
    EXPECT_EQ(ItemText(meta.aItems[META_ARTIST]), "Singer");
    ASSERT_EQ(Read(Box("udta", Join({TextBox("perf", ""), TextBox("auth", "Writer")}))), MM_OK);
    EXPECT_EQ(ItemText(meta.aItems[META_ARTIST]), "Writer");
}

TEST_F(Mp4Udta, TextBoxesFillTheirItems) {
    ByteVec albm = FullBox("albm", 0, 0, Bytes().be16(0x15C7).str("Record").u8(0).u8(4));
    ByteVec yrrc = FullBox("yrrc", 0, 0, Bytes().be16(2009));
    ASSERT_EQ(Read(Box("udta", Join({TextBox("titl", "Name"), albm, TextBox("gnre", "Jazz"), yrrc,
                                     TextBox("cprt", "(c) me"), TextBox("dscp", "dropped"),
                                     FullBox("loci", 0, 0, ByteVec(20, 0)), FullBox("rtng", 0, 0, ByteVec(2, 0))}))),
              MM_OK);
    EXPECT_EQ(ItemText(meta.aItems[META_TITLE]), "Name");
    EXPECT_EQ(meta.aItems[META_TITLE].nEncoding, 5u);
    EXPECT_EQ(ItemText(meta.aItems[META_ALBUM]), std::string("Record\0", 7)) << "the last byte is the track number";
    EXPECT_EQ(ItemText(meta.aItems[META_GENRE]), "Jazz");
    EXPECT_EQ(ItemText(meta.aItems[META_COPYRIGHT]), "(c) me");
    EXPECT_EQ(meta.aItems[META_YEAR].nLength, 2u);
    EXPECT_EQ(meta.aItems[META_YEAR].szData[0] | meta.aItems[META_YEAR].szData[1] << 8, 2009);
    EXPECT_EQ(meta.aItems[META_COMMENT].nLength, 0u);
}

TEST_F(Mp4Udta, ByteOrderMarksChooseTheEncodingAndStay) {
    ASSERT_EQ(Read(Box("udta", Join({FullBox("titl", 0, 0, Bytes().be16(0).u8(0xFE).u8(0xFF).be16('A')),
                                     FullBox("cprt", 0, 0, Bytes().be16(0).u8(0xFF).u8(0xFE).le16('B'))}))),
              MM_OK);
    EXPECT_EQ(meta.aItems[META_TITLE].nEncoding, 4u);
    EXPECT_EQ(meta.aItems[META_TITLE].nLength, 4u);
    EXPECT_EQ(meta.aItems[META_TITLE].szData[0], 0xFE);
    EXPECT_EQ(meta.aItems[META_COPYRIGHT].nEncoding, 6u);
    EXPECT_EQ(judgeLangue(nullptr), 0u);
}

TEST_F(Mp4Udta, LongTextsAreCutTo128Bytes) {
    ASSERT_EQ(Read(Box("udta", TextBox("titl", std::string(200, 'x')))), MM_OK);
    EXPECT_EQ(meta.aItems[META_TITLE].nLength, 128u);
    ASSERT_EQ(Read(Meta(Ilst(IlstItem("\xA9" "nam", 1, Text(std::string(300, 'y')))))), MM_OK);
    EXPECT_EQ(meta.aItems[META_TITLE].nLength, 128u);
    EXPECT_EQ(meta.aItems[META_TITLE].szData[127], 'y');
}

TEST_F(Mp4Udta, ItunesItemsFillTitleArtistAlbumYearGenreAndTrack) {
    ByteVec items = Join({IlstItem("\xA9" "nam", 1, Text("Song")), IlstItem("\xA9" "ART", 1, Text("Band")),
                          IlstItem("\xA9" "alb", 1, Text("LP")), IlstItem("\xA9" "day", 1, Text("2001-02-03")),
                          IlstItem("gnre", 0, {0, 1}), IlstItem("trkn", 0, {0, 0, 0, 7, 0, 12, 0, 0}),
                          IlstItem("\xA9" "cmt", 1, Text("skipped")), IlstItem("covr", 13, ByteVec(50, 0xFF))});
    ASSERT_EQ(Read(Box("udta", Meta(Ilst(items)))), MM_OK);
    EXPECT_EQ(ItemText(meta.aItems[META_TITLE]), "Song");
    EXPECT_EQ(ItemText(meta.aItems[META_ARTIST]), "Band");
    EXPECT_EQ(ItemText(meta.aItems[META_ALBUM]), "LP");
    EXPECT_EQ(ItemText(meta.aItems[META_YEAR]), "2001-02-03");
    EXPECT_EQ(ItemText(meta.aItems[META_GENRE]), "Blues");
    EXPECT_EQ(meta.aItems[META_TRACKNUMBER].nLength, 4u);
    EXPECT_EQ(meta.aItems[META_TRACKNUMBER].nEncoding, 0u);
    uint32_t track = 0;
    std::memcpy(&track, meta.aItems[META_TRACKNUMBER].szData, 4);
    EXPECT_EQ(track, 7u);
    EXPECT_EQ(meta.aItems[META_COMMENT].nLength, 0u);
    EXPECT_EQ(meta.pPicture, nullptr);
}

TEST_F(Mp4Udta, GenreNumbersOutsideTheTableStayRaw) {
    for (uint8_t n : {0, 148}) {
        ASSERT_EQ(Read(Meta(Ilst(IlstItem("gnre", 0, {0, n})))), MM_OK);
        EXPECT_EQ(meta.aItems[META_GENRE].nLength, 2u) << int(n);
        EXPECT_EQ(meta.aItems[META_GENRE].szData[1], n);
    }
    ASSERT_EQ(Read(Meta(Ilst(IlstItem("gnre", 0, {0, 147})))), MM_OK);
    EXPECT_EQ(ItemText(meta.aItems[META_GENRE]), "JPop") << "numbers count from 1: the last name is out of reach";
}

TEST_F(Mp4Udta, UserDataOverwritesItemsReadBeforeIt) {
    ByteVec ilst = Meta(Ilst(IlstItem("\xA9" "nam", 1, Text("From ilst"))));
    ByteVec udta = Box("udta", TextBox("titl", "From titl"));
    ASSERT_EQ(Read(Join({ilst, udta})), MM_OK);
    EXPECT_EQ(ItemText(meta.aItems[META_TITLE]), "From titl");
    ASSERT_EQ(Read(Join({udta, ilst})), MM_OK);
    EXPECT_EQ(ItemText(meta.aItems[META_TITLE]), "From ilst");
    // Inside one udta the text boxes are copied after its meta was read.
    ASSERT_EQ(Read(Box("udta", Join({TextBox("titl", "From titl"), ilst}))), MM_OK);
    EXPECT_EQ(ItemText(meta.aItems[META_TITLE]), "From titl");
    // A top-level udta counts too.
    ASSERT_EQ(Read(ilst, udta), MM_OK);
    EXPECT_EQ(ItemText(meta.aItems[META_TITLE]), "From titl");
}

TEST_F(Mp4Udta, LaterItemsReplaceEarlierOnes) {
    ASSERT_EQ(Read(Meta(Ilst(Join({IlstItem("\xA9" "nam", 1, Text("First longer")),
                                   IlstItem("\xA9" "nam", 1, Text("Second"))})))),
              MM_OK);
    EXPECT_EQ(ItemText(meta.aItems[META_TITLE]), "Second");
    EXPECT_EQ(meta.aItems[META_TITLE].szData[6], 0) << "nothing of the earlier value is left";
}

TEST_F(Mp4Udta, EmbeddedId3TagFillsTheItems) {
    ByteVec tag = Id3Tag(4, {Id3Frame(4, "TIT2", TextBody(3, "Embedded")), Id3Frame(4, "TPE1", TextBody(0, "Band"))});
    ByteVec id32 = FullBox("ID32", 0, 0, Join({Bytes().be16(0x15C7).data(), tag}));
    ASSERT_EQ(Read(Meta(id32)), MM_OK);
    EXPECT_EQ(ItemText(meta.aItems[META_TITLE]), "Embedded");
    EXPECT_EQ(meta.aItems[META_TITLE].nEncoding, static_cast<uint32_t>(ENCODING_UTF8));
    EXPECT_EQ(ItemText(meta.aItems[META_ARTIST]), "Band");
}

TEST_F(Mp4Udta, EmbeddedId3FailureKeepsTheOtherItems) {
    ByteVec id32 = FullBox("ID32", 0, 0, Bytes().be16(0x15C7).str("ID3").u8(4).u8(0).u8(0).syncsafe32(0));
    ASSERT_EQ(Read(Meta(Join({id32, Ilst(IlstItem("\xA9" "ART", 1, Text("Kept")))}))), MM_OK);
    EXPECT_EQ(ItemText(meta.aItems[META_ARTIST]), "Kept");
    ByteVec tiny = FullBox("ID32", 0, 0, {});
    ASSERT_EQ(Read(Meta(Join({tiny, Ilst(IlstItem("\xA9" "ART", 1, Text("Kept")))}))), MM_OK);
    EXPECT_EQ(ItemText(meta.aItems[META_ARTIST]), "Kept");
}

TEST_F(Mp4Udta, ABrokenChildDropsTheUserDataItems) {
    // A child of size 0 ends the udta walk with a failure: nothing is copied.
    ASSERT_EQ(Read(Box("udta", Join({TextBox("titl", "Lost"), Bytes().be32(0).str("junk").data()}))), MM_OK);
    EXPECT_EQ(meta.aItems[META_TITLE].nLength, 0u);
    // Boxes too short for their language field are skipped.
    ASSERT_EQ(Read(Box("udta", Join({FullBox("titl", 0, 0, {}), FullBox("albm", 0, 0, {1}), TextBox("perf", "P")}))),
              MM_OK);
    EXPECT_EQ(meta.aItems[META_TITLE].nLength, 0u);
    EXPECT_EQ(meta.aItems[META_ALBUM].nLength, 0u);
    EXPECT_EQ(ItemText(meta.aItems[META_ARTIST]), "P");
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
    ASSERT_EQ(Read(Box("udta", Box("meta", Join({Hdlr("mdir"), Ilst(IlstItem("\xA9" "nam", 1, Text("x")))})))), MM_OK);
}

TEST_F(Mp4Udta, UdtaRefusesOtherModes) {
    EXPECT_EQ(AnaUdta(0, kModeClip, nullptr), -8);
}
