// Real files: the MP4 family of the corpus (some of them hostile) and files
// written by ffmpeg, checked against what ffprobe reports.
#include <dirent.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cmath>
#include <cstdio>
#include <cstring>
#include <map>
#include <string>
#include <vector>

#include "metainfo/metainfo.h"
#include "metainfo/mp4.h"
#include "mp4/mp4_file.h"
#include "support/bytes.h"

using testing_support::CorpusDir;
using testing_support::TempDir;

namespace {

bool HasMp4Extension(const std::string& name) {
    for (const char* ext : {".m4a", ".mp4", ".m4b", ".m4v", ".3g2", ".3gp"}) {
        const size_t n = std::strlen(ext);
        if (name.size() > n && strcasecmp(name.c_str() + name.size() - n, ext) == 0) return true;
    }
    return false;
}

std::vector<std::string> CorpusMp4Files() {
    std::vector<std::string> out;
    const std::string root = CorpusDir();
    if (root.empty()) return out;
    for (const char* sub : {"/taglib", "/mutagen"}) {
        const std::string dir = root + sub;
        DIR* d = opendir(dir.c_str());
        if (d == nullptr) continue;
        while (dirent* e = readdir(d)) {
            if (HasMp4Extension(e->d_name)) out.push_back(dir + "/" + e->d_name);
        }
        closedir(d);
    }
    return out;
}

struct Answers {
    int type = 0;
    int32_t clipResult = 0, codecResult = 0, metaResult = 0, trackResult = 0;
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
    a.trackResult = MM_MediaExtractor_GetTrackType(p, MEDIA_TYPE_MP4, &a.mask);
    a.codecResult = MM_MediaExtractor_GetCodecType(p, MEDIA_TYPE_MP4, &a.codec);
    a.clipResult = MM_MediaExtractor_GetClipInfo(p, MEDIA_TYPE_MP4, &a.clip);
    a.metaResult = MM_MediaExtractor_GetMetaInfo(p, MEDIA_TYPE_MP4, &a.meta);
    _MAKERINFO maker;
    std::memset(&maker, 0, sizeof maker);
    MP4_GetMakerInfo(p, &maker);
    MM_MediaExtractor_FreeBuffer(maker.pPhoneModel);
    MM_MediaExtractor_FreeBuffer(maker.pThumbnail);
    MM_MediaExtractor_FreeBuffer(maker.pSmartAlbum);
    return a;
}

std::string Item(const _MMMetaInfo& meta, int kind) {
    return std::string(reinterpret_cast<const char*>(meta.aItems[kind].szData), meta.aItems[kind].nLength);
}

std::string RunCommand(const std::string& command) {
    std::string out;
    FILE* f = popen(command.c_str(), "r");
    if (f == nullptr) return out;
    char buf[512];
    while (size_t n = fread(buf, 1, sizeof buf, f)) out.append(buf, n);
    pclose(f);
    return out;
}

bool HaveFfmpeg() {
    struct stat st;
    return stat("/usr/bin/ffprobe", &st) == 0 && stat("/usr/bin/ffmpeg", &st) == 0;
}

// key=value lines of ffprobe for the format and each stream, "stream.N.key" / "format.key".
std::map<std::string, std::string> Probe(const std::string& path) {
    std::map<std::string, std::string> out;
    std::string text = RunCommand("/usr/bin/ffprobe -v error -show_entries "
                           "format=duration:stream=index,codec_name,codec_type,width,height,sample_rate "
                           "-of flat '" + path + "'");
    size_t pos = 0;
    while (pos < text.size()) {
        size_t end = text.find('\n', pos);
        if (end == std::string::npos) end = text.size();
        std::string line = text.substr(pos, end - pos);
        pos = end + 1;
        size_t eq = line.find('=');
        if (eq == std::string::npos) continue;
        std::string value = line.substr(eq + 1);
        if (value.size() >= 2 && value.front() == '"') value = value.substr(1, value.size() - 2);
        out[line.substr(0, eq)] = value;
    }
    return out;
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
    EXPECT_EQ(tagged.clip.nChannels, 2u);
    EXPECT_EQ(tagged.codec.nAudioCodec, 0x4008u);
    EXPECT_EQ(tagged.codec.nAudioSubType, 0x2102u);
    EXPECT_EQ(tagged.mask, TRACK_AUDIO);
    MM_MediaExtractor_FreeMetaInfo(&tagged.meta);

    Answers plain = AskEverything(root + "/taglib/no-tags.m4a");
    ASSERT_EQ(plain.metaResult, MM_OK);
    for (int k = 0; k < MM_META_ITEMS; ++k) EXPECT_EQ(plain.meta.aItems[k].nLength, 0u) << k;
    EXPECT_EQ(plain.clip.nDuration, 3000u);
    EXPECT_EQ(plain.clip.nFileSize, 2898u);
    EXPECT_STREQ(plain.clip.szFormat, "m4a");

    Answers last = AskEverything(root + "/taglib/ilst-is-last.m4a");
    EXPECT_EQ(Item(last.meta, META_TITLE), "Intro");
    EXPECT_EQ(Item(last.meta, META_ARTIST), "Pearl Jam");
    EXPECT_EQ(Item(last.meta, META_YEAR), "1995");
    EXPECT_EQ(last.clip.nDuration, 65000u);

    Answers genre = AskEverything(root + "/taglib/gnre.m4a");
    EXPECT_EQ(Item(genre.meta, META_GENRE), "Ska");
}

TEST(Mp4Ffmpeg, WrittenFilesMatchFfprobe) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg absent";
    TempDir dir;
    struct Case {
        std::string name;
        std::string args;
        uint32_t audioCodec, videoCodec;
    };
    const std::string video = "-f lavfi -i testsrc=d=2:s=320x240:r=25 ";
    const std::string audio = "-f lavfi -i sine=d=2:sample_rate=48000 ";
    std::vector<Case> cases = {
        {"mpeg4.mp4", video + audio + "-c:v mpeg4 -c:a aac -shortest", 0x4008, 0x4001},
        {"h264.mp4", video + audio + "-c:v libx264 -pix_fmt yuv420p -c:a aac -shortest", 0x4008, 0x4004},
        {"h263.3gp", "-f lavfi -i testsrc=d=3:s=176x144:r=15 -f lavfi -i sine=d=3:sample_rate=16000 "
                     "-c:v h263 -c:a aac -ac 1 -shortest", 0x4008, 0x4003},
        {"tone.m4a", "-f lavfi -i sine=d=3:sample_rate=44100 -c:a aac", 0x4008, 0},
    };
    int made = 0;
    for (const Case& c : cases) {
        SCOPED_TRACE(c.name);
        const std::string path = dir.PathOf(c.name);
        RunCommand("/usr/bin/ffmpeg -nostdin -v error -y " + c.args + " '" + path + "' 2>&1");
        struct stat st;
        if (stat(path.c_str(), &st) != 0 || st.st_size == 0) continue;  // encoder not built in
        ++made;
        std::map<std::string, std::string> probe = Probe(path);
        Answers a = AskEverything(path);
        ASSERT_EQ(a.type, MEDIA_TYPE_MP4);
        ASSERT_EQ(a.clipResult, MM_OK);
        ASSERT_EQ(a.codecResult, MM_OK);
        const double seconds = std::atof(probe["format.duration"].c_str());
        EXPECT_NEAR(a.clip.nDuration / 1000.0, std::floor(seconds), 1.0);
        EXPECT_EQ(a.codec.nAudioCodec, c.audioCodec);
        EXPECT_EQ(a.codec.nVideoCodec, c.videoCodec);
        for (int i = 0; i < 2; ++i) {
            const std::string s = "streams.stream." + std::to_string(i) + ".";
            if (probe[s + "codec_type"] == "video") {
                EXPECT_EQ(a.clip.nWidth, static_cast<uint32_t>(std::atoi(probe[s + "width"].c_str())));
                EXPECT_EQ(a.clip.nHeight, static_cast<uint32_t>(std::atoi(probe[s + "height"].c_str())));
                EXPECT_EQ(a.mask & TRACK_VIDEO, TRACK_VIDEO);
            } else if (probe[s + "codec_type"] == "audio") {
                EXPECT_EQ(a.clip.nSampleRate, static_cast<uint32_t>(std::atoi(probe[s + "sample_rate"].c_str())));
                EXPECT_EQ(a.mask & TRACK_AUDIO, TRACK_AUDIO);
            }
        }
        MM_MediaExtractor_FreeMetaInfo(&a.meta);
    }
    EXPECT_GT(made, 0);
    std::printf("[ info ] %d of %zu ffmpeg files could be written\n", made, cases.size());
}

TEST(Mp4Ffmpeg, TagsWrittenByFfmpegAreRead) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg absent";
    TempDir dir;
    const std::string path = dir.PathOf("tagged.m4a");
    RunCommand("/usr/bin/ffmpeg -nostdin -v error -y -f lavfi -i sine=d=1 -c:a aac -metadata title='My Title' "
        "-metadata artist='Some Artist' -metadata album='An Album' -metadata date=2020 -metadata track=3 '" +
        path + "' 2>&1");
    struct stat st;
    if (stat(path.c_str(), &st) != 0) GTEST_SKIP() << "ffmpeg could not write m4a";
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
