// Range extraction from raw AAC files: proportional mapping, cuts at ADTS
// sync words, the tag copies, the buffer trims and the rejected ranges.
#include <gtest/gtest.h>

#include <dirent.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "metainfo/aac.h"
#include "metainfo/metainfo.h"
#include "support/aac_builder.h"
#include "support/bytes.h"
#include "support/media.h"

using namespace testing_support;

namespace {

AdtsSpec Layout8k() {
    AdtsSpec s;
    s.samplingIndex = 11;  // 8000 Hz: a frame of F bytes makes 62.5 x F bit/s
    s.channelConfig = 1;
    return s;
}

// n frames of 100 bytes: 6250 bit/s, 12 whole seconds for 100 frames.
std::vector<uint8_t> HundredByteFrames(size_t n) { return AdtsFrames(Layout8k(), std::vector<size_t>(n, 100)); }

std::vector<uint8_t> Slice(const std::vector<uint8_t>& v, size_t from, size_t to) {
    return std::vector<uint8_t>(v.begin() + static_cast<long>(from), v.begin() + static_cast<long>(to));
}

std::vector<uint8_t> Join(std::vector<uint8_t> a, const std::vector<uint8_t>& b) {
    a.insert(a.end(), b.begin(), b.end());
    return a;
}

struct BufResult {
    int32_t result;
    std::vector<uint8_t> data;
    bool terminated;
};

BufResult CutToBuffer(const std::string& path, int start, int end) {
    unsigned char* data = nullptr;
    int length = -2;
    BufResult r{AAC_GetAuidoData_Buf(path.c_str(), start, end, &data, &length), {}, false};
    if (r.result == MM_OK && data != nullptr) {
        r.data.assign(data, data + length);
        r.terminated = data[length] == 0;
        MM_MediaExtractor_FreeBuffer(data);
    }
    return r;
}

}  // namespace

// --- File variant --------------------------------------------------------

TEST(AacExtractFile, CopiesFromTheFirstSyncAtOrAfterEachOffset) {
    TempDir dir;
    const std::vector<uint8_t> input = HundredByteFrames(100);
    const std::string path = dir.Write("in.aac", input);
    const std::string out = dir.PathOf("out.aac");
    ASSERT_EQ(MM_OK, AAC_GetAuidoData_File(path.c_str(), 1, 4, out.c_str()));
    // 1 s -> byte 833 -> sync at 900; 4 s -> byte 3333 -> sync at 3400. Before
    // them, the 20 bytes after the first 128: byte 5 of an ADTS header has the
    // bit that the leading-tag copy tests without looking for "ID3".
    const std::vector<uint8_t> expected = Join(Slice(input, 128, 148), Slice(input, 900, 3400));
    EXPECT_EQ(expected, ReadFileBytes(out));
}

TEST(AacExtractFile, LeadingTagBodyAndTrailingTagAreCopied) {
    TempDir dir;
    Bytes body;
    for (int i = 0; i < 300; ++i) body.u8(static_cast<uint8_t>(i * 7));
    const std::vector<uint8_t> tag = Id3v2Tag(3, body.data());
    Bytes trailer;
    trailer.str("TAG").fill(125, 'x');
    const std::vector<uint8_t> frames = HundredByteFrames(100);
    const std::vector<uint8_t> input = Join(Join(tag, frames), trailer.data());
    const std::string path = dir.Write("tags.aac", input);
    const std::string out = dir.PathOf("out.aac");
    ASSERT_EQ(MM_OK, AAC_GetAuidoData_File(path.c_str(), 0, 2, out.c_str()));
    const std::vector<uint8_t> result = ReadFileBytes(out);
    // The tag's size of bytes, read from where the 128-byte probe stopped.
    ASSERT_GT(result.size(), 300u + 128u);
    EXPECT_EQ(Slice(input, 128, 428), Slice(result, 0, 300));
    EXPECT_EQ(trailer.data(), Slice(result, result.size() - 128, result.size()));
    // Between them, whole frames from a sync word on.
    const std::vector<uint8_t> audio = Slice(result, 300, result.size() - 128);
    ASSERT_GE(audio.size(), 100u);
    EXPECT_EQ(0xFF, audio[0]);
    EXPECT_EQ(0u, audio.size() % 100);
}

TEST(AacExtractFile, EndBeyondTheDurationCutsAtTheFileEnd) {
    TempDir dir;
    const std::vector<uint8_t> input = HundredByteFrames(100);
    const std::string path = dir.Write("in.aac", input);
    const std::string out = dir.PathOf("out.aac");
    ASSERT_EQ(MM_OK, AAC_GetAuidoData_File(path.c_str(), 6, 1000, out.c_str()));
    EXPECT_EQ(Join(Slice(input, 128, 148), Slice(input, 5000, input.size())), ReadFileBytes(out));
}

