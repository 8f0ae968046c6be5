// Raw AAC: the ADTS and ADIF checks, clip information and codec type of byte-built
// files, the corpus and ffmpeg-made streams; range extraction; and the raw data block
// walker, which must step over real channel elements exactly, find SBR fill elements
// and never read past the data it was given.
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <random>
#include <string>
#include <thread>
#include <tuple>
#include <vector>

#include "aac/aac_bits.h"
#include "aac/aac_clip.h"
#include "aac/aac_frame.h"
#include "aac/aac_huffman.h"
#include "aac/aac_tables.h"
#include "aac/aac_walker.h"
#include "core/file_access.h"
#include "metainfo/aac.h"
#include "metainfo/metainfo.h"
#include "support/aac_builder.h"
#include "support/bytes.h"
#include "support/golden.h"
#include "support/media.h"
#include "support/summary.h"

using namespace testing_support;
using namespace metainfo;

namespace {

using Data = std::vector<uint8_t>;

Data Zeros(size_t n) { return Data(n, 0); }
Data Frames(size_t n, size_t size, int samplingIndex = 4, int channels = 2, int profile = 1, int sbr = 0) {
    return AdtsFrames(AdtsLayout(samplingIndex, channels, profile), std::vector<size_t>(n, size), sbr);
}

// The slot functions themselves (durations stay in whole seconds): clip and codec records
// on one line; a profile of 3 leaves the subtype as it was (0x1234).
std::string Probe(const std::string& path) {
    _MMClipInfo clip;
    _MM_CODECTYPE codec;
    std::memset(&clip, 0, sizeof clip);
    std::memset(&codec, 0, sizeof codec);
    codec.nAudioSubType = 0x1234;
    const int32_t clipResult = AAC_GetClipInfo(path.c_str(), &clip);
    const int32_t codecResult = AAC_GetCodecType(path.c_str(), &codec);
    if (clipResult != MM_OK) return std::to_string(clipResult);
    return ClipSummary(clip) +
           (codecResult == MM_OK ? " " + CodecSummary(codec) : " codec " + std::to_string(codecResult));
}

int32_t Verify(const std::string& path) {
    const int h = MEx_fopen(path.c_str(), "rb");
    uint8_t probe[128] = {0};
    MEx_fread(probe, 1, sizeof probe, h);
    const int32_t result = VerifyAAC(h, probe);
    MEx_fclose(h);
    return result;
}

AdifLayout Adif(bool copyright, bool variableRate, int samplingIndex, uint32_t bitrate) {
    AdifLayout layout;
    layout.copyright = copyright;
    layout.variableRate = variableRate;
    layout.bitrate = bitrate;
    layout.bufferFullness = 0xFFFFF;
    layout.pces[0].samplingIndex = samplingIndex;
    layout.pces[0].front = {true};
    return layout;
}

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
    return Join({AdifFile(layout, AacBlock(false, 0, 20)), std::vector<uint8_t>(5000, 0x11)});
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

struct Frame {
    size_t offset, length;
    int samplingIndex, headerSize, rawBlocks;
};

std::vector<Frame> AdtsFramesOf(const std::vector<uint8_t>& data) {
    std::vector<Frame> frames;
    size_t pos = 0;
    while (pos + 7 <= data.size() && data[pos] == 0xFF && (data[pos + 1] & 0xF6) == 0xF0) {
        const uint8_t* h = &data[pos];
        const size_t length = (h[3] & 3u) << 11 | uint32_t{h[4]} << 3 | uint32_t{h[5]} >> 5;
        if (length < 7 || pos + length > data.size()) break;
        frames.push_back({pos, length, (h[2] >> 2) & 0x0F, (h[1] & 1) ? 7 : 9, h[6] & 3});
        pos += length;
    }
    return frames;
}

// Walks the block of every frame; returns a description of the frames whose
// walk does not end exactly at the frame's end. Frames with a short-window TNS
// filter are read one bit short per coefficient on purpose; for them only the
// bound is checked, and they are counted in *shortTns.
std::string WalkEveryFrame(const std::vector<uint8_t>& data, size_t* walked, size_t* shortTns = nullptr) {
    std::string failures;
    *walked = 0;
    if (shortTns != nullptr) *shortTns = 0;
    for (const Frame& f : AdtsFramesOf(data)) {
        if (f.rawBlocks != 0) continue;
        // The whole file is the data, so a walk that overruns the frame shows.
        AacBitReader r =
            MakeAacBitReader(data.data(), static_cast<int>(data.size()), static_cast<int>(f.offset) + f.headerSize);
        uint32_t state = metainfo::kWalkPlain;
        RawDataStream(&r, &state, f.samplingIndex);
        const size_t end = static_cast<size_t>(metainfo::BytePosition(r));
        if (r.shortWindowTns) {
            if (shortTns != nullptr) ++*shortTns;
            if (end > data.size()) failures += "frame at " + std::to_string(f.offset) + " walked past the data\n";
            continue;
        }
        ++*walked;
        if (r.exhausted || !metainfo::AtByteStart(r) || end != f.offset + f.length) {
            failures += "frame at " + std::to_string(f.offset) + " (" + std::to_string(f.length) +
                        " bytes) walk ended at " + std::to_string(end) + "\n";
        }
    }
    return failures;
}

// Walks one raw data block from its first byte.
AacBitReader Walk(const std::vector<uint8_t>& block, int samplingIndex, uint32_t* state) {
    AacBitReader r = MakeAacBitReader(block.data(), static_cast<int>(block.size()), 0);
    *state = metainfo::kWalkPlain;
    EXPECT_EQ(1, RawDataStream(&r, state, samplingIndex));
    return r;
}
}  // namespace

