// MP3 range extraction: byte positions, the written file, and decodability.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <string>

#include "metainfo/extract.h"
#include "metainfo/metainfo.h"
#include "mp3/mp3_extract.h"
#include "support/bytes.h"
#include "support/id3_builder.h"
#include "support/mp3_builder.h"

using namespace testing_support;
using namespace metainfo;

namespace {

constexpr uint32_t kFrame = 417;  // MPEG-1 Layer III, 128 kbit/s, 44100 Hz
constexpr int kFrames = 1152;     // 480,384 bytes: 30 s at 16,000 bytes/s

struct Buffer {
    unsigned char* data = nullptr;
    int size = 0;
    int32_t result = 0;
    Buffer(const std::string& path, int start, int end) {
        result = MP3_GetAudioData2Buf(path.c_str(), start, end, &data, &size);
    }
    Buffer(const Buffer&) = delete;
    ~Buffer() { MM_MediaExtractor_FreeBuffer(data); }
};

std::string RunCommand(const std::string& command) {
    std::string out;
    if (FILE* p = popen(command.c_str(), "r")) {
        char buf[256];
        while (fgets(buf, sizeof buf, p) != nullptr) out += buf;
        if (pclose(p) != 0) return "failed";
    }
    return out;
}

// Seconds of audio a decoder finds in the file (frames counted by ffprobe), or -1
// when ffmpeg cannot decode it cleanly.
double DecodedSeconds(const std::string& path) {
    if (RunCommand("/usr/bin/ffmpeg -nostdin -v error -i '" + path + "' -f null - 2>&1") != "") return -1;
    const std::string out = RunCommand("/usr/bin/ffprobe -v error -count_frames -select_streams a:0 -show_entries "
                                       "stream=nb_read_frames,sample_rate -of csv=p=0 '" + path + "'");
    unsigned rate = 0, frames = 0;
    if (std::sscanf(out.c_str(), "%u,%u", &rate, &frames) != 2 || rate == 0) return -1;
    return frames * 1152.0 / rate;
}

}  // namespace

TEST(Mp3Extract, ConstantBitRatePositionsMoveToTheNextSyncAndUntaggedOutputIsBareFrames) {
    TempDir dir;
    const std::string path = dir.Write("cbr.mp3", Mp3Frames(kFrames));
    const Buffer b(path, 10, 20);
    ASSERT_EQ(b.result, MM_OK);
    // 160,000 and 320,000 moved to the frames at 384 and 768.
    EXPECT_EQ(b.size, static_cast<int>(320256 - 160128));
    ASSERT_NE(b.data, nullptr);
    EXPECT_EQ(b.data[0], 0xFF);
    EXPECT_EQ(b.data[kFrame], 0xFF);
    // A source without leading or trailing tags gives a file of the same bytes.
    ASSERT_EQ(MP3_GetAudioData2File(path.c_str(), 10, 20, dir.PathOf("out.mp3").c_str()), MM_OK);
    EXPECT_EQ(ReadFileBytes(dir.PathOf("out.mp3")), std::vector<uint8_t>(b.data, b.data + b.size));

    unsigned char* pub = nullptr;
    int size = 0;
    ASSERT_EQ(MM_MediaExtractor_GetAudioData(path.c_str(), 10, 20, &pub, &size), MM_OK);
    EXPECT_EQ(size, b.size);
    MM_MediaExtractor_FreeBuffer(pub);
}

TEST(Mp3Extract, EndIsCutAtTheDurationAndStartMustLieWithin) {
    TempDir dir;
    const std::string path = dir.Write("cbr.mp3", Mp3Frames(kFrames));
    const Buffer tail(path, 20, 1000);
    ASSERT_EQ(tail.result, MM_OK);
    EXPECT_EQ(tail.size, static_cast<int>(kFrames * kFrame - 320256));
    EXPECT_EQ(Buffer(path, 31, 40).result, MM_E_INVALIDARG);
    const Buffer empty(path, 30, 40);  // starting at the very end leaves no frame
    EXPECT_EQ(empty.result, MM_E_FAIL);
    EXPECT_EQ(empty.data, nullptr);

    EXPECT_EQ(Buffer(path, -1, 5).result, MM_E_INVALIDARG);
    EXPECT_EQ(Buffer(path, 5, 5).result, MM_E_INVALIDARG);
    int size = 0;
    EXPECT_EQ(MP3_GetAudioData2Buf(path.c_str(), 0, 5, nullptr, &size), MM_E_INVALIDARG);
    EXPECT_EQ(MP3_GetAudioData2File(path.c_str(), 0, 5, nullptr), MM_E_INVALIDARG);
}

