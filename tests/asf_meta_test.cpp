// ASF metadata objects: sources and their order, encodings, ratings, pictures.
#include <cstring>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "asf/asf_header.h"
#include "asf/asf_meta.h"
#include "metainfo/metainfo.h"
#include "support/asf_builder.h"
#include "support/bytes.h"

using namespace testing_support;

namespace {

constexpr uint16_t kString = 0, kBytes = 1, kDword = 3;

struct Meta {
    int32_t result = 0;
    _MMMetaInfo info;
    Meta() { std::memset(&info, 0, sizeof info); }
    ~Meta() { MM_MediaExtractor_FreeMetaInfo(&info); }
    Meta(const Meta&) = delete;
    Meta& operator=(const Meta&) = delete;
};

void MetaOf(const std::vector<Bytes>& objects, int allowance, Meta* m) {
    TempDir dir;
    Bytes file = AsfHeader(objects);
    file.zeros(64);
    auto path = dir.Write("m.wma", file.data());
    m->result = metainfo::ASF_GetMetaInfo(path.c_str(), &m->info, allowance);
}

std::vector<uint8_t> Utf16Value(const std::string& s) { return Utf16(s).data(); }

std::string Item(const _MMMetaItem& item) {
    return std::string(reinterpret_cast<const char*>(item.szData), item.nLength);
}

std::string Utf16Item(const std::string& s) {
    Bytes b = Utf16(s);
    return std::string(b.data().begin(), b.data().end());
}

Bytes Jpeg(size_t n) {
    Bytes b;
    b.u8(0xFF).u8(0xD8);
    for (size_t i = 2; i < n; ++i) b.u8(static_cast<uint8_t>(i * 7));
    return b;
}

}  // namespace

TEST(AsfContentDescription, FillsTextItemsAsUtf16) {
    Meta m;
    MetaOf({AsfContentDescription("Title", "Author", "(c)", "Words", "")}, 1, &m);
    ASSERT_EQ(m.result, 0);
    EXPECT_EQ(Item(m.info.aItems[META_TITLE]), Utf16Item("Title"));
    EXPECT_EQ(m.info.aItems[META_TITLE].nEncoding, 6u);
    EXPECT_EQ(Item(m.info.aItems[META_ARTIST]), Utf16Item("Author"));
    EXPECT_EQ(Item(m.info.aItems[META_COPYRIGHT]), Utf16Item("(c)"));
    EXPECT_EQ(Item(m.info.aItems[META_COMMENT]), Utf16Item("Words"));
    EXPECT_EQ(m.info.nRating, 0u);
}

TEST(AsfContentDescription, LongTextIsCutTo128BytesAndTheRestStillRead) {
    Meta m;
    std::string longTitle(100, 'x');
    MetaOf({AsfContentDescription(longTitle, "A", "", "", "low")}, 1, &m);
    ASSERT_EQ(m.result, 0);
    EXPECT_EQ(m.info.aItems[META_TITLE].nLength, 128u);
    EXPECT_EQ(Item(m.info.aItems[META_ARTIST]), Utf16Item("A"));
    EXPECT_EQ(m.info.nRating, 1u);
}

TEST(AsfContentDescription, RatingWordsAreComparedExactly) {
    const std::pair<const char*, uint32_t> cases[] = {
        {"high", 5}, {"higher", 4}, {"middle", 3}, {"lower", 2}, {"low", 1}, {"Higher", 0}, {"", 0}, {"highest", 0}};
    for (const auto& c : cases) {
        Meta m;
        MetaOf({AsfContentDescription("t", "", "", "", c.first)}, 1, &m);
        ASSERT_EQ(m.result, 0) << c.first;
        EXPECT_EQ(m.info.nRating, c.second) << c.first;
    }
}

TEST(AsfContentDescription, TruncatedObjectFailsButKeepsWhatWasRead) {
    TempDir dir;
    Bytes file = AsfHeader({AsfContentDescription("Title", "Author", "", "", "")});
    file.data().resize(file.size() - 6);
    auto path = dir.Write("m.wma", file.data());
    _MMMetaInfo meta{};
    EXPECT_EQ(metainfo::ASF_GetMetaInfo(path.c_str(), &meta, 1), 1);
    EXPECT_EQ(Item(meta.aItems[META_TITLE]), Utf16Item("Title"));
}