TEST(AacBits, GetBitsAndAdtsFrameSizes) {
    const uint8_t buf[] = {0xA5, 0x3C};  // 1010 0101 0011 1100
    int count = 8, pos = 0;
    EXPECT_EQ(GetBits(buf, 3, &count, &pos), 0x5u);
    EXPECT_EQ(count, 5);
    EXPECT_EQ(GetBits(buf, 5, &count, &pos), 0x05u);
    EXPECT_EQ(std::make_pair(pos, count), std::make_pair(1, 8)) << "a read that ends a byte moves to the next";
    count = 2;
    pos = 0;
    EXPECT_EQ(GetBits(buf, 6, &count, &pos), 0x13u) << "low 2 bits of A5, top 4 of 3C";
    EXPECT_EQ(std::make_pair(pos, count), std::make_pair(1, 4));

    uint32_t kind = 0;
    EXPECT_EQ(AACGetFrameSize(nullptr, &kind), 0xFFFFFFFFu);
    const uint8_t noSync[] = {0xFF, 0xE1, 0, 0, 0, 0};
    EXPECT_EQ(AACGetFrameSize(noSync, &kind), static_cast<uint32_t>(MM_E_FAIL));
    AdtsFields shape;
    shape.profile = 2;
    shape.mpegId = 1;
    EXPECT_EQ(AACGetFrameSize(AdtsFrame(shape, Data(100)).data(), &kind), 107u);
    EXPECT_EQ(kind, (2u << 1) | 0x08u);
    EXPECT_EQ(AACGetFrameSize(AdtsFrame({}, Data(4090)).data(), &kind), 0xFFFFFFFFu) << "above 4096 bytes";
}

