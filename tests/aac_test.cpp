// Raw AAC files: the ADTS and ADIF checks, clip information and codec type from
// byte-built files, the corpus and ffmpeg-made streams.
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

#include "aac/aac_bits.h"
#include "aac/aac_clip.h"
#include "aac/aac_frame.h"
#include "core/file_access.h"
#include "metainfo/aac.h"
#include "metainfo/metainfo.h"
#include "support/aac_builder.h"
#include "support/bytes.h"
#include "support/media.h"
#include "support/summary.h"

using namespace testing_support;
using namespace metainfo;

namespace {

using Data = std::vector<uint8_t>;

Data Cat(std::initializer_list<Data> parts) {
    Data out;
    for (const Data& p : parts) out.insert(out.end(), p.begin(), p.end());
    return out;
}
Data Zeros(size_t n) { return Data(n, 0); }
Data Frames(size_t n, size_t size, int samplingIndex = 4, int channels = 2, int profile = 1, int sbr = 0) {
    return AdtsFrames(AdtsLayout(samplingIndex, channels, profile), std::vector<size_t>(n, size), sbr);
}

// n frames of the smallest kind: header and a silent block, 11 bytes.
Data Silent(int n, const AdtsFields& shape = {}) {
    Data out;
    for (int i = 0; i < n; ++i) out = Cat({out, AdtsFrame(shape, SilentAacBlock())});
    return out;
}

// The slot functions themselves (durations stay in whole seconds): clip and codec records
// on one line; a profile of 3 leaves the subtype as it was (0x1234).
std::string Probe(const std::string& path) {
    _MMClipInfo clip;
    _MM_CODECTYPE codec;
    std::memset(&clip, 0, sizeof clip);
    std::memset(&codec, 0, sizeof codec);
    codec.nAudioSubType = 0x1234;
    const int32_t clipResult = AAC_GetClipInfo(path.c_str(), &clip);
    const int32_t codecResult = AAC_GetCodecType(path.c_str(), &codec);
    if (clipResult != MM_OK) return std::to_string(clipResult);
    return ClipSummary(clip) + (codecResult == MM_OK ? " " + CodecSummary(codec) : " codec " + std::to_string(codecResult));
}

int32_t Verify(const std::string& path) {
    const int h = MEx_fopen(path.c_str(), "rb");
    uint8_t probe[128] = {0};
    MEx_fread(probe, 1, sizeof probe, h);
    const int32_t result = VerifyAAC(h, probe);
    MEx_fclose(h);
    return result;
}

AdifLayout Adif(bool copyright, bool variableRate, int samplingIndex, uint32_t bitrate) {
    AdifLayout layout;
    layout.copyright = copyright;
    layout.variableRate = variableRate;
    layout.bitrate = bitrate;
    layout.bufferFullness = 0xFFFFF;
    layout.pces[0].samplingIndex = samplingIndex;
    layout.pces[0].front = {true};
    return layout;
}

}  // namespace

TEST(AacBits, GetBitsAndAdtsFrameSizes) {
    const uint8_t buf[] = {0xA5, 0x3C};  // 1010 0101 0011 1100
    int count = 8, pos = 0;
    EXPECT_EQ(GetBits(buf, 3, &count, &pos), 0x5u);
    EXPECT_EQ(count, 5);
    EXPECT_EQ(GetBits(buf, 5, &count, &pos), 0x05u);
    EXPECT_EQ(std::make_pair(pos, count), std::make_pair(1, 8)) << "a read that ends a byte moves to the next";
    count = 2;
    pos = 0;
    EXPECT_EQ(GetBits(buf, 6, &count, &pos), 0x13u) << "low 2 bits of A5, top 4 of 3C";
    EXPECT_EQ(std::make_pair(pos, count), std::make_pair(1, 4));

    uint32_t kind = 0;
    EXPECT_EQ(AACGetFrameSize(nullptr, &kind), 0xFFFFFFFFu);
    const uint8_t noSync[] = {0xFF, 0xE1, 0, 0, 0, 0};
    EXPECT_EQ(AACGetFrameSize(noSync, &kind), static_cast<uint32_t>(MM_E_FAIL));
    AdtsFields shape;
    shape.profile = 2;
    shape.mpegId = 1;
    EXPECT_EQ(AACGetFrameSize(AdtsFrame(shape, Data(100)).data(), &kind), 107u);
    EXPECT_EQ(kind, (2u << 1) | 0x08u);
    EXPECT_EQ(AACGetFrameSize(AdtsFrame({}, Data(4090)).data(), &kind), 0xFFFFFFFFu) << "above 4096 bytes";
}

