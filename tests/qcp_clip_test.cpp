// QCP files: the chunk walk, the "fmt " chunk, the duration precedence and
// the codec carried from one file to the next.
#include <gtest/gtest.h>

#include <dirent.h>

#include <thread>

#include "metainfo/metainfo.h"
#include "speech/qcp.h"
#include "speech/qcp_format.h"
#include "support/bytes.h"
#include "support/speech_builder.h"

using namespace testing_support;

namespace {

std::vector<uint8_t> Qcp(const std::vector<Bytes>& chunks) { return RiffForm("QLCM", chunks); }

// Runs body on a thread of its own, whose codec state starts empty.
template <typename F>
void OnFreshThread(F body) {
    std::thread t(body);
    t.join();
}

}  // namespace

TEST(QcpClip, FmtBitrateGivesDurationAndFields) {
    TempDir dir;
    Bytes data = SpeechPackets(4, 34, 500);  // 10 s of full-rate QCELP
    std::vector<uint8_t> file = Qcp({QcpFmtChunk(kQcelpGuid1, 13000), SpeechChunk("data", data)});
    std::string path = dir.Write("speech.qcp", file);
    _MMClipInfo clip;
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_QCP, &clip), MM_OK);
    EXPECT_EQ(clip.nFileSize, file.size());
    EXPECT_EQ(clip.nDuration, file.size() * 8 / 13000 * 1000);
    EXPECT_EQ(clip.nAudioBitrate, 13000u);
    EXPECT_EQ(clip.nBitrate, 13000u);
    EXPECT_EQ(clip.nSampleRate, 8000u);
    EXPECT_EQ(clip.nBitsPerSample, 16u);
    EXPECT_EQ(clip.nSamplesPerFrame, 160u);
    EXPECT_EQ(clip.nChannels, 0u);
    EXPECT_EQ(clip.bHasAudio, 1u);
    EXPECT_STREQ(clip.szFormat, "qcp");
}

TEST(QcpClip, VratPacketCountReplacesTheBitrateDuration) {
    TempDir dir;
    std::vector<uint8_t> file = Qcp({QcpFmtChunk(kQcelpGuid2, 13000), QcpVratChunk(1234),
                                     SpeechChunk("data", SpeechPackets(4, 34, 10))});
    std::string path = dir.Write("speech.qcp", file);
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::QCP_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 24u);  // 1234 / 50
}

TEST(QcpClip, ZeroBitrateWithoutVratCountsDataPackets) {
    TempDir dir;
    // QCELP: rate octets 4 and 1 skip 34 and 3 bytes.
    Bytes qcelp = SpeechPackets(4, 34, 60).raw(SpeechPackets(1, 3, 90));
    std::string path = dir.Write("q.qcp", Qcp({QcpFmtChunk(kQcelpGuid1, 0), SpeechChunk("data", qcelp)}));
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::QCP_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 3u);  // 150 packets
    EXPECT_EQ(clip.nBitrate, 0u);
    // EVRC inside QCP also takes the quarter rate (2, 5 bytes).
    Bytes evrc = SpeechPackets(4, 22, 50).raw(SpeechPackets(2, 5, 49));
    path = dir.Write("e.qcp", Qcp({QcpFmtChunk(kEvrcGuid, 0), SpeechChunk("data", evrc)}));
    clip = _MMClipInfo{};
    ASSERT_EQ(metainfo::QCP_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 1u);  // 99 packets
}

TEST(QcpClip, RefusedRateOctetsFailTheWalk) {
    TempDir dir;
    _MMClipInfo clip{};
    std::string path = dir.Write("q.qcp", Qcp({QcpFmtChunk(kQcelpGuid1, 0), SpeechChunk("data", Bytes().u8(8).zeros(40))}));
    EXPECT_EQ(metainfo::QCP_GetClipInfo(path.c_str(), &clip), MM_E_FAIL);
    clip = _MMClipInfo{};
    path = dir.Write("e.qcp", Qcp({QcpFmtChunk(kEvrcGuid, 0), SpeechChunk("data", Bytes().u8(6).zeros(40))}));
    EXPECT_EQ(metainfo::QCP_GetClipInfo(path.c_str(), &clip), MM_E_FAIL);
}

