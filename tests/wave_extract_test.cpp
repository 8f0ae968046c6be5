// WAVE range extraction into a buffer or a new file; and every WAVE file of
// the corpus answered without a fault.
#include <gtest/gtest.h>

#include <dirent.h>
#include <sys/stat.h>

#include <cstdio>
#include <cstdlib>
#include <string>

#include "metainfo/extract.h"
#include "metainfo/metainfo.h"
#include "speech/wave.h"
#include "support/bytes.h"
#include "support/speech_builder.h"

using namespace testing_support;

namespace {

// Three seconds of 8 kHz 16-bit mono: 16000 bytes a second from offset 36.
struct ThreeSeconds : ::testing::Test {
    void SetUp() override {
        source = CanonicalWave(1, 1, 8000, 16, 48000);
        for (size_t i = 44; i < source.size(); ++i) source[i] = static_cast<uint8_t>(i * 7);
        path = dir.Write("tone.wav", source);
    }
    TempDir dir;
    std::vector<uint8_t> source;
    std::string path;
};

std::string Ffprobe(const std::string& file, const std::string& entries) {
    std::string cmd = "/usr/bin/ffprobe -v error -show_entries " + entries + " -of csv=p=0 '" + file + "' 2>&1";
    FILE* p = popen(cmd.c_str(), "r");
    if (p == nullptr) return "";
    std::string out;
    char line[256];
    while (std::fgets(line, sizeof line, p) != nullptr) out += line;
    pclose(p);
    return out;
}

void Le32(std::vector<uint8_t>* v, uint32_t x) {
    for (int i = 0; i < 4; ++i) v->push_back(static_cast<uint8_t>(x >> (8 * i)));
}

void CollectWaves(const std::string& dir, std::vector<std::string>* out) {
    DIR* d = opendir(dir.c_str());
    if (d == nullptr) return;
    while (dirent* e = readdir(d)) {
        std::string name = e->d_name;
        if (name == "." || name == "..") continue;
        std::string full = dir + "/" + name;
        struct stat st;
        if (stat(full.c_str(), &st) != 0) continue;
        if (S_ISDIR(st.st_mode)) {
            CollectWaves(full, out);
        } else if (name.size() > 4 && name.compare(name.size() - 4, 4, ".wav") == 0) {
            out->push_back(full);
        }
    }
    closedir(d);
}

}  // namespace

TEST_F(ThreeSeconds, BufferFromSecondZeroStartsWithTheDataHeader) {
    unsigned char* data = nullptr;
    int size = 0;
    ASSERT_EQ(MM_MediaExtractor_GetAudioData(path.c_str(), 0, 1, &data, &size), MM_OK);
    ASSERT_EQ(size, 16000);
    EXPECT_TRUE(std::equal(data, data + size, source.begin() + 36));
    EXPECT_EQ(std::string(data, data + 4), "data");
    MM_MediaExtractor_FreeBuffer(data);
}

TEST_F(ThreeSeconds, EndBeyondDurationIsCutAndStartBeyondIsInvalid) {
    unsigned char* data = nullptr;
    int size = 0;
    ASSERT_EQ(metainfo::WAVE_GetAudioData2Buf(path.c_str(), 2, 10, &data, &size), MM_OK);
    EXPECT_EQ(size, 16000);
    EXPECT_TRUE(std::equal(data, data + size, source.begin() + 36 + 32000));
    MM_MediaExtractor_FreeBuffer(data);
    data = nullptr;
    EXPECT_EQ(metainfo::WAVE_GetAudioData2Buf(path.c_str(), 4, 10, &data, &size), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::WAVE_GetAudioData2Buf(path.c_str(), 2, 2, &data, &size), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::WAVE_GetAudioData2Buf(path.c_str(), -1, 2, &data, &size), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::WAVE_GetAudioData2Buf(path.c_str(), 0, 2, nullptr, &size), MM_E_INVALIDARG);
    EXPECT_EQ(data, nullptr);
}