// The check needs two matching ADTS headers within the first bytes after the
// tag, or an ADIF signature; clip information follows it.
TEST(AacClip, ChecksClipAndCodecOfEachFileShape) {
    AdtsFields main, mpeg2;
    main.profile = 0;
    mpeg2.mpegId = 1;
    const Data one = Frames(1, 100);
    Data tooLong = Frames(1, 300);  // a frame length of 5000 ends the scan
    const uint32_t length = 5000;
    tooLong[3] = static_cast<uint8_t>((tooLong[3] & 0xFC) | (length >> 11));
    tooLong[4] = static_cast<uint8_t>(length >> 3);
    tooLong[5] = static_cast<uint8_t>((length & 7) << 5 | 0x1F);
    const Data sbrThird = Join({Frames(2, 200), Frames(1, 200, 4, 2, 1, 13)});
    // An ID3v2 tag with a footer is skipped whole (20 bytes past its size) but only
    // its body leaves the count; a trailing 128-byte tag leaves it too.
    const Data footerTag =
        Join({Id3v2Tag(4, Zeros(100), 0x10), Bytes().str("3DI").u8(4).u8(0).u8(0x10).syncsafe32(100).data()});
    const Data speech = Frames(15, 128, 11, 1);  // 8 kHz frames of 128 bytes: 8000 bit/s
    AdifLayout pces;  // pairs count twice; a misread field of the first element would garble the second
    pces.variableRate = true;
    pces.pces.resize(2);
    pces.pces[0].front = {false, true};
    pces.pces[0].back = {true};
    pces.pces[0].lfe = 1;
    pces.pces[0].assocData = 1;
    pces.pces[0].validCc = 2;
    pces.pces[0].monoMixdown = true;
    pces.pces[0].comment = "first";
    pces.pces[1].objectType = 2;
    pces.pces[1].side = {true, false};
    const Data adif = AdifFile(AdifLayout{}, AacBlock(false, 0, 20));
    const struct {
        const char* name;
        Data file;
    } cases[] = {
        // An SBR fill element (extension 13 or 14) gives the AAC+ code and doubles the rate;
        // the profile goes into the subtype; a reserved sampling index gives rate, bit rate
        // and duration 0.
        {"24 kHz mono", Frames(8, 60, 6, 1)},
        {"sbr 13", Frames(8, 60, 6, 2, 0, 13)},
        {"sbr 14", Frames(8, 60, 6, 1, 2, 14)},
        {"profile 3, no channel configuration", Frames(8, 60, 4, 0, 3)},
        {"channel configuration 7", Frames(8, 60, 4, 7)},
        {"sampling index 13", Frames(8, 60, 13)},
        // Only frames followed by a whole maximal frame's worth of data are walked (besides
        // the first two), so SBR in the third frame of a short file is not seen.
        {"sbr in a short file", Join({sbrThird, Frames(5, 200)})},
        {"sbr in a long file", Join({sbrThird, Frames(60, 200)})},
        // From four frames on, the average leaves out the first and the two largest:
        // of 130 100 120 300 250 160 it keeps 100 120 160.
        {"three frames", Join({AdtsFrames(AdtsLayout(4, 2), {60, 100, 140}), Zeros(200)})},
        {"six frames", Join({AdtsFrames(AdtsLayout(4, 2), {130, 100, 120, 300, 250, 160}), Zeros(200)})},
        {"too long a third frame", Join({Frames(2, 200), tooLong, Frames(6, 300)})},
        {"whole third frame", Join({Frames(2, 200), Frames(7, 300)})},
        {"too long a first frame", Join({tooLong, Frames(6, 300)})},
        // The second frame must match the first; a lone frame's second header lies beyond the data.
        {"ssr after lc", Join({one, Frames(2, 100, 4, 2, 2)})},
        {"main after lc", Join({SilentAdts(1), SilentAdts(2, main)})},
        {"mpeg-2 after mpeg-4", Join({SilentAdts(1), SilentAdts(2, mpeg2)})},
        {"lone frame", Join({Zeros(20), one})},
        {"one frame", SilentAdts(1)},
        // Only the first 4096 bytes after the tag (and its footer) are scanned.
        {"three frames of 11 bytes", SilentAdts(3)},
        {"50 bytes before", Join({Zeros(50), SilentAdts(3)})},
        {"4089 bytes before", Join({Zeros(4089), SilentAdts(3)})},
        {"4000-byte tag", Join({Id3v2Tag(4, Zeros(4000), 0x10), Zeros(10), SilentAdts(3)})},
        // (2100 - 100) x 8 / 8000; starting at the footer would give 1990 bytes, 1 second.
        {"footer tag", Join({footerTag, speech, Zeros(60)})},
        {"trailing tag", Join({speech, Zeros(79), Bytes().str("TAG").zeros(125).data()})},
        {"four bytes after the tag", Join({Id3v2Tag(3, Zeros(10)), {0xFF, 0xF1, 0x50, 0x80}})},
        {"three bytes after the tag", Join({Id3v2Tag(3, Zeros(10)), {0xFF, 0xF1, 0x50}})},
        {"tag and two bytes", Join({Id3v2Tag(3, Zeros(200)), Zeros(2)})},
        {"15 bytes", Zeros(15)},
        {"zeros", Zeros(200)},
        // ADIF is accepted where the check meets it, but read only at the start of the data.
        // The copyright id shifts every later field by 9 bytes; a zero bit rate gives duration
        // 0; SBR in the first block gives the AAC+ code and doubles the rate.
        {"adif", Join({AdifFile(Adif(false, false, 3, 96000), AacBlock(true, 0, 20)), Zeros(24000)})},
        {"adif copyright", Join({AdifFile(Adif(true, false, 8, 64000), AacBlock(true, 0, 20)), Zeros(24000)})},
        {"adif copyright vbr", Join({AdifFile(Adif(true, true, 8, 64000), AacBlock(true, 0, 20)), Zeros(24000)})},
        {"adif bit rate 0", Join({AdifFile(Adif(false, false, 3, 0), AacBlock(true, 0, 20)), Zeros(24000)})},
        {"adif sbr", Join({AdifFile(Adif(false, true, 6, 64000), AacBlock(true, 13, 20)), Zeros(24000)})},
        // Program configuration elements are summed and the last object type kept.
        {"adif pces", AdifFile(pces, AacBlock(true, 0, 20))},
        {"adif after a tag", Join({Id3v2Tag(3, Zeros(30)), adif})},
        {"adif late", Join({Zeros(40), adif})},
        {"ADIF mid-file", Join({Zeros(30), Bytes().str("ADIF").data(), Zeros(30)})},
    };
    TempDir dir;
    Golden golden("aac", "clips");
    for (const auto& c : cases) {
        const std::string path = dir.Write("a.aac", c.file);
        const int32_t check = Verify(path);
        golden.Check(c.name, std::to_string(check) + " | " + Probe(path));
    }
    golden.Check("missing", Probe(dir.PathOf("missing.aac")));
    int type = 0;  // detection takes the late ADIF file
    ASSERT_EQ(MM_MediaExtractor_DetectMediaType(dir.Write("late.aac", Join({Zeros(40), adif})).c_str(), &type), MM_OK);
    EXPECT_EQ(type, MEDIA_TYPE_AAC);
}

