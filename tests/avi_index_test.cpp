// The AVI index: entry times, neighbour searches, seeking and frame delivery.
#include <gtest/gtest.h>

#include <cstring>
#include <vector>

#include "metainfo/avi_parser.h"
#include "metainfo/metainfo.h"
#include "support/avi_builder.h"
#include "support/bytes.h"

using namespace testing_support;

namespace {

// A parser over the file, its index already read.
class Indexed {
public:
    explicit Indexed(const std::vector<uint8_t>& file) : path_(dir_.Write("clip.avi", file)) {}
    int32_t Open() { return p_.OpenIndexed(path_); }
    CAVIParser* operator->() const { return p_.operator->(); }
    const _AVIIndexEntry& Entry(uint32_t i) const { return p_->getIndexEntries()[i]; }
    std::vector<uint32_t> TimesOf(uint32_t stream) const {
        std::vector<uint32_t> times;
        for (uint32_t i = 0; i < p_->getIndexCount(); ++i) {
            if (Entry(i).wStream == stream) times.push_back(Entry(i).dwTimeMs);
        }
        return times;
    }

private:
    TempDir dir_;
    std::string path_;
    AviParserHandle p_;
};

// Video at 25 fps interleaved with 4000-byte audio chunks at 16000 bytes/s.
std::vector<uint8_t> Interleaved(uint32_t videoFrames, uint32_t audioChunks) {
    AviMainFields main;
    main.totalFrames = videoFrames;
    main.streams = 2;
    Bytes hdrl = AviHdrl(main, {AviStrl(AviVideoStream(1, 25, videoFrames), AviVideoFormat(16, 16, "FMP4")),
                                AviStrl(AviAudioStream(16000, audioChunks * 4000), AviAudioFormat(1, 1, 8000, 16000, 2, 16))});
    std::vector<AviFrame> frames;
    for (uint32_t i = 0; i < videoFrames || i < audioChunks; ++i) {
        if (i < videoFrames) frames.push_back({0, "dc", Bytes().be32(i).zeros(5), i % 10 == 0 ? 0x10u : 0u});
        if (i < audioChunks) frames.push_back({1, "wb", Bytes().fill(4000, static_cast<uint8_t>(i)), 0x10u});
    }
    return AviFile(hdrl, frames);
}

// One video stream whose frames carry the given index flags.
std::vector<uint8_t> VideoWithFlags(const std::vector<uint32_t>& flags) {
    Bytes hdrl = AviHdrl(AviMainFields(), {AviStrl(AviVideoStream(1, 25, 6), AviVideoFormat(16, 16, "FMP4"))});
    std::vector<AviFrame> frames;
    for (uint32_t f : flags) frames.push_back({0, "dc", Bytes().zeros(4), f});
    return AviFile(hdrl, frames);
}

}  // namespace

TEST(AviIndexTimes, VideoEntriesStepByTheFrameTime) {
    Indexed pal(AviVideoOnly(5, 1));
    ASSERT_EQ(pal.Open(), MM_OK);
    EXPECT_EQ(pal.TimesOf(0), (std::vector<uint32_t>{0, 40, 80, 120, 160}));
    Indexed ntsc(AviVideoOnly(4, 1, 1001, 30000));
    ASSERT_EQ(ntsc.Open(), MM_OK);
    EXPECT_EQ(ntsc.TimesOf(0), (std::vector<uint32_t>{0, 33, 66, 99}));
}

TEST(AviIndexTimes, AudioEntriesAdvanceByThePreviousChunkLength) {
    Indexed f(Interleaved(10, 4));
    ASSERT_EQ(f.Open(), MM_OK);
    EXPECT_EQ(f.TimesOf(1), (std::vector<uint32_t>{0, 250, 500, 750}));
}

TEST(AviIndexTimes, EntriesKeepTheirFieldsAndStreamNumbers) {
    Indexed f(Interleaved(2, 1));
    ASSERT_EQ(f.Open(), MM_OK);
    ASSERT_EQ(f->getIndexCount(), 3u);
    EXPECT_EQ(f.Entry(0).ckid, 0x30306463u) << "00dc, read big-endian";
    EXPECT_EQ(f.Entry(0).dwChunkOffset, 4u);
    EXPECT_EQ(f.Entry(1).wStream, 1u);
    EXPECT_EQ(f.Entry(1).wType, 0x7762u) << "wb";
}

