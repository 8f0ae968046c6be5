// ASF files written by other tools: the corpus and files that ffmpeg writes,
// checked against what ffprobe reports.
#include <dirent.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <map>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "metainfo/metainfo.h"
#include "support/bytes.h"

using namespace testing_support;

namespace {

bool HasTool(const char* path) { return access(path, X_OK) == 0; }

void FindWma(const std::string& dir, std::vector<std::string>* out) {
    DIR* d = opendir(dir.c_str());
    if (d == nullptr) return;
    while (dirent* e = readdir(d)) {
        std::string name = e->d_name;
        if (name == "." || name == "..") continue;
        std::string full = dir + "/" + name;
        struct stat st;
        if (stat(full.c_str(), &st) != 0) continue;
        if (S_ISDIR(st.st_mode)) {
            FindWma(full, out);
        } else if (name.size() > 4 && strcasecmp(name.c_str() + name.size() - 4, ".wma") == 0) {
            out->push_back(full);
        }
    }
    closedir(d);
}

std::string Run(const std::string& command) {
    std::string out;
    if (FILE* p = popen(command.c_str(), "r")) {
        char buf[4096];
        size_t n;
        while ((n = fread(buf, 1, sizeof buf, p)) > 0) out.append(buf, n);
        pclose(p);
    }
    return out;
}

// key=value lines of ffprobe for one selection of the file.
std::map<std::string, std::string> Probe(const std::string& path, const std::string& select) {
    std::string out = Run("/usr/bin/ffprobe -v error " + select + " -of default=nw=1 '" + path + "'");
    std::map<std::string, std::string> values;
    size_t pos = 0;
    while (pos < out.size()) {
        size_t end = out.find('\n', pos);
        if (end == std::string::npos) end = out.size();
        std::string line = out.substr(pos, end - pos);
        size_t eq = line.find('=');
        if (eq != std::string::npos && values.count(line.substr(0, eq)) == 0) {
            values[line.substr(0, eq)] = line.substr(eq + 1);
        }
        pos = end + 1;
    }
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

// Whole seconds of play time, as the library counts them, against ffprobe's.
void ExpectDuration(const Answers& a, const std::map<std::string, std::string>& format) {
    double seconds = std::strtod(format.at("duration").c_str(), nullptr);
    EXPECT_NEAR(a.clip.nDuration, seconds * 1000.0, 1000.0);
    EXPECT_EQ(a.clip.nDuration % 1000, 0u);
}

class FfmpegAsf : public ::testing::Test {
protected:
    void SetUp() override {
        if (!HasTool("/usr/bin/ffmpeg") || !HasTool("/usr/bin/ffprobe")) GTEST_SKIP() << "ffmpeg absent";
    }
    std::string Make(const std::string& name, const std::string& args) {
        std::string path = dir_.PathOf(name);
        int rc = std::system(("/usr/bin/ffmpeg -nostdin -v error -y " + args + " '" + path + "'").c_str());
        EXPECT_EQ(rc, 0) << args;
        return path;
    }
    TempDir dir_;
};

}  // namespace

TEST(AsfCorpus, EveryWmaIsAnsweredAndAgreesWithFfprobe) {
    std::string corpus = CorpusDir();
    if (corpus.empty()) GTEST_SKIP() << "no corpus";
    std::vector<std::string> files;
    FindWma(corpus, &files);
    ASSERT_FALSE(files.empty());
    bool probe = HasTool("/usr/bin/ffprobe");
    for (const auto& path : files) {
        Answers a;
        Ask(path, &a);
        EXPECT_EQ(a.track, 0) << path;
        EXPECT_EQ(a.mask & TRACK_AUDIO, TRACK_AUDIO) << path;
        EXPECT_EQ(a.codecResult, 0) << path;
        ASSERT_EQ(a.clipResult, 0) << path;
        EXPECT_EQ(a.metaResult, 0) << path;
        EXPECT_GE(a.clip.bHasAudio, 1u) << path;
        if (!probe) continue;
        auto audio = Probe(path, "-select_streams a:0 -show_entries stream=sample_rate,channels");
        EXPECT_EQ(a.clip.nSampleRate, Number(audio, "sample_rate")) << path;
        EXPECT_EQ(a.clip.nChannels, Number(audio, "channels")) << path;
    }
}

TEST_F(FfmpegAsf, Wmav2WithTags) {
    std::string path = Make("tone.wma", "-f lavfi -i sine=f=440:d=2 -ar 44100 -c:a wmav2 -b:a 128k "
                                        "-metadata title=Tone -metadata artist=Someone -metadata album=Record");
    Answers a;
    Ask(path, &a);
    ASSERT_EQ(a.clipResult, 0);
    auto format = Probe(path, "-show_entries format=duration,size:format_tags=title,artist,album");
    auto audio = Probe(path, "-select_streams a:0 -show_entries stream=codec_name,sample_rate,channels");
    EXPECT_EQ(audio["codec_name"], "wmav2");
    EXPECT_EQ(a.mask, TRACK_AUDIO);
    EXPECT_EQ(a.codec.nAudioCodec, 0x6001u);
    EXPECT_EQ(a.codec.nAudioProfile, 0x6010u);
    EXPECT_EQ(a.clip.nFileSize, Number(format, "size"));
    ExpectDuration(a, format);
    EXPECT_EQ(a.clip.nSampleRate, Number(audio, "sample_rate"));
    EXPECT_EQ(a.clip.nChannels, Number(audio, "channels"));
    EXPECT_EQ(a.clip.bHasVideo, 0u);
    EXPECT_STREQ(a.clip.szFormat, "wma");
    ASSERT_EQ(a.metaResult, 0);
    EXPECT_EQ(format["TAG:title"], "Tone");
    EXPECT_EQ(Narrow(a.meta.aItems[META_TITLE]), format["TAG:title"]);
    EXPECT_EQ(Narrow(a.meta.aItems[META_ARTIST]), format["TAG:artist"]);
    EXPECT_EQ(Narrow(a.meta.aItems[META_ALBUM]), format["TAG:album"]);
}

TEST_F(FfmpegAsf, Wmv1AndWmv2VideoWithAudio) {
    struct Case {
        const char* codec;
        uint32_t code;
        const char* size;
        int rate;
    } cases[] = {{"wmv1", 0x5001, "176x144", 15}, {"wmv2", 0x5002, "320x240", 25}};
    for (const Case& c : cases) {
        std::string path = Make(std::string(c.codec) + ".wmv",
                                std::string("-f lavfi -i testsrc=d=2:s=") + c.size + ":r=" + std::to_string(c.rate) +
                                    " -f lavfi -i sine=d=2 -c:v " + c.codec + " -c:a wmav2 -metadata title=Clip");
        Answers a;
        Ask(path, &a);
        ASSERT_EQ(a.clipResult, 0) << c.codec;
        auto format = Probe(path, "-show_entries format=duration,size:format_tags=title");
        auto video = Probe(path, "-select_streams v:0 -show_entries stream=codec_name,width,height");
        auto audio = Probe(path, "-select_streams a:0 -show_entries stream=sample_rate,channels");
        EXPECT_EQ(video["codec_name"], c.codec);
        EXPECT_EQ(a.mask, TRACK_AUDIO | TRACK_VIDEO) << c.codec;
        EXPECT_EQ(a.codec.nVideoCodec, c.code) << c.codec;
        EXPECT_EQ(a.codec.nAudioCodec, 0x6001u) << c.codec;
        EXPECT_EQ(a.clip.nFileSize, Number(format, "size")) << c.codec;
        ExpectDuration(a, format);
        EXPECT_EQ(a.clip.nWidth, Number(video, "width")) << c.codec;
        EXPECT_EQ(a.clip.nHeight, Number(video, "height")) << c.codec;
        EXPECT_EQ(a.clip.nSampleRate, Number(audio, "sample_rate")) << c.codec;
        EXPECT_EQ(a.clip.nChannels, Number(audio, "channels")) << c.codec;
        EXPECT_EQ(a.clip.bHasAudio, 1u);
        EXPECT_EQ(a.clip.bHasVideo, 1u);
        EXPECT_EQ(format["TAG:title"], "Clip");
        EXPECT_EQ(Narrow(a.meta.aItems[META_TITLE]), format["TAG:title"]) << c.codec;
    }
}
