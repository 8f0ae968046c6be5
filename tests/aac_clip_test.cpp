// Clip information and codec type of raw AAC files, from byte-built ADTS and
// ADIF files, the corpus and ffmpeg-made streams.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <string>
#include <vector>

#include "aac/aac_clip.h"
#include "aac/aac_frame.h"
#include "core/file_access.h"
#include "metainfo/aac.h"
#include "metainfo/metainfo.h"
#include "support/aac_builder.h"
#include "support/bytes.h"
#include "support/media.h"

using namespace testing_support;

namespace {

struct AacResult {
    int32_t clipResult;
    _MMClipInfo clip;
    int32_t codecResult;
    _MM_CODECTYPE codec;
};

// The slot functions themselves: durations stay in whole seconds.
AacResult Probe(const std::string& path) {
    AacResult r;
    std::memset(&r.clip, 0, sizeof r.clip);
    std::memset(&r.codec, 0, sizeof r.codec);
    r.clipResult = metainfo::AAC_GetClipInfo(path.c_str(), &r.clip);
    r.codecResult = metainfo::AAC_GetCodecType(path.c_str(), &r.codec);
    return r;
}

AdtsSpec Layout(int samplingIndex, int channelConfig, int profile = 1) {
    AdtsSpec s;
    s.samplingIndex = samplingIndex;
    s.channelConfig = channelConfig;
    s.profile = profile;
    return s;
}

std::vector<uint8_t> Join(std::vector<uint8_t> a, const std::vector<uint8_t>& b) {
    a.insert(a.end(), b.begin(), b.end());
    return a;
}

std::vector<uint8_t> Zeros(size_t n) { return std::vector<uint8_t>(n, 0); }

std::vector<uint8_t> TrailingTag() {
    Bytes b;
    b.str("TAG").zeros(125);
    return b.data();
}

// An ID3v2.4 tag of bodySize zero bytes with the footer flag and its footer.
std::vector<uint8_t> Id3WithFooter(size_t bodySize) {
    Bytes footer;
    footer.str("3DI").u8(4).u8(0).u8(0x10).syncsafe32(static_cast<uint32_t>(bodySize));
    return Join(Id3v2Tag(4, Zeros(bodySize), 0x10), footer.data());
}

std::string CommandOutput(const std::string& cmd) {
    std::string out;
    FILE* p = popen(cmd.c_str(), "r");
    if (p == nullptr) return out;
    char buf[256];
    while (std::fgets(buf, sizeof buf, p) != nullptr) out += buf;
    pclose(p);
    return out;
}

}  // namespace

// --- AAC+ detection ------------------------------------------------------

TEST(AacClipInfo, SbrFillElementGivesAacPlusCodeAndDoubledRate) {
    TempDir dir;
    for (int ext : {13, 14}) {
        for (int channels : {1, 2}) {
            const std::vector<uint8_t> frames = AdtsFrames(Layout(6, channels), std::vector<size_t>(8, 60), ext);
            const std::string path = dir.Write("sbr.aac", frames);
            const AacResult r = Probe(path);
            EXPECT_EQ(MM_OK, r.clipResult);
            EXPECT_EQ(0x2012u, r.codec.nAudioCodec) << ext << " " << channels;
            EXPECT_EQ(2u * 24000, r.clip.nSampleRate) << ext << " " << channels;
            EXPECT_EQ(static_cast<uint32_t>(channels), r.clip.nChannels);
        }
    }
}

TEST(AacClipInfo, PlainAdtsKeepsHeaderRateAndPlainCode) {
    TempDir dir;
    for (int channels : {1, 2}) {
        const std::string path = dir.Write("plain.aac", AdtsFrames(Layout(6, channels), std::vector<size_t>(8, 60)));
        const AacResult r = Probe(path);
        EXPECT_EQ(MM_OK, r.clipResult);
        EXPECT_EQ(MM_OK, r.codecResult);
        EXPECT_EQ(0x2011u, r.codec.nAudioCodec);
        EXPECT_EQ(24000u, r.clip.nSampleRate);
        EXPECT_EQ(0, std::strcmp("aac", r.clip.szFormat));
        EXPECT_EQ(1u, r.clip.bHasAudio);
        EXPECT_EQ(16u, r.clip.nBitsPerSample);
    }
}

