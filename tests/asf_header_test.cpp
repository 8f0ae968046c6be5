// ASF header walk: clip information, track types, the walk's bounds.

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

struct Clip { int32_t result; _MMClipInfo info; };

Clip ClipOf(const std::string& path) {
    Clip c;
    std::memset(&c.info, 0x5A, sizeof c.info);
    c.result = metainfo::ASF_GetClipInfo(path.c_str(), &c.info);
    return c;
}

// How many of the track type, codec type and metadata queries fail (answer 1).
int Failures(const std::string& path) {
    int mask = 0;
    _MM_CODECTYPE codec{};
    _MMMetaInfo meta{};
    const int n = (metainfo::ASF_GetTrackType(path.c_str(), &mask) == 1) + (metainfo::ASF_GetCodecType(path.c_str(), &codec) == 1) +
                  (metainfo::ASF_GetMetaInfo(path.c_str(), &meta, 1) == 1);
    delete[] meta.pPicture;
    return n;
}

struct LogLine { int priority; std::string tag, message; };
std::vector<LogLine> g_lines;
void Capture(int priority, const char* tag, const char* message) {
    g_lines.push_back({priority, tag != nullptr ? tag : "", message});
}

}  // namespace

// The duration is play time less preroll in milliseconds, divided by 1000
// toward zero: 3000 - 500 gives 2 s, 1500 - 3000 gives -1 s. Of two audio
// streams the first gives the format; bHasAudio counts them.
TEST(AsfClipInfo, FilePropertiesAndTheFirstAudioStreamGiveTheClip) {
    TempDir dir;
    Clip c = ClipOf(dir.Write("song.wma", AsfFile({AsfFileProperties(123456, 3 * kSecond, 500, 128000),
                                                   AsfAudioStream(1, 0x0161, 22050, 1, 32000, 8),
                                                   AsfAudioStream(2, 0x0161, 48000, 2, 320000, 24)})));
    ASSERT_EQ(c.result, 0);
    EXPECT_STREQ(c.info.szFormat, "wma");
    EXPECT_EQ(c.info.nFileSize, 123456u);
    EXPECT_EQ(c.info.nDuration, 2u);
    EXPECT_EQ(c.info.nBitrate, 128000u);
    EXPECT_EQ(c.info.bHasAudio, 2u);
    EXPECT_EQ(c.info.bHasVideo, 0u);
    EXPECT_EQ(c.info.nSampleRate, 22050u);
    EXPECT_EQ(c.info.nChannels, 1u);
    EXPECT_EQ(c.info.nBitsPerSample, 8u);
    EXPECT_EQ(c.info.nAudioBitrate, 32000u);
    EXPECT_EQ(c.info.nSamplesPerFrame, 0u);
    c = ClipOf(dir.Write("a.wma", AsfFile({AsfFileProperties(1000, 15 * kSecond / 10, 3000, 64000)})));
    ASSERT_EQ(c.result, 0);
    EXPECT_EQ(c.info.nDuration, 0xFFFFFFFFu);
}

TEST(AsfClipInfo, VideoWithoutBitrateOrFrameRateObjects) {
    TempDir dir;
    auto path = dir.Write("v.wmv", AsfFile({AsfFileProperties(1000, kSecond, 0, 500000),
                                            AsfAudioStream(1, 0x0161, 44100, 2, 128000),
                                            AsfVideoStream(2, "WMV2", 320, 240)}));
    Clip c = ClipOf(path);
    ASSERT_EQ(c.result, 0);
    EXPECT_EQ(c.info.bHasVideo, 1u);
    EXPECT_EQ(c.info.nWidth, 320u);
    EXPECT_EQ(c.info.nHeight, 240u);
    EXPECT_EQ(c.info.nVideoBitrate, 500000u - 128000u);
    EXPECT_EQ(c.info.nFrameRate, 0u);  // no Header Extension
    // Nor a frame rate when the Header Extension describes another stream.
    c = ClipOf(dir.Write("w.wmv", AsfFile({AsfHeaderExtension({AsfExtStreamProperties(7, 400000)}),
                                           AsfVideoStream(3, "WMV2", 176, 144)})));
    ASSERT_EQ(c.result, 0);
    EXPECT_EQ(c.info.nFrameRate, 0u);
}

