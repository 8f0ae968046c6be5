// ASF header walk: clip information, track types, the walk's bounds.
#include <dirent.h>

#include <cstring>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "asf/asf_header.h"
#include "metainfo/metainfo.h"
#include "support/asf_builder.h"
#include "support/bytes.h"

using namespace testing_support;

namespace {

constexpr uint64_t kSecond = 10000000;  // 100-ns units

// A header followed by a stub Data Object, as files have one.
std::vector<uint8_t> AsfFile(const std::vector<Bytes>& objects, int64_t count = -1) {
    Bytes file = AsfHeader(objects, count);
    file.raw(AsfGuid("75B22636-668E-11CF-A6D9-00AA0062CE6C")).le64(50).fill(26, 0);
    return file.data();
}

AsfAudio Audio(uint32_t rate, uint16_t channels, uint32_t avgBytes, uint16_t bits = 16) {
    AsfAudio a;
    a.sampleRate = rate;
    a.channels = channels;
    a.avgBytesPerSec = avgBytes;
    a.bitsPerSample = bits;
    return a;
}

AsfVideo Video(uint32_t w, uint32_t h) {
    AsfVideo v;
    v.width = w;
    v.height = h;
    v.compression = "WMV2";
    v.codecData = {0, 0, 0, 0};
    return v;
}

struct Clip {
    int32_t result;
    _MMClipInfo info;
};

Clip ClipOf(const std::string& path) {
    Clip c;
    std::memset(&c.info, 0x5A, sizeof c.info);
    c.result = metainfo::ASF_GetClipInfo(path.c_str(), &c.info);
    return c;
}

struct LogLine {
    int priority;
    std::string tag;
    std::string message;
};
std::vector<LogLine> g_lines;
void Capture(int priority, const char* tag, const char* message) {
    g_lines.push_back({priority, tag != nullptr ? tag : "", message});
}

}  // namespace

TEST(AsfClipInfo, FilePropertiesGiveSizeDurationAndBitrate) {
    TempDir dir;
    auto path = dir.Write("song.wma", AsfFile({AsfFileProperties(123456, 25 * kSecond / 10 + 5000000, 500, 128000),
                                               AsfAudioStream(1, Audio(44100, 2, 16000))}));
    Clip c = ClipOf(path);
    ASSERT_EQ(c.result, 0);
    EXPECT_STREQ(c.info.szFormat, "wma");
    EXPECT_EQ(c.info.nFileSize, 123456u);
    EXPECT_EQ(c.info.nDuration, 2u);  // (3000 ms - 500 ms) / 1000, truncated
    EXPECT_EQ(c.info.nBitrate, 128000u);
    EXPECT_EQ(c.info.bHasAudio, 1u);
    EXPECT_EQ(c.info.bHasVideo, 0u);
    EXPECT_EQ(c.info.nSampleRate, 44100u);
    EXPECT_EQ(c.info.nChannels, 2u);
    EXPECT_EQ(c.info.nBitsPerSample, 16u);
    EXPECT_EQ(c.info.nAudioBitrate, 128000u);
    EXPECT_EQ(c.info.nSamplesPerFrame, 0u);
}

TEST(AsfClipInfo, PrerollLargerThanDurationGivesNegativeSecondsTruncatedTowardZero) {
    TempDir dir;
    // 1500 ms of play, 3000 ms of preroll: -1500 ms, which is -1 s.
    auto path = dir.Write("a.wma", AsfFile({AsfFileProperties(1000, 15 * kSecond / 10, 3000, 64000)}));
    Clip c = ClipOf(path);
    ASSERT_EQ(c.result, 0);
    EXPECT_EQ(c.info.nDuration, 0xFFFFFFFFu);
}

TEST(AsfClipInfo, TwoAudioStreamsReportTheFirstOnesFormatAndTheCount) {
    TempDir dir;
    auto path = dir.Write("a.wma", AsfFile({AsfFileProperties(1000, kSecond, 0, 64000),
                                            AsfAudioStream(1, Audio(22050, 1, 4000, 8)),
                                            AsfAudioStream(2, Audio(48000, 2, 40000, 24))}));
    Clip c = ClipOf(path);
    ASSERT_EQ(c.result, 0);
    EXPECT_EQ(c.info.bHasAudio, 2u);
    EXPECT_EQ(c.info.nSampleRate, 22050u);
    EXPECT_EQ(c.info.nChannels, 1u);
    EXPECT_EQ(c.info.nBitsPerSample, 8u);
    EXPECT_EQ(c.info.nAudioBitrate, 32000u);
}

