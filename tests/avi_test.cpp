// AVI files: the header list and the clip and track records built from it; the index,
// its entry times, neighbour searches, seeking and frame delivery through the parser
// object; files written by ffmpeg checked against ffprobe; and the metainfo tool's
// "frames" and "probe" over byte-built AVI and RealMedia files.
#include <gtest/gtest.h>
#include <limits.h>
#include <unistd.h>

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "avi/avi_queries.h"
#include "metainfo/avi_parser.h"
#include "metainfo/metainfo.h"
#include "support/avi_builder.h"
#include "support/bytes.h"
#include "support/ffprobe.h"
#include "support/golden.h"
#include "support/rm_builder.h"
#include "support/summary.h"

using namespace testing_support;

namespace {

Bytes VideoStrl(uint32_t rate = 25, uint32_t length = 50, uint32_t width = 64) {
    return AviStrl(AviVideoStream(1, rate, length), AviVideoFormat(width, 48, "FMP4"));
}

Bytes AudioStrl(uint32_t length = 48000) {
    return AviStrl(AviAudioStream(16000, length), AviAudioFormat(1, 1, 8000, 16000, 2, 16));
}

class AviHeaders : public ::testing::Test {
protected:
    TempDir dir;
    AviParserHandle parser;
    _MMClipInfo clip{};

    // A file of the header list alone, without movi frames or index.
    std::string Write(const std::vector<Bytes>& lists, const AviMainFields& main = AviMainFields(),
                      const std::string& name = "clip.avi") {
        return dir.Write(name, AviFile(AviHdrl(main, lists), {}, false));
    }
};

// A parser over the file, its index already read.
class Indexed {
public:
    explicit Indexed(const std::vector<uint8_t>& file) : path_(dir_.Write("clip.avi", file)) {}
    int32_t Open() { return p_.OpenIndexed(path_); }
    CAVIParser* operator->() const { return p_.operator->(); }
    const _AVIIndexEntry& Entry(uint32_t i) const { return p_->getIndexEntries()[i]; }
    std::vector<uint32_t> TimesOf(uint32_t stream) const {
        std::vector<uint32_t> times;
        for (uint32_t i = 0; i < p_->getIndexCount(); ++i) {
            if (Entry(i).wStream == stream) times.push_back(Entry(i).dwTimeMs);
        }
        return times;
    }

private:
    TempDir dir_;
    std::string path_;
    AviParserHandle p_;
};

// Video at 25 fps interleaved with 4000-byte audio chunks at 16000 bytes/s.
std::vector<uint8_t> Interleaved(uint32_t videoFrames, uint32_t audioChunks) {
    AviMainFields main;
    main.totalFrames = videoFrames;
    main.streams = 2;
    Bytes hdrl =
        AviHdrl(main, {AviStrl(AviVideoStream(1, 25, videoFrames), AviVideoFormat(16, 16, "FMP4")),
                       AviStrl(AviAudioStream(16000, audioChunks * 4000), AviAudioFormat(1, 1, 8000, 16000, 2, 16))});
    std::vector<AviFrame> frames;
    for (uint32_t i = 0; i < videoFrames || i < audioChunks; ++i) {
        if (i < videoFrames) frames.push_back({0, "dc", Bytes().be32(i).zeros(5), i % 10 == 0 ? 0x10u : 0u});
        if (i < audioChunks) frames.push_back({1, "wb", Bytes().fill(4000, static_cast<uint8_t>(i)), 0x10u});
    }
    return AviFile(hdrl, frames);
}

// One video stream whose frames carry the given index flags.
std::vector<uint8_t> VideoWithFlags(const std::vector<uint32_t>& flags) {
    Bytes hdrl = AviHdrl(AviMainFields(), {AviStrl(AviVideoStream(1, 25, 6), AviVideoFormat(16, 16, "FMP4"))});
    std::vector<AviFrame> frames;
    for (uint32_t f : flags) frames.push_back({0, "dc", Bytes().zeros(4), f});
    return AviFile(hdrl, frames);
}

struct Variant {
    const char* video;
    const char* audio;
};

class AviFromFfmpeg : public ::testing::TestWithParam<Variant> {};

// The tool is built beside the test directory; "" when it is not there.
std::string ToolPath() {
    char self[PATH_MAX] = {};
    if (readlink("/proc/self/exe", self, sizeof self - 1) <= 0) return "";
    std::string dir(self);
    dir = dir.substr(0, dir.rfind('/'));
    std::string tool = dir.substr(0, dir.rfind('/')) + "/metainfo";
    return access(tool.c_str(), X_OK) == 0 ? tool : "";
}

int RunTool(const std::string& args, std::string* out) {
    FILE* p = popen((ToolPath() + " " + args + " 2>&1").c_str(), "r");
    if (p == nullptr) return -1;
    char buf[256];
    while (fgets(buf, sizeof buf, p) != nullptr) *out += buf;
    int status = pclose(p);
    return WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}
}  // namespace