// Only frames followed by a whole maximal frame's worth of data are walked
// (besides the first two), so SBR in the third frame of a short file is not seen.
TEST(AacClipInfo, LaterFramesAreWalkedOnlyFarFromTheDataEnd) {
    TempDir dir;
    const AdtsSpec layout = Layout(4, 2);
    const std::vector<uint8_t> head = AdtsFrames(layout, {200, 200});
    const std::vector<uint8_t> sbrFrame = AdtsFrames(layout, {200}, 13);
    const std::vector<uint8_t> shortFile = Join(Join(head, sbrFrame), AdtsFrames(layout, std::vector<size_t>(5, 200)));
    EXPECT_EQ(0x2011u, Probe(dir.Write("short.aac", shortFile)).codec.nAudioCodec);
    const std::vector<uint8_t> longFile = Join(Join(head, sbrFrame), AdtsFrames(layout, std::vector<size_t>(60, 200)));
    EXPECT_EQ(0x2012u, Probe(dir.Write("long.aac", longFile)).codec.nAudioCodec);
}

TEST(AacCodecType, ProfileGoesIntoSubtype) {
    TempDir dir;
    const uint32_t expected[] = {0x2101, 0x2102, 0x2103};
    for (int profile = 0; profile < 3; ++profile) {
        const std::string path = dir.Write("p.aac", AdtsFrames(Layout(4, 2, profile), std::vector<size_t>(6, 80)));
        const AacResult r = Probe(path);
        EXPECT_EQ(expected[profile], r.codec.nAudioSubType);
        EXPECT_EQ(0u, r.codec.nAudioProfile);
    }
    // Profile 3 leaves the field as it was.
    const std::string path = dir.Write("ltp.aac", AdtsFrames(Layout(4, 2, 3), std::vector<size_t>(6, 80)));
    _MM_CODECTYPE codec;
    std::memset(&codec, 0, sizeof codec);
    codec.nAudioSubType = 0x1234;
    EXPECT_EQ(MM_OK, metainfo::AAC_GetCodecType(path.c_str(), &codec));
    EXPECT_EQ(0x1234u, codec.nAudioSubType);
}

// --- ADTS headers --------------------------------------------------------

TEST(AacClipInfo, ChannelConfigurationZeroAndSeven) {
    TempDir dir;
    const std::vector<size_t> sizes(6, 80);
    EXPECT_EQ(0xFFFFFFFFu, Probe(dir.Write("c0.aac", AdtsFrames(Layout(4, 0), sizes))).clip.nChannels);
    EXPECT_EQ(8u, Probe(dir.Write("c7.aac", AdtsFrames(Layout(4, 7), sizes))).clip.nChannels);
}

TEST(AacClipInfo, FewerThanFourFramesAverageAllOfThem) {
    TempDir dir;
    const std::string path = dir.Write("three.aac", Join(AdtsFrames(Layout(4, 2), {60, 100, 140}), Zeros(200)));
    const AacResult r = Probe(path);
    ASSERT_EQ(MM_OK, r.clipResult);
    EXPECT_EQ(44100u * 100 / 128, r.clip.nBitrate);
    EXPECT_EQ(r.clip.nBitrate, r.clip.nAudioBitrate);
}

TEST(AacClipInfo, FourOrMoreFramesLeaveOutTheFirstAndTheTwoLargest) {
    TempDir dir;
    // Sorted 100 120 130 160 250 300: without the first (130) and 300, 250.
    const std::string path =
        dir.Write("six.aac", Join(AdtsFrames(Layout(4, 2), {130, 100, 120, 300, 250, 160}), Zeros(200)));
    const AacResult r = Probe(path);
    ASSERT_EQ(MM_OK, r.clipResult);
    const uint32_t average = (1060 - 130 - 300 - 250) / 3;
    EXPECT_EQ(44100u * average / 128, r.clip.nBitrate);
    EXPECT_EQ(1260u * 8 / (44100u * average / 128), r.clip.nDuration);
}

