// MP3 stream analysis: sync acceptance, stream kinds, durations and the slot answers.
// Tag skipping and the frame-pair rule at the header level are pinned in verify_mp3_test.cpp.
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <tuple>

#include "metainfo/metainfo.h"
#include "mp3/mp3_frame.h"
#include "mp3/mp3_info.h"
#include "support/bytes.h"
#include "support/id3_builder.h"
#include "support/mp3_builder.h"

using namespace testing_support;
using namespace metainfo;

namespace {

// Clip information and audio information of one file. Default frames:
// MPEG-1 Layer III, 128 kbit/s, 44100 Hz, stereo, 417 bytes.
struct Probe {
    _MMClipInfo clip;
    _MP3AudioInfo info;
    int32_t clipResult, infoResult;
    explicit Probe(const std::vector<uint8_t>& file) {
        TempDir dir;
        const std::string path = dir.Write("s.mp3", file);
        std::memset(&clip, 0xAB, sizeof clip);
        std::memset(&info, 0, sizeof info);
        clipResult = MP3_GetClipInfo(path.c_str(), &clip);
        infoResult = GetMediaInfo_MP3(path.c_str(), &info, INFO_MP3_AUDIO);
    }
    ~Probe() { delete[] info.xingToc; }
};

std::vector<uint8_t> Then20Frames(const std::vector<uint8_t>& first, const Mp3Shape& shape = {}) {
    return Bytes().raw(first).raw(Mp3Frames(20, shape)).data();
}

}  // namespace

TEST(Mp3Stream, ConstantBitRateDurationIsAudioBytesOverSampledRate) {
    // 1,600,000 audio bytes from the first frame, then an ID3v1 tag that is not audio.
    const auto file = Bytes().raw(Mp3Frames(3836)).zeros(1600000 - 3836 * 417).raw(Id3v1Titled("")).data();
    const Probe p(file);
    ASSERT_EQ(p.clipResult, MM_OK);
    EXPECT_STREQ(p.clip.szFormat, "mp3");
    EXPECT_EQ(std::tie(p.clip.nFileSize, p.clip.nDuration, p.clip.nBitrate, p.clip.nAudioBitrate),
              std::make_tuple(1600128u, 100u, 128000u, 128000u));
    EXPECT_EQ(std::tie(p.clip.bHasAudio, p.clip.bHasVideo, p.clip.nSampleRate, p.clip.nChannels, p.clip.nBitsPerSample),
              std::make_tuple(1u, 0u, 44100u, 2u, 16u));
    EXPECT_EQ(p.clip.nSamplesPerFrame, 2304u);
    EXPECT_EQ(p.clip.nWidth, 0u);  // the record is zeroed whole
    ASSERT_EQ(p.infoResult, MM_OK);
    EXPECT_EQ(std::tie(p.info.headerKind, p.info.tagBytes, p.info.duration, p.info.avgBitRate),
              std::make_tuple(1u, 128u, 100u, 128000u));

    TempDir dir;
    _MMClipInfo pub;
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(dir.Write("pub.mp3", file).c_str(), MEDIA_TYPE_MP3, &pub), MM_OK);
    EXPECT_EQ(pub.nDuration, 100000u);
}

TEST(Mp3Stream, SampledBitRateDropsLargestAndSmallest) {
    Mp3Shape low, high;
    low.bitrateIndex = 1;    // 32 kbit/s
    high.bitrateIndex = 14;  // 320 kbit/s
    // Kept, the two would raise the average above 128 kbit/s.
    const Probe p(Bytes().raw(Mp3Frames(2)).raw(Mp3Frame(high)).raw(Mp3Frame(low)).raw(Mp3Frames(10)).data());
    EXPECT_EQ(p.clip.nBitrate, 128000u);
}

TEST(Mp3Stream, SamplingRateChangeBetweenFirstTwoFramesIsNotMp3) {
    Mp3Shape other;
    other.samplingIndex = 1;  // 48000 Hz; a valid pair follows later
    const auto file = Bytes().raw(Mp3Frame({})).raw(Mp3Frame(other)).raw(Mp3Frames(6)).data();
    EXPECT_EQ(Probe(file).clipResult, MM_E_UNSUPPORTED);
    TempDir dir;
    int type = 0;
    EXPECT_EQ(MM_MediaExtractor_DetectMediaType(dir.Write("switch.mp3", file).c_str(), &type), MM_OK);
    EXPECT_NE(type, MEDIA_TYPE_MP3);
}