// The check needs two matching ADTS headers within the first bytes after the
// tag, or an ADIF signature; clip information follows it.
TEST(AacClip, ChecksClipAndCodecOfEachFileShape) {
    AdtsFields main, mpeg2;
    main.profile = 0;
    mpeg2.mpegId = 1;
    const Data one = Frames(1, 100);
    Data tooLong = Frames(1, 300);  // a frame length of 5000 ends the scan
    const uint32_t length = 5000;
    tooLong[3] = static_cast<uint8_t>((tooLong[3] & 0xFC) | (length >> 11));
    tooLong[4] = static_cast<uint8_t>(length >> 3);
    tooLong[5] = static_cast<uint8_t>((length & 7) << 5 | 0x1F);
    const Data sbrThird = Cat({Frames(2, 200), Frames(1, 200, 4, 2, 1, 13)});
    // An ID3v2 tag with a footer is skipped whole (20 bytes past its size) but only
    // its body leaves the count; a trailing 128-byte tag leaves it too.
    const Data footerTag = Cat({Id3v2Tag(4, Zeros(100), 0x10), Bytes().str("3DI").u8(4).u8(0).u8(0x10).syncsafe32(100).data()});
    const Data speech = Frames(15, 128, 11, 1);  // 8 kHz frames of 128 bytes: 8000 bit/s
    AdifLayout pces;  // pairs count twice; a misread field of the first element would garble the second
    pces.variableRate = true;
    pces.pces.resize(2);
    pces.pces[0].front = {false, true};
    pces.pces[0].back = {true};
    pces.pces[0].lfe = 1;
    pces.pces[0].assocData = 1;
    pces.pces[0].validCc = 2;
    pces.pces[0].monoMixdown = true;
    pces.pces[0].comment = "first";
    pces.pces[1].objectType = 2;
    pces.pces[1].side = {true, false};
    const Data adif = AdifFile(AdifLayout{}, AacBlock(false, 0, 20));
    const struct { const char* name; Data file; int32_t check; const char* clip; } cases[] = {
        // An SBR fill element (extension 13 or 14) gives the AAC+ code and doubles the rate;
        // the profile goes into the subtype; a reserved sampling index gives rate, bit rate
        // and duration 0.
        {"24 kHz mono", Frames(8, 60, 6, 1), MM_OK,
         "aac size=480 bps=11250 audio=1 abps=11250 hz=24000 ch=1 bits=16 a=2011/0/2102 v=0/0/0"},
        {"sbr 13", Frames(8, 60, 6, 2, 0, 13), MM_OK,
         "aac size=480 bps=11250 audio=1 abps=11250 hz=48000 ch=2 bits=16 a=2012/0/2101 v=0/0/0"},
        {"sbr 14", Frames(8, 60, 6, 1, 2, 14), MM_OK,
         "aac size=480 bps=11250 audio=1 abps=11250 hz=48000 ch=1 bits=16 a=2012/0/2103 v=0/0/0"},
        {"profile 3, no channel configuration", Frames(8, 60, 4, 0, 3), MM_OK,
         "aac size=480 bps=20671 audio=1 abps=20671 hz=44100 ch=4294967295 bits=16 a=2011/0/1234 v=0/0/0"},
        {"channel configuration 7", Frames(8, 60, 4, 7), MM_OK,
         "aac size=480 bps=20671 audio=1 abps=20671 hz=44100 ch=8 bits=16 a=2011/0/2102 v=0/0/0"},
        {"sampling index 13", Frames(8, 60, 13), MM_OK, "aac size=480 audio=1 ch=2 bits=16 a=2011/0/2102 v=0/0/0"},
        // Only frames followed by a whole maximal frame's worth of data are walked (besides
        // the first two), so SBR in the third frame of a short file is not seen.
        {"sbr in a short file", Cat({sbrThird, Frames(5, 200)}), MM_OK,
         "aac size=1600 bps=68906 audio=1 abps=68906 hz=44100 ch=2 bits=16 a=2011/0/2102 v=0/0/0"},
        {"sbr in a long file", Cat({sbrThird, Frames(60, 200)}), MM_OK,
         "aac size=12600 dur=1 bps=68906 audio=1 abps=68906 hz=88200 ch=2 bits=16 a=2012/0/2102 v=0/0/0"},
        // From four frames on, the average leaves out the first and the two largest:
        // of 130 100 120 300 250 160 it keeps 100 120 160.
        {"three frames", Cat({AdtsFrames(AdtsLayout(4, 2), {60, 100, 140}), Zeros(200)}), MM_OK,
         "aac size=500 bps=34453 audio=1 abps=34453 hz=44100 ch=2 bits=16 a=2011/0/2102 v=0/0/0"},
        {"six frames", Cat({AdtsFrames(AdtsLayout(4, 2), {130, 100, 120, 300, 250, 160}), Zeros(200)}), MM_OK,
         "aac size=1260 bps=43410 audio=1 abps=43410 hz=44100 ch=2 bits=16 a=2011/0/2102 v=0/0/0"},
        {"too long a third frame", Cat({Frames(2, 200), tooLong, Frames(6, 300)}), MM_OK,
         "aac size=2500 bps=68906 audio=1 abps=68906 hz=44100 ch=2 bits=16 a=2011/0/2102 v=0/0/0"},
        {"whole third frame", Cat({Frames(2, 200), Frames(7, 300)}), MM_OK,
         "aac size=2500 bps=97502 audio=1 abps=97502 hz=44100 ch=2 bits=16 a=2011/0/2102 v=0/0/0"},
        {"too long a first frame", Cat({tooLong, Frames(6, 300)}), MM_E_UNSUPPORTED, "-2147024665"},
        // The second frame must match the first; a lone frame's second header lies beyond the data.
        {"ssr after lc", Cat({one, Frames(2, 100, 4, 2, 2)}), MM_E_UNSUPPORTED, "-2147024665"},
        {"main after lc", Cat({Silent(1), Silent(2, main)}), MM_E_UNSUPPORTED, "-2147024665"},
        {"mpeg-2 after mpeg-4", Cat({Silent(1), Silent(2, mpeg2)}), MM_E_UNSUPPORTED, "-2147024665"},
        {"lone frame", Cat({Zeros(20), one}), MM_E_UNSUPPORTED, "-2147024665"},
        {"one frame", Silent(1), MM_E_UNSUPPORTED, "-2147467259"},
        // Only the first 4096 bytes after the tag (and its footer) are scanned.
        {"three frames of 11 bytes", Silent(3), MM_OK,
         "aac size=33 bps=3789 audio=1 abps=3789 hz=44100 ch=2 bits=16 a=2011/0/2102 v=0/0/0"},
        {"50 bytes before", Cat({Zeros(50), Silent(3)}), MM_OK,
         "aac size=83 bps=3789 audio=1 abps=3789 hz=44100 ch=2 bits=16 a=2011/0/2102 v=0/0/0"},
        {"4089 bytes before", Cat({Zeros(4089), Silent(3)}), MM_E_UNSUPPORTED,
         "aac size=4122 bps=3789 audio=1 abps=3789 hz=44100 ch=2 bits=16 a=2011/0/2102 v=0/0/0"},
        {"4000-byte tag", Cat({Id3v2Tag(4, Zeros(4000), 0x10), Zeros(10), Silent(3)}), MM_OK,
         "aac size=4053 bps=3789 audio=1 abps=3789 hz=44100 ch=2 bits=16 a=2011/0/2102 v=0/0/0"},
        // (2100 - 100) x 8 / 8000; starting at the footer would give 1990 bytes, 1 second.
        {"footer tag", Cat({footerTag, speech, Zeros(60)}), MM_OK,
         "aac size=2100 dur=2 bps=8000 audio=1 abps=8000 hz=8000 ch=1 bits=16 a=2011/0/2102 v=0/0/0"},
        {"trailing tag", Cat({speech, Zeros(79), Bytes().str("TAG").zeros(125).data()}), MM_OK,
         "aac size=2127 dur=1 bps=8000 audio=1 abps=8000 hz=8000 ch=1 bits=16 a=2011/0/2102 v=0/0/0"},
        {"four bytes after the tag", Cat({Id3v2Tag(3, Zeros(10)), {0xFF, 0xF1, 0x50, 0x80}}), MM_E_UNSUPPORTED,
         "-2147024665"},
        {"three bytes after the tag", Cat({Id3v2Tag(3, Zeros(10)), {0xFF, 0xF1, 0x50}}), MM_E_FAIL, "-2147467259"},
        {"tag and two bytes", Cat({Id3v2Tag(3, Zeros(200)), Zeros(2)}), MM_E_FAIL, "-2147467259"},
        {"15 bytes", Zeros(15), MM_E_UNSUPPORTED, "-2147467259"},
        {"zeros", Zeros(200), MM_E_UNSUPPORTED, "-2147024665"},
        // ADIF is accepted where the check meets it, but read only at the start of the data.
        // The copyright id shifts every later field by 9 bytes; a zero bit rate gives duration
        // 0; SBR in the first block gives the AAC+ code and doubles the rate.
        {"adif", Cat({AdifFile(Adif(false, false, 3, 96000), AacBlock(true, 0, 20)), Zeros(24000)}), MM_OK,
         "aac size=24037 dur=2 bps=96000 audio=1 abps=96000 hz=48000 ch=2 bits=16 a=2001/0/2102 v=0/0/0"},
        {"adif copyright", Cat({AdifFile(Adif(true, false, 8, 64000), AacBlock(true, 0, 20)), Zeros(24000)}), MM_OK,
         "aac size=24046 dur=3 bps=64000 audio=1 abps=64000 hz=16000 ch=2 bits=16 a=2001/0/2102 v=0/0/0"},
        {"adif copyright vbr", Cat({AdifFile(Adif(true, true, 8, 64000), AacBlock(true, 0, 20)), Zeros(24000)}), MM_OK,
         "aac size=24043 dur=3 bps=64000 audio=1 abps=64000 hz=16000 ch=2 bits=16 a=2001/0/2102 v=0/0/0"},
        {"adif bit rate 0", Cat({AdifFile(Adif(false, false, 3, 0), AacBlock(true, 0, 20)), Zeros(24000)}), MM_OK,
         "aac size=24037 audio=1 hz=48000 ch=2 bits=16 a=2001/0/2102 v=0/0/0"},
        {"adif sbr", Cat({AdifFile(Adif(false, true, 6, 64000), AacBlock(true, 13, 20)), Zeros(24000)}), MM_OK,
         "aac size=24034 dur=3 bps=64000 audio=1 abps=64000 hz=48000 ch=2 bits=16 a=2002/0/2102 v=0/0/0"},
        // Program configuration elements are summed and the last object type kept.
        {"adif pces", AdifFile(pces, AacBlock(true, 0, 20)), MM_OK,
         "aac size=50 bps=128000 audio=1 abps=128000 hz=44100 ch=9 bits=16 a=2001/0/2103 v=0/0/0"},
        {"adif after a tag", Cat({Id3v2Tag(3, Zeros(30)), adif}), MM_OK,
         "aac size=76 bps=128000 audio=1 abps=128000 hz=44100 bits=16 a=2001/0/2102 v=0/0/0"},
        {"adif late", Cat({Zeros(40), adif}), MM_OK, "-2147024665"},
        {"ADIF mid-file", Cat({Zeros(30), Bytes().str("ADIF").data(), Zeros(30)}), MM_OK, "-2147024665"},
    };
    TempDir dir;
    for (const auto& c : cases) {
        const std::string path = dir.Write("a.aac", c.file);
        EXPECT_EQ(Verify(path), c.check) << c.name;
        EXPECT_EQ(Probe(path), c.clip) << c.name;
    }
    EXPECT_EQ(Probe(dir.PathOf("missing.aac")), "1");
    int type = 0;  // detection takes the late ADIF file
    ASSERT_EQ(MM_MediaExtractor_DetectMediaType(dir.Write("late.aac", Cat({Zeros(40), adif})).c_str(), &type), MM_OK);
    EXPECT_EQ(type, MEDIA_TYPE_AAC);
}