TEST(AacClipInfo, FrameLengthAbove4096EndsTheScan) {
    TempDir dir;
    const AdtsSpec layout = Layout(4, 2);
    std::vector<uint8_t> third = AdtsFrames(layout, {300});
    std::vector<uint8_t> bad = third;
    const uint32_t length = 5000;  // announced, above the 4096 limit
    bad[3] = static_cast<uint8_t>((bad[3] & 0xFC) | (length >> 11));
    bad[4] = static_cast<uint8_t>(length >> 3);
    bad[5] = static_cast<uint8_t>((length & 7) << 5 | 0x1F);
    const std::vector<uint8_t> tail = AdtsFrames(layout, std::vector<size_t>(6, 300));
    const std::vector<uint8_t> head = AdtsFrames(layout, {200, 200});
    EXPECT_EQ(44100u * 200 / 128, Probe(dir.Write("cut.aac", Join(Join(head, bad), tail))).clip.nBitrate);
    EXPECT_NE(44100u * 200 / 128, Probe(dir.Write("whole.aac", Join(Join(head, third), tail))).clip.nBitrate);
    // A first frame that long is no stream at all.
    const AacResult r = Probe(dir.Write("first.aac", Join(bad, tail)));
    EXPECT_EQ(MM_E_UNSUPPORTED, r.clipResult);
}

TEST(AacClipInfo, SecondFrameMustMatchTheFirst) {
    TempDir dir;
    const std::vector<uint8_t> first = AdtsFrames(Layout(4, 2, 1), {100});
    const std::vector<uint8_t> ssr = AdtsFrames(Layout(4, 2, 2), {100, 100});
    EXPECT_EQ(MM_E_UNSUPPORTED, Probe(dir.Write("kind.aac", Join(first, ssr))).clipResult);
    // A lone frame: the second header would lie beyond the data read.
    EXPECT_EQ(MM_E_UNSUPPORTED, Probe(dir.Write("one.aac", Join(Bytes().zeros(20).data(), first))).clipResult);
}

// 8 kHz frames of 128 bytes make 8000 bit/s: 1000 bytes of data a second.
TEST(AacClipInfo, Id3TagWithFooterIsSkippedWholeButCountsOnlyItsBody) {
    TempDir dir;
    const std::vector<uint8_t> stream = Join(AdtsFrames(Layout(11, 1), std::vector<size_t>(15, 128)), Zeros(60));
    const AacResult r = Probe(dir.Write("footer.aac", Join(Id3WithFooter(100), stream)));
    ASSERT_EQ(MM_OK, r.clipResult);
    EXPECT_EQ(8000u, r.clip.nBitrate);
    EXPECT_EQ(2100u, r.clip.nFileSize);
    // (2100 - 100) x 8 / 8000: header and footer stay in the count. Starting
    // 10 bytes early (at the footer) would give 1990 bytes, 1 second.
    EXPECT_EQ(2u, r.clip.nDuration);
}

TEST(AacClipInfo, TrailingTagBlockIsLeftOutOfTheDuration) {
    TempDir dir;
    const std::vector<uint8_t> stream = Join(AdtsFrames(Layout(11, 1), std::vector<size_t>(15, 128)), Zeros(79));
    const AacResult r = Probe(dir.Write("tag.aac", Join(stream, TrailingTag())));
    ASSERT_EQ(MM_OK, r.clipResult);
    EXPECT_EQ(1999u + 128, r.clip.nFileSize);
    EXPECT_EQ(1u, r.clip.nDuration);
}

TEST(AacClipInfo, ReservedSamplingIndexGivesZeroDurationWithoutFault) {
    TempDir dir;
    const AacResult r = Probe(dir.Write("sf13.aac", AdtsFrames(Layout(13, 2), std::vector<size_t>(6, 80))));
    EXPECT_EQ(MM_OK, r.clipResult);
    EXPECT_EQ(0u, r.clip.nSampleRate);
    EXPECT_EQ(0u, r.clip.nBitrate);
    EXPECT_EQ(0u, r.clip.nDuration);
}

