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

class Indexed {
public:
    explicit Indexed(const std::vector<uint8_t>& file) {
        path_ = dir_.Write("clip.avi", file);
        EXPECT_EQ(CreateAVIParserObject(&p_), MM_OK);
    }
    ~Indexed() { FreeAVIParserObject(p_); }

    // init, then "movi" and "idx1" as a caller locates them.
    int32_t Open() {
        int32_t r = p_->init(path_.c_str(), nullptr);
        if (r != MM_OK) return r;
        r = p_->locateChunk("movi");
        if (r == MM_OK) r = p_->parseMovi(p_->getFileHandle());
        if (r != MM_OK) return r;
        r = p_->locateChunk("idx1");
        if (r == MM_OK) r = p_->parseIdx1(p_->getFileHandle());
        return r;
    }
    CAVIParser* operator->() { return p_; }
    const _AVIIndexEntry& Entry(uint32_t i) { return p_->getIndexEntries()[i]; }

private:
    TempDir dir_;
    std::string path_;
    CAVIParser* p_ = nullptr;
};

AviStreamSpec AudioStream(uint32_t avgBytesPerSec, uint32_t length) {
    AviStreamSpec s;
    s.type = "auds";
    s.handler = std::string("\0\0\0\0", 4);
    s.scale = 1;
    s.rate = avgBytesPerSec;
    s.length = length;
    return s;
}

// Video at 25 fps interleaved with 4000-byte audio chunks at 16000 bytes/s.
std::vector<uint8_t> Interleaved(uint32_t videoFrames, uint32_t audioChunks) {
    AviMainSpec main;
    main.totalFrames = videoFrames;
    main.streams = 2;
    AviStreamSpec video;
    video.length = videoFrames;
    Bytes hdrl = AviHdrl(main, {AviStrl(video, AviVideoFormat(16, 16, "FMP4")),
                                AviStrl(AudioStream(16000, audioChunks * 4000), AviAudioFormat(1, 1, 8000, 16000, 2, 16))});
    std::vector<AviFrame> frames;
    for (uint32_t i = 0; i < videoFrames || i < audioChunks; ++i) {
        if (i < videoFrames) frames.push_back({0, "dc", Bytes().be32(i).zeros(5), i % 10 == 0 ? 0x10u : 0u});
        if (i < audioChunks) frames.push_back({1, "wb", Bytes().fill(4000, static_cast<uint8_t>(i)), 0x10u});
    }
    return AviFile(hdrl, frames);
}

std::vector<uint32_t> TimesOf(Indexed& f, uint32_t stream) {
    std::vector<uint32_t> times;
    for (uint32_t i = 0; i < f->getIndexCount(); ++i) {
        if (f.Entry(i).wStream == stream) times.push_back(f.Entry(i).dwTimeMs);
    }
    return times;
}

}  // namespace

TEST(AviIndexTimes, VideoEntriesStepByTheFrameTime) {
    Indexed f(AviVideoOnly(5, 1));
    ASSERT_EQ(f.Open(), MM_OK);
    EXPECT_EQ(TimesOf(f, 0), (std::vector<uint32_t>{0, 40, 80, 120, 160}));

    Indexed ntsc(AviVideoOnly(4, 1, 1001, 30000));
    ASSERT_EQ(ntsc.Open(), MM_OK);
    EXPECT_EQ(TimesOf(ntsc, 0), (std::vector<uint32_t>{0, 33, 66, 99}));
}

TEST(AviIndexTimes, AudioEntriesAdvanceByThePreviousChunkLength) {
    Indexed f(Interleaved(10, 4));
    ASSERT_EQ(f.Open(), MM_OK);
    EXPECT_EQ(TimesOf(f, 1), (std::vector<uint32_t>{0, 250, 500, 750}));
    EXPECT_EQ(TimesOf(f, 0).size(), 10u);
}

TEST(AviIndexTimes, EntriesKeepTheirFieldsAndStreamNumbers) {
    Indexed f(Interleaved(2, 1));
    ASSERT_EQ(f.Open(), MM_OK);
    ASSERT_EQ(f->getIndexCount(), 3u);
    EXPECT_EQ(f.Entry(0).ckid, 0x30306463u) << "00dc";
    EXPECT_EQ(f.Entry(0).dwFlags, AVI_KEYFRAME_FLAGS);
    EXPECT_EQ(f.Entry(0).dwChunkOffset, 4u);
    EXPECT_EQ(f.Entry(0).dwChunkLength, 9u);
    EXPECT_EQ(f.Entry(1).wStream, 1u);
    EXPECT_EQ(f.Entry(1).wType, 0x7762u) << "wb";
}

TEST(AviIndexTimes, EntryOfAStreamWithoutASlotStopsTheIndexKeepingEarlierEntries) {
    AviMainSpec main;
    AviStreamSpec video;
    video.length = 3;
    Bytes hdrl = AviHdrl(main, {AviStrl(video, AviVideoFormat(16, 16, "FMP4"))});
    std::vector<AviFrame> frames{{0, "dc", Bytes().zeros(4), 0x10},
                                 {0, "dc", Bytes().zeros(4), 0},
                                 {5, "tx", Bytes().zeros(4), 0},
                                 {0, "dc", Bytes().zeros(4), 0}};
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
    EXPECT_EQ(f->searchNextIndex(1, 1), 3u);
    EXPECT_EQ(f->searchNextIndex(0, 4), 6u) << "none after: the entry count";
    EXPECT_EQ(f->searchNextIndex(0, 5), 5u) << "already the last entry";
    EXPECT_EQ(f->searchPreIndex(0, 4), 2u);
    EXPECT_EQ(f->searchPreIndex(1, 5), 3u);
    EXPECT_EQ(f->searchPreIndex(0, 2), 0u) << "entry 0 is never examined";
    EXPECT_EQ(f->searchPreIndex(1, 1), 0u);
    EXPECT_EQ(f->searchPreIndex(1, 0), 0u);
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

    EXPECT_EQ(f->setMediaTime(0, 0, &actual), MM_OK);
    EXPECT_EQ(actual, 0u);
    EXPECT_EQ(f->setMediaTime(0, 1999, &actual), MM_OK);
    EXPECT_EQ(actual, 1600u);
    EXPECT_EQ(f->setMediaTime(0, 2000, &actual), MM_OK) << "the very end stays inside the index";
    EXPECT_EQ(actual, 1600u);
}

