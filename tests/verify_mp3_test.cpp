#include <gtest/gtest.h>

#include <cstdio>
#include <string>
#include <vector>

#include "core/file_access.h"
#include "metainfo/records.h"
#include "mp3/mp3_frame.h"
#include "support/bytes.h"
#include "support/media.h"

using namespace metainfo;
using testing_support::Bytes;
using testing_support::Id3v2Tag;
using testing_support::Mp3Frame;
using testing_support::Mp3FrameLayout;
using testing_support::Mp3Header;
using testing_support::TempDir;

namespace {

int32_t FrameSize(const Mp3FrameLayout& shape, uint32_t* signature = nullptr, _FrameHeader_Info* info = nullptr) {
    uint32_t sig = 0;
    return MP3GetFrameSize(Mp3Header(shape).data(), signature != nullptr ? signature : &sig, info);
}

Bytes Frames(int count, const Mp3FrameLayout& shape = {}) {
    Bytes b;
    for (int i = 0; i < count; ++i) b.raw(Mp3Frame(shape));
    return b;
}

// Runs f on the file opened from bytes, closing it afterwards.
template <typename F>
void WithFile(const std::vector<uint8_t>& bytes, F f) {
    TempDir dir;
    int h = MEx_fopen(dir.Write("stream.mp3", bytes).c_str(), "rb");
    ASSERT_NE(h, 0);
    f(h);
    MEx_fclose(h);
}

}  // namespace

TEST(MP3GetFrameSize, ComputesSizesPerVersionAndLayer) {
    EXPECT_EQ(FrameSize({}), 417);  // MPEG-1 Layer III 128 kbit/s 44.1 kHz
    Mp3FrameLayout padded;
    padded.padding = 1;
    EXPECT_EQ(FrameSize(padded), 418);
    Mp3FrameLayout layer1;
    layer1.layer = 1;
    layer1.bitrateIndex = 1;  // 32 kbit/s
    layer1.samplingIndex = 1; // 48 kHz
    layer1.padding = 1;
    EXPECT_EQ(FrameSize(layer1), (32000 * 12 / 48000 + 1) * 4);
    Mp3FrameLayout mpeg2;
    mpeg2.version = 2;
    mpeg2.bitrateIndex = 8;   // 64 kbit/s
    EXPECT_EQ(FrameSize(mpeg2), 64000 * 72 / 22050);
    Mp3FrameLayout mpeg25;
    mpeg25.version = 0;
    mpeg25.bitrateIndex = 1;  // 8 kbit/s
    mpeg25.samplingIndex = 2; // 8 kHz
    EXPECT_EQ(FrameSize(mpeg25), 72);
}

TEST(MP3GetFrameSize, RecordsTheHeaderFieldsAndSignature) {
    Mp3FrameLayout shape;
    shape.version = 2;
    shape.layer = 2;
    shape.samplingIndex = 1;
    shape.channelMode = 3;
    shape.crc = true;
    _FrameHeader_Info info{};
    uint32_t signature = 0;
    ASSERT_GT(FrameSize(shape, &signature, &info), 0);
    EXPECT_EQ(info.versionId, 2);
    EXPECT_EQ(info.layerIndex, 1);
    EXPECT_EQ(info.channelMode, 3);
    EXPECT_EQ(info.protectionBit, 0);
    EXPECT_EQ(info.sampleRate, 24000u);
    EXPECT_EQ(info.bitRate, 80000u);  // LSF Layer II index 9
    EXPECT_EQ(info.samplesPerFrame, 1152u);
    EXPECT_EQ(signature, 1u << 4 | 2u << 6 | 1u << 2);
}

TEST(MP3GetFrameSize, RejectsReservedAndUnsupportedFields) {
    const std::vector<std::vector<uint8_t>> bad = {
        {0xFE, 0xFB, 0x90, 0x00},  // no sync
        {0xFF, 0xCB, 0x90, 0x00},  // sync bits incomplete
        {0xFF, 0xEB, 0x90, 0x00},  // reserved version
        {0xFF, 0xF9, 0x90, 0x00},  // layer bits 00
        {0xFF, 0xFB, 0xF0, 0x00},  // bit rate index 15
        {0xFF, 0xFB, 0x9C, 0x00},  // sampling index 3
        {0xFF, 0xFB, 0x00, 0x00},  // free format
    };
    for (const auto& h : bad) {
        uint32_t sig = 0;
        EXPECT_EQ(MP3GetFrameSize(h.data(), &sig, nullptr), MM_E_FAIL);
    }
}

