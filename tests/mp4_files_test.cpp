// Real files: the MP4 family of the corpus (some of them hostile) and files
// written by ffmpeg, checked against what ffprobe reports.
#include <gtest/gtest.h>

#include <cctype>
#include <cmath>
#include <filesystem>
#include <string>
#include <tuple>

#include "metainfo/metainfo.h"
#include "metainfo/mp4.h"
#include "mp4/mp4_file.h"
#include "support/bytes.h"
#include "support/ffprobe.h"
#include "support/summary.h"

using namespace testing_support;

namespace {

// Every query of the public interface, plus the maker box.
struct Answers {
    int type = 0, mask = 0;
    int32_t clipResult = 0, codecResult = 0, metaResult = 0;
    _MMClipInfo clip{};
    _MM_CODECTYPE codec{};
    _MMMetaInfo meta{};
    explicit Answers(const std::string& path) {
        const char* p = path.c_str();
        MM_MediaExtractor_DetectMediaType(p, &type);
        MM_MediaExtractor_GetTrackType(p, MEDIA_TYPE_MP4, &mask);
        codecResult = MM_MediaExtractor_GetCodecType(p, MEDIA_TYPE_MP4, &codec);
        clipResult = MM_MediaExtractor_GetClipInfo(p, MEDIA_TYPE_MP4, &clip);
        metaResult = MM_MediaExtractor_GetMetaInfo(p, MEDIA_TYPE_MP4, &meta);
        _MAKERINFO maker{};
        MP4_GetMakerInfo(p, &maker);
        MM_MediaExtractor_FreeBuffer(maker.pPhoneModel);
        MM_MediaExtractor_FreeBuffer(maker.pThumbnail);
        MM_MediaExtractor_FreeBuffer(maker.pSmartAlbum);
    }
    Answers(const Answers&) = delete;
    ~Answers() { MM_MediaExtractor_FreeMetaInfo(&meta); }
};

}  // namespace

TEST(Mp4Corpus, EveryMp4FamilyFileIsAnsweredWithoutAFault) {
    const std::string root = CorpusDir();
    if (root.empty()) GTEST_SKIP() << "no corpus";
    size_t files = 0;
    for (const char* sub : {"/taglib", "/mutagen"}) {
        for (const auto& entry : std::filesystem::directory_iterator(root + sub)) {
            std::string ext = entry.path().extension().string();
            for (char& ch : ext) ch = static_cast<char>(std::tolower(static_cast<unsigned char>(ch)));
            if (ext != ".m4a" && ext != ".mp4" && ext != ".m4b" && ext != ".m4v" && ext != ".3g2" && ext != ".3gp") continue;
            SCOPED_TRACE(entry.path().string());
            ++files;
            const Answers a(entry.path().string());
            if (a.type == MEDIA_TYPE_MP4 && a.clipResult == MM_OK) {
                EXPECT_GE(a.clip.nDuration, 1000u);
                EXPECT_GT(a.clip.nFileSize, 0u);
            }
        }
    }
    EXPECT_GE(files, 20u);
}