TEST_F(ThreeSeconds, FileCopiesTheHeaderChunksThenTheRange) {
    std::string out = dir.PathOf("cut.wav");
    ASSERT_EQ(WAVE_GetAudioData2File(path.c_str(), 1, 2, out.c_str()), MM_OK);
    std::vector<uint8_t> expected = {'R', 'I', 'F', 'F'};
    Le32(&expected, 16000 + 36 - 8);
    expected.insert(expected.end(), source.begin() + 8, source.begin() + 36);
    expected.insert(expected.end(), {'d', 'a', 't', 'a'});
    Le32(&expected, 16000);
    expected.insert(expected.end(), source.begin() + 36 + 16000, source.begin() + 36 + 32000);
    EXPECT_EQ(ReadFileBytes(out), expected);
}

TEST_F(ThreeSeconds, UnwritableOutputFails) {
    EXPECT_EQ(WAVE_GetAudioData2File(path.c_str(), 0, 1, dir.PathOf("no/such/cut.wav").c_str()), MM_E_FAIL);
}

TEST_F(ThreeSeconds, CutFileIsAcceptedByFfprobeWithTheRequestedDuration) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffprobe not installed";
    std::string out = dir.PathOf("cut.wav");
    ASSERT_EQ(WAVE_GetAudioData2File(path.c_str(), 1, 3, out.c_str()), MM_OK);
    std::string codec = Ffprobe(out, "stream=codec_name");
    EXPECT_EQ(codec.substr(0, 9), "pcm_s16le") << codec;
    EXPECT_NEAR(std::atof(Ffprobe(out, "format=duration").c_str()), 2.0, 0.05);
}

TEST(WaveCorpus, EveryFileIsAnsweredWithoutAFault) {
    std::string corpus = CorpusDir();
    if (corpus.empty()) GTEST_SKIP() << "no corpus";
    std::vector<std::string> files;
    CollectWaves(corpus, &files);
    ASSERT_FALSE(files.empty());
    TempDir dir;
    int before = OpenDescriptors();
    for (const std::string& file : files) {
        SCOPED_TRACE(file);
        const char* p = file.c_str();
        _MMClipInfo clip{};
        metainfo::WAVE_GetClipInfo(p, &clip);
        _MM_CODECTYPE codec{};
        metainfo::WAVE_GetCodecType(p, &codec);
        _MM_MIMETYPE mime{};
        metainfo::WAVE_GetMIMEType(p, &mime);
        MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
        unsigned char* data = nullptr;
        int size = 0;
        metainfo::WAVE_GetAudioData2Buf(p, 0, 1, &data, &size);
        MM_MediaExtractor_FreeBuffer(data);
        WAVE_GetAudioData2File(p, 0, 2, dir.PathOf("cut.wav").c_str());
    }
    EXPECT_EQ(OpenDescriptors(), before);
}

TEST(WaveCorpus, KnownFilesGiveTheirFormats) {
    std::string corpus = CorpusDir();
    if (corpus.empty()) GTEST_SKIP() << "no corpus";
    _MM_CODECTYPE codec{};
    ASSERT_EQ(metainfo::WAVE_GetCodecType((corpus + "/taglib/alaw.wav").c_str(), &codec), MM_OK);
    EXPECT_EQ(codec.nAudioCodec, 0x1032u);
    _MMClipInfo clip{};
    EXPECT_EQ(metainfo::WAVE_GetClipInfo((corpus + "/taglib/float64.wav").c_str(), &clip), MM_E_UNSUPPORTED);
    EXPECT_EQ(metainfo::WAVE_GetClipInfo((corpus + "/taglib/segfault.wav").c_str(), &clip), MM_E_FAIL);
    ASSERT_EQ(metainfo::WAVE_GetClipInfo((corpus + "/mutagen/silence-2s-PCM-44100-16-ID3v23.wav").c_str(), &clip),
              MM_OK);
    EXPECT_EQ(clip.nDuration, 2u);
    EXPECT_EQ(clip.nSampleRate, 44100u);
    EXPECT_EQ(clip.nChannels, 2u);
}