TEST(AacExtractFile, AdifFileIsCutAsRawBytes) {
    TempDir dir;
    AdifSpec layout;
    layout.bitrate = 8000;
    const std::vector<uint8_t> input = Join(AdifFile(layout, AacBlock(false, 0, 20)), std::vector<uint8_t>(5000, 0x11));
    const std::string path = dir.Write("adif.aac", input);
    const std::string out = dir.PathOf("out.aac");
    ASSERT_EQ(MM_OK, AAC_GetAuidoData_File(path.c_str(), 1, 3, out.c_str()));
    // No sync word: each offset moves by (bytes read - 100).
    const size_t size = input.size();
    const size_t from = 1 * size / 5, to = 3 * size / 5;
    const size_t shiftFrom = std::min<size_t>(8192, size - from) - 100;
    const size_t shiftTo = std::min<size_t>(8192, size - to) - 100;
    EXPECT_EQ(Slice(input, from + shiftFrom, to + shiftTo), ReadFileBytes(out));
}

// --- Buffer variant ------------------------------------------------------

TEST(AacExtractBuf, TrimsToWholeFramesAndDropsTheLastOne) {
    TempDir dir;
    const std::vector<uint8_t> input = HundredByteFrames(100);
    const std::string path = dir.Write("in.aac", input);
    const BufResult r = CutToBuffer(path, 1, 4);
    ASSERT_EQ(MM_OK, r.result);
    // Bytes 833..3333: from the sync at 900 to the last sync (3300), which
    // starts a frame the range cuts.
    EXPECT_EQ(Slice(input, 900, 3300), r.data);
    EXPECT_TRUE(r.terminated);
}

// 30 small frames set the bit rate (8000 bit/s); large frames follow, so that
// one second of bytes is shorter than a frame.
TEST(AacExtractBuf, RangeWithOneSyncGivesNothingAndWithoutSyncIsRejected) {
    TempDir dir;
    std::vector<uint8_t> input = AdtsFrames(Layout8k(), std::vector<size_t>(30, 128));
    for (int i = 0; i < 10; ++i) input = Join(input, AdtsFrame(Layout8k(), std::vector<uint8_t>(3993, 0)));
    const std::string path = dir.Write("big.aac", input);
    ASSERT_EQ(43840u, input.size());  // 43 seconds, 1019 bytes each
    // 39 s: bytes 39763..40782 hold the frame start at 39840 only.
    const BufResult one = CutToBuffer(path, 39, 40);
    ASSERT_EQ(MM_OK, one.result);
    EXPECT_TRUE(one.data.empty());
    EXPECT_TRUE(one.terminated);
    // 40 s: bytes 40781..41800 hold no frame start.
    EXPECT_EQ(1, CutToBuffer(path, 40, 41).result);
}

// Frames of 8 bytes (header and an END element) at 8 kHz: 500 bit/s, so one
// second is 62 bytes, too few to look for a sync word in.
TEST(AacExtractBuf, RangeOfAHundredBytesOrLessIsNotFrontTrimmed) {
    TempDir dir;
    std::vector<uint8_t> input;
    for (int i = 0; i < 100; ++i) input = Join(input, AdtsFrame(Layout8k(), {0xE0}));
    const std::string path = dir.Write("small.aac", input);  // 800 bytes, 12 s
    const BufResult r = CutToBuffer(path, 2, 3);
    ASSERT_EQ(MM_OK, r.result);
    // Bytes 133..200: kept from 133 (inside a frame) up to the last sync at 192.
    EXPECT_EQ(Slice(input, 133, 192), r.data);
}

TEST(AacExtractBuf, AdifFileWithoutSyncIsRejected) {
    TempDir dir;
    AdifSpec layout;
    layout.bitrate = 8000;
    const std::string path =
        dir.Write("adif.aac", Join(AdifFile(layout, AacBlock(false, 0, 20)), std::vector<uint8_t>(5000, 0x11)));
    EXPECT_EQ(1, CutToBuffer(path, 1, 3).result);
}

// --- Rejected ranges and handles -----------------------------------------

