// Clip information and codec type of raw AAC files, from byte-built ADTS and
// ADIF files, the corpus and ffmpeg-made streams.
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <string>
#include <vector>

#include "aac/aac_clip.h"
#include "metainfo/aac.h"
#include "metainfo/metainfo.h"
#include "support/aac_builder.h"
#include "support/bytes.h"
#include "support/media.h"

using namespace testing_support;

namespace {

struct AacResult { int32_t clipResult, codecResult; _MMClipInfo clip; _MM_CODECTYPE codec; };

// The slot functions themselves: durations stay in whole seconds.
AacResult Probe(const std::string& path) {
    AacResult r;
    std::memset(&r.clip, 0, sizeof r.clip);
    std::memset(&r.codec, 0, sizeof r.codec);
    r.codec.nAudioSubType = 0x1234;  // profile 3 leaves it
    r.clipResult = metainfo::AAC_GetClipInfo(path.c_str(), &r.clip);
    r.codecResult = metainfo::AAC_GetCodecType(path.c_str(), &r.codec);
    return r;
}

std::vector<uint8_t> Zeros(size_t n) { return std::vector<uint8_t>(n, 0); }

}  // namespace

// --- ADTS ----------------------------------------------------------------

// An SBR fill element (extension 13 or 14) gives the AAC+ code and doubles the
// rate; the profile goes into the subtype; a reserved sampling index gives
// rate, bitrate and duration 0 without a fault.
TEST(AacClipInfo, HeaderFieldsAndSbrGiveCodeRateAndChannels) {
    TempDir dir;
    struct Case { int samplingIndex, channelConfig, profile, extension; uint32_t code, subtype, rate, channels; };
    for (const Case& c : {Case{6, 1, 1, 0, 0x2011, 0x2102, 24000, 1}, Case{6, 2, 0, 13, 0x2012, 0x2101, 48000, 2},
                          Case{6, 1, 2, 14, 0x2012, 0x2103, 48000, 1}, Case{4, 0, 3, 0, 0x2011, 0x1234, 44100, 0xFFFFFFFF},
                          Case{4, 7, 1, 0, 0x2011, 0x2102, 44100, 8}, Case{13, 2, 1, 0, 0x2011, 0x2102, 0, 2}}) {
        const auto layout = AdtsLayout(c.samplingIndex, c.channelConfig, c.profile);
        const AacResult r = Probe(dir.Write("a.aac", AdtsFrames(layout, std::vector<size_t>(8, 60), c.extension)));
        ASSERT_EQ(MM_OK, r.clipResult);
        EXPECT_EQ(MM_OK, r.codecResult);
        EXPECT_EQ(c.code, r.codec.nAudioCodec) << c.extension;
        EXPECT_EQ(c.subtype, r.codec.nAudioSubType) << c.profile;
        EXPECT_EQ(0u, r.codec.nAudioProfile);
        EXPECT_EQ(c.rate, r.clip.nSampleRate) << c.samplingIndex << " " << c.extension;
        EXPECT_EQ(c.channels, r.clip.nChannels) << c.channelConfig;
        EXPECT_STREQ("aac", r.clip.szFormat);
        EXPECT_EQ(1u, r.clip.bHasAudio);
        EXPECT_EQ(16u, r.clip.nBitsPerSample);
        if (c.rate == 0) { EXPECT_EQ(0u, r.clip.nBitrate + r.clip.nDuration); }
    }
}

// Only frames followed by a whole maximal frame's worth of data are walked
// (besides the first two), so SBR in the third frame of a short file is not seen.
TEST(AacClipInfo, LaterFramesAreWalkedOnlyFarFromTheDataEnd) {
    TempDir dir;
    const auto layout = AdtsLayout(4, 2);
    const std::vector<uint8_t> head = Join(AdtsFrames(layout, {200, 200}), AdtsFrames(layout, {200}, 13));
    const auto tail = [&](size_t n) { return AdtsFrames(layout, std::vector<size_t>(n, 200)); };
    EXPECT_EQ(0x2011u, Probe(dir.Write("short.aac", Join(head, tail(5)))).codec.nAudioCodec);
    EXPECT_EQ(0x2012u, Probe(dir.Write("long.aac", Join(head, tail(60)))).codec.nAudioCodec);
}

