// AMR storage files: kinds, frame header checks, mode tables, the average
// block size and the queries answered from them.
#include <gtest/gtest.h>

#include <cstring>

#include "metainfo/metainfo.h"
#include "speech/amr.h"
#include "support/bytes.h"
#include "support/speech_builder.h"

using namespace testing_support;

namespace {

int32_t Clip(const std::string& path, int type, _MMClipInfo* clip) {
    return MM_MediaExtractor_GetClipInfo(path.c_str(), type, clip);
}

}  // namespace

TEST(AmrClip, NarrowBand3000FramesAt122IsSixtySeconds) {
    TempDir dir;
    std::string path = dir.Write("speech.amr", AmrFile(false, 7, 3000));
    _MMClipInfo clip;
    ASSERT_EQ(Clip(path, MEDIA_TYPE_AMR_NB, &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 60000u);
    EXPECT_EQ(clip.nBitrate, 12200u);
    EXPECT_EQ(clip.nAudioBitrate, 12200u);
    EXPECT_EQ(clip.nFileSize, 96006u);
    EXPECT_STREQ(clip.szFormat, "amr");
    EXPECT_EQ(clip.nSampleRate, 8000u);
    EXPECT_EQ(clip.nSamplesPerFrame, 160u);
    EXPECT_EQ(clip.nBitsPerSample, 16u);
    EXPECT_EQ(clip.nChannels, 1u);
    EXPECT_EQ(clip.bHasAudio, 1u);
    EXPECT_EQ(clip.bHasVideo, 0u);
}

TEST(AmrClip, WideBandReportsAwbAt16000) {
    TempDir dir;
    std::string path = dir.Write("speech.awb", AmrFile(true, 8, 500));
    _MMClipInfo clip;
    ASSERT_EQ(Clip(path, MEDIA_TYPE_AMR_WB, &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 10000u);
    EXPECT_EQ(clip.nBitrate, 23850u);
    EXPECT_STREQ(clip.szFormat, "awb");
    EXPECT_EQ(clip.nSampleRate, 16000u);
    EXPECT_EQ(clip.nSamplesPerFrame, 320u);
}

TEST(AmrClip, MultiChannelReadsChannelCountAndFrameHeadersAfterDescription) {
    // Magic, a 4-byte channel description ending in the count 2, then one
    // frame per channel for each 20 ms.
    Bytes b;
    b.str("#!AMR_MC1.0\n").be32(2);
    for (int i = 0; i < 100; ++i) b.raw(AmrFrame(false, 7));
    TempDir dir;
    std::string path = dir.Write("multi.amr", b.data());
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::AMR_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nChannels, 2u);
    EXPECT_EQ(clip.nDuration, 1u);  // (3216 - 12) / 64 / 50
    _MM_MIMETYPE mime{};
    ASSERT_EQ(metainfo::AMR_GetMIMEType(path.c_str(), &mime), MM_OK);
    EXPECT_STREQ(mime.pszMimeType, "audio/AMR");
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
}

TEST(AmrClip, NarrowBandCodecQueryIsUnsupported) {
    TempDir dir;
    std::string path = dir.Write("speech.amr", AmrFile(false, 7, 60));
    _MM_CODECTYPE codec;
    EXPECT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), MEDIA_TYPE_AMR_NB, &codec), MM_E_UNSUPPORTED);
    EXPECT_EQ(codec.nAudioCodec, 0u);
}

TEST(AmrClip, WideBandSubTypeIsFrameTypePlusNineInTheCodeTable) {
    TempDir dir;
    const struct {
        int frameType;
        uint32_t subType;
    } cases[] = {{0, 0x1019}, {2, 0x101B}, {8, 0x1021}, {9, 0x1022}, {15, 0}};
    for (const auto& c : cases) {
        std::string path = dir.Write("speech.awb", AmrFile(true, c.frameType, 60));
        _MM_CODECTYPE codec;
        ASSERT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), MEDIA_TYPE_AMR_WB, &codec), MM_OK) << c.frameType;
        EXPECT_EQ(codec.nAudioCodec, 0x1020u);
        EXPECT_EQ(codec.nAudioSubType, c.subType) << c.frameType;
    }
}

TEST(AmrClip, MimeTypesByKindReplaceAStringAlreadyHeld) {
    TempDir dir;
    std::string nb = dir.Write("a.amr", AmrFile(false, 0, 60));
    std::string wb = dir.Write("a.awb", AmrFile(true, 0, 60));
    _MM_MIMETYPE mime{};
    mime.pszMimeType = new char[4]{'o', 'l', 'd', 0};
    ASSERT_EQ(metainfo::AMR_GetMIMEType(nb.c_str(), &mime), MM_OK);
    EXPECT_STREQ(mime.pszMimeType, "audio/AMR");
    EXPECT_EQ(mime.nMimeLength, 9u);
    ASSERT_EQ(metainfo::AMR_GetMIMEType(wb.c_str(), &mime), MM_OK);
    EXPECT_STREQ(mime.pszMimeType, "audio/AMR-WB");
    EXPECT_EQ(mime.nMimeLength, 12u);
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
}

