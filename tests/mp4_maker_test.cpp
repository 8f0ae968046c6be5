// The maker box "@mkr": phone model, thumbnail and smart album.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <string>

#include "metainfo/metainfo.h"
#include "core/file_access.h"
#include "core/thread_state.h"
#include "metainfo/mp4.h"
#include "mp4/mp4_internal.h"
#include "support/mp4_builder.h"

using namespace testing_support;
using namespace metainfo;

namespace {

ByteVec Modl(const std::string& body) { return FullBox("modl", 0, 0, ByteVec(body.begin(), body.end())); }
ByteVec Thub(const ByteVec& image, uint32_t declared) {
    return FullBox("thub", 0, 0, Bytes().be32(0xCAFE).be32(declared).raw(image));
}
ByteVec Thub(const ByteVec& image) { return Thub(image, static_cast<uint32_t>(image.size())); }
ByteVec Salb(const std::string& text) { return FullBox("salb", 0, 0, Bytes().be16(0x15C7).str(text)); }
ByteVec Mkr(const ByteVec& children) { return FullBox("@mkr", 0, 0, children); }

const ByteVec kImage = {0xFF, 0xD8, 0xFF, 0xE0, 1, 2, 3, 4, 5, 0xFF, 0xD9};

std::string Str(const unsigned char* p, uint32_t n) { return p ? std::string(reinterpret_cast<const char*>(p), n) : ""; }

// AnaMaker over the box at the start of path, as if the file were fileSize long.
int32_t MakerAt(const std::string& path, uint32_t fileSize, _MAKERINFO* maker) {
    int h = MEx_fopen(path.c_str(), "rb");
    if (h == 0) return 1;
    s_mp4FileSize = fileSize;
    int32_t result = AnaMaker(h, maker);
    MEx_fclose(h);
    return result;
}

class Mp4Maker : public ::testing::Test {
protected:
    TempDir dir;
    _MAKERINFO maker{};

    std::string File(const ByteVec& mkr, bool topLevel = false) {
        ByteVec udta = Box("udta", mkr);
        return dir.Write("cam.3gp", Movie(Join({Mvhd(0, 1000, 1000), topLevel ? ByteVec{} : udta}),
                                          Join({topLevel ? udta : ByteVec{}, Box("mdat", ByteVec(16, 0))})));
    }
    int32_t Read(const ByteVec& mkr, bool topLevel = false) {
        TearDown();
        return MP4_GetMakerInfo(File(mkr, topLevel).c_str(), &maker);
    }
    void TearDown() override {
        MM_MediaExtractor_FreeBuffer(maker.pPhoneModel);
        MM_MediaExtractor_FreeBuffer(maker.pThumbnail);
        MM_MediaExtractor_FreeBuffer(maker.pSmartAlbum);
        std::memset(&maker, 0, sizeof maker);
    }
};

}  // namespace

TEST_F(Mp4Maker, ChildrenInAnyOrderFillTheRecord) {
    std::vector<ByteVec> children = {Modl("PX-100"), Thub(kImage), Salb("Holiday")};
    std::vector<size_t> order = {0, 1, 2};
    do {
        ByteVec mkr = Mkr(Join({children[order[0]], children[order[1]], children[order[2]]}));
        ASSERT_EQ(Read(mkr), MM_OK);
        EXPECT_EQ(maker.nValid, 1u);
        EXPECT_EQ(Str(maker.pPhoneModel, maker.nPhoneModelSize), "PX-100");
        EXPECT_EQ(ByteVec(maker.pThumbnail, maker.pThumbnail + maker.nThumbnailSize), kImage);
        EXPECT_EQ(Str(maker.pSmartAlbum, maker.nSmartAlbumSize), "Holiday");
    } while (std::next_permutation(order.begin(), order.end()));
}

TEST_F(Mp4Maker, TopLevelUserDataAndPublicQueryFindIt) {
    ASSERT_EQ(Read(Mkr(Modl("M")), true), MM_OK);
    EXPECT_EQ(maker.nValid, 1u);
    EXPECT_EQ(maker.pThumbnail, nullptr) << "absent children give null";
    TearDown();
    ASSERT_EQ(MM_MediaExtractor_GetMakerInfo(File(Mkr(Salb("A"))).c_str(), &maker), MM_OK);
    EXPECT_EQ(Str(maker.pSmartAlbum, maker.nSmartAlbumSize), "A");
}

TEST_F(Mp4Maker, UnknownChildSpoilsTheWholeBox) {
    std::string path = File(Mkr(Join({Box("zzzz", ByteVec(4, 0)), Modl("PX"), Thub(kImage)})));
    _MAKERINFO marked;
    std::memset(&marked, 0x5A, sizeof marked);
    _MAKERINFO before = marked;
    EXPECT_EQ(MP4_GetMakerInfo(path.c_str(), &marked), MM_OK);
    EXPECT_EQ(std::memcmp(&marked, &before, sizeof marked), 0) << "record untouched";

    // The box reader itself reports -9.
    ByteVec file = Join({Mkr(Join({Modl("PX"), Box("zzzz", ByteVec(4, 0))})), ByteVec(64, 0)});
    EXPECT_EQ(MakerAt(dir.Write("raw.bin", file), static_cast<uint32_t>(file.size()), &maker), -9);
}

TEST_F(Mp4Maker, ThumbnailLargerThanItsBoxIsRejected) {
    ByteVec mkr = Mkr(Join({Thub(kImage, 200), Modl("PX")}));
    ASSERT_EQ(Read(Join({mkr, Box("free", ByteVec(400, 0))})), MM_OK);
    EXPECT_EQ(maker.nValid, 1u);
    EXPECT_EQ(maker.pThumbnail, nullptr);
    EXPECT_EQ(Str(maker.pPhoneModel, maker.nPhoneModelSize), "PX");
}

TEST_F(Mp4Maker, FileWithoutMakerBoxLeavesTheRecord) {
    ASSERT_EQ(Read({}), MM_OK);
    EXPECT_EQ(maker.nValid, 0u);
    EXPECT_EQ(maker.pPhoneModel, nullptr);
}

TEST_F(Mp4Maker, ShortAndHostileChildrenAreSkipped) {
    ByteVec mkr = Mkr(Join({FullBox("salb", 0, 0, {0}), FullBox("thub", 0, 0, {1, 2}), FullBox("modl", 0, 0, {}),
                            Salb("ok")}));
    ASSERT_EQ(Read(mkr), MM_OK);
    EXPECT_EQ(Str(maker.pSmartAlbum, maker.nSmartAlbumSize), "ok");
    EXPECT_EQ(maker.pThumbnail, nullptr);
    // A child of size 0 ends the box with a failure: the record stays as it was.
    ASSERT_EQ(Read(Mkr(Join({Modl("PX"), Bytes().be32(0).str("salb").data()}))), MM_OK);
    EXPECT_EQ(maker.nValid, 0u);
    // Two maker boxes: the later one replaces the earlier, nothing leaks.
    TearDown();
    std::string path = dir.Write("two.mp4", Movie(Join({Mvhd(0, 1000, 1000), Box("udta", Mkr(Modl("first")))}),
                                                  Join({Box("udta", Mkr(Thub(kImage))), Box("mdat", {})})));
    ASSERT_EQ(MP4_GetMakerInfo(path.c_str(), &maker), MM_OK);
    EXPECT_EQ(maker.pPhoneModel, nullptr);
    EXPECT_EQ(maker.nThumbnailSize, kImage.size());
}