TEST(CheckID3Header, SkipsUpToThreeChainedTagsAndFooters) {
    Bytes tag = Bytes().raw(Id3v2Tag(3, std::vector<uint8_t>(20, 0x11)));
    Bytes footerTag = Bytes().raw(Id3v2Tag(4, std::vector<uint8_t>(20, 0x11), 0x10)).zeros(10);
    Bytes tail = Frames(3);

    WithFile(Bytes().raw(tail), [](int h) {
        EXPECT_EQ(CheckID3Header(h), MM_OK);
        EXPECT_EQ(MEx_ftell(h), 0);
    });
    WithFile(Bytes().raw(tag).raw(tag).raw(tail), [](int h) {
        EXPECT_EQ(CheckID3Header(h), MM_OK);
        EXPECT_EQ(MEx_ftell(h), 60);
    });
    WithFile(Bytes().raw(footerTag).raw(tail), [](int h) {
        EXPECT_EQ(CheckID3Header(h), MM_OK);
        EXPECT_EQ(MEx_ftell(h), 40) << "a footer adds ten bytes";
    });
    WithFile(Bytes().raw(tag).raw(tag).raw(tag).raw(tag).raw(tail), [](int h) {
        EXPECT_EQ(CheckID3Header(h), MM_OK);
        EXPECT_EQ(MEx_ftell(h), 90) << "the fourth tag is left in place";
    });
}

TEST(CheckID3Header, ShortFilesFailOrStopAtTenBytes) {
    WithFile(Bytes().str("ID3").zeros(6), [](int h) { EXPECT_EQ(CheckID3Header(h), MM_E_FAIL); });
    WithFile(Bytes().str("ID3").zeros(7), [](int h) {
        EXPECT_EQ(CheckID3Header(h), MM_OK);
        EXPECT_EQ(MEx_ftell(h), 0);
    });
}

TEST(VerifyMP3, AcceptsTwoConsecutiveFramesAndReportsTheFirst) {
    Bytes file = Bytes().raw(Id3v2Tag(3, std::vector<uint8_t>(100, 0))).zeros(7).raw(Frames(2));
    WithFile(file, [](int h) {
        _FrameHeader_Info info{};
        EXPECT_EQ(VerifyMP3(h, nullptr, &info), MM_OK);
        EXPECT_EQ(info.firstFrameOffset, 117u);
        EXPECT_EQ(info.frameSize, 417u);
        EXPECT_EQ(info.bitRate, 128000u);
    });
}

TEST(VerifyMP3, AFirstPairWithDifferentSamplingRatesRejectsTheFile) {
    Mp3FrameLayout other;
    other.samplingIndex = 1;
    Bytes file = Bytes().raw(Mp3Frame({})).raw(Mp3Frame(other)).raw(Frames(3));
    WithFile(file, [](int h) { EXPECT_EQ(VerifyMP3(h, nullptr, nullptr), MM_E_UNSUPPORTED); });
}

TEST(VerifyMP3, TheSecondHeaderMustLieInsideWhatWasRead) {
    WithFile(Bytes().zeros(10).raw(Mp3Frame({})), [](int h) {
        EXPECT_EQ(VerifyMP3(h, nullptr, nullptr), MM_E_UNSUPPORTED);
    });
    Bytes late = Bytes().zeros(4000).raw(Frames(2));
    WithFile(late, [](int h) { EXPECT_EQ(VerifyMP3(h, nullptr, nullptr), MM_E_UNSUPPORTED); });
}

TEST(VerifyMP3, UndecodableCandidatesAreSkippedAndGarbageIsRejected) {
    Bytes file = Bytes{0xFF, 0xFB, 0xF0, 0x00}.zeros(3).raw(Frames(2));
    WithFile(file, [](int h) {
        _FrameHeader_Info info{};
        EXPECT_EQ(VerifyMP3(h, nullptr, &info), MM_OK);
        EXPECT_EQ(info.firstFrameOffset, 7u);
    });
    std::vector<uint8_t> noise(5000);
    for (size_t i = 0; i < noise.size(); ++i) noise[i] = static_cast<uint8_t>(i * 131 + 7);
    WithFile(noise, [](int h) { EXPECT_EQ(VerifyMP3(h, nullptr, nullptr), MM_E_UNSUPPORTED); });
    WithFile(Bytes().raw(Id3v2Tag(3, std::vector<uint8_t>(20, 0))).zeros(3), [](int h) {
        EXPECT_EQ(VerifyMP3(h, nullptr, nullptr), MM_E_FAIL) << "fewer than 4 bytes after the tag";
    });
}
