// ASF codec identification: WMA profiles, WMV codecs, WMV9 profiles and levels.
#include <cstring>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "asf/asf_codec.h"
#include "asf/asf_header.h"
#include "metainfo/metainfo.h"
#include "support/asf_builder.h"
#include "support/bytes.h"

using namespace testing_support;

namespace {

constexpr uint32_t kLow = 0x5020, kMedium = 0x5021, kHigh = 0x5022;
constexpr uint32_t kL0 = 0x5023, kL1 = 0x5024, kL2 = 0x5025, kL3 = 0x5026, kL4 = 0x5027;

_MM_CODECTYPE CodecOf(const std::vector<Bytes>& streams) {
    TempDir dir;
    auto path = dir.Write("c.asf", AsfHeader(streams).data());
    _MM_CODECTYPE codec;
    std::memset(&codec, 0x5A, sizeof codec);
    EXPECT_EQ(metainfo::ASF_GetCodecType(path.c_str(), &codec), 0);
    return codec;
}

Bytes Wma(uint16_t tag, uint32_t rate, uint32_t bitsPerSecond, int stream = 1) {
    AsfAudio a;
    a.formatTag = tag;
    a.sampleRate = rate;
    a.avgBytesPerSec = bitsPerSecond / 8;
    a.extra = {0, 0, 0, 0, 0, 0, 0, 0, 0, 0};
    return AsfAudioStream(stream, a);
}

Bytes Wmv(const std::string& fourcc, uint32_t w, uint32_t h, std::vector<uint8_t> data, int stream = 2) {
    AsfVideo v;
    v.width = w;
    v.height = h;
    v.compression = fourcc;
    v.codecData = std::move(data);
    return AsfVideoStream(stream, v);
}

// STRUCT_C's first two bytes: profile, FRMRTQ_POSTPROC, BITRTQ_POSTPROC, interlace.
std::vector<uint8_t> SequenceHeader(int profile, int fps, int kbps, bool interlaced) {
    int frmrtq = (fps - 2) / 4;
    int bitrtq = (kbps - 32) / 64;
    uint8_t b0 = static_cast<uint8_t>(profile << 6 | (interlaced ? 0x10 : 0) | frmrtq << 1 | bitrtq >> 4);
    uint8_t b1 = static_cast<uint8_t>((bitrtq & 0x0F) << 4);
    return {b0, b1, 0, 0};
}

}  // namespace

TEST(AsfAudioCodec, Wma2At44kHzAnd128kbitIsBaseline) {
    _MM_CODECTYPE c = CodecOf({Wma(0x0161, 44100, 128000)});
    EXPECT_EQ(c.nAudioCodec, 0x6001u);
    EXPECT_EQ(c.nAudioProfile, 0x6010u);
    EXPECT_EQ(c.nAudioSubType, 0u);  // cleared, never set
    EXPECT_EQ(c.nVideoCodec, 0u);
}

TEST(AsfAudioCodec, At48kHzAnd320kbitIsFull) {
    _MM_CODECTYPE c = CodecOf({Wma(0x0161, 48000, 320000)});
    EXPECT_EQ(c.nAudioCodec, 0x6001u);
    EXPECT_EQ(c.nAudioProfile, 0x6011u);
}

TEST(AsfAudioCodec, AboveSampleRateOrBitrateBoundsHasNoProfile) {
    _MM_CODECTYPE c = CodecOf({Wma(0x0161, 49153, 128000)});
    EXPECT_EQ(c.nAudioCodec, 0x6001u);
    EXPECT_EQ(c.nAudioProfile, 0u);
    EXPECT_EQ(CodecOf({Wma(0x0161, 49152, 128000)}).nAudioProfile, 0x6010u);
    EXPECT_EQ(CodecOf({Wma(0x0161, 44100, 394240)}).nAudioProfile, 0x6011u);
    EXPECT_EQ(CodecOf({Wma(0x0161, 44100, 394248)}).nAudioProfile, 0u);
    EXPECT_EQ(CodecOf({Wma(0x0161, 44100, 192992)}).nAudioProfile, 0x6010u);
    EXPECT_EQ(CodecOf({Wma(0x0161, 44100, 193000)}).nAudioProfile, 0x6011u);
}

TEST(AsfAudioCodec, Wma3AndUnknownTags) {
    EXPECT_EQ(CodecOf({Wma(0x0162, 44100, 128000)}).nAudioCodec, 0x6002u);
    _MM_CODECTYPE unknown = CodecOf({Wma(0x0163, 44100, 128000)});
    EXPECT_EQ(unknown.nAudioCodec, 0u);
    EXPECT_EQ(unknown.nAudioProfile, 0u);
}

