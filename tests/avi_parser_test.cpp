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

// Owns a parser object for one test.
class Parser {
public:
    Parser() { EXPECT_EQ(CreateAVIParserObject(&p_), MM_OK); }
    ~Parser() { FreeAVIParserObject(p_); }
    CAVIParser* operator->() { return p_; }

private:
    CAVIParser* p_ = nullptr;
};

AviStreamSpec Video(uint32_t scale, uint32_t rate, uint32_t length) {
    AviStreamSpec s;
    s.scale = scale;
    s.rate = rate;
    s.length = length;
    return s;
}

AviStreamSpec Audio(uint32_t avgBytesPerSec, uint32_t length) {
    AviStreamSpec s;
    s.type = "auds";
    s.handler = std::string("\0\0\0\0", 4);
    s.scale = 1;
    s.rate = avgBytesPerSec;
    s.length = length;
    s.sampleSize = 1;
    return s;
}

Bytes AudioFormat16k() { return AviAudioFormat(1, 1, 8000, 16000, 2, 16); }

}  // namespace

TEST(AviClipInfo, DurationComesFromScaleRateAndLengthAndFrameRateFromTotalFrames) {
    TempDir dir;
    AviMainSpec main;
    main.totalFrames = 300;
    Bytes hdrl = AviHdrl(main, {AviStrl(Video(1001, 30000, 300), AviVideoFormat(320, 240, "FMP4"))});
    std::string path = dir.Write("ntsc.avi", AviFile(hdrl, {}, false));

    Parser parser;
    _MMClipInfo clip{};
    EXPECT_EQ(parser->init(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(parser->getDuration(), 10010u);
    EXPECT_EQ(clip.nDuration, 10u);
    EXPECT_EQ(clip.nFrameRate, 30u);
    EXPECT_EQ(clip.nWidth, 320u);
    EXPECT_EQ(clip.nHeight, 240u);
    EXPECT_EQ(clip.bHasVideo, 1u);
    EXPECT_EQ(clip.bHasAudio, 0u);
    EXPECT_STREQ(clip.szFormat, "avi");

    _MMClipInfo pub{};
    EXPECT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_AVI, &pub), MM_OK);
    EXPECT_EQ(pub.nDuration, 10000u) << "whole seconds, then milliseconds";
}

TEST(AviClipInfo, AudioBitRateIsBytesPerSecondAndVideoGetsTheDifference) {
    TempDir dir;
    AviMainSpec main;
    main.totalFrames = 2500;
    main.streams = 2;
    Bytes hdrl = AviHdrl(main, {AviStrl(Video(1, 25, 2500), AviVideoFormat(176, 144, "FMP4")),
                                AviStrl(Audio(16000, 1600000), AudioFormat16k())});
    std::vector<uint8_t> file = AviFile(hdrl, {}, false);
    // Fill up to exactly 2,000,000 bytes with a JUNK chunk inside the RIFF form.
    size_t junkBody = 2000000 - file.size() - 8;
    Bytes padded(file);
    padded.raw(RiffChunk("JUNK", Bytes().zeros(junkBody)));
    padded.patch_le32(4, static_cast<uint32_t>(padded.size() - 8));
    ASSERT_EQ(padded.size(), 2000000u);
    std::string path = dir.Write("hundred.avi", padded);

    _MMClipInfo clip{};
    EXPECT_EQ(metainfo::AVI_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nFileSize, 2000000u);
    EXPECT_EQ(clip.nDuration, 100u);
    EXPECT_EQ(clip.nBitrate, 160000u);
    EXPECT_EQ(clip.nAudioBitrate, 16000u);
    EXPECT_EQ(clip.nVideoBitrate, 144000u);
    EXPECT_EQ(clip.nSampleRate, 8000u);
    EXPECT_EQ(clip.nChannels, 1u);
    EXPECT_EQ(clip.nBitsPerSample, 16u);
    EXPECT_EQ(clip.nSamplesPerFrame, 0u);
    EXPECT_EQ(clip.nFrameRate, 25u);

    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(path.c_str(), MEDIA_TYPE_AVI, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO | TRACK_VIDEO);
}