TEST(AsfDescriptors, NamesFillTheirItemsWithTheTypesEncoding) {
    Meta m;
    MetaOf({AsfExtContentDescription({
               {"WM/AlbumTitle", kString, Utf16Value("Album")},
               {"WM/AlbumArtist", kString, Utf16Value("Band")},
               {"WM/Genre", kString, Utf16Value("Jazz")},
               {"WM/Year", kString, Utf16Value("2004")},
               {"WM/Composer", kString, Utf16Value("Comp")},
               {"WM/Language", kString, Utf16Value("en")},
               {"WM/Unknown", kString, Utf16Value("skipped")},
               {"WM/OriginalArtist", kBytes, {1, 2, 3}},
           })},
           1, &m);
    ASSERT_EQ(m.result, 0);
    EXPECT_EQ(Item(m.info.aItems[META_ALBUM]), Utf16Item("Album"));
    EXPECT_EQ(Item(m.info.stAlbumArtist), Utf16Item("Band"));
    EXPECT_EQ(Item(m.info.aItems[META_GENRE]), Utf16Item("Jazz"));
    EXPECT_EQ(Item(m.info.aItems[META_YEAR]), Utf16Item("2004"));
    EXPECT_EQ(Item(m.info.aItems[META_COMPOSER]), Utf16Item("Comp"));
    EXPECT_EQ(Item(m.info.aItems[META_LANGUAGE]), Utf16Item("en"));
    EXPECT_EQ(m.info.aItems[META_ARTIST].nLength, 3u);
    EXPECT_EQ(m.info.aItems[META_ARTIST].nEncoding, 2u);
}

TEST(AsfDescriptors, TrackNumberAsDwordAndAsString) {
    Meta dword;
    MetaOf({AsfExtContentDescription({{"WM/TrackNumber", kDword, {7, 0, 0, 0}}})}, 1, &dword);
    ASSERT_EQ(dword.result, 0);
    EXPECT_EQ(dword.info.aItems[META_TRACKNUMBER].nEncoding, 0u);
    EXPECT_EQ(dword.info.aItems[META_TRACKNUMBER].nLength, 4u);
    EXPECT_EQ(dword.info.aItems[META_TRACKNUMBER].szData[0], 7);

    Meta text;
    MetaOf({AsfMetadata({{"WM/TrackNumber", kString, Utf16Value("12")}})}, 1, &text);
    ASSERT_EQ(text.result, 0);  // no Header Extension: nothing from a top-level Metadata Object
    EXPECT_EQ(text.info.aItems[META_TRACKNUMBER].nLength, 0u);
    Meta nested;
    MetaOf({AsfHeaderExtension({AsfMetadata({{"WM/TrackNumber", kString, Utf16Value("12")}})})}, 1, &nested);
    ASSERT_EQ(nested.result, 0);
    EXPECT_EQ(nested.info.aItems[META_TRACKNUMBER].nEncoding, 6u);
    EXPECT_EQ(Item(nested.info.aItems[META_TRACKNUMBER]), Utf16Item("12"));
}

TEST(AsfDescriptors, FirstSourceWins) {
    Meta m;
    // Header Extension first in the file, yet the Extended Content Description is read before it.
    MetaOf({AsfHeaderExtension({AsfMetadata({{"WM/AlbumTitle", kString, Utf16Value("FromMetadata")},
                                             {"WM/Genre", kString, Utf16Value("Rock")}}),
                                AsfMetadata({{"WM/Genre", kString, Utf16Value("Pop")}}, true)}),
            AsfExtContentDescription({{"WM/AlbumTitle", kString, Utf16Value("FromExtended")},
                                      {"WM/OriginalArtist", kString, Utf16Value("Original")},
                                      {"WM/AlbumTitle", kString, Utf16Value("Second")}}),
            AsfContentDescription("T", "Author", "", "", "")},
           1, &m);
    ASSERT_EQ(m.result, 0);
    EXPECT_EQ(Item(m.info.aItems[META_ALBUM]), Utf16Item("FromExtended"));
    EXPECT_EQ(Item(m.info.aItems[META_ARTIST]), Utf16Item("Author"));
    EXPECT_EQ(Item(m.info.aItems[META_GENRE]), Utf16Item("Rock"));
}

TEST(AsfDescriptors, LongValueIsCutAndTheNextDescriptorStillRead) {
    Meta m;
    std::vector<uint8_t> longValue(300, 'z');
    MetaOf({AsfExtContentDescription({{"WM/Genre", kBytes, longValue}, {"WM/Year", kString, Utf16Value("1999")}})},
           1, &m);
    ASSERT_EQ(m.result, 0);
    EXPECT_EQ(m.info.aItems[META_GENRE].nLength, 128u);
    EXPECT_EQ(Item(m.info.aItems[META_YEAR]), Utf16Item("1999"));
}