TEST(AacClipInfo, AverageLeavesOutTheFirstAndTheTwoLargestFromFourFramesOn) {
    TempDir dir;
    AacResult r = Probe(dir.Write("three.aac", Join(AdtsFrames(AdtsLayout(4, 2), {60, 100, 140}), Zeros(200))));
    ASSERT_EQ(MM_OK, r.clipResult);
    EXPECT_EQ(44100u * 100 / 128, r.clip.nBitrate);
    EXPECT_EQ(r.clip.nBitrate, r.clip.nAudioBitrate);
    // Sorted 100 120 130 160 250 300: without the first (130), 300 and 250.
    r = Probe(dir.Write("six.aac", Join(AdtsFrames(AdtsLayout(4, 2), {130, 100, 120, 300, 250, 160}), Zeros(200))));
    ASSERT_EQ(MM_OK, r.clipResult);
    const uint32_t bitrate = 44100u * ((1060 - 130 - 300 - 250) / 3) / 128;
    EXPECT_EQ(bitrate, r.clip.nBitrate);
    EXPECT_EQ(1260u * 8 / bitrate, r.clip.nDuration);
}

TEST(AacClipInfo, FrameLengthAbove4096EndsTheScan) {
    TempDir dir;
    const auto layout = AdtsLayout(4, 2);
    const std::vector<uint8_t> third = AdtsFrames(layout, {300});
    std::vector<uint8_t> bad = third;
    const uint32_t length = 5000;
    bad[3] = static_cast<uint8_t>((bad[3] & 0xFC) | (length >> 11));
    bad[4] = static_cast<uint8_t>(length >> 3);
    bad[5] = static_cast<uint8_t>((length & 7) << 5 | 0x1F);
    const std::vector<uint8_t> head = AdtsFrames(layout, {200, 200});
    const std::vector<uint8_t> tail = AdtsFrames(layout, std::vector<size_t>(6, 300));
    EXPECT_EQ(44100u * 200 / 128, Probe(dir.Write("cut.aac", Join(Join(head, bad), tail))).clip.nBitrate);
    EXPECT_NE(44100u * 200 / 128, Probe(dir.Write("whole.aac", Join(Join(head, third), tail))).clip.nBitrate);
    // A first frame that long is no stream at all.
    EXPECT_EQ(MM_E_UNSUPPORTED, Probe(dir.Write("first.aac", Join(bad, tail))).clipResult);
}

TEST(AacClipInfo, SecondFrameMustMatchTheFirst) {
    TempDir dir;
    const std::vector<uint8_t> first = AdtsFrames(AdtsLayout(4, 2, 1), {100});
    const std::vector<uint8_t> ssr = AdtsFrames(AdtsLayout(4, 2, 2), {100, 100});
    EXPECT_EQ(MM_E_UNSUPPORTED, Probe(dir.Write("kind.aac", Join(first, ssr))).clipResult);
    // A lone frame: the second header would lie beyond the data read.
    EXPECT_EQ(MM_E_UNSUPPORTED, Probe(dir.Write("one.aac", Join(Zeros(20), first))).clipResult);
}