TEST(AsfClipInfo, VideoWithoutStreamBitratePropertiesGetsMaximumBitrateLessAudio) {
    TempDir dir;
    auto path = dir.Write("v.wmv", AsfFile({AsfFileProperties(1000, kSecond, 0, 500000),
                                            AsfAudioStream(1, Audio(44100, 2, 16000)),
                                            AsfVideoStream(2, Video(320, 240))}));
    Clip c = ClipOf(path);
    ASSERT_EQ(c.result, 0);
    EXPECT_EQ(c.info.bHasVideo, 1u);
    EXPECT_EQ(c.info.nWidth, 320u);
    EXPECT_EQ(c.info.nHeight, 240u);
    EXPECT_EQ(c.info.nVideoBitrate, 500000u - 128000u);
    EXPECT_EQ(c.info.nFrameRate, 0u);  // no Header Extension
}

TEST(AsfClipInfo, FirstVideoStreamIsChosenForBitrateAndFrameRateWhateverTheObjectOrder) {
    TempDir dir;
    // The bitrate list and the Header Extension come before the streams they describe.
    auto path = dir.Write("v.wmv", AsfFile({
        AsfStreamBitrates({{1, 96000}, {3, 111000}, {5, 222000}}),
        AsfHeaderExtension({AsfObject(asf_guid::kPadding, Bytes().zeros(8)),
                            AsfExtStreamProperties(5, 400000), AsfExtStreamProperties(3, 666666)}),
        AsfFileProperties(1000, kSecond, 0, 500000),
        AsfAudioStream(1, Audio(44100, 2, 12000)),
        AsfVideoStream(3, Video(176, 144)),
        AsfVideoStream(5, Video(640, 480)),
    }));
    Clip c = ClipOf(path);
    ASSERT_EQ(c.result, 0);
    EXPECT_EQ(c.info.bHasVideo, 2u);
    EXPECT_EQ(c.info.nWidth, 176u);
    EXPECT_EQ(c.info.nVideoBitrate, 111000u);
    EXPECT_EQ(c.info.nFrameRate, 15u);  // 10000000 / 666666
}

TEST(AsfClipInfo, VideoStreamWithoutExtendedStreamPropertiesHasNoFrameRate) {
    TempDir dir;
    auto path = dir.Write("v.wmv", AsfFile({AsfHeaderExtension({AsfExtStreamProperties(7, 400000)}),
                                            AsfVideoStream(3, Video(176, 144))}));
    Clip c = ClipOf(path);
    ASSERT_EQ(c.result, 0);
    EXPECT_EQ(c.info.nFrameRate, 0u);
}

TEST(AsfClipInfo, HeaderExtensionDataSizeNotBelowFileSizeFails) {
    TempDir dir;
    auto path = dir.Write("v.wmv", AsfFile({AsfHeaderExtension({}, 1 << 20), AsfVideoStream(1, Video(176, 144))}));
    EXPECT_EQ(ClipOf(path).result, -1);
}

TEST(AsfClipInfo, FormatIsTheExtensionWithoutItsDot) {
    TempDir dir;
    auto bytes = AsfFile({AsfFileProperties(1000, kSecond, 0, 1)});
    EXPECT_STREQ(ClipOf(dir.Write("x.Asf", bytes)).info.szFormat, "Asf");
    EXPECT_STREQ(ClipOf(dir.Write("x.abcdefghijk", bytes)).info.szFormat, "abcdefgh");
    if (dir.path().find('.') == std::string::npos) {
        EXPECT_EQ(ClipOf(dir.Write("noext", bytes)).result, MM_E_FAIL);
    }
}

TEST(AsfClipInfo, PublicInterfaceDetectsAsfAndReportsMilliseconds) {
    TempDir dir;
    auto path = dir.Write("a.wma", AsfFile({AsfFileProperties(1000, 7 * kSecond, 0, 1)}));
    int type = 0;
    ASSERT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), 0);
    EXPECT_EQ(type, MEDIA_TYPE_ASF);
    EXPECT_EQ(MM_MediaExtractor_CheckMediaType(path.c_str()), 0);
    _MMClipInfo clip;
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), type, &clip), 0);
    EXPECT_EQ(clip.nDuration, 7000u);
}

