// WAVE: the format chunk with its data-offset rule, and the clip, MIME and
// codec answers built on it.
#include <gtest/gtest.h>

#include <cstring>

#include "metainfo/metainfo.h"
#include "speech/wave.h"
#include "support/bytes.h"
#include "support/speech_builder.h"

using namespace testing_support;

namespace {

std::string MimeOf(const std::string& path, uint32_t* length) {
    _MM_MIMETYPE mime{};
    int32_t result = MM_MediaExtractor_GetMIMEType(path.c_str(), &mime);
    if (result != MM_OK) return "error";
    std::string text = mime.pszMimeType;
    *length = mime.nMimeLength;
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
    return text;
}

}  // namespace

TEST(WaveFormat, CanonicalHeaderHasDataOffset36) {
    std::vector<uint8_t> file = CanonicalWave(1, 1, 8000, 16, 100);
    metainfo::_FormatChunk fmt;
    ASSERT_EQ(metainfo::ParseFormatChunk(file.data(), file.size(), &fmt), MM_OK);
    EXPECT_EQ(fmt.nDataOffset, 36u);
    EXPECT_EQ(fmt.wFormatTag, 1);
    EXPECT_EQ(fmt.nChannels, 1);
    EXPECT_EQ(fmt.nSamplesPerSec, 8000u);
    EXPECT_EQ(fmt.nAvgBytesPerSec, 16000u);
    EXPECT_EQ(fmt.nBlockAlign, 2);
    EXPECT_EQ(fmt.wBitsPerSample, 16);
}

TEST(WaveFormat, ChunksBeforeFmtAreCountedTwice) {
    Bytes list;
    list.str("INFOabcdef");  // 10 bytes, no pad byte
    Bytes fact;
    fact.le32(1);
    std::vector<uint8_t> file = RiffForm("WAVE", {SpeechChunk("LIST", list), SpeechChunk("fmt ", WaveFmtBody(1, 1, 8000, 8)),
                                                  SpeechChunk("fact", fact), SpeechChunk("data", Bytes().zeros(8))});
    metainfo::_FormatChunk fmt;
    ASSERT_EQ(metainfo::ParseFormatChunk(file.data(), file.size(), &fmt), MM_OK);
    // "data" id at 12 + 18 + 24 + 12 = 66; the LIST size counted again.
    EXPECT_EQ(fmt.nDataOffset, 66u + 10u);
}

TEST(WaveFormat, WalksThatLeaveTheBufferAreUnsupported) {
    metainfo::_FormatChunk fmt;
    std::vector<uint8_t> noFmt = RiffForm("WAVE", {SpeechChunk("data", Bytes().zeros(40))});
    EXPECT_EQ(metainfo::ParseFormatChunk(noFmt.data(), noFmt.size(), &fmt), MM_E_UNSUPPORTED);
    std::vector<uint8_t> noData = RiffForm("WAVE", {SpeechChunk("fmt ", WaveFmtBody(1, 1, 8000, 8)),
                                                    SpeechChunk("junk", Bytes().zeros(40))});
    EXPECT_EQ(metainfo::ParseFormatChunk(noData.data(), noData.size(), &fmt), MM_E_UNSUPPORTED);
    Bytes huge;
    huge.str("RIFF").le32(100).str("WAVE").str("junk").le32(0xFFFFFFF0u).zeros(40);
    EXPECT_EQ(metainfo::ParseFormatChunk(huge.data().data(), huge.size(), &fmt), MM_E_UNSUPPORTED);
    Bytes cutFmt;  // "fmt " id at the end of the buffer, its fields beyond it
    cutFmt.str("RIFF").le32(100).str("WAVE").str("fmt ").le32(16).le16(1);
    EXPECT_EQ(metainfo::ParseFormatChunk(cutFmt.data().data(), cutFmt.size(), &fmt), MM_E_UNSUPPORTED);
    std::vector<uint8_t> avi = CanonicalWave(1, 1, 8000, 8, 8);
    std::memcpy(avi.data() + 8, "AVI ", 4);
    EXPECT_EQ(metainfo::ParseFormatChunk(avi.data(), avi.size(), &fmt), MM_E_UNSUPPORTED);
}

TEST(WaveFormat, ClipInfoFromTheFormatAndTheDataOffset) {
    TempDir dir;
    std::string path = dir.Write("tone.wav", CanonicalWave(1, 1, 16000, 16, 64000));
    _MMClipInfo clip;
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_WAVE, &clip), MM_OK);
    EXPECT_STREQ(clip.szFormat, "wav");
    EXPECT_EQ(clip.nFileSize, 64044u);
    EXPECT_EQ(clip.nDuration, 2000u);  // (64044 - 36) / 32000, truncated
    EXPECT_EQ(clip.nBitrate, 256000u);
    EXPECT_EQ(clip.nAudioBitrate, 256000u);
    EXPECT_EQ(clip.nChannels, 1u);
    EXPECT_EQ(clip.nSampleRate, 16000u);
    EXPECT_EQ(clip.nBitsPerSample, 16u);
    EXPECT_EQ(clip.nSamplesPerFrame, 640u);
    EXPECT_EQ(clip.bHasAudio, 1u);
    EXPECT_EQ(clip.bHasVideo, 0u);
}

