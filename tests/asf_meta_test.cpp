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
    Meta(const std::vector<Bytes>& objects, int allowance = 1) {
        std::memset(&info, 0, sizeof info);
        TempDir dir;
        Bytes file = AsfHeader(objects);
        file.zeros(64);
        result = metainfo::ASF_GetMetaInfo(dir.Write("m.wma", file.data()).c_str(), &info, allowance);
    }
    ~Meta() { MM_MediaExtractor_FreeMetaInfo(&info); }
    Meta(const Meta&) = delete;
    Meta& operator=(const Meta&) = delete;
    std::string Item(int kind) const { return Text(info.aItems[kind]); }
    static std::string Text(const _MMMetaItem& item) {
        return std::string(reinterpret_cast<const char*>(item.szData), item.nLength);
    }
};

std::vector<uint8_t> Utf16Value(const std::string& s) { return Utf16(s).data(); }

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

std::vector<uint8_t> PictureValue(size_t n, const std::string& description = "") {
    return AsfWmPicture(3, "image/jpeg", description, Jpeg(n)).data();
}

}  // namespace

// A title of 202 bytes is cut to 128 and the author after it still read.
TEST(AsfContentDescription, FillsTextItemsAsUtf16CutTo128Bytes) {
    Meta m({AsfContentDescription(std::string(100, 'x'), "Author", "(c)", "Words", "")});
    ASSERT_EQ(m.result, 0);
    EXPECT_EQ(m.info.aItems[META_TITLE].nLength, 128u);
    EXPECT_EQ(m.info.aItems[META_TITLE].nEncoding, 6u);
    EXPECT_EQ(m.Item(META_ARTIST), Utf16Item("Author"));
    EXPECT_EQ(m.Item(META_COPYRIGHT), Utf16Item("(c)"));
    EXPECT_EQ(m.Item(META_COMMENT), Utf16Item("Words"));
}

TEST(AsfContentDescription, RatingWordsAreComparedExactly) {
    const std::pair<const char*, uint32_t> cases[] = {
        {"high", 5}, {"higher", 4}, {"middle", 3}, {"lower", 2}, {"low", 1}, {"Higher", 0}, {"", 0}, {"highest", 0}};
    for (const auto& c : cases) {
        Meta m({AsfContentDescription("t", "", "", "", c.first)});
        ASSERT_EQ(m.result, 0) << c.first;
        EXPECT_EQ(m.info.nRating, c.second) << c.first;
    }
}

TEST(AsfContentDescription, TruncatedObjectFailsButKeepsWhatWasRead) {
    TempDir dir;
    Bytes file = AsfHeader({AsfContentDescription("Title", "Author", "", "", "")});
    file.data().resize(file.size() - 6);
    _MMMetaInfo meta{};
    EXPECT_EQ(metainfo::ASF_GetMetaInfo(dir.Write("m.wma", file.data()).c_str(), &meta, 1), 1);
    EXPECT_EQ(Meta::Text(meta.aItems[META_TITLE]), Utf16Item("Title"));
}

// A value longer than 128 bytes is cut and the next descriptor still read.
TEST(AsfDescriptors, NamesFillTheirItemsWithTheTypesEncoding) {
    Meta m({AsfExtContentDescription({
        {"WM/AlbumTitle", kString, Utf16Value("Album")},
        {"WM/AlbumArtist", kString, Utf16Value("Band")},
        {"WM/Genre", kBytes, std::vector<uint8_t>(300, 'z')},
        {"WM/Year", kString, Utf16Value("2004")},
        {"WM/Composer", kString, Utf16Value("Comp")},
        {"WM/Language", kString, Utf16Value("en")},
        {"WM/Unknown", kString, Utf16Value("skipped")},
        {"WM/OriginalArtist", kBytes, {1, 2, 3}},
        {"WM/TrackNumber", kDword, {7, 0, 0, 0}},
    })});
    ASSERT_EQ(m.result, 0);
    EXPECT_EQ(m.Item(META_ALBUM), Utf16Item("Album"));
    EXPECT_EQ(Meta::Text(m.info.stAlbumArtist), Utf16Item("Band"));
    EXPECT_EQ(m.Item(META_GENRE), std::string(128, 'z'));
    EXPECT_EQ(m.Item(META_YEAR), Utf16Item("2004"));
    EXPECT_EQ(m.Item(META_COMPOSER), Utf16Item("Comp"));
    EXPECT_EQ(m.Item(META_LANGUAGE), Utf16Item("en"));
    EXPECT_EQ(m.Item(META_ARTIST), std::string("\1\2\3"));
    EXPECT_EQ(m.info.aItems[META_ARTIST].nEncoding, 2u);
    EXPECT_EQ(m.Item(META_TRACKNUMBER), std::string("\7\0\0\0", 4));
    EXPECT_EQ(m.info.aItems[META_TRACKNUMBER].nEncoding, 0u);
}

