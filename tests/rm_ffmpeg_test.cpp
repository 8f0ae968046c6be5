// RealMedia files written by ffmpeg, checked against what ffprobe reports.
#include <gtest/gtest.h>

#include <cmath>
#include <cstdlib>
#include <string>

#include "metainfo/metainfo.h"
#include "support/bytes.h"
#include "support/ffprobe.h"

using namespace testing_support;

namespace {

struct Variant {
    const char* name;
    const char* args;  // inputs and codecs
    bool video;
    uint32_t videoCodec;
};

class RmFromFfmpeg : public ::testing::TestWithParam<Variant> {};

}  // namespace

TEST_P(RmFromFfmpeg, HeadersAgreeWithFfprobe) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg not installed";
    const Variant& v = GetParam();
    TempDir dir;
    std::string path = dir.PathOf("out.rm");
    if (!FfmpegWrite(std::string(v.args) + " -metadata title=Probe -metadata author=Writer -f rm", path)) {
        GTEST_SKIP() << "ffmpeg could not write " << v.name;
    }
    double duration = std::atof(Probe(path, "format=duration").c_str());

    int type = 0;
    ASSERT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK);
    ASSERT_EQ(type, MEDIA_TYPE_REALMEDIA);
    _MMClipInfo clip{};
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), type, &clip), MM_OK);
    // Whole seconds, and never less than one through the public interface.
    uint32_t seconds = static_cast<uint32_t>(std::floor(duration));
    EXPECT_EQ(clip.nDuration, (seconds == 0 ? 1 : seconds) * 1000);
    EXPECT_EQ(clip.bHasAudio, 1u);
    EXPECT_EQ(clip.nSampleRate, std::stoul(Probe(path, "stream=sample_rate", "-select_streams a:0")));

    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(path.c_str(), type, &mask), MM_OK);
    EXPECT_EQ(mask, v.video ? (TRACK_AUDIO | TRACK_VIDEO) : TRACK_AUDIO);

    _MM_CODECTYPE codec{};
    EXPECT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), type, &codec), MM_OK);
    EXPECT_EQ(codec.nVideoCodec, v.videoCodec);
    EXPECT_EQ(codec.nAudioCodec, 0u) << "ffmpeg's RealMedia audio FourCCs are not in the table";

    _MM_MIMETYPE mime{};
    EXPECT_EQ(MM_MediaExtractor_GetMIMEType(path.c_str(), &mime), MM_OK);
    EXPECT_STREQ(mime.pszMimeType, "audio/x-pn-realaudio");
    if (v.video) {
        EXPECT_STREQ(mime.pszVideoMimeType, "video/x-pn-realvideo");
        EXPECT_EQ(clip.nWidth, std::stoul(Probe(path, "stream=width", "-select_streams v:0")));
        EXPECT_EQ(clip.nHeight, std::stoul(Probe(path, "stream=height", "-select_streams v:0")));
        EXPECT_EQ(clip.nFrameRate, 25u);
    }
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
    MM_MediaExtractor_FreeBuffer(mime.pszVideoMimeType);

    _MMMetaInfo meta{};
    ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(path.c_str(), type, &meta), MM_OK);
    const _MMMetaItem& title = meta.aItems[META_TITLE];
    const _MMMetaItem& artist = meta.aItems[META_ARTIST];
    EXPECT_EQ(std::string(reinterpret_cast<const char*>(title.szData), title.nLength), "Probe");
    EXPECT_EQ(std::string(reinterpret_cast<const char*>(artist.szData), artist.nLength), "Writer");
    MM_MediaExtractor_FreeMetaInfo(&meta);
}

INSTANTIATE_TEST_SUITE_P(
    Writers, RmFromFfmpeg,
    ::testing::Values(
        Variant{"rv10_real144",
                "-f lavfi -i testsrc=d=2:s=176x144:r=25 -f lavfi -i sine=d=2:sample_rate=8000 -c:v rv10 -c:a real_144 "
                "-ac 1",
                true, 0x3010},
        Variant{"real144_only", "-f lavfi -i sine=d=2:sample_rate=8000 -c:a real_144 -ac 1", false, 0}),
    [](const ::testing::TestParamInfo<Variant>& param) { return std::string(param.param.name); });