TEST(WaveFormat, ZeroByteRateHasNoDuration) {
    TempDir dir;
    std::vector<uint8_t> file = RiffForm("WAVE", {SpeechChunk("fmt ", WaveFmtBody(1, 0, 0, 16, 0)),
                                                  SpeechChunk("data", Bytes().zeros(400))});
    std::string path = dir.Write("zero.wav", file);
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::WAVE_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 0u);
    unsigned char* data = nullptr;
    int size = -1;
    ASSERT_EQ(metainfo::WAVE_GetAudioData2Buf(path.c_str(), 0, 1, &data, &size), MM_OK);
    EXPECT_EQ(size, 0);
    MM_MediaExtractor_FreeBuffer(data);
}

TEST(WaveFormat, MimeTypeByTagAndBitsWithTheL16Quirk) {
    TempDir dir;
    const struct {
        uint16_t tag;
        uint16_t bits;
        const char* text;
        uint32_t length;
    } cases[] = {
        {1, 8, "audio/L8", 8},     {1, 16, "audio/L16", 9},   {6, 8, "audio/pcma", 10}, {7, 8, "audio/pcmu", 10},
        {1, 24, "audio/L16", 9},   {2, 4, "audio/L16", 9},    {6, 16, "audio/L16", 9},
    };
    for (const auto& c : cases) {
        std::string path = dir.Write("m.wav", CanonicalWave(c.tag, 1, 8000, c.bits, 64));
        uint32_t length = 0;
        EXPECT_EQ(MimeOf(path, &length), c.text) << c.tag << "/" << c.bits;
        EXPECT_EQ(length, c.length) << c.tag << "/" << c.bits;
    }
}

TEST(WaveFormat, MimeReleasesAStringAlreadyHeld) {
    TempDir dir;
    std::string path = dir.Write("m.wav", CanonicalWave(1, 1, 8000, 8, 64));
    _MM_MIMETYPE mime{};
    mime.pszMimeType = new char[8]{'s', 't', 'a', 'l', 'e', 0};
    ASSERT_EQ(metainfo::WAVE_GetMIMEType(path.c_str(), &mime), MM_OK);
    EXPECT_STREQ(mime.pszMimeType, "audio/L8");
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
}

TEST(WaveFormat, CodecByFormatTag) {
    TempDir dir;
    const std::pair<uint16_t, uint32_t> cases[] = {{1, 0x1030}, {2, 0x1031}, {6, 0x1032}, {7, 0x1033}};
    for (const auto& c : cases) {
        std::string path = dir.Write("c.wav", CanonicalWave(c.first, 2, 8000, 8, 64));
        _MM_CODECTYPE codec;
        ASSERT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), MEDIA_TYPE_WAVE, &codec), MM_OK);
        EXPECT_EQ(codec.nAudioCodec, c.second);
    }
}

TEST(WaveFormat, FloatAndExtensibleTagsAreUnsupportedEverywhere) {
    TempDir dir;
    for (uint16_t tag : {3, 0xFFFE}) {
        std::string path = dir.Write("f.wav", CanonicalWave(tag, 1, 8000, 32, 64));
        _MMClipInfo clip;
        EXPECT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_WAVE, &clip), MM_E_UNSUPPORTED);
        _MM_CODECTYPE codec;
        EXPECT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), MEDIA_TYPE_WAVE, &codec), MM_E_UNSUPPORTED);
        uint32_t length = 0;
        EXPECT_EQ(MimeOf(path, &length), "error");
        unsigned char* data = nullptr;
        int size = 0;
        EXPECT_EQ(MM_MediaExtractor_GetAudioData(path.c_str(), 0, 1, &data, &size), MM_E_UNSUPPORTED);
    }
}

TEST(WaveFormat, ShortFilesFailAndMissingFilesAnswerOne) {
    TempDir dir;
    std::vector<uint8_t> file = CanonicalWave(1, 1, 8000, 8, 0);
    ASSERT_EQ(file.size(), 44u);
    _MMClipInfo clip{};
    EXPECT_EQ(metainfo::WAVE_GetClipInfo(dir.Write("44.wav", file).c_str(), &clip), MM_OK);
    file.pop_back();
    EXPECT_EQ(metainfo::WAVE_GetClipInfo(dir.Write("43.wav", file).c_str(), &clip), MM_E_FAIL);
    EXPECT_EQ(metainfo::WAVE_GetClipInfo(dir.PathOf("missing.wav").c_str(), &clip), 1);
    EXPECT_EQ(metainfo::WAVE_GetClipInfo(nullptr, &clip), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::WAVE_GetClipInfo(dir.PathOf("44.wav").c_str(), nullptr), MM_E_INVALIDARG);
}

TEST(WaveFormat, TrackTypeIsAudio) {
    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType("/no/such/file.wav", MEDIA_TYPE_WAVE, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO);
}