TEST(AsfTrackType, OneAudioAndOneVideoStreamGive0x11) {
    TempDir dir;
    auto path = dir.Write("v.wmv", AsfFile({AsfAudioStream(1, Audio(44100, 2, 16000)), AsfVideoStream(2, Video(8, 8))}));
    int mask = -1;
    ASSERT_EQ(MM_MediaExtractor_GetTrackType(path.c_str(), MEDIA_TYPE_ASF, &mask), 0);
    EXPECT_EQ(mask, 0x11);
}

TEST(AsfTrackType, EveryStreamTypeHasItsBit) {
    TempDir dir;
    std::vector<Bytes> streams;
    int n = 1;
    for (const char* type : {asf_guid::kAudio, asf_guid::kVideo, asf_guid::kCommand, asf_guid::kJfif,
                             asf_guid::kDegradableJpeg, asf_guid::kFileTransfer, asf_guid::kBinary,
                             asf_guid::kPadding}) {
        streams.push_back(AsfStreamProperties(type, n++, Bytes().zeros(20)));
    }
    int mask = 0;
    ASSERT_EQ(metainfo::ASF_GetTrackType(dir.Write("a.asf", AsfFile(streams)).c_str(), &mask), 0);
    EXPECT_EQ(static_cast<uint32_t>(mask), 0x1111111u);
}

TEST(AsfWalk, HeaderClaiming257ObjectsIsRejected) {
    TempDir dir;
    std::vector<Bytes> many(256, AsfObject(asf_guid::kPadding, Bytes()));
    many.push_back(AsfFileProperties(1000, kSecond, 0, 1));
    EXPECT_EQ(ClipOf(dir.Write("a.wma", AsfFile(many, 257))).result, -1);
    int mask = 0;
    EXPECT_EQ(metainfo::ASF_GetTrackType(dir.Write("b.wma", AsfFile(many, 257)).c_str(), &mask), 1);
    // 256 is still a header.
    EXPECT_EQ(ClipOf(dir.Write("c.wma", AsfFile(many, 256))).result, 0);
}

TEST(AsfWalk, WrongHeaderGuidOrMissingFileFails) {
    TempDir dir;
    auto bytes = AsfFile({AsfFileProperties(1000, kSecond, 0, 1)});
    bytes[3] ^= 1;
    EXPECT_EQ(ClipOf(dir.Write("a.wma", bytes)).result, -1);
    EXPECT_EQ(ClipOf(dir.PathOf("missing.wma")).result, -1);
    EXPECT_EQ(ClipOf(dir.Write("short.wma", {0x30, 0x26})).result, -1);
}

TEST(AsfWalk, FewerObjectsThanCountedEndAtTheFileEnd) {
    TempDir dir;
    Bytes header = AsfHeader({AsfFileProperties(1000, 3 * kSecond, 0, 1), AsfAudioStream(1, Audio(8000, 1, 1000))}, 9);
    Clip c = ClipOf(dir.Write("a.wma", header.data()));
    ASSERT_EQ(c.result, 0);
    EXPECT_EQ(c.info.nDuration, 3u);
    EXPECT_EQ(c.info.nSampleRate, 8000u);
}

TEST(AsfWalk, ObjectSizeBelowObjectHeaderEndsTheWalk) {
    TempDir dir;
    for (int64_t size : {0, 1, 23}) {
        auto path = dir.Write("a.wma", AsfFile({AsfObject(asf_guid::kPadding, Bytes(), size),
                                                AsfFileProperties(1000, kSecond, 0, 1)}));
        EXPECT_EQ(ClipOf(path).result, -1) << size;
        int mask = 0;
        EXPECT_EQ(metainfo::ASF_GetTrackType(path.c_str(), &mask), 1) << size;
        _MMMetaInfo meta{};
        EXPECT_EQ(metainfo::ASF_GetMetaInfo(path.c_str(), &meta, 1), 1) << size;
        _MM_CODECTYPE codec{};
        EXPECT_EQ(metainfo::ASF_GetCodecType(path.c_str(), &codec), 1) << size;
    }
    // A stream object that claims less than its own header.
    auto path = dir.Write("b.wma", AsfFile({AsfObject(asf_guid::kStreamProperties, Bytes().raw(AsfGuid(asf_guid::kAudio)).zeros(60), 10)}));
    EXPECT_EQ(ClipOf(path).result, -1);
    _MM_CODECTYPE codec{};
    EXPECT_EQ(metainfo::ASF_GetCodecType(path.c_str(), &codec), 1);
}