TEST(Mp3Extract, VbriStreamsCannotBeCut) {
    VbriFields vbri;
    vbri.frames = kFrames;
    TempDir dir;
    EXPECT_EQ(Buffer(dir.Write("vbri.mp3", Bytes().raw(VbriFrame(vbri)).raw(Mp3Frames(kFrames - 1)).data()), 1, 2).result,
              MM_E_FAIL);
}

TEST(Mp3Extract, FileCarriesTagsAndAXingFrameForTheRange) {
    TempDir dir;
    const std::vector<uint8_t> tag = Id3v2Tag(3, std::vector<uint8_t>(20, 0));  // 30 bytes
    XingFields xing;
    xing.frames = kFrames;
    xing.bytes = kFrames * kFrame;
    const auto file = Bytes().raw(tag).raw(XingFrame(xing)).raw(Mp3Frames(kFrames - 1)).raw(Id3v1Titled("Trailing")).data();
    const std::string out = dir.PathOf("out.mp3");
    ASSERT_EQ(MP3_GetAudioData2File(dir.Write("xing.mp3", file).c_str(), 10, 20, out.c_str()), MM_OK);
    const std::vector<uint8_t> cut = ReadFileBytes(out);

    // Table entries 33 and 67 (84 and 171) of 480,384 bytes, counted from the
    // file start, moved to the frames at 157,656 and 321,120.
    const uint32_t span = 321120 - 157656;
    ASSERT_EQ(cut.size(), 30 + kFrame + span + 128);
    EXPECT_TRUE(std::equal(tag.begin(), tag.end(), cut.begin()));
    const uint8_t* x = cut.data() + 30;
    EXPECT_EQ(std::memcmp(x, file.data() + 30, 40), 0);  // header, side information, "Xing"
    const auto fields = Bytes().be32(0xF).be32(383).be32(span).data();  // lrint(10 * 44100 / 1152) frames
    EXPECT_EQ(std::memcmp(x + 40, fields.data(), 12), 0);
    EXPECT_EQ(std::memcmp(x + 52, file.data() + 30 + 52, 100), 0);  // the source's table as it stands
    EXPECT_EQ(x[155], 57);  // quality
    EXPECT_EQ(x[156], 0);   // padding up to the source frame's size
    EXPECT_EQ(std::memcmp(cut.data() + 30 + kFrame, file.data() + 157656, span), 0);
    EXPECT_EQ(std::memcmp(cut.data() + cut.size() - 128, "TAGTrailing", 11), 0);
}

TEST(Mp3Extract, CutFilesDecodeForTheRequestedSpan) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg is not installed";
    TempDir dir;
    const std::string make = "/usr/bin/ffmpeg -nostdin -v error -y -f lavfi -i sine=frequency=440:duration=30 "
                             "-c:a libmp3lame ";
    const double frame = 1152.0 / 44100;
    const struct {
        std::string options;
        double tolerance;
    } cases[] = {
        {"-b:a 128k", frame},
        {"-q:a 4", 30 * 0.01 + 2 * frame},  // the Xing table has 1% steps: each cut may move by half a step
    };
    for (const auto& c : cases) {
        const std::string source = dir.PathOf("source.mp3"), out = dir.PathOf("cut.mp3");
        if (RunCommand(make + c.options + " '" + source + "' 2>&1") != "") GTEST_SKIP() << "ffmpeg cannot encode MP3 here";
        ASSERT_EQ(MP3_GetAudioData2File(source.c_str(), 10, 20, out.c_str()), MM_OK) << c.options;
        EXPECT_NEAR(DecodedSeconds(out), 10.0, c.tolerance) << c.options;
    }
}

TEST(Mp3Extract, CorpusFilesCutIntoReadableFiles) {
    const std::string corpus = CorpusDir();
    if (corpus.empty() || !HaveFfmpeg()) GTEST_SKIP() << "no corpus or no ffmpeg";
    TempDir dir;
    for (const char* name : {"mutagen/xing.mp3", "mutagen/silence-44-s.mp3"}) {
        const std::string out = dir.PathOf("corpus.mp3");
        ASSERT_EQ(MP3_GetAudioData2File((corpus + "/" + name).c_str(), 1, 2, out.c_str()), MM_OK) << name;
        EXPECT_GT(DecodedSeconds(out), 0.5) << name;
    }
}
