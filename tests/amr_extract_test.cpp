// AMR range extraction: whole seconds of average blocks, into a buffer or a
// new AMR file that players accept.
#include <gtest/gtest.h>

#include "metainfo/extract.h"
#include "metainfo/metainfo.h"
#include "speech/amr.h"
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