TEST(AacClip, TruncatedAdifHeadersAnswerWithoutFault) {
    TempDir dir;
    AdifLayout layout;
    layout.copyright = true;
    layout.pces[0].front = {true, true, true};
    layout.pces[0].comment = std::string(200, 'c');
    const Data full = AdifFile(layout, AacBlock(true, 13, 30));
    const Data tag = Id3v2Tag(3, Zeros(20));
    for (size_t cut = 5; cut < full.size(); cut += 3) {
        const std::string path =
            dir.Write("t.aac", Join({tag, Data(full.begin(), full.begin() + static_cast<long>(cut))}));
        _MMClipInfo clip;
        EXPECT_EQ(AAC_GetClipInfo(path.c_str(), &clip), MM_OK) << cut;
    }
}

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
    EXPECT_EQ(Join({Slice(input, 128, 148), Slice(input, 900, 3400)}), ReadFileBytes(out));
    const BufResult r = CutToBuffer(path, 1, 4);
    ASSERT_EQ(MM_OK, r.result);
    EXPECT_EQ(Slice(input, 900, 3300), r.data);
    EXPECT_TRUE(r.terminated);
    ASSERT_EQ(MM_OK, AAC_GetAuidoData_File(path.c_str(), 6, 1000, out.c_str()));
    EXPECT_EQ(Join({Slice(input, 128, 148), Slice(input, 5000, input.size())}), ReadFileBytes(out));
}