TEST(AsfAudioCodec, FirstCodecStaysAndLaterStreamsOverwriteTheProfile) {
    _MM_CODECTYPE c = CodecOf({Wma(0x0162, 44100, 128000, 1), Wma(0x0161, 48000, 320000, 2)});
    EXPECT_EQ(c.nAudioCodec, 0x6002u);
    EXPECT_EQ(c.nAudioProfile, 0x6011u);
    // An unknown tag after a known one still sets the profile.
    c = CodecOf({Wma(0x0161, 44100, 320000, 1), Wma(0x0001, 8000, 64000, 2)});
    EXPECT_EQ(c.nAudioCodec, 0x6001u);
    EXPECT_EQ(c.nAudioProfile, 0x6010u);
}

TEST(AsfVideoCodec, Wmv3SimpleProfileLevels) {
    // 14 fps, 96 kbps: LOW at 176x144, MEDIUM at 320x240.
    _MM_CODECTYPE c = CodecOf({Wmv("WMV3", 176, 144, SequenceHeader(0, 14, 96, false))});
    EXPECT_EQ(c.nVideoCodec, 0x5003u);
    EXPECT_EQ(c.nVideoProfile, 0x5010u);
    EXPECT_EQ(c.nVideoLevel, kLow);
    c = CodecOf({Wmv("WMV3", 320, 240, SequenceHeader(0, 14, 96, false))});
    EXPECT_EQ(c.nVideoLevel, kMedium);
}

TEST(AsfVideoCodec, Wmv3MainProfileLevels) {
    _MM_CODECTYPE c = CodecOf({Wmv("WMV3", 1280, 720, SequenceHeader(1, 30, 2016, false))});
    EXPECT_EQ(c.nVideoProfile, 0x5011u);
    EXPECT_EQ(c.nVideoLevel, kHigh);
    c = CodecOf({Wmv("WMV3", 1280, 720, SequenceHeader(1, 30, 2016, true))});
    EXPECT_EQ(c.nVideoProfile, 0x5011u);
    EXPECT_EQ(c.nVideoLevel, 0u);
}

TEST(AsfVideoCodec, Wmv3AdvancedProfileLevels) {
    _MM_CODECTYPE c = CodecOf({Wmv("WMV3", 1920, 1080, SequenceHeader(3, 30, 1000, false))});
    EXPECT_EQ(c.nVideoProfile, 0x5012u);
    EXPECT_EQ(c.nVideoLevel, kL4);
    // The sequence header has no 24 fps; 22 fps is just as slow.
    c = CodecOf({Wmv("WMV3", 1920, 1080, SequenceHeader(3, 22, 1000, false))});
    EXPECT_EQ(c.nVideoLevel, kL3);
}

TEST(AsfVideoCodec, Wmv3ForbiddenProfileSetsOnlyTheCodec) {
    _MM_CODECTYPE c = CodecOf({Wmv("WMV3", 176, 144, SequenceHeader(2, 14, 96, false))});
    EXPECT_EQ(c.nVideoCodec, 0x5003u);
    EXPECT_EQ(c.nVideoProfile, 0u);
    EXPECT_EQ(c.nVideoLevel, 0u);
}

TEST(AsfVideoCodec, Wmv1IsOnlyRecognisedWithoutCodecData) {
    EXPECT_EQ(CodecOf({Wmv("WMV1", 176, 144, {})}).nVideoCodec, 0x5001u);
    EXPECT_EQ(CodecOf({Wmv("WMV1", 176, 144, {0})}).nVideoCodec, 0x5001u);
    EXPECT_EQ(CodecOf({Wmv("WMV1", 176, 144, {1, 2, 3, 4})}).nVideoCodec, 0u);
}

TEST(AsfVideoCodec, OtherCompressionCodes) {
    EXPECT_EQ(CodecOf({Wmv("WMV2", 176, 144, {0x10, 0, 0, 0})}).nVideoCodec, 0x5002u);
    EXPECT_EQ(CodecOf({Wmv("WMV2", 176, 144, {})}).nVideoCodec, 0xFFFFu);
    EXPECT_EQ(CodecOf({Wmv("MP42", 176, 144, {})}).nVideoCodec, 0x4001u);
    EXPECT_EQ(CodecOf({Wmv("MP43", 176, 144, {})}).nVideoCodec, 0x4001u);
    EXPECT_EQ(CodecOf({Wmv("WVC1", 176, 144, {})}).nVideoCodec, 0xFFFFu);
    EXPECT_EQ(CodecOf({Wmv("WVC1", 176, 144, {0x25, 0, 0, 1, 0x0F})}).nVideoCodec, 0u);
}

