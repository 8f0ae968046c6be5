// MP3 stream analysis: sync acceptance, stream kinds, durations and the slot answers.
#include <gtest/gtest.h>

#include <cstring>

#include "core/file_access.h"
#include "metainfo/metainfo.h"
#include "mp3/mp3_frame.h"
#include "mp3/mp3_info.h"
#include "support/bytes.h"
#include "support/id3_builder.h"
#include "support/mp3_builder.h"

using namespace testing_support;
using namespace metainfo;

namespace {

Mp3FrameSpec Mpeg1Layer3() { return Mp3FrameSpec{}; }  // 128 kbit/s, 44100 Hz, 417 bytes

_MMClipInfo ClipOf(const std::string& path, int32_t* result = nullptr) {
    _MMClipInfo clip;
    std::memset(&clip, 0xAB, sizeof clip);
    int32_t r = MP3_GetClipInfo(path.c_str(), &clip);
    if (result != nullptr) *result = r;
    return clip;
}

struct AudioInfo {
    _MP3AudioInfo info;
    int32_t result;
    AudioInfo() { std::memset(&info, 0, sizeof info); }
    ~AudioInfo() { delete[] info.xingToc; }
};

void LoadAudioInfo(const std::string& path, AudioInfo* out) {
    out->result = GetMediaInfo_MP3(path.c_str(), &out->info, INFO_MP3_AUDIO);
}

}  // namespace

TEST(Mp3Stream, ConstantBitRateDurationIsAudioBytesOverSampledRate) {
    TempDir dir;
    Bytes file;
    file.raw(Mp3Frames(Mpeg1Layer3(), 3836));
    file.zeros(1600000 - file.size());  // 1,600,000 audio bytes from the first frame
    const std::string path = dir.Write("cbr.mp3", file.data());
    int32_t result = 0;
    _MMClipInfo clip = ClipOf(path, &result);
    ASSERT_EQ(result, MM_OK);
    EXPECT_STREQ(clip.szFormat, "mp3");
    EXPECT_EQ(clip.nFileSize, 1600000u);
    EXPECT_EQ(clip.nDuration, 100u);
    EXPECT_EQ(clip.nBitrate, 128000u);
    EXPECT_EQ(clip.nAudioBitrate, 128000u);
    EXPECT_EQ(clip.bHasAudio, 1u);
    EXPECT_EQ(clip.bHasVideo, 0u);
    EXPECT_EQ(clip.nSampleRate, 44100u);
    EXPECT_EQ(clip.nChannels, 2u);
    EXPECT_EQ(clip.nBitsPerSample, 16u);
    EXPECT_EQ(clip.nSamplesPerFrame, 2304u);
    EXPECT_EQ(clip.nWidth, 0u);
    EXPECT_EQ(clip.nReserved1, 0u);
}

TEST(Mp3Stream, TrailingTagIsNotCountedAsAudio) {
    TempDir dir;
    Bytes file;
    file.raw(Mp3Frames(Mpeg1Layer3(), 3836));
    file.zeros(1600000 - file.size());
    file.raw(Id3v1(Id3v1Spec{}));
    AudioInfo a;
    LoadAudioInfo(dir.Write("t.mp3", file.data()), &a);
    ASSERT_EQ(a.result, MM_OK);
    EXPECT_EQ(a.info.tagBytes, 128u);
    EXPECT_EQ(a.info.headerKind, 1u);
    EXPECT_EQ(a.info.duration, 100u);
    EXPECT_EQ(a.info.avgBitRate, 128000u);
    EXPECT_EQ(a.info.fileSize, 1600128u);
}

TEST(Mp3Stream, SampledBitRateDropsLargestAndSmallest) {
    TempDir dir;
    Mp3FrameSpec low = Mpeg1Layer3();
    low.bitrateIndex = 1;  // 32 kbit/s
    Mp3FrameSpec high = Mpeg1Layer3();
    high.bitrateIndex = 14;  // 320 kbit/s
    Bytes file;
    file.raw(Mp3Frames(Mpeg1Layer3(), 2)).raw(Mp3Frame(high)).raw(Mp3Frame(low)).raw(Mp3Frames(Mpeg1Layer3(), 10));
    const int h = MEx_fopen(dir.Write("v.mp3", file.data()).c_str(), "rb");
    ASSERT_NE(h, 0);
    EXPECT_EQ(GetAvBitrate(h, 0, 0), 128000);
    MEx_fclose(h);
}