TEST(AacClipInfo, ShortDataAfterTheTag) {
    TempDir dir;
    const std::vector<uint8_t> tag = Id3v2Tag(3, Zeros(10));
    EXPECT_EQ(MM_E_UNSUPPORTED, Probe(dir.Write("four.aac", Join(tag, {0xFF, 0xF1, 0x50, 0x80}))).clipResult);
    EXPECT_EQ(MM_E_FAIL, Probe(dir.Write("three.aac", Join(tag, {0xFF, 0xF1, 0x50}))).clipResult);
    EXPECT_EQ(MM_E_FAIL, Probe(dir.Write("tiny.aac", Zeros(15))).clipResult);
    EXPECT_EQ(1, Probe(dir.PathOf("missing.aac")).clipResult);
}

// --- ADIF ----------------------------------------------------------------

TEST(AacAdif, HeaderWithoutCopyrightConstantRate) {
    TempDir dir;
    AdifSpec layout;
    layout.bitrate = 96000;
    layout.bufferFullness = 0xFFFFF;
    layout.pces[0].samplingIndex = 3;
    layout.pces[0].front = {true};
    const std::vector<uint8_t> file = Join(AdifFile(layout, AacBlock(true, 0, 20)), Zeros(24000 - 60));
    const std::string path = dir.Write("cbr.aac", file);
    const AacResult r = Probe(path);
    ASSERT_EQ(MM_OK, r.clipResult);
    EXPECT_EQ(0x2001u, r.codec.nAudioCodec);
    EXPECT_EQ(0x2102u, r.codec.nAudioSubType);
    EXPECT_EQ(96000u, r.clip.nBitrate);
    EXPECT_EQ(96000u, r.clip.nAudioBitrate);
    EXPECT_EQ(48000u, r.clip.nSampleRate);
    EXPECT_EQ(2u, r.clip.nChannels);
    EXPECT_EQ(static_cast<uint32_t>(file.size()) * 8 / 96000, r.clip.nDuration);
}

TEST(AacAdif, HeaderWithCopyrightIdShiftsEveryField) {
    TempDir dir;
    for (bool variableRate : {false, true}) {
        AdifSpec layout;
        layout.copyright = true;
        layout.variableRate = variableRate;
        layout.bitrate = 64000;
        layout.pces[0].samplingIndex = 8;
        layout.pces[0].objectType = 0;
        layout.pces[0].front = {false};
        const std::string path = dir.Write("copy.aac", AdifFile(layout, AacBlock(false, 0, 20)));
        const AacResult r = Probe(path);
        ASSERT_EQ(MM_OK, r.clipResult) << variableRate;
        EXPECT_EQ(64000u, r.clip.nBitrate) << variableRate;
        EXPECT_EQ(16000u, r.clip.nSampleRate) << variableRate;
        EXPECT_EQ(1u, r.clip.nChannels) << variableRate;
        EXPECT_EQ(0x2101u, r.codec.nAudioSubType) << variableRate;
        EXPECT_EQ(0x2001u, r.codec.nAudioCodec) << variableRate;
    }
}

TEST(AacAdif, ProgramConfigElementsAreSummedAndTheLastObjectTypeKept) {
    TempDir dir;
    AdifSpec layout;
    layout.variableRate = true;
    PceSpec first;
    first.objectType = 1;
    first.samplingIndex = 4;
    first.front = {false, true};
    first.back = {true};
    first.lfe = 1;
    first.comment = "first";
    PceSpec second;
    second.objectType = 2;
    second.side = {true, false};
    layout.pces = {first, second};
    const AacResult r = Probe(dir.Write("pce.aac", AdifFile(layout, AacBlock(true, 0, 20))));
    ASSERT_EQ(MM_OK, r.clipResult);
    EXPECT_EQ(6u + 3u, r.clip.nChannels);
    EXPECT_EQ(0x2103u, r.codec.nAudioSubType);
    EXPECT_EQ(44100u, r.clip.nSampleRate);
}

TEST(AacAdif, SbrInTheFirstBlockGivesAacPlusCode) {
    TempDir dir;
    AdifSpec layout;
    layout.pces[0].samplingIndex = 6;
    layout.pces[0].front = {true};
    const AacResult r = Probe(dir.Write("sbr.aac", AdifFile(layout, AacBlock(true, 13))));
    EXPECT_EQ(0x2002u, r.codec.nAudioCodec);
    EXPECT_EQ(48000u, r.clip.nSampleRate);
}