// 8 kHz frames of 128 bytes make 8000 bit/s: 1000 bytes of data a second.
// An ID3v2 tag with a footer is skipped whole (20 bytes past its size) but
// only its body leaves the count; a trailing 128-byte tag leaves it too.
TEST(AacClipInfo, TagsAreSkippedAndLeftOutOfTheDuration) {
    TempDir dir;
    const std::vector<uint8_t> frames = AdtsFrames(AdtsLayout(11, 1), std::vector<size_t>(15, 128));
    Bytes footer;
    footer.str("3DI").u8(4).u8(0).u8(0x10).syncsafe32(100);
    const std::vector<uint8_t> tag = Join(Id3v2Tag(4, Zeros(100), 0x10), footer.data());
    AacResult r = Probe(dir.Write("footer.aac", Join(Join(tag, frames), Zeros(60))));
    ASSERT_EQ(MM_OK, r.clipResult);
    EXPECT_EQ(8000u, r.clip.nBitrate);
    EXPECT_EQ(2100u, r.clip.nFileSize);
    // (2100 - 100) x 8 / 8000; starting at the footer would give 1990 bytes, 1 second.
    EXPECT_EQ(2u, r.clip.nDuration);
    r = Probe(dir.Write("tag.aac", Join(Join(frames, Zeros(79)), Bytes().str("TAG").zeros(125).data())));
    ASSERT_EQ(MM_OK, r.clipResult);
    EXPECT_EQ(1999u + 128, r.clip.nFileSize);
    EXPECT_EQ(1u, r.clip.nDuration);
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

// The copyright id shifts every later field by 9 bytes; a zero bitrate gives
// duration 0; SBR in the first block gives the AAC+ code and doubles the rate.
TEST(AacAdif, HeaderFieldsAndTheFirstBlock) {
    TempDir dir;
    struct Case {
        bool copyright, variableRate;
        int samplingIndex;
        uint32_t bitrate;
        int extension;
        uint32_t code, rate;
    };
    for (const Case& c : {Case{false, false, 3, 96000, 0, 0x2001, 48000}, Case{true, false, 8, 64000, 0, 0x2001, 16000},
                          Case{true, true, 8, 64000, 0, 0x2001, 16000}, Case{false, false, 3, 0, 0, 0x2001, 48000},
                          Case{false, true, 6, 64000, 13, 0x2002, 48000}}) {
        AdifLayout layout;
        layout.copyright = c.copyright;
        layout.variableRate = c.variableRate;
        layout.bitrate = c.bitrate;
        layout.bufferFullness = 0xFFFFF;
        layout.pces[0].samplingIndex = c.samplingIndex;
        layout.pces[0].front = {true};
        const std::vector<uint8_t> file = Join(AdifFile(layout, AacBlock(true, c.extension, 20)), Zeros(24000));
        const AacResult r = Probe(dir.Write("adif.aac", file));
        ASSERT_EQ(MM_OK, r.clipResult) << c.copyright << c.variableRate;
        EXPECT_EQ(c.code, r.codec.nAudioCodec);
        EXPECT_EQ(0x2102u, r.codec.nAudioSubType);
        EXPECT_EQ(c.bitrate, r.clip.nBitrate);
        EXPECT_EQ(c.bitrate, r.clip.nAudioBitrate);
        EXPECT_EQ(c.rate, r.clip.nSampleRate);
        EXPECT_EQ(2u, r.clip.nChannels);
        EXPECT_EQ(c.bitrate == 0 ? 0 : static_cast<uint32_t>(file.size()) * 8 / c.bitrate, r.clip.nDuration);
    }
}

// Pairs count twice; a misread field of the first element would garble the second.
TEST(AacAdif, ProgramConfigElementsAreSummedAndTheLastObjectTypeKept) {
    TempDir dir;
    AdifLayout layout;
    layout.variableRate = true;
    PceLayout first;
    first.front = {false, true};
    first.back = {true};
    first.lfe = 1;
    first.assocData = 1;
    first.validCc = 2;
    first.monoMixdown = true;
    first.comment = "first";
    PceLayout second;
    second.objectType = 2;
    second.side = {true, false};
    layout.pces = {first, second};
    const AacResult r = Probe(dir.Write("pce.aac", AdifFile(layout, AacBlock(true, 0, 20))));
    ASSERT_EQ(MM_OK, r.clipResult);
    EXPECT_EQ(6u + 3u, r.clip.nChannels);
    EXPECT_EQ(0x2103u, r.codec.nAudioSubType);
    EXPECT_EQ(44100u, r.clip.nSampleRate);
}

TEST(AacAdif, RecognisedOnlyAtTheStartOfTheData) {
    TempDir dir;
    const std::vector<uint8_t> adif = AdifFile(AdifLayout{}, AacBlock(false, 0, 20));
    EXPECT_EQ(0x2001u, Probe(dir.Write("tagged.aac", Join(Id3v2Tag(3, Zeros(30)), adif))).codec.nAudioCodec);
    const std::string late = dir.Write("late.aac", Join(Zeros(40), adif));
    EXPECT_EQ(MM_E_UNSUPPORTED, Probe(late).clipResult);
    int type = 0;
    ASSERT_EQ(MM_OK, MM_MediaExtractor_DetectMediaType(late.c_str(), &type));
    EXPECT_EQ(MEDIA_TYPE_AAC, type);
}

TEST(AacAdif, TruncatedHeadersAnswerWithoutFault) {
    TempDir dir;
    AdifLayout layout;
    layout.copyright = true;
    layout.pces[0].front = {true, true, true};
    layout.pces[0].comment = std::string(200, 'c');
    const std::vector<uint8_t> full = AdifFile(layout, AacBlock(true, 13, 30));
    const std::vector<uint8_t> tag = Id3v2Tag(3, Zeros(20));
    for (size_t cut = 5; cut < full.size(); cut += 3) {
        const std::vector<uint8_t> part(full.begin(), full.begin() + static_cast<long>(cut));
        EXPECT_EQ(MM_OK, Probe(dir.Write("t.aac", Join(tag, part))).clipResult) << cut;
    }
}

// --- Interface and real files --------------------------------------------

TEST(AacInterface, SlotsAnswerThroughThePublicQueries) {
    TempDir dir;
    const std::string path = dir.Write("x.aac", AdtsFrames(AdtsLayout(4, 2), std::vector<size_t>(10, 100)));
    int mask = 0;
    EXPECT_EQ(MM_OK, MM_MediaExtractor_GetTrackType(path.c_str(), MEDIA_TYPE_AAC, &mask));
    EXPECT_EQ(TRACK_AUDIO, mask);
    _MMClipInfo clip;
    EXPECT_EQ(MM_OK, MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_AAC, &clip));
    EXPECT_EQ(1000u, clip.nDuration);
    EXPECT_EQ(1000u, clip.nFileSize);
    EXPECT_EQ(0, metainfo::Check_AAC_CodecType(path.c_str(), nullptr, nullptr, nullptr, nullptr));
}