TEST(Mp3Stream, ChainedLeadingTagsAreSkippedUpToThree) {
    TempDir dir;
    const std::vector<uint8_t> tag = Id3v2Tag(3, std::vector<uint8_t>(20, 0));
    Bytes two;
    two.raw(tag).raw(tag).raw(Mp3Frames(Mpeg1Layer3(), 4));
    AudioInfo a;
    LoadAudioInfo(dir.Write("two.mp3", two.data()), &a);
    ASSERT_EQ(a.result, MM_OK);
    EXPECT_EQ(a.info.firstFrameOffset, 2 * tag.size());

    // A fourth tag is left in place: a frame pair inside it is taken as the stream.
    const std::vector<uint8_t> pair = Mp3Frames(Mpeg1Layer3(), 2);
    const std::vector<uint8_t> fourth = Id3v2Tag(3, pair);
    Bytes four;
    four.raw(tag).raw(tag).raw(tag).raw(fourth).raw(Mp3Frames(Mpeg1Layer3(), 4));
    const int h = MEx_fopen(dir.Write("four.mp3", four.data()).c_str(), "rb");
    ASSERT_NE(h, 0);
    EXPECT_EQ(CheckID3Header(h), MM_OK);
    EXPECT_EQ(MEx_ftell(h), static_cast<long>(3 * tag.size()));
    _FrameHeader_Info info;
    std::memset(&info, 0, sizeof info);
    EXPECT_EQ(VerifyMP3(h, nullptr, &info), MM_OK);
    EXPECT_EQ(info.firstFrameOffset, 3 * tag.size() + 10);
    MEx_fclose(h);
}

TEST(Mp3Stream, FooterFlagSkipsTwentyBytesPlusSize) {
    TempDir dir;
    Bytes file;
    file.raw(Id3v2Tag(4, std::vector<uint8_t>(30, 0), 0x10)).str("3DI").u8(4).zeros(6);
    file.raw(Mp3Frames(Mpeg1Layer3(), 4));
    const int h = MEx_fopen(dir.Write("footer.mp3", file.data()).c_str(), "rb");
    ASSERT_NE(h, 0);
    EXPECT_EQ(CheckID3Header(h), MM_OK);
    EXPECT_EQ(MEx_ftell(h), 50);
    MEx_fclose(h);
}

TEST(Mp3Stream, SamplingRateChangeBetweenFirstTwoFramesIsRejected) {
    TempDir dir;
    Mp3FrameSpec other = Mpeg1Layer3();
    other.samplingIndex = 1;  // 48000 Hz
    Bytes file;
    file.raw(Mp3Frame(Mpeg1Layer3())).raw(Mp3Frame(other)).raw(Mp3Frames(Mpeg1Layer3(), 6));
    const std::string path = dir.Write("switch.mp3", file.data());
    int32_t result = 0;
    ClipOf(path, &result);
    EXPECT_EQ(result, MM_E_UNSUPPORTED);
    int type = 0;
    EXPECT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK);
    EXPECT_NE(type, MEDIA_TYPE_MP3);
}

TEST(Mp3Stream, FilesShorterThanSixteenBytesFailEveryRequest) {
    TempDir dir;
    Bytes file;
    file.raw(Mp3Header(Mpeg1Layer3())).zeros(11);
    const std::string path = dir.Write("short.mp3", file.data());
    _MMClipInfo clip;
    _MM_MIMETYPE mime{};
    _MM_CODECTYPE codec{};
    AudioInfo a;
    EXPECT_EQ(MP3_GetClipInfo(path.c_str(), &clip), MM_E_FAIL);
    EXPECT_EQ(MP3_GetMIMEType(path.c_str(), &mime), MM_E_FAIL);
    EXPECT_EQ(MP3_GetCodecType(path.c_str(), &codec), MM_E_FAIL);
    LoadAudioInfo(path, &a);
    EXPECT_EQ(a.result, MM_E_FAIL);
    EXPECT_EQ(mime.pszMimeType, nullptr);
}

TEST(Mp3Stream, XingHeaderGivesDurationFromFrameCount) {
    TempDir dir;
    XingSpec xing;
    xing.frames = 3828;
    xing.bytes = 1600000;
    Bytes file;
    file.raw(XingFrame(Mpeg1Layer3(), xing)).raw(Mp3Frames(Mpeg1Layer3(), 20));
    const std::string path = dir.Write("xing.mp3", file.data());
    int32_t result = 0;
    _MMClipInfo clip = ClipOf(path, &result);
    ASSERT_EQ(result, MM_OK);
    EXPECT_EQ(clip.nDuration, 3828u * 1152 / 44100);  // 99
    EXPECT_EQ(clip.nBitrate, file.size() * 8 / 99);

    AudioInfo a;
    LoadAudioInfo(path, &a);
    ASSERT_EQ(a.result, MM_OK);
    EXPECT_EQ(a.info.headerKind, 2u);
    EXPECT_EQ(a.info.xingOffset, 36u);
    EXPECT_EQ(a.info.xingFlags, 0xFu);
    EXPECT_EQ(a.info.totalFrames, 3828u);
    EXPECT_EQ(a.info.totalBytes, 1600000u);
    EXPECT_EQ(a.info.quality, 57);
    EXPECT_EQ(a.info.duration, 99u);
    ASSERT_NE(a.info.xingToc, nullptr);
    EXPECT_EQ(a.info.xingToc[50], 128);
    EXPECT_EQ(a.info.avgBitRate, 128000u);  // with a table the sampled average stays
}