TEST(Mp3Stream, FilesShorterThanSixteenBytesFailEveryRequest) {
    TempDir dir;
    const std::string path = dir.Write("short.mp3", Bytes().raw(Mp3Header({})).zeros(11).data());
    _MM_MIMETYPE mime{};
    _MM_CODECTYPE codec{};
    EXPECT_EQ(MP3_GetMIMEType(path.c_str(), &mime), MM_E_FAIL);
    EXPECT_EQ(mime.pszMimeType, nullptr);
    EXPECT_EQ(MP3_GetCodecType(path.c_str(), &codec), MM_E_FAIL);
    const Probe p(ReadFileBytes(path));
    EXPECT_EQ(p.clipResult, MM_E_FAIL);
    EXPECT_EQ(p.infoResult, MM_E_FAIL);
}

TEST(Mp3Stream, XingHeaderGivesDurationFromFrameCount) {
    XingFields xing;
    xing.frames = 3828;
    xing.bytes = 1600000;
    const auto file = Then20Frames(XingFrame(xing));
    const Probe p(file);
    ASSERT_EQ(p.clipResult, MM_OK);
    EXPECT_EQ(p.clip.nDuration, 99u);  // 3828 * 1152 / 44100
    EXPECT_EQ(p.clip.nBitrate, file.size() * 8 / 99);
    ASSERT_EQ(p.infoResult, MM_OK);
    EXPECT_EQ(std::tie(p.info.headerKind, p.info.xingOffset, p.info.xingFlags, p.info.duration),
              std::make_tuple(2u, 36u, 0xFu, 99u));
    EXPECT_EQ(std::tie(p.info.totalFrames, p.info.totalBytes, p.info.quality), std::make_tuple(3828u, 1600000u, 57));
    ASSERT_NE(p.info.xingToc, nullptr);
    EXPECT_EQ(p.info.xingToc[50], 128);
    EXPECT_EQ(p.info.avgBitRate, 128000u);  // with a table the sampled average stays
}

TEST(Mp3Stream, XingWithoutFramesFlagOrWithZeroFramesAnswersWithoutFault) {
    XingFields bytesOnly;
    bytesOnly.flags = 0x2;
    const Probe p(Then20Frames(XingFrame(bytesOnly)));
    ASSERT_EQ(p.infoResult, MM_OK);
    EXPECT_EQ(std::tie(p.info.duration, p.info.avgBitRate), std::make_tuple(0u, 0u));  // no table: recomputed
    EXPECT_EQ(p.info.quality, -1);
    ASSERT_EQ(p.clipResult, MM_OK);
    EXPECT_EQ(p.clip.nDuration, (0xFFFFFFFFu * 1152u) / 44100u);  // the clip request reads 0xFFFFFFFF frames

    XingFields zero;
    zero.flags = 0x1;
    const Probe z(Then20Frames(XingFrame(zero)));
    ASSERT_EQ(z.clipResult, MM_OK);
    EXPECT_EQ(std::tie(z.clip.nDuration, z.clip.nBitrate), std::make_tuple(0u, 0u));
}

TEST(Mp3Stream, OnlyXingIsRecognisedAtThePositionSetByVersionAndChannels) {
    Mp3Shape mono, lsf, lsfMono;
    mono.channelMode = lsfMono.channelMode = 3;
    lsf.version = lsfMono.version = 2;
    lsf.bitrateIndex = lsfMono.bitrateIndex = 8;  // 64 kbit/s
    XingFields info;
    info.tag = "Info";
    const struct {
        Mp3Shape shape;
        XingFields xing;
        uint32_t kind, offset;
    } cases[] = {{mono, {}, 2, 21}, {lsf, {}, 2, 21}, {lsfMono, {}, 2, 13}, {{}, info, 1, 0}};
    for (const auto& c : cases) {
        const Probe p(Then20Frames(XingFrame(c.xing, c.shape), c.shape));
        ASSERT_EQ(p.infoResult, MM_OK);
        EXPECT_EQ(std::tie(p.info.headerKind, p.info.xingOffset), std::tie(c.kind, c.offset));
        EXPECT_EQ(p.info.xingToc != nullptr, c.kind == 2);
    }
}

