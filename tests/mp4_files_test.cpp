// Real files: the MP4 family of the corpus (some of them hostile) and files
// written by ffmpeg, checked against what ffprobe reports.
#include <dirent.h>
#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <string>
#include <vector>

#include "metainfo/metainfo.h"
#include "metainfo/mp4.h"
#include "mp4/mp4_file.h"
#include "support/bytes.h"
#include "support/ffprobe.h"

using namespace testing_support;

namespace {

std::vector<std::string> CorpusMp4Files() {
    std::vector<std::string> out;
    const std::string root = CorpusDir();
    for (const char* sub : {"/taglib", "/mutagen"}) {
        DIR* d = root.empty() ? nullptr : opendir((root + sub).c_str());
        while (dirent* e = d ? readdir(d) : nullptr) {
            const char* dot = std::strrchr(e->d_name, '.');
            for (const char* ext : {".m4a", ".mp4", ".m4b", ".m4v", ".3g2", ".3gp"}) {
                if (dot != nullptr && strcasecmp(dot, ext) == 0) out.push_back(root + sub + "/" + e->d_name);
            }
        }
        if (d != nullptr) closedir(d);
    }
    return out;
}

struct Answers {
    int type = 0;
    int32_t clipResult = 0, codecResult = 0, metaResult = 0;
    _MMClipInfo clip{};
    _MM_CODECTYPE codec{};
    _MMMetaInfo meta{};
    int mask = 0;
};

// Every query of the public interface, plus the MP4 functions called directly.
Answers AskEverything(const std::string& path) {
    Answers a;
    const char* p = path.c_str();
    MM_MediaExtractor_DetectMediaType(p, &a.type);
    MM_MediaExtractor_GetTrackType(p, MEDIA_TYPE_MP4, &a.mask);
    a.codecResult = MM_MediaExtractor_GetCodecType(p, MEDIA_TYPE_MP4, &a.codec);
    a.clipResult = MM_MediaExtractor_GetClipInfo(p, MEDIA_TYPE_MP4, &a.clip);
    a.metaResult = MM_MediaExtractor_GetMetaInfo(p, MEDIA_TYPE_MP4, &a.meta);
    _MAKERINFO maker{};
    MP4_GetMakerInfo(p, &maker);
    MM_MediaExtractor_FreeBuffer(maker.pPhoneModel);
    MM_MediaExtractor_FreeBuffer(maker.pThumbnail);
    MM_MediaExtractor_FreeBuffer(maker.pSmartAlbum);
    return a;
}

std::string Item(const _MMMetaInfo& meta, int kind) {
    return std::string(reinterpret_cast<const char*>(meta.aItems[kind].szData), meta.aItems[kind].nLength);
}

}  // namespace

TEST(Mp4Corpus, EveryMp4FamilyFileIsAnsweredWithoutAFault) {
    std::vector<std::string> files = CorpusMp4Files();
    if (files.empty()) GTEST_SKIP() << "no corpus";
    EXPECT_GE(files.size(), 20u);
    for (const std::string& path : files) {
        SCOPED_TRACE(path);
        Answers a = AskEverything(path);
        if (a.type == MEDIA_TYPE_MP4 && a.clipResult == MM_OK) {
            EXPECT_GE(a.clip.nDuration, 1000u);
            EXPECT_GT(a.clip.nFileSize, 0u);
        }
        MM_MediaExtractor_FreeMetaInfo(&a.meta);
    }
}