TEST(QcpClip, DataBeforeFmtDependsOnThePreviousFilesCodec) {
    TempDir dir;
    // The walk of "data" runs to the end of the file, so it also reads the
    // "fmt " chunk behind it: a last half-rate packet (10 bytes) covers that
    // chunk's header, and its zeroed body counts as 148 blank packets.
    Bytes data = SpeechPackets(4, 22, 100).u8(3);
    std::vector<uint8_t> early = Qcp({SpeechChunk("data", data), SpeechChunk("fmt ", Bytes().zeros(150))});
    std::string earlyPath = dir.Write("early.qcp", early);
    std::string evrcPath = dir.Write("evrc.qcp", Qcp({QcpFmtChunk(kEvrcGuid, 0), SpeechChunk("data", SpeechPackets(4, 22, 50))}));
    std::string qcelpPath = dir.Write("qcelp.qcp", Qcp({QcpFmtChunk(kQcelpGuid1, 13000)}));
    OnFreshThread([&] {
        _MMClipInfo clip{};
        EXPECT_EQ(metainfo::QCP_GetClipInfo(earlyPath.c_str(), &clip), MM_E_FAIL);
        clip = _MMClipInfo{};
        ASSERT_EQ(metainfo::QCP_GetClipInfo(evrcPath.c_str(), &clip), MM_OK);
        clip = _MMClipInfo{};
        ASSERT_EQ(metainfo::QCP_GetClipInfo(earlyPath.c_str(), &clip), MM_OK);
        EXPECT_EQ(clip.nDuration, 4u);  // 249 packets
        // After a QCELP file the same bytes are sized by the QCELP table
        // (a full-rate octet takes 34 bytes): 743 packets.
        _MM_CODECTYPE codec{};
        ASSERT_EQ(metainfo::QCP_GetCodecType(qcelpPath.c_str(), &codec), MM_OK);
        clip = _MMClipInfo{};
        ASSERT_EQ(metainfo::QCP_GetClipInfo(earlyPath.c_str(), &clip), MM_OK);
        EXPECT_EQ(clip.nDuration, 14u);
    });
}

TEST(QcpClip, SmvReportsItsCodecButCannotBeWalked) {
    TempDir dir;
    std::string path = dir.Write("s.qcp", Qcp({QcpFmtChunk(kSmvGuid, 0), SpeechChunk("data", SpeechPackets(4, 22, 10))}));
    OnFreshThread([&] {
        _MM_CODECTYPE codec;
        ASSERT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), MEDIA_TYPE_QCP, &codec), MM_OK);
        EXPECT_EQ(codec.nAudioCodec, 0x9001u);
        _MMClipInfo clip{};
        EXPECT_EQ(metainfo::QCP_GetClipInfo(path.c_str(), &clip), MM_E_FAIL);
    });
}

TEST(QcpClip, CodecCodesByGuid) {
    TempDir dir;
    std::vector<uint8_t> unknown(16, 0x11);
    const std::pair<std::vector<uint8_t>, uint32_t> cases[] = {
        {kQcelpGuid1, 0x7001}, {kQcelpGuid2, 0x7001}, {kEvrcGuid, 0x8001}, {kSmvGuid, 0x9001}, {unknown, 0xFFFF}};
    for (const auto& c : cases) {
        // The data chunk is not walked for a codec query.
        std::string path = dir.Write("c.qcp", Qcp({QcpFmtChunk(c.first, 0), SpeechChunk("data", Bytes().u8(0xFF))}));
        _MM_CODECTYPE codec;
        ASSERT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), MEDIA_TYPE_QCP, &codec), MM_OK);
        EXPECT_EQ(codec.nAudioCodec, c.second);
    }
}

TEST(QcpClip, ThirteenByteRiffReportsTheFileSizeOnly) {
    TempDir dir;
    std::string path = dir.Write("tiny.qcp", Bytes().str("RIFF").le32(5).str("QLCM").u8('x').data());
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::QCP_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nFileSize, 13u);
    EXPECT_EQ(clip.nDuration, 0u);
    EXPECT_EQ(clip.nBitrate, 0u);
    EXPECT_EQ(clip.bHasAudio, 1u);
    EXPECT_STREQ(clip.szFormat, "qcp");
    std::string bare = dir.Write("bare.qcp", Bytes().str("RIFF").u8(1).data());
    clip = _MMClipInfo{};
    ASSERT_EQ(metainfo::QCP_GetClipInfo(bare.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nFileSize, 5u);
}

