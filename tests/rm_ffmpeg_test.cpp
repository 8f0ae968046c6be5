// RealMedia files written by ffmpeg, checked against what ffprobe reports.
#include <gtest/gtest.h>

#include <unistd.h>

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "metainfo/metainfo.h"
#include "support/bytes.h"

using testing_support::TempDir;

namespace {

bool HaveFfmpeg() { return access("/usr/bin/ffmpeg", X_OK) == 0 && access("/usr/bin/ffprobe", X_OK) == 0; }

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
    std::string cmd = std::string("/usr/bin/ffmpeg -nostdin -v error -y ") + v.args +
                      " -metadata title=Probe -metadata author=Writer -f rm '" + path + "' 2>&1 && echo ok";
    if (RunShell(cmd).find("ok") == std::string::npos) GTEST_SKIP() << "ffmpeg could not write " << v.name;
    double duration = std::atof(Probe(path, "format=duration").c_str());
    std::string rate = Probe(path, "stream=sample_rate", "-select_streams a:0");

    int type = 0;
    ASSERT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK);
    ASSERT_EQ(type, MEDIA_TYPE_REALMEDIA);
    _MMClipInfo clip{};
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), type, &clip), MM_OK);
    // Whole seconds, and never less than one through the public interface.
    uint32_t seconds = static_cast<uint32_t>(std::floor(duration));
    EXPECT_EQ(clip.nDuration, (seconds == 0 ? 1 : seconds) * 1000);
    EXPECT_EQ(clip.bHasAudio, 1u);
    EXPECT_EQ(clip.nSampleRate, std::stoul(rate));
    EXPECT_STREQ(clip.szFormat, "rm");

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
    EXPECT_EQ(std::string(reinterpret_cast<char*>(meta.aItems[META_TITLE].szData), meta.aItems[META_TITLE].nLength),
              "Probe");
    EXPECT_EQ(std::string(reinterpret_cast<char*>(meta.aItems[META_ARTIST].szData), meta.aItems[META_ARTIST].nLength),
              "Writer");
    MM_MediaExtractor_FreeMetaInfo(&meta);
}

INSTANTIATE_TEST_SUITE_P(
    Writers, RmFromFfmpeg,
    ::testing::Values(
        Variant{"rv10_real144",
                "-f lavfi -i testsrc=d=2:s=176x144:r=25 -f lavfi -i sine=d=2:sample_rate=8000 -c:v rv10 -c:a real_144 "
                "-ac 1",
                true, 0x3010},
        Variant{"rv20_ac3", "-f lavfi -i testsrc=d=3:s=176x144:r=25 -f lavfi -i sine=d=3 -c:v rv20 -c:a ac3", true,
                0x3020},
        Variant{"real144_only", "-f lavfi -i sine=d=2:sample_rate=8000 -c:a real_144 -ac 1", false, 0}),
    [](const ::testing::TestParamInfo<Variant>& info) { return std::string(info.param.name); });
