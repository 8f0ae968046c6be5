#include <gtest/gtest.h>

#include <vector>

#include "aac/aac_bits.h"
#include "aac/aac_frame.h"
#include "core/file_access.h"
#include "metainfo/records.h"
#include "support/bytes.h"
#include "support/media.h"

using namespace metainfo;
using testing_support::AdtsFrame;
using testing_support::AdtsFields;
using testing_support::Bytes;
using testing_support::TempDir;

namespace {

int32_t Verify(const std::vector<uint8_t>& bytes) {
    TempDir dir;
    int h = MEx_fopen(dir.Write("x.aac", bytes).c_str(), "rb");
    EXPECT_NE(h, 0);
    uint8_t probe[128] = {0};
    MEx_fread(probe, 1, sizeof probe, h);
    int32_t result = VerifyAAC(h, probe);
    MEx_fclose(h);
    return result;
}

Bytes Frames(int count, const AdtsFields& shape = {}) {
    Bytes b;
    for (int i = 0; i < count; ++i) b.raw(AdtsFrame(shape, testing_support::SilentAacBlock()));
    return b;
}

}  // namespace

TEST(GetBits, ReadsMostSignificantFirstAcrossOneByteBoundary) {
    const uint8_t buf[] = {0xA5, 0x3C};  // 1010 0101 0011 1100
    int count = 8, pos = 0;
    EXPECT_EQ(GetBits(buf, 3, &count, &pos), 0x5u);
    EXPECT_EQ(count, 5);
    EXPECT_EQ(GetBits(buf, 5, &count, &pos), 0x05u);
    EXPECT_EQ(pos, 1) << "a read that ends a byte moves to the next";
    EXPECT_EQ(count, 8);
    count = 2;
    pos = 0;
    EXPECT_EQ(GetBits(buf, 6, &count, &pos), 0x13u) << "low 2 bits of A5, top 4 of 3C";
    EXPECT_EQ(pos, 1);
    EXPECT_EQ(count, 4);
}

TEST(AACGetFrameSize, ReadsLengthAndKindAndRejectsLongOrMissingFrames) {
    uint32_t kind = 0;
    EXPECT_EQ(AACGetFrameSize(nullptr, &kind), 0xFFFFFFFFu);
    const uint8_t noSync[] = {0xFF, 0xE1, 0, 0, 0, 0};
    EXPECT_EQ(AACGetFrameSize(noSync, &kind), static_cast<uint32_t>(MM_E_FAIL));

    AdtsFields shape;
    shape.profile = 2;
    shape.mpegId = 1;
    std::vector<uint8_t> frame = AdtsFrame(shape, std::vector<uint8_t>(100));
    EXPECT_EQ(AACGetFrameSize(frame.data(), &kind), 107u);
    EXPECT_EQ(kind, (2u << 1) | 0x08u);

    std::vector<uint8_t> big = AdtsFrame({}, std::vector<uint8_t>(4090));
    EXPECT_EQ(AACGetFrameSize(big.data(), &kind), 0xFFFFFFFFu) << "above 4096 bytes";
}

TEST(VerifyAAC, NeedsTwoMatchingAdtsHeadersOrAnAdifSignature) {
    EXPECT_EQ(Verify(Frames(3)), MM_OK);
    EXPECT_EQ(Verify(Bytes().zeros(50).raw(Frames(3))), MM_OK);
    EXPECT_EQ(Verify(Bytes().zeros(30).str("ADIF").zeros(30)), MM_OK) << "ADIF is accepted where it is met";

    AdtsFields main;
    main.profile = 0;
    EXPECT_EQ(Verify(Bytes().raw(Frames(1)).raw(Frames(2, main))), MM_E_UNSUPPORTED);
    AdtsFields mpeg2;
    mpeg2.mpegId = 1;
    EXPECT_EQ(Verify(Bytes().raw(Frames(1)).raw(Frames(2, mpeg2))), MM_E_UNSUPPORTED);
    EXPECT_EQ(Verify(Bytes().zeros(200)), MM_E_UNSUPPORTED);
}

TEST(VerifyAAC, ScansOnlyTheFirstBytesAfterTheTag) {
    EXPECT_EQ(Verify(Bytes().zeros(4089).raw(Frames(3))), MM_E_UNSUPPORTED);
    Bytes tagged = Bytes().raw(testing_support::Id3v2Tag(4, std::vector<uint8_t>(4000, 0), 0x10)).zeros(10);
    EXPECT_EQ(Verify(tagged.raw(Frames(3))), MM_OK) << "the scan starts after the tag and its footer";
}

TEST(VerifyAAC, TinyFilesAreRefused) {
    EXPECT_EQ(Verify(Bytes().raw(testing_support::Id3v2Tag(3, std::vector<uint8_t>(200, 0))).zeros(2)), MM_E_FAIL);
    EXPECT_EQ(Verify(Bytes().raw(Frames(1)).zeros(0)), MM_E_UNSUPPORTED) << "one frame is not a stream";
}