TEST(AacAdif, ZeroBitrateGivesZeroDuration) {
    TempDir dir;
    AdifSpec layout;
    layout.bitrate = 0;
    const std::string path = dir.Write("zero.aac", Join(AdifFile(layout, AacBlock(false)), Zeros(3000)));
    const AacResult r = Probe(path);
    EXPECT_EQ(MM_OK, r.clipResult);
    EXPECT_EQ(0u, r.clip.nDuration);
    _MMClipInfo clip;
    EXPECT_EQ(MM_OK, MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_AAC, &clip));
    EXPECT_EQ(1000u, clip.nDuration);
}

TEST(AacAdif, RecognisedOnlyAtTheStartOfTheData) {
    TempDir dir;
    AdifSpec layout;
    const std::vector<uint8_t> adif = AdifFile(layout, AacBlock(false, 0, 20));
    const std::string tagged = dir.Write("tagged.aac", Join(Id3v2Tag(3, Zeros(30)), adif));
    EXPECT_EQ(0x2001u, Probe(tagged).codec.nAudioCodec);
    const std::string late = dir.Write("late.aac", Join(Zeros(40), adif));
    EXPECT_EQ(MM_E_UNSUPPORTED, Probe(late).clipResult);
    int type = 0;
    ASSERT_EQ(MM_OK, MM_MediaExtractor_DetectMediaType(late.c_str(), &type));
    EXPECT_EQ(MEDIA_TYPE_AAC, type);
}

TEST(AacAdif, TruncatedHeadersAnswerWithoutFault) {
    TempDir dir;
    AdifSpec layout;
    layout.copyright = true;
    layout.pces[0].front = {true, true, true};
    layout.pces[0].comment = std::string(200, 'c');
    const std::vector<uint8_t> full = AdifFile(layout, AacBlock(true, 13, 30));
    const std::vector<uint8_t> tag = Id3v2Tag(3, Zeros(20));
    for (size_t cut = 5; cut < full.size(); cut += 3) {
        const std::vector<uint8_t> part(full.begin(), full.begin() + static_cast<long>(cut));
        const AacResult r = Probe(dir.Write("t.aac", Join(tag, part)));
        EXPECT_EQ(MM_OK, r.clipResult) << cut;
    }
}

// --- Interface and real files --------------------------------------------

TEST(AacInterface, SlotsAnswerThroughThePublicQueries) {
    TempDir dir;
    const std::string path = dir.Write("x.aac", AdtsFrames(Layout(4, 2), std::vector<size_t>(10, 100)));
    int type = 0;
    ASSERT_EQ(MM_OK, MM_MediaExtractor_DetectMediaType(path.c_str(), &type));
    ASSERT_EQ(MEDIA_TYPE_AAC, type);
    int mask = 0;
    EXPECT_EQ(MM_OK, MM_MediaExtractor_GetTrackType(path.c_str(), type, &mask));
    EXPECT_EQ(TRACK_AUDIO, mask);
    _MM_CODECTYPE codec;
    EXPECT_EQ(MM_OK, MM_MediaExtractor_GetCodecType(path.c_str(), type, &codec));
    EXPECT_EQ(0x2011u, codec.nAudioCodec);
    _MMClipInfo clip;
    EXPECT_EQ(MM_OK, MM_MediaExtractor_GetClipInfo(path.c_str(), type, &clip));
    EXPECT_EQ(1000u, clip.nDuration);
    EXPECT_EQ(1000u, clip.nFileSize);
    EXPECT_EQ(0, metainfo::Check_AAC_CodecType(path.c_str(), nullptr, nullptr, nullptr, nullptr));
}