TEST(Mp3Stream, XingWithoutFramesFlag) {
    TempDir dir;
    XingSpec xing;
    xing.flags = 0x2;
    xing.bytes = 5000;
    Bytes file;
    file.raw(XingFrame(Mpeg1Layer3(), xing)).raw(Mp3Frames(Mpeg1Layer3(), 20));
    const std::string path = dir.Write("noframes.mp3", file.data());
    AudioInfo a;
    LoadAudioInfo(path, &a);
    ASSERT_EQ(a.result, MM_OK);
    EXPECT_EQ(a.info.duration, 0u);
    EXPECT_EQ(a.info.avgBitRate, 0u);  // no table: recomputed over a zero duration
    EXPECT_EQ(a.info.quality, -1);
    int32_t result = 0;
    _MMClipInfo clip = ClipOf(path, &result);
    ASSERT_EQ(result, MM_OK);
    EXPECT_EQ(clip.nDuration, (0xFFFFFFFFu * 1152u) / 44100u);
}

TEST(Mp3Stream, ZeroXingFrameCountGivesZeroRates) {
    TempDir dir;
    XingSpec xing;
    xing.flags = 0x1;
    xing.frames = 0;
    Bytes file;
    file.raw(XingFrame(Mpeg1Layer3(), xing)).raw(Mp3Frames(Mpeg1Layer3(), 20));
    int32_t result = 0;
    _MMClipInfo clip = ClipOf(dir.Write("zero.mp3", file.data()), &result);
    ASSERT_EQ(result, MM_OK);
    EXPECT_EQ(clip.nDuration, 0u);
    EXPECT_EQ(clip.nBitrate, 0u);
}

TEST(Mp3Stream, OnlyXingIsRecognisedAtTheXingPosition) {
    TempDir dir;
    XingSpec info;
    info.tag = "Info";
    info.frames = 3828;
    Bytes file;
    file.raw(XingFrame(Mpeg1Layer3(), info)).raw(Mp3Frames(Mpeg1Layer3(), 20));
    AudioInfo a;
    LoadAudioInfo(dir.Write("info.mp3", file.data()), &a);
    ASSERT_EQ(a.result, MM_OK);
    EXPECT_EQ(a.info.headerKind, 1u);
    EXPECT_EQ(a.info.xingToc, nullptr);
}

TEST(Mp3Stream, XingPositionFollowsVersionAndChannels) {
    TempDir dir;
    Mp3FrameSpec mono = Mpeg1Layer3();
    mono.channelMode = 3;
    Mp3FrameSpec lsf;
    lsf.version = 2;
    lsf.bitrateIndex = 8;  // 64 kbit/s
    Mp3FrameSpec lsfMono = lsf;
    lsfMono.channelMode = 3;
    const struct {
        Mp3FrameSpec shape;
        uint32_t offset;
    } cases[] = {{mono, 21}, {lsf, 21}, {lsfMono, 13}};
    for (const auto& c : cases) {
        XingSpec xing;
        xing.flags = 1;
        xing.frames = 100;
        Bytes file;
        file.raw(XingFrame(c.shape, xing)).raw(Mp3Frames(c.shape, 10));
        AudioInfo a;
        LoadAudioInfo(dir.Write("x.mp3", file.data()), &a);
        ASSERT_EQ(a.result, MM_OK);
        EXPECT_EQ(a.info.headerKind, 2u);
        EXPECT_EQ(a.info.xingOffset, c.offset);
    }
}

