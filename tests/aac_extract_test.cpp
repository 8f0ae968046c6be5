// Range extraction from raw AAC files: proportional mapping, cuts at ADTS
// sync words, the tag copies, the buffer trims and the rejected ranges.
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <string>
#include <vector>

#include "metainfo/aac.h"
#include "metainfo/metainfo.h"
#include "support/aac_builder.h"
#include "support/bytes.h"
#include "support/media.h"

using namespace testing_support;

namespace {

// 8000 Hz: a frame of F bytes makes 62.5 x F bit/s.
const auto kLayout8k = AdtsLayout(11, 1);

// n frames of 100 bytes: 6250 bit/s, 12 whole seconds for 100 frames.
std::vector<uint8_t> HundredByteFrames(size_t n) { return AdtsFrames(kLayout8k, std::vector<size_t>(n, 100)); }

std::vector<uint8_t> Slice(const std::vector<uint8_t>& v, size_t from, size_t to) {
    return std::vector<uint8_t>(v.begin() + static_cast<long>(from), v.begin() + static_cast<long>(to));
}

// An ADIF file of no sync word; a bitrate of 0 makes its duration 0.
std::vector<uint8_t> AdifWithoutSync(uint32_t bitrate) {
    AdifLayout layout;
    layout.bitrate = bitrate;
    return Join(AdifFile(layout, AacBlock(false, 0, 20)), std::vector<uint8_t>(5000, 0x11));
}

struct BufResult { int32_t result; std::vector<uint8_t> data; bool terminated; };

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

// Before the file variant's audio come the 20 bytes after the first 128: byte
// 5 of an ADTS header has the bit that the leading-tag copy tests without
// looking for "ID3". The buffer variant drops the frame the range end cuts.
TEST(AacExtract, CutsAtTheFirstSyncAtOrAfterEachOffsetWithTheEndClamped) {
    TempDir dir;
    const std::vector<uint8_t> input = HundredByteFrames(100);
    const std::string path = dir.Write("in.aac", input);
    const std::string out = dir.PathOf("out.aac");
    // 1 s -> byte 833 -> sync at 900; 4 s -> byte 3333 -> sync at 3400.
    ASSERT_EQ(MM_OK, AAC_GetAuidoData_File(path.c_str(), 1, 4, out.c_str()));
    EXPECT_EQ(Join(Slice(input, 128, 148), Slice(input, 900, 3400)), ReadFileBytes(out));
    const BufResult r = CutToBuffer(path, 1, 4);
    ASSERT_EQ(MM_OK, r.result);
    EXPECT_EQ(Slice(input, 900, 3300), r.data);
    EXPECT_TRUE(r.terminated);
    ASSERT_EQ(MM_OK, AAC_GetAuidoData_File(path.c_str(), 6, 1000, out.c_str()));
    EXPECT_EQ(Join(Slice(input, 128, 148), Slice(input, 5000, input.size())), ReadFileBytes(out));
}

TEST(AacExtractFile, LeadingTagBodyAndTrailingTagAreCopied) {
    TempDir dir;
    Bytes body;
    for (int i = 0; i < 300; ++i) body.u8(static_cast<uint8_t>(i * 7));
    const std::vector<uint8_t> trailer = Bytes().str("TAG").fill(125, 'x').data();
    const std::vector<uint8_t> input = Join(Join(Id3v2Tag(3, body.data()), HundredByteFrames(100)), trailer);
    const std::string path = dir.Write("tags.aac", input);
    const std::string out = dir.PathOf("out.aac");
    ASSERT_EQ(MM_OK, AAC_GetAuidoData_File(path.c_str(), 0, 2, out.c_str()));
    const std::vector<uint8_t> result = ReadFileBytes(out);
    // The tag's size of bytes, read from where the 128-byte probe stopped.
    ASSERT_GE(result.size(), 300u + 128u + 100u);
    EXPECT_EQ(Slice(input, 128, 428), Slice(result, 0, 300));
    EXPECT_EQ(trailer, Slice(result, result.size() - 128, result.size()));
    // Between them, whole frames from a sync word on.
    EXPECT_EQ(0xFF, result[300]);
    EXPECT_EQ(0u, (result.size() - 428) % 100);
}

// No sync word: each offset moves by (bytes read - 100), and the buffer
// variant, which needs a frame start, rejects the range.
TEST(AacExtractFile, AdifFileIsCutAsRawBytes) {
    TempDir dir;
    const std::vector<uint8_t> input = AdifWithoutSync(8000);
    const std::string path = dir.Write("adif.aac", input);
    const std::string out = dir.PathOf("out.aac");
    ASSERT_EQ(MM_OK, AAC_GetAuidoData_File(path.c_str(), 1, 3, out.c_str()));
    const size_t size = input.size();
    const size_t from = 1 * size / 5, to = 3 * size / 5;
    const size_t shiftFrom = std::min<size_t>(8192, size - from) - 100;
    const size_t shiftTo = std::min<size_t>(8192, size - to) - 100;
    EXPECT_EQ(Slice(input, from + shiftFrom, to + shiftTo), ReadFileBytes(out));
    EXPECT_EQ(1, CutToBuffer(path, 1, 3).result);
}

// 30 small frames set the bit rate (8000 bit/s); large frames follow, so that
// one second of bytes is shorter than a frame.
TEST(AacExtractBuf, RangeWithOneSyncGivesNothingAndWithoutSyncIsRejected) {
    TempDir dir;
    std::vector<uint8_t> input = AdtsFrames(kLayout8k, std::vector<size_t>(30, 128));
    for (int i = 0; i < 10; ++i) input = Join(input, AdtsFrame(kLayout8k, std::vector<uint8_t>(3993, 0)));
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
    for (int i = 0; i < 100; ++i) input = Join(input, AdtsFrame(kLayout8k, {0xE0}));
    const BufResult r = CutToBuffer(dir.Write("small.aac", input), 2, 3);  // 800 bytes, 12 s
    ASSERT_EQ(MM_OK, r.result);
    // Bytes 133..200: kept from 133 (inside a frame) up to the last sync at 192.
    EXPECT_EQ(Slice(input, 133, 192), r.data);
}

// Handles are closed on the rejected paths as on the successful ones.
TEST(AacExtract, RejectedRangesAnswerOneAndCloseTheirFiles) {
    TempDir dir;
    const std::string path = dir.Write("in.aac", HundredByteFrames(100));  // 12 s
    const std::string zeroDuration = dir.Write("zero.aac", AdifWithoutSync(0));
    const std::string notAac = dir.Write("zeros.aac", std::vector<uint8_t>(4000, 0));
    const std::string tiny = dir.Write("tiny.aac", AdtsFrames(kLayout8k, std::vector<size_t>(4, 30)));
    const std::string missing = dir.PathOf("missing.aac");
    const std::string out = dir.PathOf("out.aac");
    const int before = OpenDescriptors();
    struct Case { const std::string* file; int start, end; };
    for (const Case& c : {Case{&path, 3, 3}, Case{&path, 4, 2}, Case{&path, 12, 20}, Case{&path, 50, 60},
                          Case{&zeroDuration, -5, 5}, Case{&notAac, 0, 1}, Case{&missing, 0, 1}, Case{&tiny, -1, 1}}) {
        EXPECT_EQ(1, AAC_GetAuidoData_File(c.file->c_str(), c.start, c.end, out.c_str())) << *c.file << c.start;
        EXPECT_EQ(1, CutToBuffer(*c.file, c.start, c.end).result) << *c.file << c.start;
    }
    // 64 MiB at 6250 bit/s: a late time times the size leaves 32 bits, so
    // nothing is cut; an early one still is.
    const std::string large = dir.Write("large.aac", HundredByteFrames(100));
    ASSERT_EQ(0, ::truncate(large.c_str(), 64 << 20));
    EXPECT_EQ(MM_E_UNSUPPORTED, AAC_GetAuidoData_File(large.c_str(), 0, 80000, out.c_str()));
    EXPECT_EQ(MM_E_UNSUPPORTED, CutToBuffer(large, 0, 80000).result);
    EXPECT_EQ(MM_OK, CutToBuffer(large, 0, 1).result);
    EXPECT_EQ(1, AAC_GetAuidoData_File(path.c_str(), 0, 1, dir.PathOf("no/such/dir.aac").c_str()));
    EXPECT_EQ(MM_E_INVALIDARG, AAC_GetAuidoData_Buf(path.c_str(), 0, 1, nullptr, nullptr));
    EXPECT_EQ(MM_OK, AAC_GetAuidoData_File(path.c_str(), 1, 4, out.c_str()));
    EXPECT_EQ(MM_OK, CutToBuffer(path, 1, 4).result);
    EXPECT_EQ(before, OpenDescriptors());
}

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
    const std::string fileCut = dir.PathOf("cut.aac");
    ASSERT_EQ(MM_OK, AAC_GetAuidoData_File(in.c_str(), 1, 4, fileCut.c_str()));
    const BufResult r = CutToBuffer(in, 1, 4);
    ASSERT_EQ(MM_OK, r.result);
    for (const std::string& cut : {fileCut, dir.Write("buf.aac", r.data)}) {
        const std::string pcm = dir.PathOf("decoded.raw");
        const std::string decode = "/usr/bin/ffmpeg -hide_banner -loglevel quiet -y -f aac -i \"" + cut +
                                   "\" -f s16le -ac 1 -ar 8000 \"" + pcm + "\"";
        ASSERT_EQ(0, std::system(decode.c_str())) << cut;
        const double seconds = static_cast<double>(ReadFileBytes(pcm).size()) / 2 / 8000;
        EXPECT_GT(seconds, 2.5) << cut;
        EXPECT_LT(seconds, 3.5) << cut;
    }
}