TEST(AacCorpus, KnownFilesGiveTheirStreamValues) {
    const std::string dir = CorpusDir();
    if (dir.empty()) GTEST_SKIP() << "no corpus";
    struct Case { const char* name; uint32_t code, bitrate, rate, channels; };
    for (const Case& c : {Case{"/mutagen/adif.aac", 0x2001, 128000, 48000, 2},
                          Case{"/mutagen/empty.aac", 0x2011, 0, 44100, 2},
                          Case{"/taglib/empty1s.aac", 0x2011, 0, 11025, 1}}) {
        const AacResult r = Probe(dir + c.name);
        EXPECT_EQ(MM_OK, r.clipResult) << c.name;
        EXPECT_EQ(c.code, r.codec.nAudioCodec) << c.name;
        if (c.bitrate != 0) { EXPECT_EQ(c.bitrate, r.clip.nBitrate) << c.name; }
        EXPECT_EQ(c.rate, r.clip.nSampleRate) << c.name;
        EXPECT_EQ(c.channels, r.clip.nChannels) << c.name;
    }
}

// Every corpus file, AAC or not and hostile ones included, is answered by the
// AAC readers without a fault or a leaked handle.
TEST(AacCorpus, EveryFileIsAnsweredWithoutFault) {
    const std::string dir = CorpusDir();
    if (dir.empty()) GTEST_SKIP() << "no corpus";
    const int before = OpenDescriptors();
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
    EXPECT_EQ(before, OpenDescriptors());
}

// ffmpeg-made ADTS files: the rate and channels they were made with, a
// plausible bit rate and duration.
TEST(AacFfmpeg, ClipInfoMatchesTheEncodedStream) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg not installed";
    TempDir dir;
    struct Case { uint32_t rate, channels, kbps; };
    for (const Case& c : {Case{8000, 1, 16}, Case{22050, 1, 32}, Case{44100, 2, 128}}) {
        const std::string out = dir.PathOf("f" + std::to_string(c.rate) + ".aac");
        const std::string cmd = "/usr/bin/ffmpeg -hide_banner -loglevel error -y -f lavfi -i "
                                "\"anoisesrc=d=6:c=pink:a=0.3:seed=7:r=" + std::to_string(c.rate) + "\" -ac " +
                                std::to_string(c.channels) + " -b:a " + std::to_string(c.kbps) + "k -c:a aac \"" +
                                out + "\"";
        ASSERT_EQ(0, std::system(cmd.c_str())) << cmd;
        const AacResult r = Probe(out);
        ASSERT_EQ(MM_OK, r.clipResult) << out;
        EXPECT_EQ(c.rate, r.clip.nSampleRate) << out;
        EXPECT_EQ(c.channels, r.clip.nChannels) << out;
        EXPECT_EQ(0x2011u, r.codec.nAudioCodec);
        EXPECT_EQ(0x2102u, r.codec.nAudioSubType);
        EXPECT_GT(r.clip.nBitrate, c.kbps * 1000 / 2) << out;
        EXPECT_LT(r.clip.nBitrate, c.kbps * 1000 * 2) << out;
        EXPECT_GE(r.clip.nDuration, 3u) << out;
        EXPECT_LE(r.clip.nDuration, 12u) << out;
    }
}