TEST(Mp3Stream, VbriFieldsAndDuration) {
    TempDir dir;
    VbriSpec vbri;
    vbri.frames = 1000;
    vbri.bytes = 400000;
    vbri.entries = 10;
    vbri.framesPerEntry = 100;
    vbri.scale = 3;
    Bytes file;
    file.raw(VbriFrame(Mpeg1Layer3(), vbri)).raw(Mp3Frames(Mpeg1Layer3(), 20));
    const std::string path = dir.Write("vbri.mp3", file.data());
    AudioInfo a;
    LoadAudioInfo(path, &a);
    ASSERT_EQ(a.result, MM_OK);
    EXPECT_EQ(a.info.headerKind, 3u);
    EXPECT_EQ(a.info.totalFrames, 1000u);
    EXPECT_EQ(a.info.totalBytes, 400000u);
    EXPECT_EQ(a.info.vbriVersion, 1u);
    EXPECT_EQ(a.info.vbriDelay, 0x0102u);
    EXPECT_EQ(a.info.vbriQuality, 75u);
    EXPECT_EQ(a.info.vbriTocEntries, 10u);
    EXPECT_EQ(a.info.quality, 3);
    EXPECT_EQ(a.info.vbriTocEntrySize, 2u);
    EXPECT_EQ(a.info.vbriFramesPerEntry, 100u);
    EXPECT_EQ(a.info.duration, 1000u * 1152 / 44100);
    int32_t result = 0;
    _MMClipInfo clip = ClipOf(path, &result);
    ASSERT_EQ(result, MM_OK);
    EXPECT_EQ(clip.nDuration, 26u);
    EXPECT_EQ(clip.nBitrate, file.size() * 8 / 26);
}

TEST(Mp3Stream, SamplesPerFrameRuleOfMpeg25IsAsymmetric) {
    TempDir dir;
    const struct {
        int version, channelMode;
        uint32_t channels, samples;
    } cases[] = {{0, 3, 1, 576}, {0, 0, 2, 288}, {2, 3, 1, 1152}, {2, 0, 2, 2304}, {3, 3, 1, 1152}};
    for (const auto& c : cases) {
        Mp3FrameSpec shape;
        shape.version = c.version;
        shape.bitrateIndex = 8;
        shape.channelMode = c.channelMode;
        int32_t result = 0;
        _MMClipInfo clip = ClipOf(dir.Write("s.mp3", Mp3Frames(shape, 12)), &result);
        ASSERT_EQ(result, MM_OK);
        EXPECT_EQ(clip.nChannels, c.channels);
        EXPECT_EQ(clip.nSamplesPerFrame, c.samples) << "version " << c.version;
    }
}

TEST(Mp3Stream, CodecAndMimeAnswers) {
    TempDir dir;
    for (int layer = 1; layer <= 3; ++layer) {
        Mp3FrameSpec shape;
        shape.layer = layer;
        shape.crc = true;  // MPEG-1 Layer I without CRC starts FF FF, never a sync candidate
        _MM_CODECTYPE codec{};
        ASSERT_EQ(MP3_GetCodecType(dir.Write("c.mp3", Mp3Frames(shape, 8)).c_str(), &codec), MM_OK);
        EXPECT_EQ(codec.nAudioCodec, 0x1000u + static_cast<uint32_t>(layer));
    }
    const std::string path = dir.Write("m.mp3", Mp3Frames(Mpeg1Layer3(), 8));
    _MM_MIMETYPE mime{};
    mime.pszMimeType = new char[4]{'o', 'l', 'd', 0};  // released by the query
    ASSERT_EQ(MP3_GetMIMEType(path.c_str(), &mime), MM_OK);
    EXPECT_STREQ(mime.pszMimeType, "audio/mp3");
    EXPECT_EQ(mime.nMimeLength, 9u);
    delete[] mime.pszMimeType;

    _MM_MIMETYPE pub{};
    ASSERT_EQ(MM_MediaExtractor_GetMIMEType(path.c_str(), &pub), MM_OK);
    EXPECT_STREQ(pub.pszMimeType, "audio/mp3");
    MM_MediaExtractor_FreeBuffer(pub.pszMimeType);

    int mask = 0;
    EXPECT_EQ(MP3_GetTrackType("/no/such/file.mp3", &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO);
    int dummy = 0;
    EXPECT_EQ(GetMediaInfo_MP3(path.c_str(), &dummy, INFO_METADATA), MM_E_FAIL);
    EXPECT_EQ(GetMediaInfo_MP3(nullptr, &dummy, INFO_CLIPINFO), MM_E_INVALIDARG);
}

TEST(Mp3Stream, PublicClipInfoReportsMilliseconds) {
    TempDir dir;
    Bytes file;
    file.raw(Mp3Frames(Mpeg1Layer3(), 3836));
    file.zeros(1600000 - file.size());
    const std::string path = dir.Write("pub.mp3", file.data());
    int type = 0;
    ASSERT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK);
    ASSERT_EQ(type, MEDIA_TYPE_MP3);
    _MMClipInfo clip;
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), type, &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 100000u);
    _MM_CODECTYPE codec;
    ASSERT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), type, &codec), MM_OK);
    EXPECT_EQ(codec.nAudioCodec, 0x1003u);
}
