#include <gtest/gtest.h>

#include <cstddef>
#include <cstring>
#include <string>
#include <vector>

#include "core/byte_reader.h"
#include "core/codes.h"
#include "core/unsync.h"
#include "metainfo/metainfo.h"

using namespace metainfo;

TEST(Records, LayoutsMatchWhatCallersCompileAgainst) {
    EXPECT_EQ(sizeof(_MMClipInfo), 192u);
    EXPECT_EQ(offsetof(_MMClipInfo, nFileSize), 128u);
    EXPECT_EQ(offsetof(_MMClipInfo, nFrameRate), 188u);
    EXPECT_EQ(sizeof(_MMMetaItem), 136u);
    EXPECT_EQ(offsetof(_MMMetaItem, nLength), 132u);
    EXPECT_EQ(sizeof(_MM_CODECTYPE), 24u);
    EXPECT_EQ(offsetof(_MMMetaInfo, pPicture), sizeof(void*) == 4 ? 2312u : 2312u);
    EXPECT_LT(offsetof(_MMMetaInfo, nPlayCount), offsetof(_MMMetaInfo, stAlbumArtist));
    EXPECT_LT(offsetof(_MMMetaInfo, stAlbumArtist), offsetof(_MMMetaInfo, nReserved));
    EXPECT_LT(offsetof(_MM_MIMETYPE, nMimeLength), offsetof(_MM_MIMETYPE, pszVideoMimeType));
    EXPECT_LT(offsetof(_MAKERINFO, nThumbnailSize), offsetof(_MAKERINFO, pPhoneModel));
}

TEST(CodecInfo, HoldsSixtyOneNamedCodesInOrderWithTheirBlanks) {
    ASSERT_EQ(sizeof codecinfo / sizeof codecinfo[0], 61u);
    EXPECT_STREQ(codecinfo[0].name, "CODEC_MP3_LAYER1");
    EXPECT_EQ(codecinfo[60].code, 0xFFFFu);
    EXPECT_STREQ(CodecName(0x1030), "CODEC_WAVE_PCM  ");
    EXPECT_STREQ(CodecName(0x1032), "CODEC_WAVE_ALAW ");
    EXPECT_STREQ(CodecName(0x5010), "CODEC_WMV9_PEOFILE_SIMPLE");
    EXPECT_STREQ(CodecName(0x400A), "CODEC_MP4AUDIO_MP4A_AAC_PLUS_V2");
    EXPECT_EQ(CodecName(0), nullptr);
    EXPECT_EQ(CodecName(0x1011), nullptr) << "AMR frame-type sub-codes have no names";
    uint32_t previous = 0;
    for (const MM_CodecName& row : codecinfo) {
        EXPECT_GT(row.code, previous) << row.name;
        previous = row.code;
    }
}

TEST(CodecInfo, AsfAttributeTypesMapToEncodings) {
    const uint32_t expected[7] = {ENCODING_UTF16LE, ENCODING_RAW, ENCODING_RAW, ENCODING_BINARY,
                                  ENCODING_BINARY, ENCODING_BINARY, ENCODING_RAW};
    EXPECT_EQ(std::memcmp(TTable, expected, sizeof expected), 0);
}

TEST(ByteReader, ReadsEitherOrderAndRefusesToPassTheEnd) {
    const uint8_t data[] = {0x01, 0x02, 0x03, 0x04, 0x05, 0x06, 0x07, 0x08, 0x09};
    ByteReader r(data, sizeof data);
    uint32_t be = 0;
    uint16_t le = 0;
    ASSERT_TRUE(r.BE32(&be));
    EXPECT_EQ(be, 0x01020304u);
    ASSERT_TRUE(r.LE16(&le));
    EXPECT_EQ(le, 0x0605);
    uint32_t too_far = 0xDEAD;
    EXPECT_FALSE(r.LE32(&too_far));
    EXPECT_EQ(too_far, 0xDEADu) << "a failed read writes nothing";
    EXPECT_EQ(r.position(), 6u) << "and does not move";
    EXPECT_FALSE(r.Skip(4));
    EXPECT_TRUE(r.Skip(3));
    EXPECT_TRUE(r.empty());
    EXPECT_FALSE(r.Seek(10));
    EXPECT_TRUE(r.Seek(0));
    EXPECT_TRUE(r.Tag("\x01\x02", 2));
    EXPECT_EQ(ReadLE64(data), 0x0807060504030201ull);
    EXPECT_EQ(ReadBE64(data), 0x0102030405060708ull);
    const uint8_t syncsafe[] = {0x00, 0x00, 0x02, 0x01};
    EXPECT_EQ(ReadSyncsafe32(syncsafe), 257u);
}

TEST(Sync, DropsTheZeroAfterEachFFButLooksNoFurther) {
    auto sync = [](std::vector<uint8_t> in) {
        int n = Sync(in.data(), static_cast<int>(in.size()));
        in.resize(static_cast<size_t>(n));
        return in;
    };
    EXPECT_EQ(sync({0xFF, 0x00}), (std::vector<uint8_t>{0xFF}));
    EXPECT_EQ(sync({0xFF, 0x00, 0x00}), (std::vector<uint8_t>{0xFF, 0x00}));
    EXPECT_EQ(sync({0xFF, 0xFF, 0x00}), (std::vector<uint8_t>{0xFF, 0xFF, 0x00}));
    EXPECT_EQ(sync({0x12, 0xFF, 0x00, 0xE0, 0xFF}), (std::vector<uint8_t>{0x12, 0xFF, 0xE0, 0xFF}));
    EXPECT_EQ(Sync(nullptr, 4), 0);
}
