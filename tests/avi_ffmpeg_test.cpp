// AVI files written by ffmpeg, checked against what ffprobe reports.
#include <gtest/gtest.h>

#include <cmath>
#include <cstdlib>
#include <string>

#include "metainfo/avi_parser.h"
#include "metainfo/metainfo.h"
#include "support/avi_builder.h"
#include "support/bytes.h"
#include "support/ffprobe.h"

using namespace testing_support;

namespace {

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
    if (!FfmpegWrite(std::string("-f lavfi -i testsrc=d=2:s=176x144:r=25 -f lavfi -i sine=d=2 -c:v ") +
                         GetParam().video + " -c:a " + GetParam().audio, path)) {
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