TEST(AacCorpus, KnownFilesGiveTheirStreamValues) {
    const std::string dir = CorpusDir();
    if (dir.empty()) GTEST_SKIP() << "no corpus";
    AacResult r = Probe(dir + "/mutagen/adif.aac");
    EXPECT_EQ(MM_OK, r.clipResult);
    EXPECT_EQ(0x2001u, r.codec.nAudioCodec);
    EXPECT_EQ(128000u, r.clip.nBitrate);
    EXPECT_EQ(48000u, r.clip.nSampleRate);
    EXPECT_EQ(2u, r.clip.nChannels);
    r = Probe(dir + "/mutagen/empty.aac");
    EXPECT_EQ(MM_OK, r.clipResult);
    EXPECT_EQ(0x2011u, r.codec.nAudioCodec);
    EXPECT_EQ(0x2102u, r.codec.nAudioSubType);
    EXPECT_EQ(44100u, r.clip.nSampleRate);
    EXPECT_EQ(2u, r.clip.nChannels);
    r = Probe(dir + "/taglib/empty1s.aac");
    EXPECT_EQ(MM_OK, r.clipResult);
    EXPECT_EQ(0x2011u, r.codec.nAudioCodec);
    EXPECT_EQ(11025u, r.clip.nSampleRate);
    EXPECT_EQ(1u, r.clip.nChannels);
}

// Every corpus file, AAC or not and hostile ones included, is answered by the
// AAC readers without a fault or a leaked handle.
TEST(AacCorpus, EveryFileIsAnsweredWithoutFault) {
    const std::string dir = CorpusDir();
    if (dir.empty()) GTEST_SKIP() << "no corpus";
    for (const char* sub : {"/mutagen", "/taglib"}) {
        DIR* d = opendir((dir + sub).c_str());
        ASSERT_NE(nullptr, d);
        while (dirent* e = readdir(d)) {
            if (e->d_name[0] == '.') continue;
            const std::string path = dir + sub + "/" + e->d_name;
            Probe(path);
            unsigned char* data = nullptr;
            int length = 0;
            if (AAC_GetAuidoData_Buf(path.c_str(), 0, 1, &data, &length) == MM_OK) MM_MediaExtractor_FreeBuffer(data);
        }
        closedir(d);
    }
}

// ffmpeg-made ADTS files: rate and channels as ffprobe reads them, a plausible
// bit rate and duration.
TEST(AacFfmpeg, ClipInfoAgreesWithFfprobe) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg not installed";
    TempDir dir;
    struct Case {
        int rate;
        int channels;
        int kbps;
    };
    for (const Case& c : {Case{8000, 1, 16}, Case{16000, 2, 48}, Case{22050, 1, 32}, Case{32000, 2, 96},
                          Case{44100, 2, 128}, Case{48000, 1, 64}}) {
        const std::string out = dir.PathOf("f" + std::to_string(c.rate) + ".aac");
        const std::string cmd = "/usr/bin/ffmpeg -hide_banner -loglevel error -y -f lavfi -i "
                                "\"anoisesrc=d=6:c=pink:a=0.3:seed=7:r=" + std::to_string(c.rate) + "\" -ac " +
                                std::to_string(c.channels) + " -b:a " + std::to_string(c.kbps) + "k -c:a aac \"" +
                                out + "\"";
        ASSERT_EQ(0, std::system(cmd.c_str())) << cmd;
        const std::string probed = CommandOutput("/usr/bin/ffprobe -v error -select_streams a:0 -show_entries "
                                       "stream=sample_rate,channels -of csv=p=0 \"" + out + "\"");
        const AacResult r = Probe(out);
        ASSERT_EQ(MM_OK, r.clipResult) << out;
        EXPECT_EQ(std::to_string(r.clip.nSampleRate) + "," + std::to_string(r.clip.nChannels) + "\n", probed);
        EXPECT_EQ(0x2011u, r.codec.nAudioCodec);
        EXPECT_EQ(0x2102u, r.codec.nAudioSubType);
        EXPECT_GT(r.clip.nBitrate, static_cast<uint32_t>(c.kbps) * 1000 / 2) << out;
        EXPECT_LT(r.clip.nBitrate, static_cast<uint32_t>(c.kbps) * 1000 * 2) << out;
        EXPECT_GE(r.clip.nDuration, 3u) << out;
        EXPECT_LE(r.clip.nDuration, 12u) << out;
    }
}
