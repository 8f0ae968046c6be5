// WAVE: the format chunk with its data-offset rule, and the clip, MIME and
// codec answers built on it.
#include <gtest/gtest.h>

#include <cstring>

#include "metainfo/metainfo.h"
#include "speech/wave.h"
#include "support/speech_builder.h"

using namespace testing_support;

TEST(WaveFormat, DataOffsetIsTheDataIdPlusEarlyChunksAndWalksStayInTheBuffer) {
    std::vector<uint8_t> notWave = CanonicalWave(1, 1, 8000, 8, 8);
    std::memcpy(notWave.data() + 8, "AVI ", 4);
    const struct {
        std::vector<uint8_t> file;
        int32_t result;
        uint32_t offset;
    } cases[] = {
        {CanonicalWave(1, 1, 8000, 16, 100), MM_OK, 36},
        // "data" id at 12 + 18 + 24 + 12 = 66, the 10 bytes of LIST (no pad) counted again.
        {RiffForm("WAVE", {SpeechChunk("LIST", Bytes().str("INFOabcdef")), SpeechChunk("fmt ", WaveFmtBody(1, 1, 8, 8)),
                           SpeechChunk("fact", Bytes().le32(1)), SpeechChunk("data", Bytes().zeros(8))}),
         MM_OK, 76},
        {notWave, MM_E_UNSUPPORTED, 0},
        {RiffForm("WAVE", {SpeechChunk("data", Bytes().zeros(40))}), MM_E_UNSUPPORTED, 0},
        {RiffForm("WAVE", {SpeechChunk("fmt ", WaveFmtBody(1, 1, 8000, 8)), SpeechChunk("junk", Bytes().zeros(40))}),
         MM_E_UNSUPPORTED, 0},
        {Bytes().str("RIFF").le32(100).str("WAVE").str("junk").le32(0xFFFFFFF0u).zeros(40), MM_E_UNSUPPORTED, 0},
        {Bytes().str("RIFF").le32(100).str("WAVE").str("fmt ").le32(16).le16(1), MM_E_UNSUPPORTED, 0},  // cut fields
    };
    for (const auto& c : cases) {
        metainfo::_FormatChunk fmt;
        EXPECT_EQ(metainfo::ParseFormatChunk(c.file.data(), c.file.size(), &fmt), c.result) << &c - cases;
        EXPECT_EQ(fmt.nDataOffset, c.offset) << &c - cases;
    }
}

TEST(WaveFormat, ClipInfoFromTheFormatAndTheDataOffset) {
    // (64044 - 36) / 32000 s, truncated; 40 ms of samples a frame.
    _MMClipInfo clip;
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(SpeechFile("tone.wav", CanonicalWave(1, 1, 16000, 16, 64000)).c_str(),
                                            MEDIA_TYPE_WAVE, &clip), MM_OK);
    EXPECT_EQ(AudioSummary(clip), "wav size=64044 dur=2000 bps=256000/256000 hz=16000 ch=1 bits=16 spf=640 av=1/0");
}

TEST(WaveFormat, ZeroByteRateHasNoDurationAndAnEmptyRange) {
    std::string zero = SpeechFile("zero.wav", CanonicalWave(1, 0, 0, 16, 400));
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::WAVE_GetClipInfo(zero.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 0u);
    unsigned char* data = nullptr;
    int size = -1;
    ASSERT_EQ(metainfo::WAVE_GetAudioData2Buf(zero.c_str(), 0, 1, &data, &size), MM_OK);
    EXPECT_EQ(size, 0);
    MM_MediaExtractor_FreeBuffer(data);
}

TEST(WaveFormat, MimeAndCodecByTagWithTheL16Quirk) {
    const struct {
        uint16_t tag, bits;
        const char* text;
        uint32_t length, codec;
    } cases[] = {
        {1, 8, "audio/L8", 8, 0x1030},     {1, 16, "audio/L16", 9, 0x1030},  {6, 8, "audio/pcma", 10, 0x1032},
        {7, 8, "audio/pcmu", 10, 0x1033},  {1, 24, "audio/L16", 9, 0x1030},  {2, 4, "audio/L16", 9, 0x1031},
        {6, 16, "audio/L16", 9, 0x1032},
    };
    _MM_MIMETYPE mime{};  // kept across files: each answer releases the one before
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::Message() << c.tag << "/" << c.bits);
        std::string path = SpeechFile("m.wav", CanonicalWave(c.tag, 2, 8000, c.bits, 64));
        ASSERT_EQ(metainfo::WAVE_GetMIMEType(path.c_str(), &mime), MM_OK);
        EXPECT_STREQ(mime.pszMimeType, c.text);
        EXPECT_EQ(mime.nMimeLength, c.length);
        _MM_CODECTYPE codec;
        ASSERT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), MEDIA_TYPE_WAVE, &codec), MM_OK);
        EXPECT_EQ(codec.nAudioCodec, c.codec);
    }
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
}

TEST(WaveFormat, FloatAndExtensibleTagsAreUnsupportedEverywhere) {
    for (uint16_t tag : {uint16_t{3}, uint16_t{0xFFFE}}) {
        std::string path = SpeechFile("f.wav", CanonicalWave(tag, 1, 8000, 32, 64));
        _MMClipInfo clip;
        EXPECT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_WAVE, &clip), MM_E_UNSUPPORTED);
        _MM_CODECTYPE codec;
        EXPECT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), MEDIA_TYPE_WAVE, &codec), MM_E_UNSUPPORTED);
        _MM_MIMETYPE mime{};
        EXPECT_EQ(MM_MediaExtractor_GetMIMEType(path.c_str(), &mime), MM_E_UNSUPPORTED);
        unsigned char* data = nullptr;
        int size = 0;
        EXPECT_EQ(MM_MediaExtractor_GetAudioData(path.c_str(), 0, 1, &data, &size), MM_E_UNSUPPORTED);
    }
}

TEST(WaveFormat, ShortFilesFailAndMissingFilesAnswerOne) {
    std::vector<uint8_t> file = CanonicalWave(1, 1, 8000, 8, 0);
    _MMClipInfo clip{};
    EXPECT_EQ(metainfo::WAVE_GetClipInfo(SpeechFile("44.wav", file).c_str(), &clip), MM_OK);
    file.pop_back();
    EXPECT_EQ(metainfo::WAVE_GetClipInfo(SpeechFile("43.wav", file).c_str(), &clip), MM_E_FAIL);
    EXPECT_EQ(metainfo::WAVE_GetClipInfo("/no/such/file.wav", &clip), 1);
    EXPECT_EQ(metainfo::WAVE_GetClipInfo(nullptr, &clip), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::WAVE_GetClipInfo(SpeechFile("44.wav", file).c_str(), nullptr), MM_E_INVALIDARG);
}