TEST(AsfDescriptors, DataTypeAboveSixIsCorruption) {
    Meta m;
    MetaOf({AsfContentDescription("Kept", "", "", "", ""),
            AsfExtContentDescription({{"WM/Year", kString, Utf16Value("1")}, {"WM/Genre", 7, {1, 2}}})},
           1, &m);
    EXPECT_EQ(m.result, 1);
    EXPECT_EQ(Item(m.info.aItems[META_TITLE]), Utf16Item("Kept"));
    EXPECT_EQ(Item(m.info.aItems[META_YEAR]), Utf16Item("1"));
}

TEST(AsfDescriptors, LengthsBeyondTheFileFailWithoutAllocatingThem) {
    // A name and a picture value that claim more than the file holds.
    Bytes name = AsfObject(asf_guid::kExtContentDescription, Bytes().le16(1).le16(0xFFFF).str("W"));
    Meta a;
    MetaOf({name}, 1, &a);
    EXPECT_EQ(a.result, 1);
    Bytes picture = AsfMetadata({{"WM/Picture", kBytes, {3, 0, 0, 0, 0}}});
    picture.patch_le32(picture.size() - 5 - Utf16("WM/Picture").size() - 4, 0xFFFFFFF0u);
    Meta b;
    MetaOf({AsfHeaderExtension({picture})}, 0x7FFFFFFF, &b);
    EXPECT_EQ(b.result, 1);
    EXPECT_EQ(b.info.pPicture, nullptr);
}

TEST(AsfDescriptors, HeaderExtensionDataSizeNotBelowFileSizeFails) {
    Meta m;
    MetaOf({AsfHeaderExtension({AsfMetadata({{"WM/Year", kString, Utf16Value("1")}})}, 1 << 20)}, 1, &m);
    EXPECT_EQ(m.result, 1);
    Meta empty;
    MetaOf({AsfHeaderExtension({}, 0)}, 1, &empty);
    EXPECT_EQ(empty.result, 0);
}

TEST(AsfPicture, WmPictureBelowTheCeilingIsTakenWithItsMimeAndDescription) {
    Bytes jpeg = Jpeg(1000);
    Meta m;
    MetaOf({AsfExtContentDescription({{"WM/Picture", kBytes, AsfWmPicture(3, "image/jpeg", "cover", jpeg).data()}})},
           1, &m);
    ASSERT_EQ(m.result, 0);
    ASSERT_NE(m.info.pPicture, nullptr);
    ASSERT_EQ(m.info.nPictureSize, 1000u);
    EXPECT_EQ(std::vector<uint8_t>(m.info.pPicture, m.info.pPicture + 1000), jpeg.data());
    const _MMMetaItem& mime = m.info.aItems[META_PICTURE_FORMAT];
    EXPECT_EQ(mime.nEncoding, 6u);
    EXPECT_EQ(Item(mime), Utf16Item("image/jpeg") + Utf16Item("cover"));
}

TEST(AsfPicture, WmPictureAboveTheCeilingNeedsAnAllowanceOfItsSize) {
    Bytes big = Jpeg(600000);
    auto value = AsfWmPicture(3, "image/jpeg", "", big).data();
    Bytes inner = AsfHeaderExtension({AsfMetadata({{"WM/Picture", kBytes, value}}, true)});
    Meta one;
    MetaOf({inner}, 1, &one);
    ASSERT_EQ(one.result, 0);
    EXPECT_EQ(one.info.pPicture, nullptr);
    EXPECT_EQ(one.info.aItems[META_PICTURE_FORMAT].nLength, 0u);
    Meta less;
    MetaOf({inner}, 599999, &less);
    EXPECT_EQ(less.info.pPicture, nullptr);
    Meta enough;
    MetaOf({inner}, 600000, &enough);
    ASSERT_EQ(enough.result, 0);
    ASSERT_NE(enough.info.pPicture, nullptr);
    EXPECT_EQ(enough.info.nPictureSize, 600000u);
    EXPECT_EQ(enough.info.pPicture[599999], big.data()[599999]);
}

TEST(AsfPicture, AllowanceZeroReadsNoPicture) {
    Meta m;
    MetaOf({AsfExtContentDescription({{"WM/Picture", kBytes, AsfWmPicture(3, "image/png", "", Jpeg(10)).data()}})},
           0, &m);
    ASSERT_EQ(m.result, 0);
    EXPECT_EQ(m.info.pPicture, nullptr);
    EXPECT_EQ(m.info.nPictureSize, 0u);
}