// The duration comes from scale, rate and length (a stream without a rate leaves it to
// the next), the frame rate from the total frames; flags are read byte-swapped; a JUNK
// chunk inside the header list ends the stream walk but keeps earlier streams
// (unreported); stream lists beyond the two slots are ignored.
TEST_F(AviHeaders, ClipAndStreamsOfEachHeaderList) {
    AviMainFields ntsc;
    ntsc.totalFrames = 300;
    ntsc.flags = 0x10;  // AVIF_HASINDEX as written in the file
    AviStreamFields xvid = AviVideoStream(1, 25, 50);
    xvid.handler = "XVID";
    const struct {
        const char* name;
        std::vector<Bytes> lists;
        AviMainFields main;
    } cases[] = {
        {"ntsc", {AviStrl(AviVideoStream(1001, 30000, 300), AviVideoFormat(320, 240, "FMP4"))}, ntsc},
        {"junk", {VideoStrl(), RiffChunk("JUNK", Bytes().zeros(24)), AudioStrl()}, AviMainFields()},
        {"no rate", {VideoStrl(0), AudioStrl(48000)}, AviMainFields()},
        {"three streams",
         {AviStrl(xvid, AviVideoFormat(64, 48, "XVID")), AudioStrl(),
          AviStrl(AviVideoStream(1, 30, 90), AviVideoFormat(999, 999, "DIVX"))},
         AviMainFields()},
    };
    Golden golden("avi", "headers");
    for (const auto& c : cases) {
        std::memset(&clip, 0, sizeof clip);
        EXPECT_EQ(parser->init(Write(c.lists, c.main).c_str(), &clip), MM_OK) << c.name;
        char text[96];
        std::snprintf(text, sizeof text, "ms=%u streams=%u types=%x/%x/%x flags=%x index=%u", parser->getDuration(),
                      parser->getStreamNum(), static_cast<unsigned>(parser->getStreamType(0)),
                      static_cast<unsigned>(parser->getStreamType(1)), static_cast<unsigned>(parser->getStreamType(2)),
                      parser->getMainHeader()->dwFlags, parser->getMainHeader()->bHasIndex);
        golden.Check(c.name, ClipSummary(clip) + " | " + text);
    }
    _MMClipInfo pub{};  // whole seconds, then milliseconds
    EXPECT_EQ(MM_MediaExtractor_GetClipInfo(Write(cases[0].lists, ntsc).c_str(), MEDIA_TYPE_AVI, &pub), MM_OK);
    EXPECT_EQ(pub.nDuration, 10000u);
}

