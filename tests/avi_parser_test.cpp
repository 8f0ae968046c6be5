// The AVI header list and the clip and track records built from it.
#include <gtest/gtest.h>

#include <cstring>

#include "avi/avi_queries.h"
#include "metainfo/avi_parser.h"
#include "metainfo/metainfo.h"
#include "support/avi_builder.h"
#include "support/bytes.h"

using namespace testing_support;

namespace {

Bytes VideoStrl(uint32_t rate = 25, uint32_t length = 50, uint32_t width = 64) {
    return AviStrl(AviVideoStream(1, rate, length), AviVideoFormat(width, 48, "FMP4"));
}

Bytes AudioStrl(uint32_t length = 48000) {
    return AviStrl(AviAudioStream(16000, length), AviAudioFormat(1, 1, 8000, 16000, 2, 16));
}

class AviHeaders : public ::testing::Test {
protected:
    TempDir dir;
    AviParserHandle parser;
    _MMClipInfo clip{};

    // A file of the header list alone, without movi frames or index.
    std::string Write(const std::vector<Bytes>& lists, const AviMainFields& main = AviMainFields(),
                      const std::string& name = "clip.avi") {
        return dir.Write(name, AviFile(AviHdrl(main, lists), {}, false));
    }
};

}  // namespace

TEST_F(AviHeaders, DurationComesFromScaleRateAndLengthAndFrameRateFromTotalFrames) {
    AviMainFields main;
    main.totalFrames = 300;
    main.flags = 0x10;  // AVIF_HASINDEX as written in the file
    std::string path = Write({AviStrl(AviVideoStream(1001, 30000, 300), AviVideoFormat(320, 240, "FMP4"))}, main);
    EXPECT_EQ(parser->init(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(parser->getDuration(), 10010u);
    EXPECT_EQ(clip.nDuration, 10u);
    EXPECT_EQ(clip.nFrameRate, 30u);
    EXPECT_EQ(clip.nWidth, 320u);
    EXPECT_EQ(clip.bHasVideo, 1u);
    EXPECT_STREQ(clip.szFormat, "avi");
    EXPECT_EQ(parser->getMainHeader()->dwFlags, 0x10000000u) << "flags are read byte-swapped";
    EXPECT_EQ(parser->getMainHeader()->bHasIndex, 0u);

    _MMClipInfo pub{};
    EXPECT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_AVI, &pub), MM_OK);
    EXPECT_EQ(pub.nDuration, 10000u) << "whole seconds, then milliseconds";
}

TEST_F(AviHeaders, AudioBitRateIsBytesPerSecondAndVideoGetsTheDifference) {
    AviMainFields main;
    main.totalFrames = 2500;
    main.streams = 2;
    Bytes padded(AviFile(AviHdrl(main, {VideoStrl(25, 2500), AudioStrl(1600000)}), {}, false));
    // Fill up to exactly 2,000,000 bytes with a JUNK chunk inside the RIFF form.
    padded.raw(RiffChunk("JUNK", Bytes().zeros(2000000 - padded.size() - 8)));
    padded.patch_le32(4, static_cast<uint32_t>(padded.size() - 8));
    ASSERT_EQ(padded.size(), 2000000u);
    std::string path = dir.Write("hundred.avi", padded);

    EXPECT_EQ(metainfo::AVI_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 100u);
    EXPECT_EQ(clip.nBitrate, 160000u);
    EXPECT_EQ(clip.nAudioBitrate, 16000u);
    EXPECT_EQ(clip.nVideoBitrate, 144000u);
    EXPECT_EQ(clip.nSampleRate, 8000u);
    EXPECT_EQ(clip.nBitsPerSample, 16u);
    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(path.c_str(), MEDIA_TYPE_AVI, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO | TRACK_VIDEO);
}

TEST_F(AviHeaders, JunkInsideTheHeaderListEndsTheStreamWalkButKeepsEarlierStreams) {
    std::string path = Write({VideoStrl(), RiffChunk("JUNK", Bytes().zeros(24)), AudioStrl()});
    EXPECT_EQ(parser->init(path.c_str(), &clip), MM_OK) << "header-list damage is not reported";
    EXPECT_EQ(parser->getStreamNum(), 1u);
    EXPECT_EQ(clip.bHasVideo, 1u);
    EXPECT_EQ(clip.bHasAudio, 0u);
    EXPECT_EQ(clip.nDuration, 2u);
}

TEST_F(AviHeaders, StreamWithoutRateLeavesTheDurationToTheNextStream) {
    EXPECT_EQ(parser->init(Write({VideoStrl(0), AudioStrl(48000)}).c_str(), nullptr), MM_OK);
    EXPECT_EQ(parser->getDuration(), 3000u);
}

