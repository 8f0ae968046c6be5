// The raw data block walker: it must step over real channel elements exactly,
// find SBR fill elements, and never read past the data it was given.
#include <gtest/gtest.h>

#include <cstdlib>
#include <random>
#include <string>
#include <vector>

#include "aac/aac_bits.h"
#include "aac/aac_walker.h"
#include "support/aac_builder.h"
#include "support/bytes.h"
#include "support/media.h"

using namespace testing_support;
using metainfo::AacBitReader;
using metainfo::MakeAacBitReader;
using metainfo::RawDataStream;

namespace {

struct Frame { size_t offset, length; int samplingIndex, headerSize, rawBlocks; };

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
        AacBitReader r = MakeAacBitReader(data.data(), static_cast<int>(data.size()),
                                          static_cast<int>(f.offset) + f.headerSize);
        uint32_t state = metainfo::kWalkPlain;
        RawDataStream(&r, &state, f.samplingIndex);
        const size_t end = static_cast<size_t>(r.bytePos);
        if (r.shortWindowTns) {
            if (shortTns != nullptr) ++*shortTns;
            if (end > data.size()) failures += "frame at " + std::to_string(f.offset) + " walked past the data\n";
            continue;
        }
        ++*walked;
        if (r.exhausted || r.bitCount != 8 || end != f.offset + f.length) {
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

TEST(AacWalker, EndElementFirstReadsNothingElse) {
    uint32_t state;
    const AacBitReader r = Walk({0xE0, 0xFF, 0xFF}, 4, &state);
    EXPECT_EQ(1, r.bytePos);
    EXPECT_EQ(8, r.bitCount);
    EXPECT_EQ(metainfo::kWalkPlain, state);
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
            EXPECT_EQ(static_cast<int>(w.bytes().size()), r.bytePos) << ext << " " << elements[e];
            EXPECT_FALSE(r.exhausted);
        }
    }
}

TEST(AacWalker, MaxSfbAboveBandCountStopsElementAndWalkGoesOn) {
    BitWriter w;
    w.put(0, 3).put(0, 4).put(100, 8);           // SCE, tag, global_gain
    w.put(0, 1).put(0, 2).put(0, 1).put(63, 6);  // long window, max_sfb 63 > 49 bands at 44.1 kHz
    PutFill(w, 13, 1);                           // read as the next element
    PutEnd(w);
    AacBitReader r = MakeAacBitReader(w.bytes().data(), static_cast<int>(w.bytes().size()), 0, 5);
    EXPECT_EQ(metainfo::kWalkMaxSfb, metainfo::single_lfe_channel_element(&r, 4));
    uint32_t state;
    Walk(w.bytes(), 4, &state);
    EXPECT_EQ(metainfo::kWalkSbrFound, state);
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
        if (round % 3 == 1) for (size_t i = 0; i < size; i += 2) data[i] = 0xFF;
        if (round % 3 == 2) for (size_t i = 0; i < size; i += 3) data[i] = 0x00;
        AacBitReader r = MakeAacBitReader(data.data(), static_cast<int>(size), 0);
        uint32_t state = metainfo::kWalkPlain;
        RawDataStream(&r, &state, static_cast<int>(rng() % 16));
        ASSERT_LE(r.bytePos, static_cast<int>(size));
    }
}

TEST(AacWalker, TruncatedRealBlocksEndAtTheCut) {
    const std::vector<uint8_t> full = AacBlock(true, 13, 40);
    for (size_t cut = 1; cut < full.size(); ++cut) {
        uint32_t state;
        EXPECT_TRUE(Walk(std::vector<uint8_t>(full.begin(), full.begin() + static_cast<long>(cut)), 4, &state).exhausted)
            << cut;
    }
}

TEST(AacWalker, CorpusStreamsWalkToEveryFrameEnd) {
    const std::string dir = CorpusDir();
    if (dir.empty()) GTEST_SKIP() << "no corpus";
    for (const char* name : {"/mutagen/empty.aac", "/taglib/empty1s.aac"}) {
        const std::vector<uint8_t> data = ReadFileBytes(dir + name);
        size_t walked = 0;
        EXPECT_EQ("", WalkEveryFrame(data, &walked)) << name;
        EXPECT_GT(walked, 3u) << name;
    }
}