TEST(Mp3Stream, VbriSixteenBitFieldsAreLittleEndianAndGiveTheDuration) {
    VbriFields vbri;
    vbri.frames = 1000;
    vbri.bytes = 400000;
    vbri.framesPerEntry = 100;
    vbri.scale = 3;
    const auto file = Then20Frames(VbriFrame(vbri));
    const Probe p(file);
    ASSERT_EQ(p.infoResult, MM_OK);
    EXPECT_EQ(std::tie(p.info.headerKind, p.info.totalFrames, p.info.totalBytes), std::make_tuple(3u, 1000u, 400000u));
    EXPECT_EQ(p.info.vbriDelay, 0x0102u);
    EXPECT_EQ(p.info.vbriFramesPerEntry, 100u);
    EXPECT_EQ(p.info.quality, 3);  // the scale word
    EXPECT_EQ(p.info.duration, 26u);  // 1000 * 1152 / 44100
    ASSERT_EQ(p.clipResult, MM_OK);
    EXPECT_EQ(p.clip.nDuration, 26u);
    EXPECT_EQ(p.clip.nBitrate, file.size() * 8 / 26);
}

TEST(Mp3Stream, SamplesPerFrameRuleOfMpeg25IsAsymmetric) {
    const struct {
        int version, channelMode;
        uint32_t channels, samples;
    } cases[] = {{0, 3, 1, 576}, {0, 0, 2, 288}, {2, 3, 1, 1152}, {2, 0, 2, 2304}, {3, 3, 1, 1152}};
    for (const auto& c : cases) {
        Mp3Shape shape;
        shape.version = c.version;
        shape.bitrateIndex = 8;
        shape.channelMode = c.channelMode;
        const Probe p(Mp3Frames(12, shape));
        ASSERT_EQ(p.clipResult, MM_OK);
        EXPECT_EQ(std::tie(p.clip.nChannels, p.clip.nSamplesPerFrame), std::tie(c.channels, c.samples)) << c.version;
    }
}

TEST(Mp3Stream, CodecFollowsTheLayerAndMimeReplacesTheOldString) {
    TempDir dir;
    for (int layer = 1; layer <= 3; ++layer) {
        Mp3Shape shape;
        shape.layer = layer;
        shape.crc = true;  // MPEG-1 Layer I without CRC starts FF FF, never a sync candidate
        _MM_CODECTYPE codec{};
        ASSERT_EQ(MP3_GetCodecType(dir.Write("c.mp3", Mp3Frames(8, shape)).c_str(), &codec), MM_OK);
        EXPECT_EQ(codec.nAudioCodec, 0x1000u + static_cast<uint32_t>(layer));
    }
    const std::string path = dir.Write("m.mp3", Mp3Frames(8));
    _MM_MIMETYPE mime{};
    mime.pszMimeType = new char[4]{'o', 'l', 'd', 0};  // released by the query
    ASSERT_EQ(MP3_GetMIMEType(path.c_str(), &mime), MM_OK);
    EXPECT_STREQ(mime.pszMimeType, "audio/mp3");
    EXPECT_EQ(mime.nMimeLength, 9u);
    delete[] mime.pszMimeType;
    int mask = 0;
    EXPECT_EQ(MP3_GetTrackType("/no/such/file.mp3", &mask), MM_OK);  // the file is never opened
    EXPECT_EQ(mask, TRACK_AUDIO);
    int dummy = 0;
    EXPECT_EQ(GetMediaInfo_MP3(path.c_str(), &dummy, INFO_METADATA), MM_E_FAIL);
    EXPECT_EQ(GetMediaInfo_MP3(nullptr, &dummy, INFO_CLIPINFO), MM_E_INVALIDARG);
}