TEST(AacClip, TruncatedAdifHeadersAnswerWithoutFault) {
    TempDir dir;
    AdifLayout layout;
    layout.copyright = true;
    layout.pces[0].front = {true, true, true};
    layout.pces[0].comment = std::string(200, 'c');
    const Data full = AdifFile(layout, AacBlock(true, 13, 30));
    const Data tag = Id3v2Tag(3, Zeros(20));
    for (size_t cut = 5; cut < full.size(); cut += 3) {
        const std::string path = dir.Write("t.aac", Cat({tag, Data(full.begin(), full.begin() + static_cast<long>(cut))}));
        _MMClipInfo clip;
        EXPECT_EQ(AAC_GetClipInfo(path.c_str(), &clip), MM_OK) << cut;
    }
}

TEST(AacClip, SlotsAnswerThroughThePublicQueries) {
    TempDir dir;
    const std::string path = dir.Write("x.aac", Frames(10, 100));
    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(path.c_str(), MEDIA_TYPE_AAC, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO);
    _MMClipInfo clip;
    EXPECT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_AAC, &clip), MM_OK);
    EXPECT_EQ(std::make_pair(clip.nDuration, clip.nFileSize), std::make_pair(1000u, 1000u));
    EXPECT_EQ(Check_AAC_CodecType(path.c_str(), nullptr, nullptr, nullptr, nullptr), 0);
}