// Content Description beats descriptors, descriptors beat the Metadata
// Objects of the Header Extension (read after them wherever it stands), and a
// Metadata Object outside the Header Extension is not read.
TEST(AsfDescriptors, FirstSourceWins) {
    Meta m({AsfMetadata({{"WM/TrackNumber", kString, Utf16Value("99")}}),
            AsfHeaderExtension({AsfMetadata({{"WM/AlbumTitle", kString, Utf16Value("FromMetadata")},
                                             {"WM/Genre", kString, Utf16Value("Rock")},
                                             {"WM/TrackNumber", kString, Utf16Value("12")}}),
                                AsfMetadata({{"WM/Genre", kString, Utf16Value("Pop")}}, true)}),
            AsfExtContentDescription({{"WM/AlbumTitle", kString, Utf16Value("FromExtended")},
                                      {"WM/OriginalArtist", kString, Utf16Value("Original")},
                                      {"WM/AlbumTitle", kString, Utf16Value("Second")}}),
            AsfContentDescription("T", "Author", "", "", "")});
    ASSERT_EQ(m.result, 0);
    EXPECT_EQ(m.Item(META_ALBUM), Utf16Item("FromExtended"));
    EXPECT_EQ(m.Item(META_ARTIST), Utf16Item("Author"));
    EXPECT_EQ(m.Item(META_GENRE), Utf16Item("Rock"));
    EXPECT_EQ(m.Item(META_TRACKNUMBER), Utf16Item("12"));
    EXPECT_EQ(m.info.aItems[META_TRACKNUMBER].nEncoding, 6u);
}

TEST(AsfDescriptors, DataTypeAboveSixIsCorruption) {
    Meta m({AsfContentDescription("Kept", "", "", "", ""),
            AsfExtContentDescription({{"WM/Year", kString, Utf16Value("1")}, {"WM/Genre", 7, {1, 2}}})});
    EXPECT_EQ(m.result, 1);
    EXPECT_EQ(m.Item(META_TITLE), Utf16Item("Kept"));
    EXPECT_EQ(m.Item(META_YEAR), Utf16Item("1"));
}

// A name, a picture value or a Header Extension that claims more than the file holds.
TEST(AsfDescriptors, LengthsBeyondTheFileFailWithoutAllocatingThem) {
    Meta name({AsfObject(asf_guid::kExtContentDescription, Bytes().le16(1).le16(0xFFFF).str("W"))});
    EXPECT_EQ(name.result, 1);
    Bytes picture = AsfMetadata({{"WM/Picture", kBytes, {3, 0, 0, 0, 0}}});
    picture.patch_le32(picture.size() - 5 - Utf16("WM/Picture").size() - 4, 0xFFFFFFF0u);
    Meta value({AsfHeaderExtension({picture})}, 0x7FFFFFFF);
    EXPECT_EQ(value.result, 1);
    EXPECT_EQ(value.info.pPicture, nullptr);
    EXPECT_EQ(Meta({AsfHeaderExtension({}, 1 << 20)}).result, 1);
    EXPECT_EQ(Meta({AsfHeaderExtension({}, 0)}).result, 0);
}

// Up to 524288 bytes a picture is taken with any allowance but 0, above only
// with an allowance of at least its size; MIME type and description go into
// the MIME item as UTF-16.
TEST(AsfPicture, WmPictureAboveTheCeilingNeedsAnAllowanceOfItsSize) {
    struct Case { size_t size; int allowance; bool taken; };
    for (const Case& c : {Case{1000, 1, true}, Case{600000, 1, false}, Case{600000, 599999, false},
                          Case{600000, 600000, true}}) {
        // The small picture as an extended content descriptor, the large ones in a Metadata Library.
        const AsfDescriptor picture{"WM/Picture", kBytes, PictureValue(c.size, "cover")};
        Meta m({c.size < 524288 ? AsfExtContentDescription({picture}) : AsfHeaderExtension({AsfMetadata({picture}, true)})},
               c.allowance);
        ASSERT_EQ(m.result, 0);
        if (!c.taken) {
            EXPECT_EQ(m.info.pPicture, nullptr) << c.size << " " << c.allowance;
            EXPECT_EQ(m.info.aItems[META_PICTURE_FORMAT].nLength, 0u) << c.size << " " << c.allowance;
            continue;
        }
        ASSERT_NE(m.info.pPicture, nullptr) << c.size << " " << c.allowance;
        ASSERT_EQ(m.info.nPictureSize, c.size);
        EXPECT_EQ(std::vector<uint8_t>(m.info.pPicture, m.info.pPicture + c.size), Jpeg(c.size).data());
        EXPECT_EQ(m.info.aItems[META_PICTURE_FORMAT].nEncoding, 6u);
        EXPECT_EQ(m.Item(META_PICTURE_FORMAT), Utf16Item("image/jpeg") + Utf16Item("cover"));
    }
}