TEST(AmrClip, FirstFrameHeaderChecksFailEveryQuery) {
    TempDir dir;
    std::vector<std::vector<uint8_t>> bad;
    Bytes quality;  // quality bit 0
    quality.str("#!AMR\n").raw(AmrFrame(false, 7, false)).raw(AmrFrame(false, 7));
    bad.push_back(quality.data());
    Bytes padding;  // low bits set
    padding.str("#!AMR\n").u8(0x3D).zeros(40);
    bad.push_back(padding.data());
    Bytes top;  // bit 7 set
    top.str("#!AMR\n").u8(0xBC).zeros(40);
    bad.push_back(top.data());
    bad.push_back(AmrFile(false, 9, 10));   // narrow-band 9..14 reserved
    bad.push_back(AmrFile(false, 14, 10));
    bad.push_back(AmrFile(true, 10, 10));   // wide-band 10..14 reserved
    for (size_t i = 0; i < bad.size(); ++i) {
        std::string path = dir.Write("bad.amr", bad[i]);
        _MMClipInfo clip{};
        EXPECT_EQ(metainfo::AMR_GetClipInfo(path.c_str(), &clip), MM_E_FAIL) << i;
        _MM_MIMETYPE mime{};
        EXPECT_EQ(metainfo::AMR_GetMIMEType(path.c_str(), &mime), MM_E_FAIL) << i;
        EXPECT_EQ(mime.pszMimeType, nullptr);
        _MM_CODECTYPE codec{};
        EXPECT_EQ(metainfo::AMR_GetCodecType(path.c_str(), &codec), MM_E_FAIL) << i;
    }
}

TEST(AmrClip, NoDataFramesAreAcceptedAsFirstFrame) {
    TempDir dir;
    std::string path = dir.Write("sid.amr", AmrFile(false, 15, 200));
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::AMR_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 4u);  // 200 one-byte frames
    EXPECT_EQ(clip.nBitrate, 40u);
}

TEST(AmrClip, ShortOrUnknownFilesAreRefused) {
    TempDir dir;
    _MMClipInfo clip{};
    std::string shortFile = dir.Write("short.amr", Bytes().str("#!AMR\n").raw(AmrFrame(false, 0)).data());
    std::vector<uint8_t> fifteen = Bytes().str("#!AMR\n").u8(0x3C).zeros(8).data();
    EXPECT_EQ(metainfo::AMR_GetClipInfo(dir.Write("15.amr", fifteen).c_str(), &clip), MM_E_FAIL);
    std::vector<uint8_t> other = Bytes().str("#!AMR_X\n").zeros(40).data();
    EXPECT_EQ(metainfo::AMR_GetClipInfo(dir.Write("x.amr", other).c_str(), &clip), MM_E_UNSUPPORTED);
    // The wide-band multi-channel first frame lies past a 16-byte file.
    std::vector<uint8_t> mc = Bytes().str("#!AMR-WB_MC1.0\n").u8(1).data();
    EXPECT_EQ(metainfo::AMR_GetClipInfo(dir.Write("mc.awb", mc).c_str(), &clip), MM_E_FAIL);
    EXPECT_EQ(metainfo::AMR_GetClipInfo(dir.PathOf("missing.amr").c_str(), &clip), MM_E_FAIL);
    EXPECT_EQ(metainfo::AMR_GetClipInfo(nullptr, &clip), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::AMR_GetClipInfo(shortFile.c_str(), nullptr), MM_E_INVALIDARG);
}

TEST(AmrBlockSize, DropsOneOutlierAtEachEnd) {
    Bytes b;
    b.raw(AmrFrame(false, 7)).raw(AmrFrame(false, 7)).raw(AmrFrame(false, 7)).raw(AmrFrame(false, 0));
    EXPECT_EQ(metainfo::Get_avBlockSize(b.data().data(), 0, b.size(), 1), 32);  // (109 - 32 - 13) / 2
    Bytes two;
    two.raw(AmrFrame(false, 7)).raw(AmrFrame(false, 0));
    EXPECT_EQ(metainfo::Get_avBlockSize(two.data().data(), 0, two.size(), 1), 22);  // 45 / 2
    EXPECT_EQ(metainfo::Get_avBlockSize(nullptr, 0, 100, 1), 0);
}

TEST(AmrBlockSize, ReservedFrameTypesStopAfter4096BlocksAndFailTheClip) {
    // A valid first frame, then frames of size 0 that never advance the walk.
    Bytes b;
    b.str("#!AMR\n").raw(AmrFrame(false, 7)).u8(12 << 3 | 4).zeros(100);
    EXPECT_EQ(metainfo::Get_avBlockSize(b.data().data() + 6, 0, b.size() - 6, 1), 0);
    TempDir dir;
    std::string path = dir.Write("stuck.amr", b.data());
    _MMClipInfo clip{};
    EXPECT_EQ(metainfo::AMR_GetClipInfo(path.c_str(), &clip), MM_E_FAIL);
}

TEST(AmrBlockSize, MultiChannelWithoutChannelsHasNoBlockSize) {
    Bytes b;
    b.str("#!AMR_MC1.0\n").be32(0);
    for (int i = 0; i < 10; ++i) b.raw(AmrFrame(false, 7));
    TempDir dir;
    std::string path = dir.Write("none.amr", b.data());
    _MMClipInfo clip{};
    EXPECT_EQ(metainfo::AMR_GetClipInfo(path.c_str(), &clip), MM_E_FAIL);
}

TEST(AmrClip, TrackTypeIsAudioWithoutReadingTheFile) {
    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType("/no/such/file.amr", MEDIA_TYPE_AMR_NB, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO);
}