TEST(AviIndexTimes, EntryOfAStreamWithoutASlotStopsTheIndexKeepingEarlierEntries) {
    Bytes hdrl = AviHdrl(AviMainFields(), {AviStrl(AviVideoStream(1, 25, 3), AviVideoFormat(16, 16, "FMP4"))});
    std::vector<AviFrame> frames{{0, "dc", Bytes().zeros(4), 0x10}, {0, "dc", Bytes().zeros(4), 0},
                                 {5, "tx", Bytes().zeros(4), 0}, {0, "dc", Bytes().zeros(4), 0}};
    Indexed f(AviFile(hdrl, frames));
    EXPECT_EQ(f.Open(), MM_E_FAIL);
    ASSERT_EQ(f->getIndexCount(), 4u);
    EXPECT_EQ(f.Entry(1).dwTimeMs, 40u);
    EXPECT_EQ(f.Entry(3).ckid, 0u) << "entries after the failure stay unread";
}

TEST(AviIndexSearch, NextAndPreviousEntriesOfAStream) {
    Indexed f(Interleaved(3, 3));  // v a v a v a
    ASSERT_EQ(f.Open(), MM_OK);
    EXPECT_EQ(f->searchNextIndex(0, 0), 2u);
    EXPECT_EQ(f->searchNextIndex(0, 4), 6u) << "none after: the entry count";
    EXPECT_EQ(f->searchNextIndex(0, 5), 5u) << "already the last entry";
    EXPECT_EQ(f->searchPreIndex(1, 5), 3u);
    EXPECT_EQ(f->searchPreIndex(0, 2), 0u) << "entry 0 is never examined";
}

TEST(AviSeek, VideoLandsOnTheEarlierKeyFrame) {
    Indexed f(AviVideoOnly(50, 10));  // key frames at 0, 400, 800, 1200, 1600 ms
    ASSERT_EQ(f.Open(), MM_OK);
    uint32_t actual = 1;
    EXPECT_EQ(f->setMediaTime(0, 1000, &actual), MM_OK);
    EXPECT_EQ(actual, 800u);
    _FrameInfo frame{};
    ASSERT_EQ(f->getNextFrame(0, &frame), MM_OK);
    EXPECT_EQ(frame.dwTimeMs, 800u);
    EXPECT_EQ(frame.dwFlags, AVI_KEYFRAME_FLAGS);
    MM_MediaExtractor_FreeBuffer(frame.pData);
    EXPECT_EQ(f->setMediaTime(0, 2000, &actual), MM_OK) << "the very end stays inside the index";
    EXPECT_EQ(actual, 1600u);
}

TEST(AviSeek, KeyFlagWithAnotherBitIsNotAKeyFrame) {
    Indexed f(VideoWithFlags({0x10, 0, 0, 0x11, 0, 0}));
    ASSERT_EQ(f.Open(), MM_OK);
    EXPECT_EQ(f.Entry(3).dwFlags, 0x11000000u);
    uint32_t actual = 1;
    EXPECT_EQ(f->setMediaTime(0, 150, &actual), MM_OK);
    EXPECT_EQ(actual, 0u);
}

TEST(AviSeek, AudioSeeksToTheFirstEntryAtOrAfterTheTime) {
    Indexed f(Interleaved(25, 4));
    ASSERT_EQ(f.Open(), MM_OK);
    uint32_t actual = 0;
    EXPECT_EQ(f->setMediaTime(1, 600, &actual), MM_OK);
    EXPECT_EQ(actual, 750u);
}

TEST(AviFrames, EveryFrameButTheStreamsLastIsDeliveredWithItsBytes) {
    Indexed f(Interleaved(6, 3));
    ASSERT_EQ(f.Open(), MM_OK);
    std::vector<uint32_t> times;
    _FrameInfo frame{};
    while (f->getNextFrame(0, &frame) == MM_OK) {
        ASSERT_EQ(frame.dwSize, 9u);
        EXPECT_EQ(frame.pData[3] * 40u, frame.dwTimeMs) << "the bytes are those of the indexed chunk";
        times.push_back(frame.dwTimeMs);
        MM_MediaExtractor_FreeBuffer(frame.pData);
    }
    EXPECT_EQ(times, (std::vector<uint32_t>{0, 40, 80, 120, 160}));
    EXPECT_EQ(f->getNextFrame(0, &frame), 1) << "the end stays the end";
    int audio = 0;
    for (; f->getNextFrame(1, &frame) == MM_OK; ++audio) MM_MediaExtractor_FreeBuffer(frame.pData);
    EXPECT_EQ(audio, 2);
}