TEST(Mp4Corpus, TaggedAndUntaggedM4aAsByHand) {
    const std::string root = CorpusDir();
    if (root.empty()) GTEST_SKIP() << "no corpus";
    Answers tagged = AskEverything(root + "/taglib/has-tags.m4a");
    ASSERT_EQ(tagged.metaResult, MM_OK);
    EXPECT_EQ(Item(tagged.meta, META_ARTIST), "Test Artist");
    EXPECT_EQ(tagged.meta.aItems[META_TITLE].nLength, 0u) << "only \xA9too, \xA9" "ART, ---- and covr are stored";
    EXPECT_EQ(tagged.meta.pPicture, nullptr) << "covr is not an item MP4 reports";
    EXPECT_EQ(tagged.clip.nDuration, 3000u) << "3.7 s in whole seconds";
    EXPECT_EQ(tagged.clip.nSampleRate, 44100u);
    EXPECT_EQ(tagged.codec.nAudioSubType, 0x2102u);
    EXPECT_EQ(tagged.mask, TRACK_AUDIO);
    MM_MediaExtractor_FreeMetaInfo(&tagged.meta);

    Answers plain = AskEverything(root + "/taglib/no-tags.m4a");
    ASSERT_EQ(plain.metaResult, MM_OK);
    for (int k = 0; k < MM_META_ITEMS; ++k) EXPECT_EQ(plain.meta.aItems[k].nLength, 0u) << k;
    EXPECT_EQ(plain.clip.nFileSize, 2898u);
    EXPECT_STREQ(plain.clip.szFormat, "m4a");

    Answers last = AskEverything(root + "/taglib/ilst-is-last.m4a");
    EXPECT_EQ(Item(last.meta, META_TITLE), "Intro");
    EXPECT_EQ(Item(last.meta, META_YEAR), "1995");
    EXPECT_EQ(last.clip.nDuration, 65000u);

    Answers genre = AskEverything(root + "/taglib/gnre.m4a");
    EXPECT_EQ(Item(genre.meta, META_GENRE), "Ska");
}

TEST(Mp4Ffmpeg, WrittenFilesMatchFfprobe) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg absent";
    TempDir dir;
    struct Case {
        std::string name, args;
        uint32_t videoCodec;
    };
    const std::string sources = "-f lavfi -i testsrc=d=2:s=176x144:r=15 -f lavfi -i sine=d=2:sample_rate=16000 ";
    const std::vector<Case> cases = {{"mpeg4.mp4", "-c:v mpeg4", 0x4001},
                                     {"h264.mp4", "-c:v libx264 -pix_fmt yuv420p", 0x4004},
                                     {"h263.3gp", "-c:v h263", 0x4003}};
    int made = 0;
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        const std::string path = dir.PathOf(c.name);
        if (!FfmpegWrite(sources + c.args + " -c:a aac -ac 1 -shortest", path)) continue;  // encoder not built in
        ++made;
        Answers a = AskEverything(path);
        ASSERT_EQ(a.type, MEDIA_TYPE_MP4);
        ASSERT_EQ(a.clipResult, MM_OK);
        ASSERT_EQ(a.codecResult, MM_OK);
        EXPECT_NEAR(a.clip.nDuration / 1000.0, std::floor(std::atof(Probe(path, "format=duration").c_str())), 1.0);
        EXPECT_EQ(a.codec.nAudioCodec, 0x4008u);
        EXPECT_EQ(a.codec.nVideoCodec, c.videoCodec);
        EXPECT_EQ(a.clip.nWidth, std::stoul(Probe(path, "stream=width", "-select_streams v:0")));
        EXPECT_EQ(a.clip.nHeight, std::stoul(Probe(path, "stream=height", "-select_streams v:0")));
        EXPECT_EQ(a.clip.nSampleRate, std::stoul(Probe(path, "stream=sample_rate", "-select_streams a:0")));
        EXPECT_EQ(a.mask, TRACK_AUDIO | TRACK_VIDEO);
        MM_MediaExtractor_FreeMetaInfo(&a.meta);
    }
    EXPECT_GT(made, 0);
}

TEST(Mp4Ffmpeg, TagsWrittenByFfmpegAreRead) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg absent";
    TempDir dir;
    const std::string path = dir.PathOf("tagged.m4a");
    if (!FfmpegWrite("-f lavfi -i sine=d=1 -c:a aac -metadata title='My Title' -metadata artist='Some Artist' "
                     "-metadata album='An Album' -metadata date=2020 -metadata track=3", path)) {
        GTEST_SKIP() << "ffmpeg could not write m4a";
    }
    Answers a = AskEverything(path);
    ASSERT_EQ(a.metaResult, MM_OK);
    EXPECT_EQ(Item(a.meta, META_TITLE), "My Title");
    EXPECT_EQ(Item(a.meta, META_ARTIST), "Some Artist");
    EXPECT_EQ(Item(a.meta, META_ALBUM), "An Album");
    EXPECT_EQ(Item(a.meta, META_YEAR), "2020");
    uint32_t track = 0;
    std::memcpy(&track, a.meta.aItems[META_TRACKNUMBER].szData, 4);
    EXPECT_EQ(track, 3u);
    EXPECT_EQ(a.meta.aItems[META_TITLE].nEncoding, 5u);
    MM_MediaExtractor_FreeMetaInfo(&a.meta);
}
