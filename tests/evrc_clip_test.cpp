// EVRC storage files: the packet walk, duration and bit rate; and the track
// type every speech format answers without reading the file.
#include <gtest/gtest.h>

#include "metainfo/metainfo.h"
#include "speech/evrc.h"
#include "support/speech_builder.h"

using namespace testing_support;

TEST(EvrcClip, FiftyFullRatePacketsAreOneSecondAt9256) {
    std::string path = SpeechFile("speech.evc", EvrcFile(SpeechPackets(4, 22, 50)));  // 7 + 50 * 23 bytes
    _MMClipInfo clip;
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_EVRC, &clip), MM_OK);
    EXPECT_EQ(AudioSummary(clip), "evc size=1157 dur=1000 bps=9256/9256 hz=8000 ch=0 bits=0 spf=0 av=1/0");
}

TEST(EvrcClip, PacketsBySizeOfTheirRateOver50GiveTheDurationAndBitrate) {
    // Blank (0), eighth (1: 2 bytes), half (3: 10 bytes) and rate 5 (no payload).
    Bytes mixed = SpeechPackets(0, 0, 30).raw(SpeechPackets(1, 2, 30)).raw(SpeechPackets(3, 10, 30));
    const struct {
        Bytes packets;
        uint32_t duration, bitrate;
    } cases[] = {
        {mixed.raw(SpeechPackets(5, 0, 10)), 2, 467 * 8 / 2},
        {SpeechPackets(4, 22, 49), 0, 0},  // under one second: no bit rate, and no fault
        {Bytes(), 0, 0},
    };
    for (const auto& c : cases) {
        _MMClipInfo clip{};
        clip.nChannels = 7;  // the record is not cleared first
        ASSERT_EQ(metainfo::EVRC_GetClipInfo(SpeechFile("speech.evc", EvrcFile(c.packets)).c_str(), &clip), MM_OK);
        EXPECT_EQ(clip.nDuration, c.duration);
        EXPECT_EQ(clip.nBitrate, c.bitrate);
        EXPECT_EQ(clip.nChannels, 7u);
    }
}

TEST(EvrcClip, QuarterRateHighRatesMissingFilesAndExtensionsFail) {
    _MMClipInfo clip{};
    for (uint8_t rate : {uint8_t{2}, uint8_t{6}, uint8_t{0xFF}}) {
        std::string path = SpeechFile("bad.evc", EvrcFile(SpeechPackets(4, 22, 3).raw(SpeechPackets(rate, 5, 1))));
        EXPECT_EQ(metainfo::EVRC_GetClipInfo(path.c_str(), &clip), MM_E_FAIL) << int(rate);
    }
    std::string noExtension = SpeechFile("speech", EvrcFile(SpeechPackets(4, 22, 5)));
    EXPECT_EQ(metainfo::EVRC_GetClipInfo(noExtension.c_str(), &clip), MM_E_FAIL);
    EXPECT_EQ(metainfo::EVRC_GetClipInfo("/no/such/file.evc", &clip), -1);
    EXPECT_EQ(metainfo::EVRC_GetClipInfo(nullptr, &clip), MM_E_INVALIDARG);
}

TEST(EvrcClip, CodecIsEvrcWithoutOpeningTheFile) {
    _MM_CODECTYPE codec;
    codec.nVideoCodec = 5;
    EXPECT_EQ(metainfo::EVRC_GetCodecType("/no/such/file.evc", &codec), MM_OK);
    EXPECT_EQ(codec.nAudioCodec, 0x8001u);
    EXPECT_EQ(codec.nVideoCodec, 0u);
    EXPECT_EQ(metainfo::EVRC_GetCodecType("/no/such/file.evc", nullptr), MM_E_INVALIDARG);
}

TEST(SpeechTrack, EverySpeechFormatIsAudioWithoutReadingTheFile) {
    for (int type : {MEDIA_TYPE_AMR_NB, MEDIA_TYPE_AMR_WB, MEDIA_TYPE_WAVE, MEDIA_TYPE_QCP, MEDIA_TYPE_EVRC}) {
        int mask = 0;
        EXPECT_EQ(MM_MediaExtractor_GetTrackType("/no/such/file", type, &mask), MM_OK) << type;
        EXPECT_EQ(mask, TRACK_AUDIO) << type;
    }
}