TEST(AacExtract, RejectedRangesAnswerOne) {
    TempDir dir;
    const std::string path = dir.Write("in.aac", HundredByteFrames(100));  // 12 s
    const std::string out = dir.PathOf("out.aac");
    for (auto range : {std::make_pair(3, 3), std::make_pair(4, 2), std::make_pair(12, 20), std::make_pair(50, 60)}) {
        EXPECT_EQ(1, AAC_GetAuidoData_File(path.c_str(), range.first, range.second, out.c_str()));
        EXPECT_EQ(1, CutToBuffer(path, range.first, range.second).result);
    }
    const std::string notAac = dir.Write("zeros.aac", std::vector<uint8_t>(4000, 0));
    EXPECT_EQ(1, AAC_GetAuidoData_File(notAac.c_str(), 0, 1, out.c_str()));
    EXPECT_EQ(1, CutToBuffer(notAac, 0, 1).result);
    EXPECT_EQ(1, AAC_GetAuidoData_File(dir.PathOf("missing.aac").c_str(), 0, 1, out.c_str()));
    EXPECT_EQ(1, CutToBuffer(dir.PathOf("missing.aac"), 0, 1).result);
    EXPECT_EQ(1, AAC_GetAuidoData_File(path.c_str(), 0, 1, dir.PathOf("no/such/dir.aac").c_str()));
    EXPECT_EQ(MM_E_INVALIDARG, AAC_GetAuidoData_Buf(path.c_str(), 0, 1, nullptr, nullptr));
}

TEST(AacExtract, ZeroDurationIsRejectedEvenForNegativeStart) {
    TempDir dir;
    AdifSpec layout;
    layout.bitrate = 0;  // duration 0
    const std::string path =
        dir.Write("zero.aac", Join(AdifFile(layout, AacBlock(false, 0, 20)), std::vector<uint8_t>(3000, 0)));
    const std::string out = dir.PathOf("out.aac");
    EXPECT_EQ(1, AAC_GetAuidoData_File(path.c_str(), -5, 5, out.c_str()));
    EXPECT_EQ(1, CutToBuffer(path, -5, 5).result);
}

TEST(AacExtract, EveryPathClosesItsFiles) {
    TempDir dir;
    const std::string path = dir.Write("in.aac", HundredByteFrames(100));
    const std::string out = dir.PathOf("out.aac");
    const int before = OpenDescriptors();
    AAC_GetAuidoData_File(path.c_str(), 1, 4, out.c_str());
    AAC_GetAuidoData_File(path.c_str(), 4, 1, out.c_str());
    AAC_GetAuidoData_File(path.c_str(), 0, 1, dir.PathOf("no/dir/out.aac").c_str());
    CutToBuffer(path, 1, 4);
    CutToBuffer(path, 4, 1);
    CutToBuffer(path, 0, 1);
    const std::string tiny = dir.Write("tiny.aac", AdtsFrames(Layout8k(), std::vector<size_t>(4, 30)));
    AAC_GetAuidoData_File(tiny.c_str(), -1, 1, out.c_str());
    CutToBuffer(tiny, -1, 1);
    EXPECT_EQ(before, OpenDescriptors());
}

// --- ffmpeg --------------------------------------------------------------

namespace {

// Seconds of audio ffmpeg decodes from an ADTS file, or -1 when it fails.
double DecodedSeconds(const TempDir& dir, const std::string& path) {
    const std::string pcm = dir.PathOf("decoded.raw");
    const std::string decode = "/usr/bin/ffmpeg -hide_banner -loglevel quiet -y -f aac -i \"" + path +
                               "\" -f s16le -ac 1 -ar 8000 \"" + pcm + "\"";
    if (std::system(decode.c_str()) != 0) return -1;
    return static_cast<double>(ReadFileBytes(pcm).size()) / 2 / 8000;
}

}  // namespace

// The cut points are the first 12-bit sync patterns found, which may lie
// inside a frame (and the file variant starts with the leading-tag copy), so
// the decoder may skip a little at the start; the rest decodes.
TEST(AacExtractFfmpeg, CutsDecode) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg not installed";
    TempDir dir;
    const std::string in = dir.PathOf("in.aac");
    const std::string cmd = "/usr/bin/ffmpeg -hide_banner -loglevel error -y -f lavfi -i "
                            "\"anoisesrc=d=6:c=pink:a=0.3:seed=7:r=44100\" -ac 2 -c:a aac \"" + in + "\"";
    ASSERT_EQ(0, std::system(cmd.c_str()));
    const std::string out = dir.PathOf("cut.aac");
    ASSERT_EQ(MM_OK, AAC_GetAuidoData_File(in.c_str(), 1, 4, out.c_str()));
    double seconds = DecodedSeconds(dir, out);
    EXPECT_GT(seconds, 2.5);
    EXPECT_LT(seconds, 3.5);

    unsigned char* data = nullptr;
    int length = 0;
    ASSERT_EQ(MM_OK, AAC_GetAuidoData_Buf(in.c_str(), 1, 4, &data, &length));
    const std::string buffered = dir.Write("buf.aac", std::vector<uint8_t>(data, data + length));
    MM_MediaExtractor_FreeBuffer(data);
    seconds = DecodedSeconds(dir, buffered);
    EXPECT_GT(seconds, 2.5);
    EXPECT_LT(seconds, 3.5);
}