TEST(AsfPicture, WmPictureClaimingMoreThanItsValueIsNotTaken) {
    Bytes value = AsfWmPicture(3, "image/jpeg", "", Jpeg(16));
    value.patch_le32(1, 5000);
    Meta m;
    MetaOf({AsfExtContentDescription({{"WM/Picture", kBytes, value.data()}, {"WM/Year", kString, Utf16Value("7")}})},
           1, &m);
    ASSERT_EQ(m.result, 0);
    EXPECT_EQ(m.info.pPicture, nullptr);
    EXPECT_EQ(Item(m.info.aItems[META_YEAR]), Utf16Item("7"));
    // Shorter than its own type and length fields.
    Meta tiny;
    MetaOf({AsfExtContentDescription({{"WM/Picture", kBytes, {3, 1}}})}, 1, &tiny);
    EXPECT_EQ(tiny.result, 0);
    EXPECT_EQ(tiny.info.pPicture, nullptr);
}

TEST(AsfBranding, BannerIsReadWithinTheAllowanceAndBeatsWmPicture) {
    Bytes banner = Jpeg(300);
    Meta m;
    MetaOf({AsfContentBranding(2, banner, "http://b", "http://c"),
            AsfExtContentDescription({{"WM/Picture", kBytes, AsfWmPicture(3, "image/png", "", Jpeg(10)).data()}}),
            AsfContentDescription("After", "", "", "", "")},
           1, &m);
    ASSERT_EQ(m.result, 0);
    ASSERT_NE(m.info.pPicture, nullptr);
    EXPECT_EQ(m.info.nPictureSize, 300u);
    EXPECT_EQ(std::vector<uint8_t>(m.info.pPicture, m.info.pPicture + 300), banner.data());
    const _MMMetaItem& mime = m.info.aItems[META_PICTURE_FORMAT];
    EXPECT_EQ(mime.nEncoding, 2u);
    EXPECT_EQ(mime.nLength, 11u);
    EXPECT_EQ(std::memcmp(mime.szData, "image/jpeg", 11), 0);
    EXPECT_EQ(Item(m.info.aItems[META_TITLE]), Utf16Item("After"));
}

TEST(AsfBranding, AllowanceZeroKeepsTheSizeWordAndMimeButNoPicture) {
    Meta m;
    MetaOf({AsfContentBranding(1, Jpeg(300)), AsfContentDescription("After", "", "", "", "")}, 0, &m);
    ASSERT_EQ(m.result, 0);
    EXPECT_EQ(m.info.pPicture, nullptr);
    EXPECT_EQ(m.info.nPictureSize, 300u);
    EXPECT_EQ(m.info.aItems[META_PICTURE_FORMAT].nEncoding, 2u);
    EXPECT_EQ(m.info.aItems[META_PICTURE_FORMAT].nLength, 10u);
    EXPECT_EQ(Item(m.info.aItems[META_TITLE]), Utf16Item("After"));
}

TEST(AsfBranding, ImageTypeZeroLeavesTheWalkInsideTheObject) {
    Meta m;
    MetaOf({AsfContentBranding(0, Bytes()), AsfContentDescription("Lost", "", "", "", "")}, 1, &m);
    EXPECT_EQ(m.result, 0);
    EXPECT_EQ(m.info.aItems[META_TITLE].nLength, 0u);
}

TEST(AsfBranding, ASecondBannerReplacesTheFirstPicture) {
    Meta m;
    MetaOf({AsfContentBranding(2, Jpeg(300)), AsfContentBranding(3, Jpeg(600000))}, 1, &m);
    ASSERT_EQ(m.result, 0);
    // The size word never describes a buffer it does not match.
    EXPECT_EQ(m.info.pPicture, nullptr);
    EXPECT_EQ(m.info.nPictureSize, 600000u);
}

TEST(AsfMetaInfo, PublicInterfaceLoadsPicturesUpToTheCeiling) {
    TempDir dir;
    Bytes file = AsfHeader({AsfContentDescription("T", "", "", "", ""),
                            AsfHeaderExtension({AsfMetadata(
                                {{"WM/Picture", kBytes, AsfWmPicture(3, "image/jpeg", "", Jpeg(0x80000)).data()}}, true)})});
    auto path = dir.Write("p.wma", file.data());
    _MMMetaInfo meta;
    ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(path.c_str(), MEDIA_TYPE_ASF, &meta), 0);
    EXPECT_NE(meta.pPicture, nullptr);
    EXPECT_EQ(meta.nPictureSize, 0x80000u);
    EXPECT_EQ(MM_MediaExtractor_FreeMetaInfo(&meta), 0);
}