TEST(AacExtractFile, LeadingTagBodyAndTrailingTagAreCopied) {
    TempDir dir;
    Bytes body;
    for (int i = 0; i < 300; ++i) body.u8(static_cast<uint8_t>(i * 7));
    const std::vector<uint8_t> trailer = Bytes().str("TAG").fill(125, 'x').data();
    const std::vector<uint8_t> input = Join({Id3v2Tag(3, body.data()), HundredByteFrames(100), trailer});
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
    for (int i = 0; i < 10; ++i) input = Join({input, AdtsFrame(kLayout8k, std::vector<uint8_t>(3993, 0))});
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
    for (int i = 0; i < 100; ++i) input = Join({input, AdtsFrame(kLayout8k, {0xE0})});
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
    struct Case {
        const std::string* file;
        int start, end;
    };
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
    const std::string cmd =
        "/usr/bin/ffmpeg -hide_banner -loglevel error -y -f lavfi -i "
        "\"anoisesrc=d=6:c=pink:a=0.3:seed=7:r=44100\" -ac 2 -c:a aac \"" +
        in + "\"";
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

namespace {

struct Codeword {
    std::vector<int> bits;
    int index;
};

// Every codeword of a tree, by walking it.
void CodewordsOf(const HuffNode* tree, int node, std::vector<int>* prefix, std::vector<Codeword>* out) {
    if (tree[node].zero & kHuffLeaf) {
        out->push_back({*prefix, tree[node].zero & (kHuffLeaf - 1)});
        return;
    }
    for (int bit : {0, 1}) {
        prefix->push_back(bit);
        CodewordsOf(tree, bit ? tree[node].one : tree[node].zero, prefix, out);
        prefix->pop_back();
    }
}

// The bits packed most significant first, starting `offset` bits into the first byte.
Data Pack(const std::vector<int>& bits, int offset) {
    Data out(static_cast<size_t>(offset + static_cast<int>(bits.size()) + 7) / 8, 0);
    for (size_t i = 0; i < bits.size(); ++i) {
        const size_t at = static_cast<size_t>(offset) + i;
        if (bits[i]) out[at / 8] = static_cast<uint8_t>(out[at / 8] | 0x80 >> (at % 8));
    }
    return out;
}

}  // namespace

// The lookup tables against the trees they come from: every codeword of every
// book, followed by other bits or ending the data exactly, decodes to its index
// and length; one bit fewer exhausts the reader.
TEST(AacHuffman, EveryCodewordOfEveryBookDecodesAsItsTree) {
    std::mt19937 rng(7);
    for (int book = 0; book <= 11; ++book) {
        const HuffNode* tree = book == 0 ? hcb_sf : hcb_table[book].tree;
        std::vector<Codeword> codewords;
        std::vector<int> prefix;
        CodewordsOf(tree, 0, &prefix, &codewords);
        ASSERT_EQ(codewords.size(), book == 0 ? 121u : (hcb_table[book].nodes + 1u) / 2) << book;
        for (const Codeword& c : codewords) {
            const int length = static_cast<int>(c.bits.size());
            std::vector<int> followed = c.bits;
            for (int i = 0; i < 40; ++i) followed.push_back(static_cast<int>(rng() & 1));
            const int offset = static_cast<int>(rng() % 8);
            const Data data = Pack(followed, offset);
            AacBitReader r = MakeAacBitReader(data.data(), static_cast<int>(data.size()), 0, 8 - offset);
            EXPECT_EQ(DecodeCodeword(&r, HuffTableFor(book)), c.index) << book << " " << c.index;
            EXPECT_EQ(r.bitPos, offset + length) << book << " " << c.index;

            // The codeword as the last bits of the data, then without its last bit.
            for (const int kept : {length, length - 1}) {
                const std::vector<int> bits(c.bits.begin(), c.bits.begin() + kept);
                const int start = (8 - kept % 8) % 8;
                const Data tail = Pack(bits, start);
                r = MakeAacBitReader(tail.data(), static_cast<int>(tail.size()), 0, 8 - start);
                const int expected = kept == length ? c.index : -1;
                EXPECT_EQ(DecodeCodeword(&r, HuffTableFor(book)), expected) << book << " " << c.index << " " << kept;
                EXPECT_EQ(r.exhausted, kept < length) << book << " " << c.index;
            }
        }
    }
}

// After an SCE, an LFE, or a CPE with or without a common window (then two
// independent channel streams), and a data stream element (escaped count or
// not, aligned or not), only fill extensions 13 and 14 set the state.
TEST(AacWalker, OnlySbrFillExtensionsSetTheState) {
    const char* const elements[] = {"SCE", "LFE", "CPE", "CPE without common window"};
    for (int ext : {0, 1, 11, 12, 13, 14, 15}) {
        for (int e = 0; e < 4; ++e) {
            BitWriter w;
            if (e < 2) {
                PutSilentSce(w, e == 0 ? 0 : 3);
            } else {
                PutSilentCpe(w, e == 2);
            }
            PutDataStream(w, e >= 2 ? 260 : 2, e != 1);
            PutFill(w, ext, 3);
            PutEnd(w);
            uint32_t state;
            const AacBitReader r = Walk(w.bytes(), 3, &state);
            const bool sbr = ext == 13 || ext == 14;
            EXPECT_EQ(sbr ? metainfo::kWalkSbrFound : metainfo::kWalkPlain, state) << ext << " " << elements[e];
            EXPECT_EQ(static_cast<int>(w.bytes().size()), metainfo::BytePosition(r)) << ext << " " << elements[e];
            EXPECT_FALSE(r.exhausted);
        }
    }
}

// A corrupt or truncated stream ends the walk at the end of the data: the
// buffers are allocated to their exact size, so the sanitizers see any read
// past them.
TEST(AacWalker, CorruptStreamsNeverReadPastTheData) {
    std::mt19937 rng(1234);
    for (int round = 0; round < 3000; ++round) {
        const size_t size = 1 + rng() % 600;
        std::vector<uint8_t> data(size);
        for (auto& b : data) b = static_cast<uint8_t>(rng());
        // Bias some buffers towards long runs of ones and zeros (escapes, sections).
        if (round % 3 == 1)
            for (size_t i = 0; i < size; i += 2) data[i] = 0xFF;
        if (round % 3 == 2)
            for (size_t i = 0; i < size; i += 3) data[i] = 0x00;
        AacBitReader r = MakeAacBitReader(data.data(), static_cast<int>(size), 0);
        uint32_t state = metainfo::kWalkPlain;
        RawDataStream(&r, &state, static_cast<int>(rng() % 16));
        ASSERT_LE(metainfo::BytePosition(r), static_cast<int>(size));
    }
}

TEST(AacWalker, TruncatedRealBlocksEndAtTheCut) {
    const std::vector<uint8_t> full = AacBlock(true, 13, 40);
    for (size_t cut = 1; cut < full.size(); ++cut) {
        uint32_t state;
        EXPECT_TRUE(
            Walk(std::vector<uint8_t>(full.begin(), full.begin() + static_cast<long>(cut)), 4, &state).exhausted)
            << cut;
    }
}

// ffmpeg's encoder writes long and short windows, pairs with a common window,
// M/S, intensity and noise bands, TNS in long and short windows, every
// spectral book with escapes, and (AAC Main) prediction: walking each frame's
// block must end exactly at the frame's end.
TEST(AacWalker, FfmpegStreamsWalkToEveryFrameEnd) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg not installed";
    TempDir dir;
    struct Case {
        const char* name;
        std::string input;
        const char* options;
        uint32_t rate, channels, kbps, profile;
    };
    const std::string clicks =
        "aevalsrc=if(lt(mod(t\\,0.25)\\,0.004)\\,0.9*sin(2*PI*3000*t)\\,0.02*random(0))"
        "|0.5*sin(2*PI*440*t)+0.3*random(1):d=2:s=";
    const Case cases[] = {
        {"mono8", "sine=d=2:f=300:r=8000", "-ac 1", 8000, 1, 0, 0x2102},
        {"mono11", "anoisesrc=d=2:c=pink:seed=7:r=11025", "-ac 1", 11025, 1, 0, 0x2102},
        {"mono16", "sine=d=2:f=1000:r=16000", "-ac 1 -b:a 64k", 16000, 1, 64, 0x2102},
        {"stereo22", clicks + "22050", "-b:a 96k", 22050, 2, 96, 0x2102},
        {"stereo32", "anoisesrc=d=2:c=white:seed=7:r=32000:a=0.9", "-ac 2 -b:a 160k", 32000, 2, 160, 0x2102},
        {"mono44", "sine=d=2:f=440:r=44100", "-ac 1", 44100, 1, 0, 0x2102},
        {"stereo44", clicks + "44100", "-b:a 128k", 44100, 2, 128, 0x2102},
        {"stereo48", clicks + "48000", "-b:a 256k", 48000, 2, 256, 0x2102},
        {"stereo48low", clicks + "48000", "-b:a 32k", 48000, 2, 32, 0x2102},
        {"loud24", "sine=d=2:f=60:r=24000,volume=40", "-ac 2 -b:a 128k", 24000, 2, 128, 0x2102},
        {"main44", "sine=d=2:f=440:r=44100", "-ac 2 -profile:a aac_main -aac_pred 1", 44100, 2, 0, 0x2101},
        {"main48", clicks + "48000", "-profile:a aac_main -aac_pred 1 -b:a 128k", 48000, 2, 128, 0x2101},
    };
    for (const Case& c : cases) {
        const std::string out = dir.PathOf(std::string(c.name) + ".aac");
        const std::string cmd = "/usr/bin/ffmpeg -hide_banner -loglevel error -y -f lavfi -i \"" + c.input + "\" " +
                                c.options + " -c:a aac \"" + out + "\"";
        ASSERT_EQ(0, std::system(cmd.c_str())) << cmd;
        const std::vector<uint8_t> data = ReadFileBytes(out);
        size_t walked = 0;
        size_t shortTns = 0;
        EXPECT_EQ("", WalkEveryFrame(data, &walked, &shortTns)) << c.name;
        EXPECT_GT(walked, 10u) << c.name;
        EXPECT_LT(shortTns * 4, walked) << c.name << ": most frames are checked exactly";
        // The clip: the rate, channels and profile the stream was made with, a plausible bit rate.
        _MMClipInfo clip;
        _MM_CODECTYPE codec;
        ASSERT_EQ(AAC_GetClipInfo(out.c_str(), &clip), MM_OK) << c.name;
        ASSERT_EQ(AAC_GetCodecType(out.c_str(), &codec), MM_OK) << c.name;
        EXPECT_EQ(std::make_tuple(clip.nSampleRate, clip.nChannels, codec.nAudioCodec, codec.nAudioSubType),
                  std::make_tuple(c.rate, c.channels, 0x2011u, c.profile))
            << c.name;
        if (c.kbps != 0) {
            EXPECT_GT(clip.nBitrate, c.kbps * 1000 / 2) << c.name;
            EXPECT_LT(clip.nBitrate, c.kbps * 1000 * 2) << c.name;
        }
        EXPECT_GE(clip.nDuration, 1u) << c.name;
        EXPECT_LE(clip.nDuration, 3u) << c.name;
    }
}