TEST(AsfWalk, ZeroSizedObjectInsideHeaderExtensionEndsTheWalk) {
    TempDir dir;
    Bytes zero = AsfObject(asf_guid::kPadding, Bytes().zeros(8), 0);
    auto path = dir.Write("v.wmv", AsfFile({AsfHeaderExtension({zero}), AsfVideoStream(1, Video(8, 8))}));
    EXPECT_EQ(ClipOf(path).result, -1);
    _MMMetaInfo meta{};
    EXPECT_EQ(metainfo::ASF_GetMetaInfo(path.c_str(), &meta, 1), 1);
}

TEST(AsfWalk, ClosesTheFileOnEveryPath) {
    TempDir dir;
    std::vector<std::string> paths = {
        dir.Write("ok.wma", AsfFile({AsfFileProperties(1000, kSecond, 0, 1)})),
        dir.Write("count.wma", AsfFile({}, 300)),
        dir.Write("guid.wma", std::vector<uint8_t>(64, 0x11)),
        dir.Write("size.wma", AsfFile({AsfObject(asf_guid::kPadding, Bytes(), 3)})),
        dir.Write("ext.wma", AsfFile({AsfHeaderExtension({}, 1 << 24)})),
    };
    int before = OpenDescriptors();
    for (const auto& p : paths) {
        _MMClipInfo clip;
        _MMMetaInfo meta{};
        _MM_CODECTYPE codec;
        int mask;
        metainfo::ASF_GetClipInfo(p.c_str(), &clip);
        metainfo::ASF_GetMetaInfo(p.c_str(), &meta, 1);
        metainfo::ASF_GetCodecType(p.c_str(), &codec);
        metainfo::ASF_GetTrackType(p.c_str(), &mask);
        delete[] meta.pPicture;
    }
    EXPECT_EQ(OpenDescriptors(), before);
}

TEST(AsfWalk, NullRecordFailsWithoutReading) {
    TempDir dir;
    auto path = dir.Write("a.wma", AsfFile({AsfFileProperties(1000, kSecond, 0, 1)}));
    EXPECT_EQ(metainfo::ASF_GetClipInfo(path.c_str(), nullptr), -1);
    EXPECT_EQ(metainfo::ASF_GetTrackType(path.c_str(), nullptr), 1);
    EXPECT_EQ(metainfo::ASF_GetCodecType(path.c_str(), nullptr), 1);
    EXPECT_EQ(metainfo::ASF_GetMetaInfo(path.c_str(), nullptr, 1), 1);
}

TEST(AsfNames, Unicode2AsciiKeepsLowBytesInPlaceAndCountsThem) {
    uint8_t text[] = {'W', 0, 'M', 0, 0, 0x30, '/', 0};
    EXPECT_EQ(metainfo::ASF_unicode2ascii(text, sizeof text), 3u);
    // Unit 2 has a zero low byte: byte 2 keeps what it held.
    EXPECT_EQ(text[0], 'W');
    EXPECT_EQ(text[1], 'M');
    EXPECT_EQ(text[2], 'M');
    EXPECT_EQ(text[3], '/');
    uint8_t one[] = {'A'};
    EXPECT_EQ(metainfo::ASF_unicode2ascii(one, 1), 0u);
}

TEST(AsfNames, IsEqualNameNeedsEqualLengths) {
    const uint8_t name[] = {'W', 'M', '/', 'Y', 'e', 'a', 'r'};
    EXPECT_EQ(metainfo::ASF_IsEqualName(name, "WM/Year", 7, 7), 1);
    EXPECT_EQ(metainfo::ASF_IsEqualName(name, "WM/Yea", 6, 7), 0);
    EXPECT_EQ(metainfo::ASF_IsEqualName(name, "WM/Yeah", 7, 7), 0);
}

TEST(AsfLog, DiagnosticsGoToTheLogAtVerbosePriorityWithTheAsfTag) {
    TempDir dir;
    auto path = dir.Write("a.wma", AsfFile({AsfAudioStream(1, Audio(44100, 2, 16000))}));
    g_lines.clear();
    MM_MediaExtractor_SetLogSink(Capture);
    _MM_CODECTYPE codec;
    metainfo::ASF_GetCodecType(path.c_str(), &codec);
    MM_MediaExtractor_SetLogSink(nullptr);
    ASSERT_GE(g_lines.size(), 3u);
    EXPECT_EQ(g_lines[0].message, "\nEnter the ASF GetCodec Type " + path + "\n");
    EXPECT_EQ(g_lines[1].message, "the currObjSize = 96\n");
    for (const auto& line : g_lines) {
        EXPECT_EQ(line.priority, 2);
        EXPECT_EQ(line.tag, "ASF_LEVEL");
    }
}
