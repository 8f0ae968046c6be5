// ASF files written by other tools: the corpus and files that ffmpeg writes,
// checked against what ffprobe reports.
#include <dirent.h>
#include <strings.h>

#include <cstdio>
#include <cstdlib>
#include <map>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "metainfo/metainfo.h"
#include "support/bytes.h"

using namespace testing_support;

namespace {

// key=value lines of ffprobe for one selection of the file (the first of each key).
std::map<std::string, std::string> Probe(const std::string& path, const std::string& select) {
    std::map<std::string, std::string> values;
    FILE* p = popen(("/usr/bin/ffprobe -v error " + select + " -of default=nw=1 '" + path + "'").c_str(), "r");
    if (p == nullptr) return values;
    char line[4096];
    while (std::fgets(line, sizeof line, p) != nullptr) {
        std::string s(line);
        if (!s.empty() && s.back() == '\n') s.pop_back();
        const size_t eq = s.find('=');
        if (eq != std::string::npos) values.emplace(s.substr(0, eq), s.substr(eq + 1));
    }
    pclose(p);
    return values;
}

uint32_t Number(const std::map<std::string, std::string>& v, const char* key) {
    auto it = v.find(key);
    return it == v.end() ? 0 : static_cast<uint32_t>(std::strtoul(it->second.c_str(), nullptr, 10));
}

std::string Narrow(const _MMMetaItem& item) {
    std::string s;
    for (uint32_t i = 0; i + 1 < item.nLength && item.szData[i] != 0; i += 2) s.push_back(static_cast<char>(item.szData[i]));
    return s;
}

struct Answers {
    int type = 0;
    int32_t track = 0, codecResult = 0, clipResult = 0, metaResult = 0;
    int mask = 0;
    _MM_CODECTYPE codec{};
    _MMClipInfo clip{};
    _MMMetaInfo meta{};
    ~Answers() { MM_MediaExtractor_FreeMetaInfo(&meta); }
};

void Ask(const std::string& path, Answers* a) {
    ASSERT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &a->type), 0) << path;
    ASSERT_EQ(a->type, MEDIA_TYPE_ASF) << path;
    a->track = MM_MediaExtractor_GetTrackType(path.c_str(), a->type, &a->mask);
    a->codecResult = MM_MediaExtractor_GetCodecType(path.c_str(), a->type, &a->codec);
    a->clipResult = MM_MediaExtractor_GetClipInfo(path.c_str(), a->type, &a->clip);
    a->metaResult = MM_MediaExtractor_GetMetaInfo(path.c_str(), a->type, &a->meta);
}

}  // namespace

TEST(AsfCorpus, EveryWmaIsAnsweredAndAgreesWithFfprobe) {
    const std::string corpus = CorpusDir();
    if (corpus.empty()) GTEST_SKIP() << "no corpus";
    int files = 0;
    for (const char* sub : {"/mutagen/", "/taglib/"}) {
        DIR* d = opendir((corpus + sub).c_str());
        ASSERT_NE(d, nullptr);
        while (dirent* e = readdir(d)) {
            const std::string name = e->d_name;
            if (name.size() <= 4 || strcasecmp(name.c_str() + name.size() - 4, ".wma") != 0) continue;
            const std::string path = corpus + sub + name;
            ++files;
            Answers a;
            Ask(path, &a);
            EXPECT_EQ(a.track, 0) << path;
            EXPECT_EQ(a.mask & TRACK_AUDIO, TRACK_AUDIO) << path;
            EXPECT_EQ(a.codecResult, 0) << path;
            ASSERT_EQ(a.clipResult, 0) << path;
            EXPECT_EQ(a.metaResult, 0) << path;
            EXPECT_GE(a.clip.bHasAudio, 1u) << path;
            if (!HaveFfmpeg()) continue;
            auto audio = Probe(path, "-select_streams a:0 -show_entries stream=sample_rate,channels");
            EXPECT_EQ(a.clip.nSampleRate, Number(audio, "sample_rate")) << path;
            EXPECT_EQ(a.clip.nChannels, Number(audio, "channels")) << path;
        }
        closedir(d);
    }
    EXPECT_GT(files, 0);
}