TEST(AviClipInfo, JunkInsideTheHeaderListEndsTheStreamWalkButKeepsEarlierStreams) {
    TempDir dir;
    AviMainSpec main;
    main.totalFrames = 50;
    Bytes hdrl = AviHdrl(main, {AviStrl(Video(1, 25, 50), AviVideoFormat(64, 48, "FMP4")),
                                RiffChunk("JUNK", Bytes().zeros(24)),
                                AviStrl(Audio(16000, 32000), AudioFormat16k())});
    std::string path = dir.Write("junk.avi", AviFile(hdrl, {}, false));

    Parser parser;
    _MMClipInfo clip{};
    EXPECT_EQ(parser->init(path.c_str(), &clip), MM_OK) << "header-list damage is not reported";
    EXPECT_EQ(parser->getStreamNum(), 1u);
    EXPECT_EQ(clip.bHasVideo, 1u);
    EXPECT_EQ(clip.bHasAudio, 0u);
    EXPECT_EQ(clip.nWidth, 64u);
    EXPECT_EQ(clip.nDuration, 2u);
}

TEST(AviClipInfo, StreamWithoutRateLeavesTheDurationToTheNextStream) {
    TempDir dir;
    Bytes hdrl = AviHdrl(AviMainSpec(), {AviStrl(Video(1, 0, 50), AviVideoFormat(64, 48, "FMP4")),
                                         AviStrl(Audio(16000, 48000), AudioFormat16k())});
    std::string path = dir.Write("norate.avi", AviFile(hdrl, {}, false));
    Parser parser;
    EXPECT_EQ(parser->init(path.c_str(), nullptr), MM_OK);
    EXPECT_EQ(parser->getDuration(), 3000u);
}

