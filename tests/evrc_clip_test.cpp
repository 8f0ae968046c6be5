// EVRC storage files: the packet walk, duration and bit rate.
#include <gtest/gtest.h>

#include "metainfo/metainfo.h"
#include "speech/evrc.h"
#include "support/bytes.h"
#include "support/speech_builder.h"

using namespace testing_support;

TEST(EvrcClip, FiftyFullRatePacketsAreOneSecondAt9256) {
    TempDir dir;
    std::vector<uint8_t> file = EvrcFile(SpeechPackets(4, 22, 50));
    ASSERT_EQ(file.size(), 1157u);
    std::string path = dir.Write("speech.evc", file);
    _MMClipInfo clip;
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_EVRC, &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 1000u);
    EXPECT_EQ(clip.nBitrate, 9256u);
    EXPECT_EQ(clip.nAudioBitrate, 9256u);
    EXPECT_EQ(clip.nFileSize, 1157u);
    EXPECT_EQ(clip.nSampleRate, 8000u);
    EXPECT_EQ(clip.bHasAudio, 1u);
    EXPECT_STREQ(clip.szFormat, "evc");
}

TEST(EvrcClip, UnderOneSecondHasNoBitrate) {
    TempDir dir;
    std::string path = dir.Write("short.evc", EvrcFile(SpeechPackets(4, 22, 49)));
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::EVRC_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 0u);
    EXPECT_EQ(clip.nBitrate, 0u);
    std::string empty = dir.Write("empty.evc", EvrcFile(Bytes()));
    ASSERT_EQ(metainfo::EVRC_GetClipInfo(empty.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 0u);
}

TEST(EvrcClip, PacketSizesFollowTheRateTable) {
    TempDir dir;
    // Blank (0), eighth (1: 2 bytes), half (3: 10 bytes) and rate 5 (no payload).
    Bytes packets = SpeechPackets(0, 0, 30).raw(SpeechPackets(1, 2, 30)).raw(SpeechPackets(3, 10, 30)).raw(SpeechPackets(5, 0, 10));
    std::string path = dir.Write("mixed.evc", EvrcFile(packets));
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::EVRC_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 2u);  // 100 packets
}

TEST(EvrcClip, QuarterRateAndHighRatesAreRefused) {
    TempDir dir;
    for (uint8_t rate : {2, 6, 7, 0xFF}) {
        std::string path = dir.Write("bad.evc", EvrcFile(SpeechPackets(4, 22, 3).raw(SpeechPackets(rate, 5, 1))));
        _MMClipInfo clip{};
        EXPECT_EQ(metainfo::EVRC_GetClipInfo(path.c_str(), &clip), MM_E_FAIL) << int(rate);
    }
}

TEST(EvrcClip, RecordIsNotClearedFirst) {
    TempDir dir;
    std::string path = dir.Write("speech.evc", EvrcFile(SpeechPackets(4, 22, 50)));
    _MMClipInfo clip{};
    clip.nChannels = 7;
    clip.nBitsPerSample = 9;
    ASSERT_EQ(metainfo::EVRC_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nChannels, 7u);
    EXPECT_EQ(clip.nBitsPerSample, 9u);
}

TEST(EvrcClip, MissingFilesAndExtensions) {
    TempDir dir;
    _MMClipInfo clip{};
    EXPECT_EQ(metainfo::EVRC_GetClipInfo(dir.PathOf("missing.evc").c_str(), &clip), -1);
    std::string noExt = dir.Write("speech", EvrcFile(SpeechPackets(4, 22, 5)));
    EXPECT_EQ(metainfo::EVRC_GetClipInfo(noExt.c_str(), &clip), MM_E_FAIL);
    EXPECT_EQ(metainfo::EVRC_GetClipInfo(nullptr, &clip), MM_E_INVALIDARG);
}

TEST(EvrcClip, CodecIsEvrcWithoutOpeningTheFile) {
    _MM_CODECTYPE codec;
    codec.nVideoCodec = 5;
    EXPECT_EQ(metainfo::EVRC_GetCodecType("/no/such/file.evc", &codec), MM_OK);
    EXPECT_EQ(codec.nAudioCodec, 0x8001u);
    EXPECT_EQ(codec.nVideoCodec, 0u);
    EXPECT_EQ(metainfo::EVRC_GetCodecType("/no/such/file.evc", nullptr), MM_E_INVALIDARG);
    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType("/no/such/file.evc", MEDIA_TYPE_EVRC, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO);
}
