// ASF files written by other tools: the corpus and files that ffmpeg writes,
// checked against what ffprobe reports.
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <string>
#include <tuple>

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

// Every query of the public interface, which must all succeed.
struct Answers {
    int type = 0, mask = 0;
    _MM_CODECTYPE codec{};
    _MMClipInfo clip{};
    _MMMetaInfo meta{};
    explicit Answers(const std::string& path) {
        const char* p = path.c_str();
        EXPECT_EQ(MM_MediaExtractor_DetectMediaType(p, &type), 0);
        EXPECT_EQ(type, MEDIA_TYPE_ASF);
        EXPECT_EQ(MM_MediaExtractor_GetTrackType(p, type, &mask), 0);
        EXPECT_EQ(MM_MediaExtractor_GetCodecType(p, type, &codec), 0);
        EXPECT_EQ(MM_MediaExtractor_GetClipInfo(p, type, &clip), 0);
        EXPECT_EQ(MM_MediaExtractor_GetMetaInfo(p, type, &meta), 0);
    }
    Answers(const Answers&) = delete;
    ~Answers() { MM_MediaExtractor_FreeMetaInfo(&meta); }
};

}  // namespace

TEST(AsfCorpus, EveryWmaIsAnsweredAndAgreesWithFfprobe) {
    const std::string corpus = CorpusDir();
    if (corpus.empty()) GTEST_SKIP() << "no corpus";
    int files = 0;
    for (const char* sub : {"/mutagen/", "/taglib/"}) {
        for (const auto& entry : std::filesystem::directory_iterator(corpus + sub)) {
            if (entry.path().extension() != ".wma") continue;
            const std::string path = entry.path().string();
            SCOPED_TRACE(path);
            ++files;
            const Answers a(path);
            EXPECT_EQ(a.mask & TRACK_AUDIO, TRACK_AUDIO);
            EXPECT_GE(a.clip.bHasAudio, 1u);
            if (!HaveFfmpeg()) continue;
            auto audio = Probe(path, "-select_streams a:0 -show_entries stream=sample_rate,channels");
            EXPECT_EQ(a.clip.nSampleRate, Number(audio, "sample_rate"));
            EXPECT_EQ(a.clip.nChannels, Number(audio, "channels"));
        }
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
        SCOPED_TRACE(c.name);
        const std::string path = dir.PathOf(c.name);
        const std::string cmd = std::string("/usr/bin/ffmpeg -nostdin -v error -y ") + c.videoInput +
                                " -f lavfi -i sine=f=440:d=2 " + c.videoCodec + " -ar 44100 -c:a wmav2 -b:a 128k "
                                "-metadata title=Tone -metadata artist=Someone -metadata album=Record '" + path + "'";
        ASSERT_EQ(std::system(cmd.c_str()), 0) << cmd;
        const Answers a(path);
        auto format = Probe(path, "-show_entries format=duration,size:format_tags=title,artist,album");
        auto audio = Probe(path, "-select_streams a:0 -show_entries stream=sample_rate,channels");
        auto video = Probe(path, "-select_streams v:0 -show_entries stream=width,height");
        const bool hasVideo = c.videoCode != 0;
        EXPECT_EQ(a.mask, hasVideo ? TRACK_AUDIO | TRACK_VIDEO : TRACK_AUDIO);
        EXPECT_EQ(std::make_tuple(a.codec.nAudioCodec, a.codec.nAudioProfile, a.codec.nVideoCodec),
                  std::make_tuple(0x6001u, 0x6010u, c.videoCode));
        EXPECT_STREQ(a.clip.szFormat, c.name + std::string(c.name).size() - 3);
        EXPECT_EQ(a.clip.nFileSize, Number(format, "size"));
        EXPECT_NEAR(a.clip.nDuration, std::strtod(format["duration"].c_str(), nullptr) * 1000.0, 1000.0);
        EXPECT_EQ(a.clip.nDuration % 1000, 0u);
        EXPECT_EQ(std::make_tuple(a.clip.nSampleRate, a.clip.nChannels, a.clip.bHasAudio, a.clip.bHasVideo),
                  std::make_tuple(Number(audio, "sample_rate"), Number(audio, "channels"), 1u, hasVideo ? 1u : 0u));
        EXPECT_EQ(std::make_pair(a.clip.nWidth, a.clip.nHeight), std::make_pair(Number(video, "width"), Number(video, "height")));
        EXPECT_EQ(format["TAG:title"], "Tone");
        EXPECT_EQ(Narrow(a.meta.aItems[META_TITLE]), format["TAG:title"]);
        EXPECT_EQ(Narrow(a.meta.aItems[META_ARTIST]), format["TAG:artist"]);
        EXPECT_EQ(Narrow(a.meta.aItems[META_ALBUM]), format["TAG:album"]);
    }
}