TEST(AviClipInfo, StreamListsBeyondTheTwoSlotsAreIgnored) {
    TempDir dir;
    AviStreamSpec xvid = Video(1, 25, 50);
    xvid.handler = "XVID";
    AviStreamSpec text = Video(1, 10, 10);
    text.type = "txts";
    Bytes hdrl = AviHdrl(AviMainSpec(), {AviStrl(xvid, AviVideoFormat(64, 48, "XVID")),
                                         AviStrl(Audio(16000, 48000), AudioFormat16k()),
                                         AviStrl(Video(1, 30, 90), AviVideoFormat(999, 999, "DIVX")),
                                         AviStrl(text, RiffChunk("strf", Bytes().zeros(8)))});
    std::string path = dir.Write("many.avi", AviFile(hdrl, {}, false));
    Parser parser;
    _MMClipInfo clip{};
    EXPECT_EQ(parser->init(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(parser->getStreamNum(), 2u);
    EXPECT_EQ(clip.nWidth, 64u) << "the third stream did not replace the video format";
    EXPECT_EQ(parser->getStreamType(0), 0x58564944) << "XVID";
    EXPECT_EQ(parser->getStreamType(1), 1);
    EXPECT_EQ(parser->getStreamType(2), -1);
    EXPECT_EQ(parser->getStreamType(-1), -1);
}

TEST(AviClipInfo, MainHeaderFlagsAreTakenFromTheByteSwappedWord) {
    TempDir dir;
    AviMainSpec main;
    main.flags = 0x10;  // AVIF_HASINDEX as written in the file
    Bytes hdrl = AviHdrl(main, {AviStrl(Video(1, 25, 50), AviVideoFormat(64, 48, "FMP4"))});
    std::string path = dir.Write("flags.avi", AviFile(hdrl, {}, false));
    Parser parser;
    EXPECT_EQ(parser->init(path.c_str(), nullptr), MM_OK);
    EXPECT_EQ(parser->getMainHeader()->dwFlags, 0x10000000u);
    EXPECT_EQ(parser->getMainHeader()->bHasIndex, 0u);
}

TEST(AviQueries, CodecAndMimeAreNotProvided) {
    EXPECT_EQ(metainfo::AVI_GetCodecType("/nonexistent/file.avi", nullptr), MM_E_NOTPROVIDED);
    EXPECT_EQ(metainfo::AVI_GetMIMEType("/nonexistent/file.avi", nullptr), MM_E_NOTPROVIDED);
    EXPECT_EQ(MM_GetCodecType[MEDIA_TYPE_AVI], nullptr);
    EXPECT_EQ(MM_GetMIMEType[MEDIA_TYPE_AVI], nullptr);
}

TEST(AviQueries, ArgumentAndOpenFailures) {
    TempDir dir;
    _MMClipInfo clip{};
    int mask = 0;
    EXPECT_EQ(metainfo::AVI_GetClipInfo(nullptr, &clip), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::AVI_GetClipInfo("x.avi", nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::AVI_GetClipInfo(dir.PathOf("missing.avi").c_str(), &clip), -1);
    EXPECT_EQ(metainfo::AVI_GetTrackType(dir.PathOf("missing.avi").c_str(), &mask), -1);
    EXPECT_EQ(CreateAVIParserObject(nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(FreeAVIParserObject(nullptr), MM_E_INVALIDARG);

    std::string notRiff = dir.Write("form.avi", Bytes().str("RIFX").le32(100).str("AVI ").zeros(100));
    EXPECT_EQ(metainfo::AVI_GetClipInfo(notRiff.c_str(), &clip), MM_E_FAIL);
}

TEST(AviQueries, PathWithoutExtensionFailsAfterFillingTheRecord) {
    TempDir dir;
    Bytes hdrl = AviHdrl(AviMainSpec(), {AviStrl(Video(1, 25, 50), AviVideoFormat(64, 48, "FMP4"))});
    std::string path = dir.Write("noext", AviFile(hdrl, {}, false));
    _MMClipInfo clip{};
    // The temporary directory's name has no dot either.
    if (path.find('.') != std::string::npos) GTEST_SKIP() << "temporary path holds a dot";
    EXPECT_EQ(metainfo::AVI_GetClipInfo(path.c_str(), &clip), MM_E_FAIL);
    EXPECT_EQ(clip.nWidth, 64u);
}

TEST(AviHostile, OversizedAndTruncatedChunksAreRejectedWithoutFaults) {
    TempDir dir;
    Bytes hdrl = AviHdrl(AviMainSpec(), {AviStrl(Video(1, 25, 50), AviVideoFormat(64, 48, "FMP4"))});
    std::vector<uint8_t> good = AviFile(hdrl, {}, false);

    // The header list claims far more than the file holds.
    Bytes big(good);
    big.patch_le32(16, 0x7FFFFFF0);
    _MMClipInfo clip{};
    EXPECT_EQ(metainfo::AVI_GetClipInfo(dir.Write("big.avi", big).c_str(), &clip), MM_E_FAIL);

    // A stream list that reaches past its header list.
    Bytes strl(good);
    strl.patch_le32(12 + 12 + 64 + 4, 0x00100000);
    EXPECT_EQ(metainfo::AVI_GetClipInfo(dir.Write("strl.avi", strl).c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.bHasVideo, 0u);

    // Every truncation of a valid file.
    for (size_t n = 0; n < good.size(); ++n) {
        std::vector<uint8_t> cut(good.begin(), good.begin() + static_cast<long>(n));
        std::string path = dir.Write("cut.avi", cut);
        std::memset(&clip, 0, sizeof clip);
        metainfo::AVI_GetClipInfo(path.c_str(), &clip);
        int mask = 0;
        metainfo::AVI_GetTrackType(path.c_str(), &mask);
    }

    // A strh with a tiny size and a strf whose size claims more than the list holds.
    Bytes body;
    body.raw(RiffChunk("strh", Bytes().str("vids").str("DIVX")));
    body.str("strf").le32(0x10000);
    body.zeros(8);
    Bytes odd = AviHdrl(AviMainSpec(), {RiffList("strl", {body})});
    EXPECT_EQ(metainfo::AVI_GetClipInfo(dir.Write("odd.avi", AviFile(odd, {}, false)).c_str(), &clip), MM_OK);
}

TEST(AviParserObject, InitTwiceStartsAfresh) {
    TempDir dir;
    Bytes a = AviHdrl(AviMainSpec(), {AviStrl(Video(1, 25, 50), AviVideoFormat(64, 48, "FMP4")),
                                      AviStrl(Audio(16000, 48000), AudioFormat16k())});
    Bytes b = AviHdrl(AviMainSpec(), {AviStrl(Video(1, 25, 100), AviVideoFormat(32, 32, "FMP4"))});
    std::string pa = dir.Write("a.avi", AviFile(a, {}, false));
    std::string pb = dir.Write("b.avi", AviFile(b, {}, false));
    Parser parser;
    EXPECT_EQ(parser->init(pa.c_str(), nullptr), MM_OK);
    EXPECT_EQ(parser->getStreamNum(), 2u);
    _MMClipInfo clip{};
    EXPECT_EQ(parser->init(pb.c_str(), &clip), MM_OK);
    EXPECT_EQ(parser->getStreamNum(), 1u);
    EXPECT_EQ(parser->getDuration(), 4000u);
    EXPECT_EQ(clip.bHasAudio, 0u);
    EXPECT_EQ(parser->free(), MM_OK);
    EXPECT_EQ(parser->free(), MM_OK);
}