// Audio alone and with WMV1 and WMV2 video: every query agrees with ffprobe;
// durations are whole seconds.
TEST(AsfFfmpeg, WrittenFilesAgreeWithFfprobe) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg not installed";
    TempDir dir;
    struct Case { const char* name; const char* videoInput; const char* videoCodec; uint32_t videoCode; };
    for (const Case& c : {Case{"tone.wma", "", "", 0}, Case{"v1.wmv", "-f lavfi -i testsrc=d=2:s=176x144:r=15", "-c:v wmv1", 0x5001},
                          Case{"v2.wmv", "-f lavfi -i testsrc=d=2:s=320x240:r=25", "-c:v wmv2", 0x5002}}) {
        const std::string path = dir.PathOf(c.name);
        const std::string cmd = std::string("/usr/bin/ffmpeg -nostdin -v error -y ") + c.videoInput +
                                " -f lavfi -i sine=f=440:d=2 " + c.videoCodec + " -ar 44100 -c:a wmav2 -b:a 128k "
                                "-metadata title=Tone -metadata artist=Someone -metadata album=Record '" + path + "'";
        ASSERT_EQ(std::system(cmd.c_str()), 0) << cmd;
        Answers a;
        Ask(path, &a);
        ASSERT_EQ(a.clipResult, 0) << c.name;
        ASSERT_EQ(a.metaResult, 0) << c.name;
        auto format = Probe(path, "-show_entries format=duration,size:format_tags=title,artist,album");
        auto audio = Probe(path, "-select_streams a:0 -show_entries stream=sample_rate,channels");
        EXPECT_EQ(a.mask, c.videoCode != 0 ? TRACK_AUDIO | TRACK_VIDEO : TRACK_AUDIO) << c.name;
        EXPECT_EQ(a.codec.nAudioCodec, 0x6001u) << c.name;
        EXPECT_EQ(a.codec.nAudioProfile, 0x6010u) << c.name;
        EXPECT_EQ(a.codec.nVideoCodec, c.videoCode) << c.name;
        EXPECT_STREQ(a.clip.szFormat, c.name + std::string(c.name).size() - 3);
        EXPECT_EQ(a.clip.nFileSize, Number(format, "size")) << c.name;
        EXPECT_NEAR(a.clip.nDuration, std::strtod(format["duration"].c_str(), nullptr) * 1000.0, 1000.0) << c.name;
        EXPECT_EQ(a.clip.nDuration % 1000, 0u) << c.name;
        EXPECT_EQ(a.clip.nSampleRate, Number(audio, "sample_rate")) << c.name;
        EXPECT_EQ(a.clip.nChannels, Number(audio, "channels")) << c.name;
        EXPECT_EQ(a.clip.bHasAudio, 1u) << c.name;
        EXPECT_EQ(a.clip.bHasVideo, c.videoCode != 0 ? 1u : 0u) << c.name;
        if (c.videoCode != 0) {
            auto video = Probe(path, "-select_streams v:0 -show_entries stream=width,height");
            EXPECT_EQ(a.clip.nWidth, Number(video, "width")) << c.name;
            EXPECT_EQ(a.clip.nHeight, Number(video, "height")) << c.name;
        }
        EXPECT_EQ(format["TAG:title"], "Tone") << c.name;
        EXPECT_EQ(Narrow(a.meta.aItems[META_TITLE]), format["TAG:title"]) << c.name;
        EXPECT_EQ(Narrow(a.meta.aItems[META_ARTIST]), format["TAG:artist"]) << c.name;
        EXPECT_EQ(Narrow(a.meta.aItems[META_ALBUM]), format["TAG:album"]) << c.name;
    }
}
