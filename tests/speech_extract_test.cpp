// Range extraction from AMR and WAVE files, into a buffer or a new file that
// players accept; and every WAVE file of the corpus answered without a fault.
#include <gtest/gtest.h>

#include <filesystem>

#include "metainfo/extract.h"
#include "metainfo/metainfo.h"
#include "speech/amr.h"
#include "speech/wave.h"
#include "support/speech_builder.h"

using namespace testing_support;

namespace {

// Cuts from a 60-second 12.2 kbit/s file: 1600 bytes per second after the 6-byte magic.
struct AmrExtract : ::testing::Test {
    void SetUp() override {
        source = AmrFile(false, 7, 3000);
        // Mark each frame with its index so that a wrong offset shows.
        for (size_t i = 0; i < 3000; ++i) source[6 + i * 32 + 1] = static_cast<uint8_t>(i);
        path = dir.Write("speech.amr", source);
    }
    TempDir dir;
    std::vector<uint8_t> source;
    std::string path;
};

}  // namespace

TEST_F(AmrExtract, BufferHoldsWholeSecondsCutToTheDuration) {
    const struct {
        int start, end;
        int32_t result;
        int size;
    } cases[] = {
        {10, 20, MM_OK, 16000}, {50, 100, MM_OK, 16000},
        {60, 61, MM_OK, 0},  // start at the duration: an empty buffer, still allocated
        {61, 62, MM_E_INVALIDARG, 0}, {5, 5, MM_E_INVALIDARG, 0}, {-1, 5, MM_E_INVALIDARG, 0},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.start);
        unsigned char* data = nullptr;
        int size = -1;
        ASSERT_EQ(MM_MediaExtractor_GetAudioData(path.c_str(), c.start, c.end, &data, &size), c.result);
        EXPECT_EQ(data != nullptr, c.result == MM_OK);
        if (c.result != MM_OK) continue;
        EXPECT_EQ(size, c.size);
        EXPECT_TRUE(std::equal(data, data + size, source.begin() + 6 + c.start * 1600));
        MM_MediaExtractor_FreeBuffer(data);
    }
    unsigned char* data = nullptr;
    int size = 0;
    EXPECT_EQ(metainfo::AMR_GetAudioData2Buf(path.c_str(), 0, 5, nullptr, &size), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::AMR_GetAudioData2Buf(nullptr, 0, 5, &data, &size), MM_E_INVALIDARG);
}

TEST_F(AmrExtract, FileKeepsTheMagicOfItsKindAndTheRange) {
    std::string out = dir.PathOf("cut.amr");
    ASSERT_EQ(AMR_GetAudioData2File(path.c_str(), 1, 3, out.c_str()), MM_OK);
    std::vector<uint8_t> expected = Bytes().str("#!AMR\n").data();
    expected.insert(expected.end(), source.begin() + 6 + 1600, source.begin() + 6 + 3 * 1600);
    EXPECT_EQ(ReadFileBytes(out), expected);
    std::string wide = dir.Write("speech.awb", AmrFile(true, 2, 250));
    ASSERT_EQ(AMR_GetAudioData2File(wide.c_str(), 2, 4, out.c_str()), MM_OK);
    std::vector<uint8_t> written = ReadFileBytes(out);
    ASSERT_EQ(written.size(), 9u + 2u * 50u * 33u);
    EXPECT_EQ(std::string(written.begin(), written.begin() + 9), "#!AMR-WB\n");
    EXPECT_EQ(AMR_GetAudioData2File(path.c_str(), 0, 1, dir.PathOf("no/such/dir.amr").c_str()), MM_E_FAIL);
}

TEST_F(AmrExtract, CutFileIsAcceptedByFfprobeWithTheRequestedDuration) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffprobe not installed";
    std::string out = dir.PathOf("cut.amr");
    ASSERT_EQ(AMR_GetAudioData2File(path.c_str(), 5, 15, out.c_str()), MM_OK);
    EXPECT_NEAR(FfprobePlayTime(out), 10.0, 0.021);
}

namespace {

// Cuts from three seconds of 8 kHz 16-bit mono: 16000 bytes a second from offset 36.
struct WaveExtract : ::testing::Test {
    void SetUp() override {
        source = CanonicalWave(1, 1, 8000, 16, 48000);
        for (size_t i = 44; i < source.size(); ++i) source[i] = static_cast<uint8_t>(i * 7);
        path = dir.Write("tone.wav", source);
    }
    TempDir dir;
    std::vector<uint8_t> source;
    std::string path;
};

}  // namespace

TEST_F(WaveExtract, BufferFromTheDataIdCutToTheDuration) {
    const struct {
        int start, end;
        int32_t result;
    } cases[] = {
        {0, 1, MM_OK},  // begins with the 8 bytes of the "data" chunk header
        {2, 10, MM_OK}, {4, 10, MM_E_INVALIDARG}, {2, 2, MM_E_INVALIDARG}, {-1, 2, MM_E_INVALIDARG},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.start);
        unsigned char* data = nullptr;
        int size = 0;
        ASSERT_EQ(MM_MediaExtractor_GetAudioData(path.c_str(), c.start, c.end, &data, &size), c.result);
        EXPECT_EQ(data != nullptr, c.result == MM_OK);
        if (c.result != MM_OK) continue;
        ASSERT_EQ(size, 16000);
        EXPECT_TRUE(std::equal(data, data + size, source.begin() + 36 + c.start * 16000));
        MM_MediaExtractor_FreeBuffer(data);
    }
    int size = 0;
    EXPECT_EQ(metainfo::WAVE_GetAudioData2Buf(path.c_str(), 0, 2, nullptr, &size), MM_E_INVALIDARG);
}

TEST_F(WaveExtract, FileCopiesTheHeaderChunksThenTheRange) {
    std::string out = dir.PathOf("cut.wav");
    ASSERT_EQ(WAVE_GetAudioData2File(path.c_str(), 1, 2, out.c_str()), MM_OK);
    Bytes expected;
    expected.str("RIFF").le32(16000 + 36 - 8).raw({source.begin() + 8, source.begin() + 36});
    expected.str("data").le32(16000).raw({source.begin() + 36 + 16000, source.begin() + 36 + 32000});
    EXPECT_EQ(ReadFileBytes(out), expected.data());
    EXPECT_EQ(WAVE_GetAudioData2File(path.c_str(), 0, 1, dir.PathOf("no/such/cut.wav").c_str()), MM_E_FAIL);
}

TEST_F(WaveExtract, CutFileIsAcceptedByFfprobeWithTheRequestedDuration) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffprobe not installed";
    std::string out = dir.PathOf("cut.wav");
    ASSERT_EQ(WAVE_GetAudioData2File(path.c_str(), 1, 3, out.c_str()), MM_OK);
    EXPECT_NEAR(FfprobePlayTime(out), 2.0, 0.05);
}

TEST(WaveCorpus, EveryFileIsAnsweredWithoutAFaultOrALeak) {
    std::string corpus = CorpusDir();
    if (corpus.empty()) GTEST_SKIP() << "no corpus";
    TempDir dir;
    int before = OpenDescriptors();
    int files = 0;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(corpus)) {
        if (!entry.is_regular_file() || entry.path().extension() != ".wav") continue;
        SCOPED_TRACE(entry.path().string());
        const char* p = entry.path().c_str();
        ++files;
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
    EXPECT_GT(files, 0);
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