TEST(AviFrames, SeekingAndReadingNeedTheIndexAndValidArguments) {
    Indexed f(AviVideoOnly(10, 5));
    uint32_t actual = 0;
    _FrameInfo frame{};
    EXPECT_EQ(f->setMediaTime(0, 0, &actual), MM_E_INVALIDARG) << "nothing read yet";
    EXPECT_EQ(f->getNextFrame(0, &frame), MM_E_FAIL);
    EXPECT_EQ(f->getNextFrame(0, nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(f->init(nullptr, nullptr), MM_E_INVALIDARG);
    ASSERT_EQ(f.Open(), MM_OK);
    EXPECT_EQ(f->setMediaTime(0, 100, nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(f->setMediaTime(0, 401, &actual), MM_E_INVALIDARG) << "past the stream's end";
    EXPECT_EQ(f->setMediaTime(1, 0, &actual), MM_E_INVALIDARG);
    EXPECT_EQ(f->getNextFrame(1, &frame), MM_E_FAIL);
    EXPECT_EQ(f->locateChunk("strl"), MM_E_FAIL) << "only top-level chunks are located";
}

TEST(AviFrames, OffsetsAndLengthsOutsideMoviAreRefused) {
    Bytes file(VideoWithFlags({0x10, 0x10, 0x10, 0x10}));
    size_t idx1 = file.size() - 4 * 16;
    file.patch_le32(idx1 + 8, 0x7FFFFFF0);                               // entry 0: offset far past movi
    file.patch_le32(idx1 + 16 + 12, 0x7FFFFFF0);                         // entry 1: length above movi
    file.patch_le32(idx1 + 32 + 8, static_cast<uint32_t>(file.size()));  // entry 2: data past the file
    Indexed f(file.data());
    ASSERT_EQ(f.Open(), MM_OK);
    _FrameInfo frame{};
    EXPECT_EQ(f->getNextFrame(0, &frame), MM_E_FAIL);
    uint32_t actual = 0;
    ASSERT_EQ(f->setMediaTime(0, 40, &actual), MM_OK);
    EXPECT_EQ(f->getNextFrame(0, &frame), MM_E_FAIL);
}

TEST(AviHostile, IndexSizesAndTruncationsStayBounded) {
    std::vector<uint8_t> good = Interleaved(8, 4);
    // An idx1 that claims almost the whole file while holding few entries.
    Bytes big(good);
    size_t idx1 = good.size() - 12 * 16 - 8;
    ASSERT_EQ(std::memcmp(good.data() + idx1, "idx1", 4), 0);
    big.patch_le32(idx1 + 4, static_cast<uint32_t>(good.size() - 1));
    {
        Indexed f(big.data());
        EXPECT_EQ(f.Open(), MM_E_FAIL) << "the header walk sees the chunk pass the end of the file";
        ASSERT_EQ(f->locateChunk("movi"), MM_OK);
        ASSERT_EQ(f->parseMovi(f->getFileHandle()), MM_OK);
        ASSERT_EQ(f->locateChunk("idx1"), MM_OK);
        EXPECT_EQ(f->parseIdx1(f->getFileHandle()), MM_OK);
        EXPECT_EQ(f->getIndexCount(), 12u) << "no more entries than the file holds";
    }
    // Every truncation of the file runs through the whole sequence.
    for (size_t n = 0; n < good.size(); n += 11) {
        Indexed f(std::vector<uint8_t>(good.begin(), good.begin() + static_cast<long>(n)));
        f.Open();
        uint32_t actual = 0;
        f->setMediaTime(0, 100, &actual);
        _FrameInfo frame{};
        for (int i = 0; i < 20 && f->getNextFrame(0, &frame) == MM_OK; ++i) MM_MediaExtractor_FreeBuffer(frame.pData);
    }
}