TEST(AsfPicture, WmPictureClaimingMoreThanItsValueIsNotTaken) {
    Bytes value = AsfWmPicture(3, "image/jpeg", "", Jpeg(16));
    value.patch_le32(1, 5000);
    Meta m({AsfExtContentDescription({{"WM/Picture", kBytes, value.data()}, {"WM/Year", kString, Utf16Value("7")}})});
    ASSERT_EQ(m.result, 0);
    EXPECT_EQ(m.info.pPicture, nullptr);
    EXPECT_EQ(m.Item(META_YEAR), Utf16Item("7"));
    // Shorter than its own type and length fields.
    Meta tiny({AsfExtContentDescription({{"WM/Picture", kBytes, {3, 1}}})});
    EXPECT_EQ(tiny.result, 0);
    EXPECT_EQ(tiny.info.pPicture, nullptr);
}

TEST(AsfBranding, BannerIsReadWithinTheAllowanceAndBeatsWmPicture) {
    const Bytes banner = Jpeg(300);
    Meta m({AsfContentBranding(2, banner, "http://b", "http://c"),
            AsfExtContentDescription({{"WM/Picture", kBytes, PictureValue(10)}}),
            AsfContentDescription("After", "", "", "", "")});
    ASSERT_EQ(m.result, 0);
    ASSERT_NE(m.info.pPicture, nullptr);
    EXPECT_EQ(m.info.nPictureSize, 300u);
    EXPECT_EQ(std::vector<uint8_t>(m.info.pPicture, m.info.pPicture + 300), banner.data());
    EXPECT_EQ(m.info.aItems[META_PICTURE_FORMAT].nEncoding, 2u);
    EXPECT_EQ(m.Item(META_PICTURE_FORMAT), std::string("image/jpeg", 11));
    EXPECT_EQ(m.Item(META_TITLE), Utf16Item("After"));
}

// With an allowance of 0 neither the banner nor a WM/Picture is read, but the
// banner still sets the MIME item and the picture size word.
TEST(AsfBranding, AllowanceZeroKeepsTheSizeWordAndMimeButNoPicture) {
    Meta m({AsfContentBranding(1, Jpeg(300)), AsfExtContentDescription({{"WM/Picture", kBytes, PictureValue(10)}}),
            AsfContentDescription("After", "", "", "", "")},
           0);
    ASSERT_EQ(m.result, 0);
    EXPECT_EQ(m.info.pPicture, nullptr);
    EXPECT_EQ(m.info.nPictureSize, 300u);
    EXPECT_EQ(m.info.aItems[META_PICTURE_FORMAT].nEncoding, 2u);
    EXPECT_EQ(m.Item(META_PICTURE_FORMAT), std::string("image/bmp", 10));
    EXPECT_EQ(m.Item(META_TITLE), Utf16Item("After"));
}

TEST(AsfBranding, ImageTypeZeroLeavesTheWalkInsideTheObject) {
    Meta m({AsfContentBranding(0, Bytes()), AsfContentDescription("Lost", "", "", "", "")});
    EXPECT_EQ(m.result, 0);
    EXPECT_EQ(m.info.aItems[META_TITLE].nLength, 0u);
}

TEST(AsfBranding, ASecondBannerReplacesTheFirstPicture) {
    Meta m({AsfContentBranding(2, Jpeg(300)), AsfContentBranding(3, Jpeg(600000))});
    ASSERT_EQ(m.result, 0);
    // The size word never describes a buffer it does not match.
    EXPECT_EQ(m.info.pPicture, nullptr);
    EXPECT_EQ(m.info.nPictureSize, 600000u);
}

TEST(AsfMetaInfo, PublicInterfaceLoadsPicturesUpToTheCeiling) {
    TempDir dir;
    Bytes file = AsfHeader({AsfHeaderExtension({AsfMetadata({{"WM/Picture", kBytes, PictureValue(0x80000)}}, true)})});
    _MMMetaInfo meta;
    ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(dir.Write("p.wma", file.data()).c_str(), MEDIA_TYPE_ASF, &meta), 0);
    EXPECT_NE(meta.pPicture, nullptr);
    EXPECT_EQ(meta.nPictureSize, 0x80000u);
    EXPECT_EQ(MM_MediaExtractor_FreeMetaInfo(&meta), 0);
}
