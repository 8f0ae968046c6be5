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
    return AsfAudioStream(stream, tag, rate, 2, bitsPerSecond);
}

Bytes Wmv(const std::string& fourcc, uint32_t w, uint32_t h, const std::vector<uint8_t>& data, int stream = 2) {
    return AsfVideoStream(stream, fourcc, w, h, data);
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

TEST(AsfAudioCodec, FormatTagGivesTheCodecAndRateAndBitrateTheProfile) {
    struct Case { uint16_t tag; uint32_t rate, bitsPerSecond, codec, profile; };
    for (const Case& c : {Case{0x0161, 44100, 128000, 0x6001, 0x6010}, Case{0x0161, 48000, 320000, 0x6001, 0x6011},
                          Case{0x0161, 49153, 128000, 0x6001, 0}, Case{0x0161, 49152, 128000, 0x6001, 0x6010},
                          Case{0x0161, 44100, 192992, 0x6001, 0x6010}, Case{0x0161, 44100, 193000, 0x6001, 0x6011},
                          Case{0x0161, 44100, 394240, 0x6001, 0x6011}, Case{0x0161, 44100, 394248, 0x6001, 0},
                          Case{0x0162, 44100, 128000, 0x6002, 0x6010}, Case{0x0163, 44100, 128000, 0, 0}}) {
        const _MM_CODECTYPE codec = CodecOf({Wma(c.tag, c.rate, c.bitsPerSecond)});
        EXPECT_EQ(codec.nAudioCodec, c.codec) << c.tag << " " << c.rate << " " << c.bitsPerSecond;
        EXPECT_EQ(codec.nAudioProfile, c.profile) << c.tag << " " << c.rate << " " << c.bitsPerSecond;
        EXPECT_EQ(codec.nAudioSubType, 0u);  // cleared, never set
        EXPECT_EQ(codec.nVideoCodec, 0u);
    }
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

// Profile 2 is forbidden: only the codec is set. The sequence header has no
// 24 fps; 22 fps is just as slow.
TEST(AsfVideoCodec, Wmv3SequenceHeaderGivesProfileAndLevel) {
    struct Case { int profile, fps, kbps; bool interlaced; uint32_t w, h, videoProfile, level; };
    for (const Case& c : {Case{0, 14, 96, false, 176, 144, 0x5010, kLow}, Case{0, 14, 96, false, 320, 240, 0x5010, kMedium},
                          Case{1, 30, 2016, false, 1280, 720, 0x5011, kHigh}, Case{1, 30, 2016, true, 1280, 720, 0x5011, 0},
                          Case{3, 30, 1000, false, 1920, 1080, 0x5012, kL4}, Case{3, 22, 1000, false, 1920, 1080, 0x5012, kL3},
                          Case{2, 14, 96, false, 176, 144, 0, 0}}) {
        const _MM_CODECTYPE codec = CodecOf({Wmv("WMV3", c.w, c.h, SequenceHeader(c.profile, c.fps, c.kbps, c.interlaced))});
        EXPECT_EQ(codec.nVideoCodec, 0x5003u);
        EXPECT_EQ(codec.nVideoProfile, c.videoProfile) << c.profile << " " << c.w;
        EXPECT_EQ(codec.nVideoLevel, c.level) << c.profile << " " << c.w << " " << c.fps << " " << c.interlaced;
    }
}

// WMV1, MP42 and MP43 are recognised only without codec data, WMV2 only with it.
TEST(AsfVideoCodec, CompressionCodesAndCodecDataLength) {
    const std::pair<const char*, std::vector<uint8_t>> none[] = {{"WMV1", {}}, {"WMV1", {0}}, {"WMV2", {}},
                                                                 {"MP42", {}}, {"MP43", {}}, {"WVC1", {}}};
    const uint32_t noneCodes[] = {0x5001, 0x5001, 0xFFFF, 0x4001, 0x4001, 0xFFFF};
    for (size_t i = 0; i < 6; ++i) {
        EXPECT_EQ(CodecOf({Wmv(none[i].first, 176, 144, none[i].second)}).nVideoCodec, noneCodes[i]) << none[i].first;
    }
    EXPECT_EQ(CodecOf({Wmv("WMV2", 176, 144, {0x10, 0, 0, 0})}).nVideoCodec, 0x5002u);
    EXPECT_EQ(CodecOf({Wmv("WMV1", 176, 144, {1, 2, 3, 4})}).nVideoCodec, 0u);
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
