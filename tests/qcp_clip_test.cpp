// QCP files: the chunk walk, the "fmt " chunk, the duration precedence and
// the codec carried from one file to the next.
#include <gtest/gtest.h>

#include <thread>

#include "metainfo/metainfo.h"
#include "speech/qcp.h"
#include "speech/qcp_format.h"
#include "support/speech_builder.h"

using namespace testing_support;

namespace {

std::vector<uint8_t> Qcp(const std::vector<Bytes>& chunks) { return RiffForm("QLCM", chunks); }
Bytes Data(const Bytes& packets) { return SpeechChunk("data", packets); }

}  // namespace

TEST(QcpClip, FmtBitrateGivesDurationAndFields) {
    std::vector<uint8_t> file = Qcp({QcpFmtChunk(kQcelpGuid1, 13000), Data(SpeechPackets(4, 34, 500))});
    _MMClipInfo clip;
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(SpeechFile("speech.qcp", file).c_str(), MEDIA_TYPE_QCP, &clip), MM_OK);
    // 17678 bytes * 8 / 13000 = 10 s; no channel count.
    EXPECT_EQ(AudioSummary(clip), "qcp size=17678 dur=10000 bps=13000/13000 hz=8000 ch=0 bits=16 spf=160 av=1/0");
}

TEST(QcpClip, DurationFromVratElseBitrateElseCountedDataPackets) {
    const struct {
        std::vector<Bytes> chunks;
        int32_t result;
        uint32_t duration;
    } cases[] = {
        // 1234 / 50; the odd-sized chunk before "fmt " gets no pad byte.
        {{SpeechChunk("labl", Bytes().str("abc")), QcpFmtChunk(kQcelpGuid2, 13000), QcpVratChunk(1234),
          Data(SpeechPackets(4, 34, 10))}, MM_OK, 24},
        // Bit rate 0: QCELP rate octets 4 and 1 skip 34 and 3 bytes, 150 packets.
        {{QcpFmtChunk(kQcelpGuid1, 0), Data(SpeechPackets(4, 34, 60).raw(SpeechPackets(1, 3, 90)))}, MM_OK, 3},
        // EVRC inside QCP also takes the quarter rate (2, 5 bytes): 99 packets.
        {{QcpFmtChunk(kEvrcGuid, 0), Data(SpeechPackets(4, 22, 50).raw(SpeechPackets(2, 5, 49)))}, MM_OK, 1},
        {{QcpFmtChunk(kQcelpGuid1, 0), Data(Bytes().u8(8).zeros(40))}, MM_E_FAIL, 0},
        {{QcpFmtChunk(kEvrcGuid, 0), Data(Bytes().u8(6).zeros(40))}, MM_E_FAIL, 0},
    };
    for (const auto& c : cases) {
        _MMClipInfo clip{};
        EXPECT_EQ(metainfo::QCP_GetClipInfo(SpeechFile("q.qcp", Qcp(c.chunks)).c_str(), &clip), c.result) << &c - cases;
        EXPECT_EQ(clip.nDuration, c.duration) << &c - cases;
    }
}

TEST(QcpClip, DataBeforeFmtIsWalkedWithThePreviousFilesCodec) {
    // The walk of "data" runs to the end of the file, so it also reads the
    // "fmt " chunk behind it: a last half-rate packet (10 bytes) covers that
    // chunk's header, and its zeroed body counts as 148 blank packets.
    std::string early = SpeechFile("early.qcp", Qcp({Data(SpeechPackets(4, 22, 100).u8(3)),
                                                    SpeechChunk("fmt ", Bytes().zeros(150))}));
    std::string evrc = SpeechFile("evrc.qcp", Qcp({QcpFmtChunk(kEvrcGuid, 0), Data(Bytes().u8(4))}));
    std::string qcelp = SpeechFile("qcelp.qcp", Qcp({QcpFmtChunk(kQcelpGuid1, 13000)}));
    std::string smv = SpeechFile("smv.qcp", Qcp({QcpFmtChunk(kSmvGuid, 0), Data(Bytes().u8(4))}));
    auto duration = [](const std::string& path, int32_t result) {
        _MMClipInfo clip{};
        EXPECT_EQ(metainfo::QCP_GetClipInfo(path.c_str(), &clip), result) << path;
        return clip.nDuration;
    };
    std::thread([&] {  // a thread of its own, whose codec state starts empty
        // SMV sets no codec state, so its packets cannot be walked.
        duration(smv, MM_E_FAIL);
        _MM_CODECTYPE codec{};
        ASSERT_EQ(metainfo::QCP_GetCodecType(smv.c_str(), &codec), MM_OK);
        EXPECT_EQ(codec.nAudioCodec, 0x9001u);
        duration(early, MM_E_FAIL);
        duration(evrc, MM_OK);
        EXPECT_EQ(duration(early, MM_OK), 4u);  // 249 packets
        // After a QCELP file the same bytes are sized by the QCELP table
        // (a full-rate octet takes 34 bytes): 743 packets.
        ASSERT_EQ(metainfo::QCP_GetCodecType(qcelp.c_str(), &codec), MM_OK);
        EXPECT_EQ(duration(early, MM_OK), 14u);
    }).join();
}