// ffmpeg's encoder writes long and short windows, pairs with a common window,
// M/S, intensity and noise bands, TNS in long and short windows, every
// spectral book with escapes, and (AAC Main) prediction: walking each frame's
// block must end exactly at the frame's end.
TEST(AacWalker, FfmpegStreamsWalkToEveryFrameEnd) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg not installed";
    TempDir dir;
    struct Case { const char* name; std::string input; const char* options; };
    const std::string clicks =
        "aevalsrc=if(lt(mod(t\\,0.25)\\,0.004)\\,0.9*sin(2*PI*3000*t)\\,0.02*random(0))"
        "|0.5*sin(2*PI*440*t)+0.3*random(1):d=2:s=";
    const Case cases[] = {
        {"mono8", "sine=d=2:f=300:r=8000", "-ac 1"},
        {"mono11", "anoisesrc=d=2:c=pink:seed=7:r=11025", "-ac 1"},
        {"mono16", "sine=d=2:f=1000:r=16000", "-ac 1 -b:a 64k"},
        {"stereo22", clicks + "22050", "-b:a 96k"},
        {"stereo32", "anoisesrc=d=2:c=white:seed=7:r=32000:a=0.9", "-ac 2 -b:a 160k"},
        {"mono44", "sine=d=2:f=440:r=44100", "-ac 1"},
        {"stereo44", clicks + "44100", "-b:a 128k"},
        {"stereo48", clicks + "48000", "-b:a 256k"},
        {"stereo48low", clicks + "48000", "-b:a 32k"},
        {"loud24", "sine=d=2:f=60:r=24000,volume=40", "-ac 2 -b:a 128k"},
        {"main44", "sine=d=2:f=440:r=44100", "-ac 2 -profile:a aac_main -aac_pred 1"},
        {"main48", clicks + "48000", "-profile:a aac_main -aac_pred 1 -b:a 128k"},
    };
    for (const Case& c : cases) {
        const std::string out = dir.PathOf(std::string(c.name) + ".aac");
        const std::string cmd = "/usr/bin/ffmpeg -hide_banner -loglevel error -y -f lavfi -i \"" + c.input +
                                "\" " + c.options + " -c:a aac \"" + out + "\"";
        ASSERT_EQ(0, std::system(cmd.c_str())) << cmd;
        const std::vector<uint8_t> data = ReadFileBytes(out);
        size_t walked = 0;
        size_t shortTns = 0;
        EXPECT_EQ("", WalkEveryFrame(data, &walked, &shortTns)) << c.name;
        EXPECT_GT(walked, 10u) << c.name;
        EXPECT_LT(shortTns * 4, walked) << c.name << ": most frames are checked exactly";
    }
}

// Short-window TNS coefficients are read one bit shorter than long-window ones:
// a block written that way walks to its end.
TEST(AacWalker, ShortWindowTnsCoefficientsAreOneBitShorter) {
    BitWriter w;
    w.put(0, 3).put(0, 4).put(100, 8);                       // SCE, tag, global_gain
    w.put(0, 1).put(2, 2).put(0, 1).put(0, 4).put(0, 7);     // eight short windows, max_sfb 0
    w.put(0, 1).put(1, 1);                                   // no pulse data, TNS present
    w.put(1, 1).put(1, 1).put(5, 4).put(2, 3).put(0, 1).put(0, 1);  // window 0: one filter of order 2
    w.put(5, 3).put(2, 3);                                   // two coefficients of 1 + 3 - 0 - 1 bits
    for (int win = 1; win < 8; ++win) w.put(0, 1);           // no filters in the other windows
    w.put(0, 1);                                             // no gain control
    PutEnd(w);
    uint32_t state;
    const AacBitReader r = Walk(w.bytes(), 4, &state);
    EXPECT_TRUE(r.shortWindowTns);
    EXPECT_FALSE(r.exhausted);
    EXPECT_EQ(static_cast<int>(w.bytes().size()), r.bytePos);
    EXPECT_EQ(8, r.bitCount);
}