TEST(AsfVideoCodec, FirstWmvStreamDecidesButALaterStreamWithoutDataOverwritesTheCodec) {
    _MM_CODECTYPE c = CodecOf({Wmv("WMV3", 176, 144, SequenceHeader(0, 14, 96, false), 2),
                               Wmv("WMV2", 640, 480, {0, 0, 0, 0}, 3)});
    EXPECT_EQ(c.nVideoCodec, 0x5003u);
    EXPECT_EQ(c.nVideoLevel, kLow);
    c = CodecOf({Wmv("WMV3", 176, 144, SequenceHeader(0, 14, 96, false), 2), Wmv("MP43", 640, 480, {}, 3)});
    EXPECT_EQ(c.nVideoCodec, 0x4001u);
    EXPECT_EQ(c.nVideoProfile, 0x5010u);
    EXPECT_EQ(c.nVideoLevel, kLow);
}

TEST(AsfVideoCodec, AudioAndVideoStreamsTogether) {
    _MM_CODECTYPE c = CodecOf({Wma(0x0161, 44100, 128000, 1), Wmv("WMV2", 176, 144, {0, 0, 0, 0}, 2)});
    EXPECT_EQ(c.nAudioCodec, 0x6001u);
    EXPECT_EQ(c.nVideoCodec, 0x5002u);
}

TEST(AsfVideoCodec, OtherStreamTypesLandThirtyEightBytesPastTheirEnd) {
    Bytes command = AsfStreamProperties(asf_guid::kCommand, 3, Bytes());
    // Straight after a command stream the audio stream is read from its middle.
    EXPECT_EQ(CodecOf({command, Wma(0x0161, 44100, 128000)}).nAudioCodec, 0u);
    // With 38 bytes in between, the walk lands on the audio stream.
    Bytes filler = AsfObject(asf_guid::kPadding, Bytes().zeros(14));
    ASSERT_EQ(filler.size(), 38u);
    EXPECT_EQ(CodecOf({command, filler, Wma(0x0161, 44100, 128000)}).nAudioCodec, 0x6001u);
}

TEST(AsfVideoCodec, NullArgumentsAreRejected) {
    _MM_CODECTYPE c;
    EXPECT_EQ(metainfo::ASF_GetCodecInfo(0, &c), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::ASF_GetCodecInfo(1, nullptr), MM_E_INVALIDARG);
}

// Cases the sequence header cannot express (24 fps) and the order in which the rules fire.
TEST(AsfWmv9Levels, RulesFireInTheirOrder) {
    using metainfo::ASF_AdvancedProfileLevel;
    using metainfo::ASF_MainProfileLevel;
    using metainfo::ASF_SimpleProfileLevel;
    EXPECT_EQ(ASF_SimpleProfileLevel(416, 14, 176, 144), 0u);      // above 384 kbps before MEDIUM
    EXPECT_EQ(ASF_SimpleProfileLevel(160, 14, 352, 288), kMedium);
    EXPECT_EQ(ASF_MainProfileLevel(0, 22, true, 320, 240), kLow);    // LOW before the interlace rule
    EXPECT_EQ(ASF_MainProfileLevel(0, 26, false, 720, 576), kMedium);
    EXPECT_EQ(ASF_MainProfileLevel(0, 30, false, 1920, 1088), 0u);
    EXPECT_EQ(ASF_AdvancedProfileLevel(30, true, 352, 288), kL0);
    EXPECT_EQ(ASF_AdvancedProfileLevel(26, false, 720, 576), kL1);
    EXPECT_EQ(ASF_AdvancedProfileLevel(30, false, 1280, 720), kL2);
    EXPECT_EQ(ASF_AdvancedProfileLevel(24, false, 1920, 1080), kL3);
    EXPECT_EQ(ASF_AdvancedProfileLevel(30, true, 1920, 1080), kL3);
    EXPECT_EQ(ASF_AdvancedProfileLevel(24, true, 2048, 1536), kL4);  // only the slow rule
    EXPECT_EQ(ASF_AdvancedProfileLevel(30, false, 2048, 1536), 0u);
}