// Every corpus file, AAC or not and hostile ones included, is answered by the
// AAC readers without a fault or a leaked handle; known files give their values.
TEST(AacCorpus, EveryFileIsAnsweredWithoutFaultAndKnownFilesGiveTheirValues) {
    const std::string corpus = CorpusDir();
    if (corpus.empty()) GTEST_SKIP() << "no corpus";
    const int before = OpenDescriptors();
    for (const char* sub : {"/mutagen", "/taglib"}) {
        for (const auto& entry : std::filesystem::directory_iterator(corpus + sub)) {
            const std::string path = entry.path().string();
            Probe(path);
            unsigned char* data = nullptr;
            int length = 0;
            if (AAC_GetAuidoData_Buf(path.c_str(), 0, 1, &data, &length) == MM_OK) MM_MediaExtractor_FreeBuffer(data);
        }
    }
    EXPECT_EQ(before, OpenDescriptors());
    EXPECT_EQ(Probe(corpus + "/mutagen/adif.aac"), 
              "aac size=4096 bps=128000 audio=1 abps=128000 hz=48000 ch=2 bits=16 a=2001/0/1234 v=0/0/0");
    EXPECT_EQ(Probe(corpus + "/mutagen/empty.aac"), 
              "aac size=2577 dur=3 bps=5167 audio=1 abps=5167 hz=44100 ch=2 bits=16 a=2011/0/2102 v=0/0/0");
    EXPECT_EQ(Probe(corpus + "/taglib/empty1s.aac"), 
              "aac size=147 bps=1378 audio=1 abps=1378 hz=11025 ch=1 bits=16 a=2011/0/2102 v=0/0/0");
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
        _MMClipInfo clip;
        _MM_CODECTYPE codec;
        ASSERT_EQ(AAC_GetClipInfo(out.c_str(), &clip), MM_OK) << out;
        ASSERT_EQ(AAC_GetCodecType(out.c_str(), &codec), MM_OK) << out;
        EXPECT_EQ(std::make_pair(clip.nSampleRate, clip.nChannels), std::make_pair(c.rate, c.channels)) << out;
        EXPECT_EQ(std::make_pair(codec.nAudioCodec, codec.nAudioSubType), std::make_pair(0x2011u, 0x2102u));
        EXPECT_GT(clip.nBitrate, c.kbps * 1000 / 2) << out;
        EXPECT_LT(clip.nBitrate, c.kbps * 1000 * 2) << out;
        EXPECT_GE(clip.nDuration, 3u) << out;
        EXPECT_LE(clip.nDuration, 12u) << out;
    }
}
