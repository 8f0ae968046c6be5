// AVI files written by ffmpeg, checked against what ffprobe reports.
#include <gtest/gtest.h>

#include <unistd.h>

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "metainfo/avi_parser.h"
#include "metainfo/metainfo.h"
#include "support/bytes.h"

using testing_support::TempDir;

namespace {

bool HaveFfmpeg() { return access("/usr/bin/ffmpeg", X_OK) == 0 && access("/usr/bin/ffprobe", X_OK) == 0; }

// Output of a shell command, or "" when it failed.
std::string RunShell(const std::string& command) {
    std::string out;
    FILE* p = popen(command.c_str(), "r");
    if (p == nullptr) return out;
    char buf[256];
    while (fgets(buf, sizeof buf, p) != nullptr) out += buf;
    return pclose(p) == 0 ? out : std::string();
}

std::string Probe(const std::string& path, const std::string& entries, const std::string& select = "") {
    std::string out = RunShell("/usr/bin/ffprobe -v error " + select + " -show_entries " + entries +
                          " -of default=nw=1:nk=1 '" + path + "'");
    while (!out.empty() && (out.back() == '\n' || out.back() == '\r')) out.pop_back();
    return out;
}

struct Variant {
    const char* video;
    const char* audio;
};

class AviFromFfmpeg : public ::testing::TestWithParam<Variant> {};

}  // namespace

TEST_P(AviFromFfmpeg, ClipAndFramesAgreeWithFfprobe) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg not installed";
    TempDir dir;
    std::string path = dir.PathOf("out.avi");
    std::string cmd = std::string("/usr/bin/ffmpeg -nostdin -v error -y -f lavfi -i testsrc=d=2:s=176x144:r=25 ") +
                      "-f lavfi -i sine=d=2 -c:v " + GetParam().video + " -c:a " + GetParam().audio + " '" + path +
                      "' 2>&1 && echo ok";
    if (RunShell(cmd).find("ok") == std::string::npos) GTEST_SKIP() << "ffmpeg could not write " << GetParam().video;

    std::string width = Probe(path, "stream=width", "-select_streams v:0");
    std::string height = Probe(path, "stream=height", "-select_streams v:0");
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
    EXPECT_EQ(clip.nHeight, std::stoul(height));
    EXPECT_EQ(clip.nDuration, static_cast<uint32_t>(std::floor(duration)) * 1000);
    EXPECT_EQ(clip.bHasAudio, 1u);
    EXPECT_EQ(clip.nSampleRate, 44100u);
    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(path.c_str(), type, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO | TRACK_VIDEO);

    CAVIParser* parser = nullptr;
    ASSERT_EQ(CreateAVIParserObject(&parser), MM_OK);
    ASSERT_EQ(parser->init(path.c_str(), nullptr), MM_OK);
    EXPECT_EQ(parser->getMainHeader()->dwTotalFrames, std::stoul(frames));
    EXPECT_EQ(static_cast<uint32_t>(parser->getStreamType(0)), static_cast<uint32_t>(tag[0]) << 24 |
                                                                   static_cast<uint32_t>(tag[1]) << 16 |
                                                                   static_cast<uint32_t>(tag[2]) << 8 |
                                                                   static_cast<uint32_t>(tag[3]))
        << tag;
    ASSERT_EQ(parser->locateChunk("movi"), MM_OK);
    ASSERT_EQ(parser->parseMovi(parser->getFileHandle()), MM_OK);
    ASSERT_EQ(parser->locateChunk("idx1"), MM_OK);
    ASSERT_EQ(parser->parseIdx1(parser->getFileHandle()), MM_OK);

    uint32_t delivered = 0, previous = 0;
    for (;;) {
        _FrameInfo frame{};
        int32_t r = parser->getNextFrame(0, &frame);
        if (r == 1) break;
        ASSERT_EQ(r, MM_OK);
        EXPECT_EQ(frame.dwTimeMs, delivered * 40);
        if (delivered == 0) {
            EXPECT_EQ(frame.dwFlags, AVI_KEYFRAME_FLAGS);
        }
        EXPECT_GE(frame.dwTimeMs, previous);
        previous = frame.dwTimeMs;
        MM_MediaExtractor_FreeBuffer(frame.pData);
        ++delivered;
    }
    EXPECT_EQ(delivered + 1, std::stoul(frames)) << "all frames but the last";

    uint32_t actual = 0;
    EXPECT_EQ(parser->setMediaTime(0, 1500, &actual), MM_OK);
    EXPECT_LE(actual, 1500u);
    _FrameInfo frame{};
    ASSERT_EQ(parser->getNextFrame(0, &frame), MM_OK);
    EXPECT_EQ(frame.dwFlags, AVI_KEYFRAME_FLAGS);
    EXPECT_EQ(frame.dwTimeMs, actual);
    MM_MediaExtractor_FreeBuffer(frame.pData);
    FreeAVIParserObject(parser);
}

INSTANTIATE_TEST_SUITE_P(Writers, AviFromFfmpeg,
                         ::testing::Values(Variant{"mpeg4", "pcm_s16le"}, Variant{"msmpeg4", "libmp3lame"},
                                           Variant{"mpeg4", "libmp3lame"}),
                         [](const ::testing::TestParamInfo<Variant>& info) {
                             return std::string(info.param.video) + "_" + info.param.audio;
                         });
