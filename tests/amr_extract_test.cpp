// AMR range extraction: whole seconds of average blocks, into a buffer or a
// new AMR file that players accept.
#include <gtest/gtest.h>

#include <sys/stat.h>

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <string>

#include "metainfo/extract.h"
#include "metainfo/metainfo.h"
#include "speech/amr.h"
#include "support/bytes.h"
#include "support/speech_builder.h"

using namespace testing_support;

namespace {

// A 60-second 12.2 kbit/s file: 1600 bytes per second after the 6-byte magic.
struct SixtySeconds : ::testing::Test {
    void SetUp() override {
        std::vector<uint8_t> bytes = AmrFile(false, 7, 3000);
        // Mark each frame with its index so that a wrong offset shows.
        for (size_t i = 0; i < 3000; ++i) bytes[6 + i * 32 + 1] = static_cast<uint8_t>(i);
        source = bytes;
        path = dir.Write("speech.amr", bytes);
    }
    TempDir dir;
    std::vector<uint8_t> source;
    std::string path;
};

// Play time as ffprobe's demuxer reads it: the end of the last packet. (Its
// container duration is only an estimate from the bit rate.)
double FfprobeDuration(const std::string& file) {
    std::string cmd = "/usr/bin/ffprobe -v error -show_entries packet=pts_time,duration_time -of csv=p=0 '" + file + "'";
    FILE* p = popen(cmd.c_str(), "r");
    if (p == nullptr) return -1;
    char line[128];
    double end = -1;
    while (std::fgets(line, sizeof line, p) != nullptr) {
        double pts = 0;
        double duration = 0;
        if (std::sscanf(line, "%lf,%lf", &pts, &duration) == 2) end = pts + duration;
    }
    pclose(p);
    return end;
}

}  // namespace

TEST_F(SixtySeconds, BufferHoldsWholeSecondsFromTheHeaderOn) {
    unsigned char* data = nullptr;
    int size = 0;
    ASSERT_EQ(MM_MediaExtractor_GetAudioData(path.c_str(), 10, 20, &data, &size), MM_OK);
    ASSERT_EQ(size, 16000);
    EXPECT_TRUE(std::equal(data, data + size, source.begin() + 6 + 16000));
    MM_MediaExtractor_FreeBuffer(data);
}

TEST_F(SixtySeconds, EndBeyondDurationIsCutToIt) {
    unsigned char* data = nullptr;
    int size = 0;
    ASSERT_EQ(metainfo::AMR_GetAudioData2Buf(path.c_str(), 50, 100, &data, &size), MM_OK);
    EXPECT_EQ(size, 16000);
    EXPECT_TRUE(std::equal(data, data + size, source.end() - 16000));
    MM_MediaExtractor_FreeBuffer(data);
}

TEST_F(SixtySeconds, StartAtDurationGivesAnEmptyBuffer) {
    unsigned char* data = nullptr;
    int size = -1;
    ASSERT_EQ(metainfo::AMR_GetAudioData2Buf(path.c_str(), 60, 61, &data, &size), MM_OK);
    EXPECT_EQ(size, 0);
    EXPECT_NE(data, nullptr);
    MM_MediaExtractor_FreeBuffer(data);
}

TEST_F(SixtySeconds, RangesOutsideTheClipAreInvalid) {
    unsigned char* data = nullptr;
    int size = 0;
    EXPECT_EQ(metainfo::AMR_GetAudioData2Buf(path.c_str(), 61, 62, &data, &size), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::AMR_GetAudioData2Buf(path.c_str(), 5, 5, &data, &size), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::AMR_GetAudioData2Buf(path.c_str(), -1, 5, &data, &size), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::AMR_GetAudioData2Buf(path.c_str(), 0, 5, nullptr, &size), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::AMR_GetAudioData2Buf(nullptr, 0, 5, &data, &size), MM_E_INVALIDARG);
    EXPECT_EQ(data, nullptr);
}

TEST_F(SixtySeconds, FileKeepsTheMagicAndTheRange) {
    std::string out = dir.PathOf("cut.amr");
    ASSERT_EQ(AMR_GetAudioData2File(path.c_str(), 1, 3, out.c_str()), MM_OK);
    std::vector<uint8_t> written = ReadFileBytes(out);
    ASSERT_EQ(written.size(), 6u + 3200u);
    EXPECT_EQ(std::string(written.begin(), written.begin() + 6), "#!AMR\n");
    EXPECT_TRUE(std::equal(written.begin() + 6, written.end(), source.begin() + 6 + 1600));
}

TEST_F(SixtySeconds, UnwritableOutputFails) {
    EXPECT_EQ(AMR_GetAudioData2File(path.c_str(), 0, 1, dir.PathOf("no/such/dir.amr").c_str()), MM_E_FAIL);
}

TEST(AmrExtract, WideBandCutKeepsWideBandMagic) {
    TempDir dir;
    std::string path = dir.Write("speech.awb", AmrFile(true, 2, 250));
    std::string out = dir.PathOf("cut.awb");
    ASSERT_EQ(AMR_GetAudioData2File(path.c_str(), 2, 4, out.c_str()), MM_OK);
    std::vector<uint8_t> written = ReadFileBytes(out);
    ASSERT_EQ(written.size(), 9u + 2u * 50u * 33u);
    EXPECT_EQ(std::string(written.begin(), written.begin() + 9), "#!AMR-WB\n");
}

TEST(AmrExtract, FailedDescriptionIsPassedOn) {
    TempDir dir;
    Bytes b;
    b.str("#!AMR\n").raw(AmrFrame(false, 7, false)).zeros(64);
    std::string path = dir.Write("bad.amr", b.data());
    unsigned char* data = nullptr;
    int size = 0;
    EXPECT_EQ(metainfo::AMR_GetAudioData2Buf(path.c_str(), 0, 1, &data, &size), MM_E_FAIL);
    EXPECT_EQ(data, nullptr);
}

TEST_F(SixtySeconds, CutFileIsAcceptedByFfprobeWithTheRequestedDuration) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffprobe not installed";
    std::string out = dir.PathOf("cut.amr");
    ASSERT_EQ(AMR_GetAudioData2File(path.c_str(), 5, 15, out.c_str()), MM_OK);
    EXPECT_NEAR(FfprobeDuration(out), 10.0, 0.021);
}

TEST(AmrExtract, CutWideBandFileIsAcceptedByFfprobe) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffprobe not installed";
    TempDir dir;
    std::string path = dir.Write("speech.awb", AmrFile(true, 8, 500));
    std::string out = dir.PathOf("cut.awb");
    ASSERT_EQ(AMR_GetAudioData2File(path.c_str(), 3, 7, out.c_str()), MM_OK);
    EXPECT_NEAR(FfprobeDuration(out), 4.0, 0.021);
}