TEST_F(AviHeaders, StreamListsBeyondTheTwoSlotsAreIgnored) {
    AviStreamFields xvid = AviVideoStream(1, 25, 50);
    xvid.handler = "XVID";
    std::string path = Write({AviStrl(xvid, AviVideoFormat(64, 48, "XVID")), AudioStrl(),
                              AviStrl(AviVideoStream(1, 30, 90), AviVideoFormat(999, 999, "DIVX"))});
    EXPECT_EQ(parser->init(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(parser->getStreamNum(), 2u);
    EXPECT_EQ(clip.nWidth, 64u) << "the third stream did not replace the video format";
    EXPECT_EQ(parser->getStreamType(0), 0x58564944) << "XVID";
    EXPECT_EQ(parser->getStreamType(1), 1);
    EXPECT_EQ(parser->getStreamType(2), -1);
}

TEST_F(AviHeaders, CodecAndMimeAreNotProvided) {
    EXPECT_EQ(metainfo::AVI_GetCodecType("/nonexistent/file.avi", nullptr), MM_E_NOTPROVIDED);
    EXPECT_EQ(metainfo::AVI_GetMIMEType("/nonexistent/file.avi", nullptr), MM_E_NOTPROVIDED);
    EXPECT_EQ(MM_GetCodecType[MEDIA_TYPE_AVI], nullptr);
}

TEST_F(AviHeaders, ArgumentAndOpenFailures) {
    int mask = 0;
    EXPECT_EQ(metainfo::AVI_GetClipInfo(nullptr, &clip), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::AVI_GetClipInfo(dir.PathOf("missing.avi").c_str(), &clip), -1);
    EXPECT_EQ(metainfo::AVI_GetTrackType(dir.PathOf("missing.avi").c_str(), &mask), -1);
    EXPECT_EQ(CreateAVIParserObject(nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(FreeAVIParserObject(nullptr), MM_E_INVALIDARG);
    std::string notRiff = dir.Write("form.avi", Bytes().str("RIFX").le32(100).str("AVI ").zeros(100));
    EXPECT_EQ(metainfo::AVI_GetClipInfo(notRiff.c_str(), &clip), MM_E_FAIL);
}

TEST_F(AviHeaders, PathWithoutExtensionFailsAfterFillingTheRecord) {
    std::string path = Write({VideoStrl()}, AviMainFields(), "noext");
    // The temporary directory's name has no dot either.
    if (path.find('.') != std::string::npos) GTEST_SKIP() << "temporary path holds a dot";
    EXPECT_EQ(metainfo::AVI_GetClipInfo(path.c_str(), &clip), MM_E_FAIL);
    EXPECT_EQ(clip.nWidth, 64u);
}

TEST_F(AviHeaders, OversizedAndTruncatedChunksAreRejectedWithoutFaults) {
    std::vector<uint8_t> good = AviFile(AviHdrl(AviMainFields(), {VideoStrl()}), {}, false);
    // The header list claims far more than the file holds.
    Bytes big(good);
    big.patch_le32(16, 0x7FFFFFF0);
    EXPECT_EQ(metainfo::AVI_GetClipInfo(dir.Write("big.avi", big).c_str(), &clip), MM_E_FAIL);
    // A stream list that reaches past its header list.
    Bytes strl(good);
    strl.patch_le32(12 + 12 + 64 + 4, 0x00100000);
    EXPECT_EQ(metainfo::AVI_GetClipInfo(dir.Write("strl.avi", strl).c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.bHasVideo, 0u);
    // A strh with a tiny size and a strf whose size claims more than the list holds.
    Bytes odd = Bytes().raw(RiffChunk("strh", Bytes().str("vids").str("DIVX"))).str("strf").le32(0x10000).zeros(8);
    EXPECT_EQ(metainfo::AVI_GetClipInfo(Write({RiffList("strl", {odd})}).c_str(), &clip), MM_OK);
    // Every truncation of a valid file.
    for (size_t n = 0; n < good.size(); ++n) {
        std::string path = dir.Write("cut.avi", std::vector<uint8_t>(good.begin(), good.begin() + static_cast<long>(n)));
        metainfo::AVI_GetClipInfo(path.c_str(), &clip);
        int mask = 0;
        metainfo::AVI_GetTrackType(path.c_str(), &mask);
    }
}

TEST_F(AviHeaders, InitTwiceStartsAfresh) {
    EXPECT_EQ(parser->init(Write({VideoStrl(), AudioStrl()}, AviMainFields(), "a.avi").c_str(), nullptr), MM_OK);
    EXPECT_EQ(parser->getStreamNum(), 2u);
    EXPECT_EQ(parser->init(Write({VideoStrl(25, 100, 32)}, AviMainFields(), "b.avi").c_str(), &clip), MM_OK);
    EXPECT_EQ(parser->getStreamNum(), 1u);
    EXPECT_EQ(parser->getDuration(), 4000u);
    EXPECT_EQ(clip.bHasAudio, 0u);
    EXPECT_EQ(parser->free(), MM_OK);
    EXPECT_EQ(parser->free(), MM_OK);
}