TEST(QcpClip, CodecCodesByGuid) {
    const std::pair<std::vector<uint8_t>, uint32_t> cases[] = {{kQcelpGuid1, 0x7001}, {kQcelpGuid2, 0x7001},
                                                               {kEvrcGuid, 0x8001},   {kSmvGuid, 0x9001},
                                                               {std::vector<uint8_t>(16, 0x11), 0xFFFF}};
    for (const auto& c : cases) {
        // The data chunk is not walked for a codec query.
        std::string path = SpeechFile("c.qcp", Qcp({QcpFmtChunk(c.first, 0), Data(Bytes().u8(0xFF))}));
        _MM_CODECTYPE codec;
        ASSERT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), MEDIA_TYPE_QCP, &codec), MM_OK);
        EXPECT_EQ(codec.nAudioCodec, c.second);
    }
}

TEST(QcpClip, RiffWithoutChunksReportsTheFileSizeOnly) {
    _MMClipInfo clip{};
    std::string path = SpeechFile("tiny.qcp", Bytes().str("RIFF").le32(5).str("QLCM").u8('x'));
    ASSERT_EQ(metainfo::QCP_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(AudioSummary(clip), "qcp size=13 dur=0 bps=0/0 hz=0 ch=0 bits=0 spf=0 av=1/0");
    clip = _MMClipInfo{};  // a RIFF header cut short
    ASSERT_EQ(metainfo::QCP_GetClipInfo(SpeechFile("bare.qcp", Bytes().str("RIFF").u8(1)).c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nFileSize, 5u);
}

TEST(QcpClip, BrokenFilesFailAndAreClosed) {
    std::vector<uint8_t> cut = Qcp({QcpFmtChunk(kQcelpGuid1, 13000)});
    cut.resize(cut.size() - 10);  // the "fmt " chunk runs past the end
    const struct {
        const char* name;
        std::vector<uint8_t> bytes;
    } cases[] = {
        {"notriff.qcp", Bytes().str("RIFX").le32(4).str("QLCM").zeros(20).data()},
        {"huge.qcp", Bytes().str("RIFF").le32(4).str("QLCM").str("junk").le32(1000).zeros(20).data()},
        {"short.qcp", cut},
        {"noextension", Qcp({QcpFmtChunk(kQcelpGuid1, 13000)})},
    };
    int before = OpenDescriptors();
    _MMClipInfo clip{};
    for (const auto& c : cases) {
        EXPECT_EQ(metainfo::QCP_GetClipInfo(SpeechFile(c.name, c.bytes).c_str(), &clip), MM_E_FAIL) << c.name;
    }
    _MM_CODECTYPE codec{};
    EXPECT_EQ(metainfo::QCP_GetCodecType(SpeechFile("short.qcp", cut).c_str(), &codec), MM_E_FAIL);
    EXPECT_EQ(metainfo::QCP_GetClipInfo("/no/such/file.qcp", &clip), -1);
    EXPECT_EQ(metainfo::QCP_GetClipInfo(nullptr, &clip), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::QCP_GetCodecType(SpeechFile("short.qcp", cut).c_str(), nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(OpenDescriptors(), before);
}

TEST(QcpFormat, DecodesABufferAndReadsFieldsPastItsEndAsZero) {
    Bytes chunk = QcpFmtChunk(kEvrcGuid, 9600);
    metainfo::_QCPFMT fmt;
    ASSERT_EQ(metainfo::parseFMTInfo(chunk.data().data(), chunk.size(), &fmt), MM_OK);
    EXPECT_EQ(fmt.nPacketSize, 35);
    EXPECT_EQ(fmt.nNumRates, 5u);
    EXPECT_EQ(fmt.rateMap[0].nWordSize, 4);
    EXPECT_EQ(metainfo::CodecOfGuid(fmt.codecGuid), metainfo::QcpCodec::kEvrc);
    EXPECT_STREQ(fmt.szCodecName, "speech");
    ASSERT_EQ(metainfo::parseFMTInfo(chunk.data().data(), 110, &fmt), MM_OK);
    EXPECT_EQ(fmt.nAvgBitrate, 9600);
    EXPECT_EQ(fmt.nSamplingRate, 0);
    EXPECT_EQ(metainfo::parseFMTInfo(nullptr, 10, &fmt), MM_E_INVALIDARG);
}