// Short-window TNS coefficients are read one bit shorter than long-window ones:
// a block written that way walks to its end.
// Hand-built blocks, each walked to where it was written to end: an END
// first reads nothing else; a max_sfb above the band count stops the element
// and the walk goes on reading element ids where it stopped (here a fill
// element that announces SBR); short-window TNS coefficients are read one bit
// shorter than written, and the flag says so.
TEST(AacWalker, HandBuiltBlocksEndWhereTheWalkSays) {
    BitWriter maxSfb;
    maxSfb.put(0, 3).put(0, 4).put(100, 8);  // SCE, tag, global_gain
    maxSfb.put(0, 1).put(0, 2).put(0, 1).put(63, 6);  // long window, max_sfb 63 > 49 bands at 44.1 kHz
    PutFill(maxSfb, 13, 1);
    PutEnd(maxSfb);
    BitWriter tns;
    tns.put(0, 3).put(0, 4).put(100, 8);  // SCE, tag, global_gain
    tns.put(0, 1).put(2, 2).put(0, 1).put(0, 4).put(0, 7);  // eight short windows, max_sfb 0
    tns.put(0, 1).put(1, 1);  // no pulse data, TNS present
    tns.put(1, 1).put(1, 1).put(5, 4).put(2, 3).put(0, 1).put(0, 1);  // window 0: one filter of order 2
    tns.put(5, 3).put(2, 3);  // two coefficients of 1 + 3 - 0 - 1 bits
    for (int win = 1; win < 8; ++win) tns.put(0, 1);  // no filters in the other windows
    tns.put(0, 1);  // no gain control
    PutEnd(tns);
    const struct {
        const char* name;
        Data block;
        uint32_t state;
        int end;
        bool shortTns;
    } cases[] = {
        {"END first", {0xE0, 0xFF, 0xFF}, metainfo::kWalkPlain, 1, false},
        {"max_sfb above the bands", maxSfb.bytes(), metainfo::kWalkSbrFound, static_cast<int>(maxSfb.bytes().size()),
         false},
        {"short-window TNS", tns.bytes(), metainfo::kWalkPlain, static_cast<int>(tns.bytes().size()), true},
    };
    for (const auto& c : cases) {
        uint32_t state;
        const AacBitReader r = Walk(c.block, 4, &state);
        EXPECT_EQ(state, c.state) << c.name;
        EXPECT_EQ(metainfo::BytePosition(r), c.end) << c.name;
        EXPECT_TRUE(metainfo::AtByteStart(r)) << c.name;
        EXPECT_FALSE(r.exhausted) << c.name;
        EXPECT_EQ(r.shortWindowTns, c.shortTns) << c.name;
    }
    AacBitReader r = MakeAacBitReader(maxSfb.bytes().data(), static_cast<int>(maxSfb.bytes().size()), 0, 5);
    EXPECT_EQ(metainfo::kWalkMaxSfb, metainfo::single_lfe_channel_element(&r, 4));
}