TEST_F(AviHeaders, AudioBitRateIsBytesPerSecondAndVideoGetsTheDifference) {
    AviMainFields main;
    main.totalFrames = 2500;
    main.streams = 2;
    Bytes padded(AviFile(AviHdrl(main, {VideoStrl(25, 2500), AudioStrl(1600000)}), {}, false));
    // Fill up to exactly 2,000,000 bytes with a JUNK chunk inside the RIFF form.
    padded.raw(RiffChunk("JUNK", Bytes().zeros(2000000 - padded.size() - 8)));
    padded.patch_le32(4, static_cast<uint32_t>(padded.size() - 8));
    ASSERT_EQ(padded.size(), 2000000u);
    std::string path = dir.Write("hundred.avi", padded);
    EXPECT_EQ(metainfo::AVI_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(ClipSummary(clip),
              "avi size=2000000 dur=100 bps=160000 audio=1 video=1 abps=16000 hz=8000 ch=1 bits=16 "
              "vbps=144000 w=64 h=48 fps=25");
    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(path.c_str(), MEDIA_TYPE_AVI, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO | TRACK_VIDEO);
}

TEST_F(AviHeaders, ArgumentAndOpenFailures) {
    int mask = 0;
    EXPECT_EQ(metainfo::AVI_GetClipInfo(nullptr, &clip), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::AVI_GetClipInfo(dir.PathOf("missing.avi").c_str(), &clip), -1);
    EXPECT_EQ(metainfo::AVI_GetTrackType(dir.PathOf("missing.avi").c_str(), &mask), -1);
    EXPECT_EQ(CreateAVIParserObject(nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(FreeAVIParserObject(nullptr), MM_E_INVALIDARG);
    std::string notRiff = dir.Write("form.avi", Bytes().str("RIFX").le32(100).str("AVI ").zeros(100));
    EXPECT_EQ(metainfo::AVI_GetClipInfo(notRiff.c_str(), &clip), MM_E_FAIL);
}

TEST_F(AviHeaders, PathWithoutExtensionFailsAfterFillingTheRecord) {
    std::string path = Write({VideoStrl()}, AviMainFields(), "noext");
    // The temporary directory's name has no dot either.
    if (path.find('.') != std::string::npos) GTEST_SKIP() << "temporary path holds a dot";
    EXPECT_EQ(metainfo::AVI_GetClipInfo(path.c_str(), &clip), MM_E_FAIL);
    EXPECT_EQ(clip.nWidth, 64u);
}

TEST_F(AviHeaders, OversizedAndTruncatedChunksAreRejectedWithoutFaults) {
    std::vector<uint8_t> good = AviFile(AviHdrl(AviMainFields(), {VideoStrl()}), {}, false);
    // The header list claims far more than the file holds.
    Bytes big(good);
    big.patch_le32(16, 0x7FFFFFF0);
    EXPECT_EQ(metainfo::AVI_GetClipInfo(dir.Write("big.avi", big).c_str(), &clip), MM_E_FAIL);
    // A stream list that reaches past its header list.
    Bytes strl(good);
    strl.patch_le32(12 + 12 + 64 + 4, 0x00100000);
    EXPECT_EQ(metainfo::AVI_GetClipInfo(dir.Write("strl.avi", strl).c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.bHasVideo, 0u);
    // A strh with a tiny size and a strf whose size claims more than the list holds.
    Bytes odd = Bytes().raw(RiffChunk("strh", Bytes().str("vids").str("DIVX"))).str("strf").le32(0x10000).zeros(8);
    EXPECT_EQ(metainfo::AVI_GetClipInfo(Write({RiffList("strl", {odd})}).c_str(), &clip), MM_OK);
    // Every truncation of a valid file.
    for (size_t n = 0; n < good.size(); ++n) {
        std::string path =
            dir.Write("cut.avi", std::vector<uint8_t>(good.begin(), good.begin() + static_cast<long>(n)));
        metainfo::AVI_GetClipInfo(path.c_str(), &clip);
        int mask = 0;
        metainfo::AVI_GetTrackType(path.c_str(), &mask);
    }
}

TEST_F(AviHeaders, InitTwiceStartsAfresh) {
    EXPECT_EQ(parser->init(Write({VideoStrl(), AudioStrl()}, AviMainFields(), "a.avi").c_str(), nullptr), MM_OK);
    EXPECT_EQ(parser->getStreamNum(), 2u);
    EXPECT_EQ(parser->init(Write({VideoStrl(25, 100, 32)}, AviMainFields(), "b.avi").c_str(), &clip), MM_OK);
    EXPECT_EQ(parser->getStreamNum(), 1u);
    EXPECT_EQ(parser->getDuration(), 4000u);
    EXPECT_EQ(clip.bHasAudio, 0u);
    EXPECT_EQ(parser->free(), MM_OK);
    EXPECT_EQ(parser->free(), MM_OK);
}

// Video entries step by the frame time, audio ones by the previous chunk's
// length; entries keep their fields; an entry of a stream without a slot stops
// the index, keeping the earlier entries.
TEST(AviIndex, EntryTimesAndFields) {
    const struct {
        std::vector<uint8_t> file;
        uint32_t stream;
        std::vector<uint32_t> times;
    } cases[] = {{AviVideoOnly(5, 1), 0, {0, 40, 80, 120, 160}},
                 {AviVideoOnly(4, 1, 1001, 30000), 0, {0, 33, 66, 99}},
                 {Interleaved(10, 4), 1, {0, 250, 500, 750}}};
    for (const auto& c : cases) {
        Indexed f(c.file);
        ASSERT_EQ(f.Open(), MM_OK);
        EXPECT_EQ(f.TimesOf(c.stream), c.times);
    }
    Indexed f(Interleaved(2, 1));
    ASSERT_EQ(f.Open(), MM_OK);
    ASSERT_EQ(f->getIndexCount(), 3u);
    EXPECT_EQ(f.Entry(0).ckid, 0x30306463u) << "00dc, read big-endian";
    EXPECT_EQ(f.Entry(0).dwChunkOffset, 4u);
    EXPECT_EQ(f.Entry(1).wStream, 1u);
    EXPECT_EQ(f.Entry(1).wType, 0x7762u) << "wb";
    Bytes hdrl = AviHdrl(AviMainFields(), {AviStrl(AviVideoStream(1, 25, 3), AviVideoFormat(16, 16, "FMP4"))});
    std::vector<AviFrame> frames{{0, "dc", Bytes().zeros(4), 0x10},
                                 {0, "dc", Bytes().zeros(4), 0},
                                 {5, "tx", Bytes().zeros(4), 0},
                                 {0, "dc", Bytes().zeros(4), 0}};
    Indexed stopped(AviFile(hdrl, frames));
    EXPECT_EQ(stopped.Open(), MM_E_FAIL);
    ASSERT_EQ(stopped->getIndexCount(), 4u);
    EXPECT_EQ(stopped.Entry(1).dwTimeMs, 40u);
    EXPECT_EQ(stopped.Entry(3).ckid, 0u) << "entries after the failure stay unread";
}

TEST(AviIndexSearch, NextAndPreviousEntriesOfAStream) {
    Indexed f(Interleaved(3, 3));  // v a v a v a
    ASSERT_EQ(f.Open(), MM_OK);
    EXPECT_EQ(f->searchNextIndex(0, 0), 2u);
    EXPECT_EQ(f->searchNextIndex(0, 4), 6u) << "none after: the entry count";
    EXPECT_EQ(f->searchNextIndex(0, 5), 5u) << "already the last entry";
    EXPECT_EQ(f->searchPreIndex(1, 5), 3u);
    EXPECT_EQ(f->searchPreIndex(0, 2), 0u) << "entry 0 is never examined";
}

// Video lands on the key frame at or before the time (a key flag with another bit is
// none), even at the very end; audio on the first entry at or after it.
TEST(AviSeek, EachStreamLandsOnItsEntry) {
    const struct {
        std::vector<uint8_t> file;
        uint32_t stream, time, actual;
    } cases[] = {
        {AviVideoOnly(50, 10), 0, 1000, 800},  // key frames at 0, 400, 800, 1200, 1600 ms
        {AviVideoOnly(50, 10), 0, 2000, 1600},
        {VideoWithFlags({0x10, 0, 0, 0x11, 0, 0}), 0, 150, 0},
        {Interleaved(25, 5), 1, 600, 750},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.time);
        Indexed f(c.file);
        ASSERT_EQ(f.Open(), MM_OK);
        uint32_t actual = 1;
        EXPECT_EQ(f->setMediaTime(c.stream, c.time, &actual), MM_OK);
        EXPECT_EQ(actual, c.actual);
        _FrameInfo frame{};
        ASSERT_EQ(f->getNextFrame(c.stream, &frame), MM_OK);
        EXPECT_EQ(frame.dwTimeMs, c.actual);
        EXPECT_EQ(frame.dwFlags, AVI_KEYFRAME_FLAGS);
        MM_MediaExtractor_FreeBuffer(frame.pData);
    }
    Indexed f(VideoWithFlags({0x10, 0, 0, 0x11, 0, 0}));
    ASSERT_EQ(f.Open(), MM_OK);
    EXPECT_EQ(f.Entry(3).dwFlags, 0x11000000u);
}

TEST(AviFrames, EveryFrameButTheStreamsLastIsDeliveredWithItsBytes) {
    Indexed f(Interleaved(6, 3));
    ASSERT_EQ(f.Open(), MM_OK);
    std::vector<uint32_t> times;
    _FrameInfo frame{};
    while (f->getNextFrame(0, &frame) == MM_OK) {
        ASSERT_EQ(frame.dwSize, 9u);
        EXPECT_EQ(frame.pData[3] * 40u, frame.dwTimeMs) << "the bytes are those of the indexed chunk";
        times.push_back(frame.dwTimeMs);
        MM_MediaExtractor_FreeBuffer(frame.pData);
    }
    EXPECT_EQ(times, (std::vector<uint32_t>{0, 40, 80, 120, 160}));
    EXPECT_EQ(f->getNextFrame(0, &frame), 1) << "the end stays the end";
    int audio = 0;
    for (; f->getNextFrame(1, &frame) == MM_OK; ++audio) MM_MediaExtractor_FreeBuffer(frame.pData);
    EXPECT_EQ(audio, 2);
}

TEST(AviFrames, SeekingAndReadingNeedTheIndexAndValidArguments) {
    Indexed f(AviVideoOnly(10, 5));
    uint32_t actual = 0;
    _FrameInfo frame{};
    EXPECT_EQ(f->setMediaTime(0, 0, &actual), MM_E_INVALIDARG) << "nothing read yet";
    EXPECT_EQ(f->getNextFrame(0, &frame), MM_E_FAIL);
    EXPECT_EQ(f->getNextFrame(0, nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(f->init(nullptr, nullptr), MM_E_INVALIDARG);
    ASSERT_EQ(f.Open(), MM_OK);
    EXPECT_EQ(f->setMediaTime(0, 100, nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(f->setMediaTime(0, 401, &actual), MM_E_INVALIDARG) << "past the stream's end";
    EXPECT_EQ(f->setMediaTime(1, 0, &actual), MM_E_INVALIDARG);
    EXPECT_EQ(f->getNextFrame(1, &frame), MM_E_FAIL);
    EXPECT_EQ(f->locateChunk("strl"), MM_E_FAIL) << "only top-level chunks are located";
}

TEST(AviFrames, OffsetsAndLengthsOutsideMoviAreRefused) {
    Bytes file(VideoWithFlags({0x10, 0x10, 0x10, 0x10}));
    size_t idx1 = file.size() - 4 * 16;
    file.patch_le32(idx1 + 8, 0x7FFFFFF0);  // entry 0: offset far past movi
    file.patch_le32(idx1 + 16 + 12, 0x7FFFFFF0);  // entry 1: length above movi
    file.patch_le32(idx1 + 32 + 8, static_cast<uint32_t>(file.size()));  // entry 2: data past the file
    Indexed f(file.data());
    ASSERT_EQ(f.Open(), MM_OK);
    _FrameInfo frame{};
    EXPECT_EQ(f->getNextFrame(0, &frame), MM_E_FAIL);
    uint32_t actual = 0;
    ASSERT_EQ(f->setMediaTime(0, 40, &actual), MM_OK);
    EXPECT_EQ(f->getNextFrame(0, &frame), MM_E_FAIL);
}

TEST(AviHostile, IndexSizesAndTruncationsStayBounded) {
    std::vector<uint8_t> good = Interleaved(8, 4);
    // An idx1 that claims almost the whole file while holding few entries.
    Bytes big(good);
    size_t idx1 = good.size() - 12 * 16 - 8;
    ASSERT_EQ(std::memcmp(good.data() + idx1, "idx1", 4), 0);
    big.patch_le32(idx1 + 4, static_cast<uint32_t>(good.size() - 1));
    {
        Indexed f(big.data());
        EXPECT_EQ(f.Open(), MM_E_FAIL) << "the header walk sees the chunk pass the end of the file";
        ASSERT_EQ(f->locateChunk("movi"), MM_OK);
        ASSERT_EQ(f->parseMovi(f->getFileHandle()), MM_OK);
        ASSERT_EQ(f->locateChunk("idx1"), MM_OK);
        EXPECT_EQ(f->parseIdx1(f->getFileHandle()), MM_OK);
        EXPECT_EQ(f->getIndexCount(), 12u) << "no more entries than the file holds";
    }
    // Every truncation of the file runs through the whole sequence.
    for (size_t n = 0; n < good.size(); n += 11) {
        Indexed f(std::vector<uint8_t>(good.begin(), good.begin() + static_cast<long>(n)));
        f.Open();
        uint32_t actual = 0;
        f->setMediaTime(0, 100, &actual);
        _FrameInfo frame{};
        for (int i = 0; i < 20 && f->getNextFrame(0, &frame) == MM_OK; ++i) MM_MediaExtractor_FreeBuffer(frame.pData);
    }
}

TEST_P(AviFromFfmpeg, ClipAndFramesAgreeWithFfprobe) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg not installed";
    TempDir dir;
    std::string path = dir.PathOf("out.avi");
    if (!FfmpegWrite(std::string("-f lavfi -i testsrc=d=2:s=176x144:r=25 -f lavfi -i sine=d=2 -c:v ") +
                         GetParam().video + " -c:a " + GetParam().audio,
                     path)) {
        GTEST_SKIP() << "ffmpeg could not write " << GetParam().video;
    }

    std::string width = Probe(path, "stream=width", "-select_streams v:0");
    std::string frames = Probe(path, "stream=nb_frames", "-select_streams v:0");
    std::string tag = Probe(path, "stream=codec_tag_string", "-select_streams v:0");
    double duration = std::atof(Probe(path, "format=duration").c_str());
    ASSERT_FALSE(width.empty());

    int type = 0;
    ASSERT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK);
    ASSERT_EQ(type, MEDIA_TYPE_AVI);
    _MMClipInfo clip{};
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), type, &clip), MM_OK);
    EXPECT_EQ(clip.nWidth, std::stoul(width));
    EXPECT_EQ(clip.nHeight, std::stoul(Probe(path, "stream=height", "-select_streams v:0")));
    EXPECT_EQ(clip.nDuration, static_cast<uint32_t>(std::floor(duration)) * 1000);
    EXPECT_EQ(clip.bHasAudio, 1u);
    EXPECT_EQ(clip.nSampleRate, 44100u);
    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(path.c_str(), type, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO | TRACK_VIDEO);

    AviParserHandle parser;
    ASSERT_EQ(parser.OpenIndexed(path), MM_OK);
    EXPECT_EQ(parser->getMainHeader()->dwTotalFrames, std::stoul(frames));
    const uint32_t handler = static_cast<uint32_t>(parser->getStreamType(0));
    EXPECT_EQ(Bytes().be32(handler).data(), Bytes().str(tag).data()) << "the video handler FourCC";

    uint32_t delivered = 0;
    _FrameInfo frame{};
    for (; parser->getNextFrame(0, &frame) == MM_OK; ++delivered) {
        EXPECT_EQ(frame.dwTimeMs, delivered * 40);
        MM_MediaExtractor_FreeBuffer(frame.pData);
    }
    EXPECT_EQ(delivered + 1, std::stoul(frames)) << "all frames but the last";

    uint32_t actual = 0;
    EXPECT_EQ(parser->setMediaTime(0, 1500, &actual), MM_OK);
    EXPECT_LE(actual, 1500u);
    ASSERT_EQ(parser->getNextFrame(0, &frame), MM_OK);
    EXPECT_EQ(frame.dwFlags, AVI_KEYFRAME_FLAGS);
    EXPECT_EQ(frame.dwTimeMs, actual);
    MM_MediaExtractor_FreeBuffer(frame.pData);
}

INSTANTIATE_TEST_SUITE_P(Writers, AviFromFfmpeg,
                         ::testing::Values(Variant{"mpeg4", "pcm_s16le"}, Variant{"msmpeg4", "libmp3lame"}),
                         [](const ::testing::TestParamInfo<Variant>& param) {
                             return std::string(param.param.video) + "_" + param.param.audio;
                         });

TEST(MetainfoTool, FramesListsEntriesAndReadsFramesFromTheSeekPoint) {
    if (ToolPath().empty()) GTEST_SKIP() << "metainfo tool not built beside the tests";
    TempDir dir;
    std::string path = dir.Write("clip.avi", AviVideoOnly(20, 5));
    std::string out;
    ASSERT_EQ(RunTool("frames '" + path + "' --stream 0 --seek 500", &out), 0) << out;
    EXPECT_NE(out.find("index: 20 entries"), std::string::npos) << out;
    EXPECT_NE(out.find("#19     00dc time 760 ms, size 9, -"), std::string::npos) << out;
    EXPECT_NE(out.find("seek to 500 ms: at 400 ms"), std::string::npos) << out;
    EXPECT_NE(out.find("time 400 ms, size 7, key"), std::string::npos) << out;
    EXPECT_NE(out.find("9 frame(s)"), std::string::npos) << out << "frames 10..18; the last entry stays";

    EXPECT_EQ(RunTool("frames '" + path + "' --stream 3", &out), 1);
    EXPECT_EQ(RunTool("frames", &out), 2);
    std::string rm = dir.Write("clip.rm", RmFile(RmProps(), {RmMdpr(RmStream())}));
    EXPECT_EQ(RunTool("frames '" + rm + "'", &out), 1) << "not an AVI file";
}

TEST(MetainfoTool, ProbeShowsAviAndRealMedia) {
    if (ToolPath().empty()) GTEST_SKIP() << "metainfo tool not built beside the tests";
    TempDir dir;
    std::string avi = dir.Write("clip.avi", AviVideoOnly(50, 10));
    RmStream audio;
    audio.typeData = RaHeaderV4(22050, 16, 1, "cook");
    std::string rm = dir.Write("clip.rm", RmFile(RmProps(), {RmCont("Song", "", "", ""), RmMdpr(audio)}));
    std::string out;
    ASSERT_EQ(RunTool("probe '" + avi + "' '" + rm + "'", &out), 0) << out;
    EXPECT_NE(out.find("media type: 11 (avi)"), std::string::npos) << out;
    EXPECT_NE(out.find("16x16, 25 fps"), std::string::npos) << out;
    EXPECT_NE(out.find("media type: 2 (realmedia)"), std::string::npos) << out;
    EXPECT_NE(out.find("CODEC_RMAUDIO_COOK"), std::string::npos) << out;
    EXPECT_NE(out.find("Song"), std::string::npos) << out;
}