TEST(AsfClipInfo, FirstVideoStreamIsChosenForBitrateAndFrameRateWhateverTheObjectOrder) {
    TempDir dir;
    // The bitrate list and the Header Extension come before the streams they describe.
    auto path = dir.Write("v.wmv", AsfFile({
        AsfStreamBitrates({{1, 96000}, {3, 111000}, {5, 222000}}),
        AsfHeaderExtension({AsfObject(asf_guid::kPadding, Bytes().zeros(8)),
                            AsfExtStreamProperties(5, 400000), AsfExtStreamProperties(3, 666666)}),
        AsfFileProperties(1000, kSecond, 0, 500000),
        AsfAudioStream(1, 0x0161, 44100, 2, 96000),
        AsfVideoStream(3, "WMV2", 176, 144),
        AsfVideoStream(5, "WMV2", 640, 480),
    }));
    Clip c = ClipOf(path);
    ASSERT_EQ(c.result, 0);
    EXPECT_EQ(c.info.bHasVideo, 2u);
    EXPECT_EQ(c.info.nWidth, 176u);
    EXPECT_EQ(c.info.nVideoBitrate, 111000u);
    EXPECT_EQ(c.info.nFrameRate, 15u);  // 10000000 / 666666
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

// Audio 0x1, video 0x10 and so on up to binary 0x1000000, OR-ed; padding adds nothing.
TEST(AsfTrackType, EveryStreamTypeHasItsBit) {
    TempDir dir;
    std::vector<Bytes> streams;
    for (const char* type : {asf_guid::kAudio, asf_guid::kVideo, asf_guid::kCommand, asf_guid::kJfif,
                             asf_guid::kDegradableJpeg, asf_guid::kFileTransfer, asf_guid::kBinary, asf_guid::kPadding}) {
        streams.push_back(AsfStreamProperties(type, static_cast<int>(streams.size()) + 1, Bytes().zeros(20)));
    }
    int mask = -1;
    ASSERT_EQ(metainfo::ASF_GetTrackType(dir.Write("a.asf", AsfFile(streams)).c_str(), &mask), 0);
    EXPECT_EQ(static_cast<uint32_t>(mask), 0x1111111u);
}

// Every broken header fails the clip query (-1) and, where the other queries
// walk the broken part, those too (1); no path leaves the file open.
TEST(AsfWalk, BrokenHeadersFailAndCloseTheFile) {
    TempDir dir;
    std::vector<Bytes> many(256, AsfObject(asf_guid::kPadding, Bytes()));
    many.push_back(AsfFileProperties(1000, kSecond, 0, 1));
    EXPECT_EQ(ClipOf(dir.Write("256.wma", AsfFile(many, 256))).result, 0);
    std::vector<uint8_t> badGuid = AsfFile({AsfFileProperties(1000, kSecond, 0, 1)});
    badGuid[3] ^= 1;
    const Bytes shortStream =
        AsfObject(asf_guid::kStreamProperties, Bytes().raw(AsfGuid(asf_guid::kAudio)).zeros(60), 10);
    struct Case { const char* name; std::vector<uint8_t> bytes; int otherFailures; };
    const Case cases[] = {
        {"257", AsfFile(many, 257), 3},
        {"guid", badGuid, 3},
        {"short", {0x30, 0x26}, 3},
        {"size0", AsfFile({AsfObject(asf_guid::kPadding, Bytes(), 0), AsfFileProperties(1000, kSecond, 0, 1)}), 3},
        {"size23", AsfFile({AsfObject(asf_guid::kPadding, Bytes(), 23), AsfFileProperties(1000, kSecond, 0, 1)}), 3},
        {"stream", AsfFile({shortStream}), 3},
        // The Header Extension is walked in the clip and metadata queries only.
        {"extSize", AsfFile({AsfHeaderExtension({}, 1 << 20), AsfVideoStream(1, "WMV2", 8, 8)}), 1},
        {"extZero", AsfFile({AsfHeaderExtension({AsfObject(asf_guid::kPadding, Bytes().zeros(8), 0)}),
                             AsfVideoStream(1, "WMV2", 8, 8)}), 1},
    };
    const int before = OpenDescriptors();
    for (const Case& c : cases) {
        const std::string path = dir.Write(c.name, c.bytes);
        EXPECT_EQ(ClipOf(path).result, -1) << c.name;
        EXPECT_EQ(Failures(path), c.otherFailures) << c.name;
    }
    EXPECT_EQ(ClipOf(dir.PathOf("missing.wma")).result, -1);
    EXPECT_EQ(OpenDescriptors(), before);
}

TEST(AsfWalk, FewerObjectsThanCountedEndAtTheFileEnd) {
    TempDir dir;
    Clip c = ClipOf(dir.Write(
        "a.wma", AsfHeader({AsfFileProperties(1000, 3 * kSecond, 0, 1), AsfAudioStream(1, 0x0161, 8000, 1, 8000)}, 9)));
    ASSERT_EQ(c.result, 0);
    EXPECT_EQ(c.info.nDuration, 3u);
    EXPECT_EQ(c.info.nSampleRate, 8000u);
}

TEST(AsfWalk, NullRecordFailsWithoutReading) {
    TempDir dir;
    auto path = dir.Write("a.wma", AsfFile({AsfFileProperties(1000, kSecond, 0, 1)}));
    EXPECT_EQ(metainfo::ASF_GetClipInfo(path.c_str(), nullptr), -1);
    EXPECT_EQ(metainfo::ASF_GetTrackType(path.c_str(), nullptr), 1);
    EXPECT_EQ(metainfo::ASF_GetCodecType(path.c_str(), nullptr), 1);
    EXPECT_EQ(metainfo::ASF_GetMetaInfo(path.c_str(), nullptr, 1), 1);
}

// The low byte of unit i goes to byte i and is counted; a unit with a zero
// low byte leaves byte i as it was.
TEST(AsfNames, Unicode2AsciiAndIsEqualName) {
    uint8_t text[] = {'W', 0, 'M', 0, 0, 0x30, '/', 0};
    EXPECT_EQ(metainfo::ASF_unicode2ascii(text, sizeof text), 3u);
    EXPECT_EQ(std::string(reinterpret_cast<char*>(text), 4), "WMM/");
    uint8_t one[] = {'A'};
    EXPECT_EQ(metainfo::ASF_unicode2ascii(one, 1), 0u);
    const uint8_t name[] = {'W', 'M', '/', 'Y', 'e', 'a', 'r'};
    EXPECT_EQ(metainfo::ASF_IsEqualName(name, "WM/Year", 7, 7), 1);
    EXPECT_EQ(metainfo::ASF_IsEqualName(name, "WM/Yea", 6, 7), 0);
    EXPECT_EQ(metainfo::ASF_IsEqualName(name, "WM/Yeah", 7, 7), 0);
}

TEST(AsfLog, DiagnosticsGoToTheLogAtVerbosePriorityWithTheAsfTag) {
    TempDir dir;
    auto path = dir.Write("a.wma", AsfFile({AsfAudioStream(1, 0x0161, 44100, 2, 128000)}));
    g_lines.clear();
    MM_MediaExtractor_SetLogSink(Capture);
    _MM_CODECTYPE codec;
    metainfo::ASF_GetCodecType(path.c_str(), &codec);
    MM_MediaExtractor_SetLogSink(nullptr);
    ASSERT_GE(g_lines.size(), 3u);
    EXPECT_EQ(g_lines[0].message, "\nEnter the ASF GetCodec Type " + path + "\n");
    EXPECT_EQ(g_lines[1].message, "the currObjSize = 106\n");
    for (const auto& line : g_lines) {
        EXPECT_EQ(line.priority, 2);
        EXPECT_EQ(line.tag, "ASF_LEVEL");
    }
}