TEST(QcpClip, BrokenFilesFailAndAreClosed) {
    TempDir dir;
    int before = OpenDescriptors();
    _MMClipInfo clip{};
    std::string notRiff = dir.Write("n.qcp", Bytes().str("RIFX").le32(4).str("QLCM").zeros(20).data());
    EXPECT_EQ(metainfo::QCP_GetClipInfo(notRiff.c_str(), &clip), MM_E_FAIL);
    std::string huge = dir.Write("h.qcp", Bytes().str("RIFF").le32(4).str("QLCM").str("junk").le32(1000).zeros(20).data());
    EXPECT_EQ(metainfo::QCP_GetClipInfo(huge.c_str(), &clip), MM_E_FAIL);
    std::vector<uint8_t> cut = Qcp({QcpFmtChunk(kQcelpGuid1, 13000)});
    cut.resize(cut.size() - 10);  // the "fmt " chunk runs past the end
    std::string shortFmt = dir.Write("s.qcp", cut);
    EXPECT_EQ(metainfo::QCP_GetClipInfo(shortFmt.c_str(), &clip), MM_E_FAIL);
    _MM_CODECTYPE codec{};
    EXPECT_EQ(metainfo::QCP_GetCodecType(shortFmt.c_str(), &codec), MM_E_FAIL);
    std::string noExtension = dir.Write("noext", Qcp({QcpFmtChunk(kQcelpGuid1, 13000)}));
    EXPECT_EQ(metainfo::QCP_GetClipInfo(noExtension.c_str(), &clip), MM_E_FAIL);
    EXPECT_EQ(metainfo::QCP_GetClipInfo(dir.PathOf("missing.qcp").c_str(), &clip), -1);
    EXPECT_EQ(metainfo::QCP_GetClipInfo(nullptr, &clip), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::QCP_GetCodecType(noExtension.c_str(), nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(OpenDescriptors(), before);
}

TEST(QcpClip, OddChunkSizesGetNoPadByte) {
    TempDir dir;
    std::vector<uint8_t> file = Qcp({SpeechChunk("labl", Bytes().str("abc")), QcpFmtChunk(kQcelpGuid1, 8000), QcpVratChunk(500)});
    std::string path = dir.Write("odd.qcp", file);
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::QCP_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nAudioBitrate, 8000u);
    EXPECT_EQ(clip.nDuration, 10u);
}

TEST(QcpClip, TrackTypeIsAudio) {
    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType("/no/such/file.qcp", MEDIA_TYPE_QCP, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO);
}

TEST(QcpFormat, DecodesAChunkHandedOverAsABuffer) {
    Bytes chunk = QcpFmtChunk(kEvrcGuid, 9600, 160, 8000, 16);
    metainfo::_QCPFMT fmt;
    ASSERT_EQ(metainfo::parseFMTInfo(chunk.data().data(), chunk.size(), &fmt), MM_OK);
    EXPECT_EQ(fmt.nChunkSize, 150u);
    EXPECT_EQ(fmt.nMajor, 1);
    EXPECT_EQ(fmt.nAvgBitrate, 9600);
    EXPECT_EQ(fmt.nPacketSize, 35);
    EXPECT_EQ(fmt.nBlockSize, 160);
    EXPECT_EQ(fmt.nSamplingRate, 8000);
    EXPECT_EQ(fmt.nSampleSize, 16);
    EXPECT_EQ(fmt.nNumRates, 5u);
    EXPECT_EQ(fmt.rateMap[0].nWordSize, 4);
    EXPECT_EQ(metainfo::CodecOfGuid(fmt.codecGuid), metainfo::QcpCodec::kEvrc);
    EXPECT_STREQ(fmt.szCodecName, "speech");
}

TEST(QcpFormat, FieldsPastAShortBufferReadAsZero) {
    Bytes chunk = QcpFmtChunk(kQcelpGuid1, 13000);
    metainfo::_QCPFMT fmt;
    ASSERT_EQ(metainfo::parseFMTInfo(chunk.data().data(), 110, &fmt), MM_OK);
    EXPECT_EQ(fmt.nAvgBitrate, 13000);
    EXPECT_EQ(fmt.nSamplingRate, 0);
    EXPECT_EQ(metainfo::parseFMTInfo(nullptr, 10, &fmt), MM_E_INVALIDARG);
}