// has-tags.m4a stores only \xA9too, \xA9ART, ---- and covr (covr is not an item MP4 reports);
// 3.7 s are 3 whole seconds.
TEST(Mp4Corpus, TaggedAndUntaggedM4aAsByHand) {
    const std::string root = CorpusDir();
    if (root.empty()) GTEST_SKIP() << "no corpus";
    const struct { const char* name; const char* clip; const char* codec; const char* meta; } cases[] = {
        {"has-tags.m4a", "m4a size=5108 dur=3000 bps=13621 c1=3237234137 audio=1 abps=2914 hz=44100 ch=2 bits=16",
         "a=4008/0/2102 v=0/0/0", "artist=5:Test Artist"},
        {"no-tags.m4a", "m4a size=2898 dur=3000 bps=7728 c1=3237234137 audio=1 abps=2914 hz=44100 ch=2 bits=16",
         "a=4008/0/2102 v=0/0/0", ""},
        {"ilst-is-last.m4a",
         "m4a size=32768 dur=65000 bps=4032 c1=3239522692 audio=1 abps=159622 hz=44100 ch=2 bits=16",
         "a=4008/0/2102 v=0/0/0",
         "title=5:Intro artist=5:Pearl Jam album=5:1995-03-22 Brisbane, Australia - Entertainment Centre year=5:1995 track=0:\\x01\\x00\\x00\\x00"},
        {"gnre.m4a", "m4a size=5026 dur=3000 bps=13402 c1=3237234137 audio=1 abps=2914 hz=44100 ch=2 bits=16",
         "a=4008/0/2102 v=0/0/0", "genre=5:Ska"},
    };
    for (const auto& c : cases) {
        const Answers a(root + "/taglib/" + c.name);
        EXPECT_EQ(a.mask, TRACK_AUDIO) << c.name;
        EXPECT_EQ(ClipSummary(a.clip), c.clip) << c.name;
        EXPECT_EQ(CodecSummary(a.codec), c.codec) << c.name;
        EXPECT_EQ(a.metaResult == MM_OK ? MetaSummary(a.meta) : "failed", c.meta) << c.name;
    }
}

TEST(Mp4Ffmpeg, WrittenFilesMatchFfprobe) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg absent";
    TempDir dir;
    const std::string sources = "-f lavfi -i testsrc=d=2:s=176x144:r=15 -f lavfi -i sine=d=2:sample_rate=16000 ";
    const struct { const char* name; const char* args; uint32_t videoCodec; } cases[] = {
        {"mpeg4.mp4", "-c:v mpeg4", 0x4001}, {"h264.mp4", "-c:v libx264 -pix_fmt yuv420p", 0x4004},
        {"h263.3gp", "-c:v h263", 0x4003}};
    int made = 0;
    for (const auto& c : cases) {
        SCOPED_TRACE(c.name);
        const std::string path = dir.PathOf(c.name);
        if (!FfmpegWrite(sources + c.args + " -c:a aac -ac 1 -shortest", path)) continue;  // encoder not built in
        ++made;
        const Answers a(path);
        ASSERT_EQ(std::tie(a.type, a.clipResult, a.codecResult), std::make_tuple(MEDIA_TYPE_MP4, MM_OK, MM_OK));
        EXPECT_NEAR(a.clip.nDuration / 1000.0, std::floor(std::atof(Probe(path, "format=duration").c_str())), 1.0);
        EXPECT_EQ(std::tie(a.codec.nAudioCodec, a.codec.nVideoCodec), std::make_tuple(0x4008u, c.videoCodec));
        EXPECT_EQ(a.clip.nWidth, std::stoul(Probe(path, "stream=width", "-select_streams v:0")));
        EXPECT_EQ(a.clip.nHeight, std::stoul(Probe(path, "stream=height", "-select_streams v:0")));
        EXPECT_EQ(a.clip.nSampleRate, std::stoul(Probe(path, "stream=sample_rate", "-select_streams a:0")));
        EXPECT_EQ(a.mask, TRACK_AUDIO | TRACK_VIDEO);
    }
    EXPECT_GT(made, 0);
    // Tags as iTunes items: text in UTF-8, the track a 4-byte binary number.
    const std::string path = dir.PathOf("tagged.m4a");
    ASSERT_TRUE(FfmpegWrite("-f lavfi -i sine=d=1 -c:a aac -metadata title='My Title' -metadata artist='Some Artist' "
                            "-metadata album='An Album' -metadata date=2020 -metadata track=3", path));
    const Answers a(path);
    ASSERT_EQ(a.metaResult, MM_OK);
    EXPECT_EQ(MetaSummary(a.meta), "title=5:My Title artist=5:Some Artist album=5:An Album year=5:2020 track=0:\\x03\\x00\\x00\\x00");
}