TEST(AviSeek, KeyFlagWithAnotherBitIsNotAKeyFrame) {
    AviMainSpec main;
    AviStreamSpec video;
    video.length = 6;
    Bytes hdrl = AviHdrl(main, {AviStrl(video, AviVideoFormat(16, 16, "FMP4"))});
    std::vector<AviFrame> frames;
    for (uint32_t i = 0; i < 6; ++i) {
        uint32_t flags = i == 0 ? 0x10u : i == 3 ? 0x11u : 0u;
        frames.push_back({0, "dc", Bytes().zeros(4), flags});
    }
    Indexed f(AviFile(hdrl, frames));
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
    EXPECT_EQ(f->setMediaTime(1, 500, &actual), MM_OK);
    EXPECT_EQ(actual, 500u);
}

TEST(AviSeek, BadArguments) {
    Indexed f(AviVideoOnly(10, 5));
    uint32_t actual = 0;
    EXPECT_EQ(f->setMediaTime(0, 0, &actual), MM_E_INVALIDARG) << "nothing read yet";
    ASSERT_EQ(f.Open(), MM_OK);
    EXPECT_EQ(f->setMediaTime(0, 100, nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(f->setMediaTime(0, 401, &actual), MM_E_INVALIDARG);
    EXPECT_EQ(f->setMediaTime(1, 0, &actual), MM_E_INVALIDARG);
}

TEST(AviFrames, EveryFrameButTheStreamsLastIsDeliveredWithItsBytes) {
    std::vector<uint8_t> file = Interleaved(6, 3);
    Indexed f(file);
    ASSERT_EQ(f.Open(), MM_OK);
    std::vector<uint32_t> times;
    for (;;) {
        _FrameInfo frame{};
        int32_t r = f->getNextFrame(0, &frame);
        if (r == 1) break;
        ASSERT_EQ(r, MM_OK);
        ASSERT_EQ(frame.dwSize, 9u);
        ASSERT_NE(frame.pData, nullptr);
        uint32_t n = static_cast<uint32_t>(frame.pData[0]) << 24 | frame.pData[1] << 16 | frame.pData[2] << 8 |
                     frame.pData[3];
        EXPECT_EQ(n * 40, frame.dwTimeMs) << "the bytes are those of the indexed chunk";
        times.push_back(frame.dwTimeMs);
        MM_MediaExtractor_FreeBuffer(frame.pData);
    }
    EXPECT_EQ(times, (std::vector<uint32_t>{0, 40, 80, 120, 160}));
    _FrameInfo frame{};
    EXPECT_EQ(f->getNextFrame(0, &frame), 1) << "the end stays the end";

    int audio = 0;
    while (f->getNextFrame(1, &frame) == MM_OK) {
        EXPECT_EQ(frame.dwSize, 4000u);
        MM_MediaExtractor_FreeBuffer(frame.pData);
        ++audio;
    }
    EXPECT_EQ(audio, 2);
}

TEST(AviFrames, ReadingNeedsMoviAndIndexAndAValidStream) {
    Indexed f(AviVideoOnly(4, 1));
    _FrameInfo frame{};
    EXPECT_EQ(f->getNextFrame(0, nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(f->init(nullptr, nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(f->getNextFrame(0, &frame), MM_E_FAIL);
    ASSERT_EQ(f.Open(), MM_OK);
    EXPECT_EQ(f->getNextFrame(1, &frame), MM_E_FAIL);
    EXPECT_EQ(f->locateChunk("abc"), MM_E_INVALIDARG);
    EXPECT_EQ(f->locateChunk("strl"), MM_E_FAIL);
}

TEST(AviFrames, OffsetsAndLengthsOutsideMoviAreRefused) {
    AviMainSpec main;
    AviStreamSpec video;
    video.length = 4;
    Bytes hdrl = AviHdrl(main, {AviStrl(video, AviVideoFormat(16, 16, "FMP4"))});
    std::vector<AviFrame> frames;
    for (uint32_t i = 0; i < 4; ++i) frames.push_back({0, "dc", Bytes().zeros(4), 0x10});
    Bytes file(AviFile(hdrl, frames));
    size_t idx1 = file.size() - 4 * 16;
    file.patch_le32(idx1 + 8, 0x7FFFFFF0);           // entry 0: offset far past movi
    file.patch_le32(idx1 + 16 + 12, 0x7FFFFFF0);     // entry 1: length above movi
    file.patch_le32(idx1 + 32 + 8, static_cast<uint32_t>(file.size()));  // entry 2: offset at movi's end, data past the file
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
    TempDir dir;
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
        std::vector<uint8_t> cut(good.begin(), good.begin() + static_cast<long>(n));
        Indexed f(cut);
        f.Open();
        uint32_t actual = 0;
        f->setMediaTime(0, 100, &actual);
        _FrameInfo frame{};
        for (int i = 0; i < 20 && f->getNextFrame(0, &frame) == MM_OK; ++i) MM_MediaExtractor_FreeBuffer(frame.pData);
    }
}
