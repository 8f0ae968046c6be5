// Speech and PCM files: AMR storage files, EVRC, QCP and WAVE; their clip, MIME and
// codec answers (each speech type's track answer is audio without reading the file:
// see the dispatch table test); range extraction from AMR and WAVE files into a buffer
// or a new file that players accept; every WAVE file of the corpus.
#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <thread>

#include "metainfo/extract.h"
#include "metainfo/metainfo.h"
#include "speech/amr.h"
#include "speech/evrc.h"
#include "speech/qcp.h"
#include "speech/qcp_format.h"
#include "speech/wave.h"
#include "support/speech_builder.h"
#include "support/summary.h"

using namespace testing_support;

TEST(AmrClip, EachFileKindAnswersItsRatesMimeAndCodec) {
    const struct {
        bool wideBand;
        int frameType;
        uint32_t frames, channels, subType;
        const char* clip;
    } cases[] = {
        // 3000 frames of 32 bytes: (96006 - 6) / 32 / 50 = 60 s.
        {false, 7, 3000, 0, 0, "amr size=96006 dur=60000 bps=12200 audio=1 abps=12200 hz=8000 ch=1 bits=16 spf=160"},
        {true, 8, 500, 0, 0x1021,
         "awb size=30509 dur=10000 bps=23850 audio=1 abps=23850 hz=16000 ch=1 bits=16 spf=320"},
        // Wide-band 9 is a SID frame, 15 carries no data (and runs off the code table).
        {true, 9, 250, 0, 0x1022, "awb size=1509 dur=5000 bps=1750 audio=1 abps=1750 hz=16000 ch=1 bits=16 spf=320"},
        {true, 15, 200, 0, 0, "awb size=209 dur=4000 bps=40 audio=1 abps=40 hz=16000 ch=1 bits=16 spf=320"},
        // Multi-channel: one frame per channel in each 20 ms block, the frame
        // headers after the 4-byte channel description.
        {false, 7, 200, 2, 0, "amr size=6416 dur=2000 bps=12200 audio=1 abps=12200 hz=8000 ch=2 bits=16 spf=160"},
        {true, 0, 300, 3, 0x1019, "awb size=5419 dur=2000 bps=6600 audio=1 abps=6600 hz=16000 ch=3 bits=16 spf=320"},
    };
    _MM_MIMETYPE mime{};  // kept across files: each answer releases the one before
    for (const auto& c : cases) {
        SCOPED_TRACE(c.clip);
        std::string path = SpeechFile("speech.amr", AmrFile(c.wideBand, c.frameType, c.frames, c.channels));
        int type = c.wideBand ? MEDIA_TYPE_AMR_WB : MEDIA_TYPE_AMR_NB;
        _MMClipInfo clip;
        ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), type, &clip), MM_OK);
        EXPECT_EQ(ClipSummary(clip), c.clip);
        ASSERT_EQ(metainfo::AMR_GetMIMEType(path.c_str(), &mime), MM_OK);
        std::string expected = c.wideBand ? "audio/AMR-WB" : "audio/AMR";
        EXPECT_EQ(mime.pszMimeType, expected);
        EXPECT_EQ(mime.nMimeLength, expected.size());
        // A narrow-band file has no codec answer.
        _MM_CODECTYPE codec;
        EXPECT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), type, &codec), c.wideBand ? MM_OK : MM_E_UNSUPPORTED);
        EXPECT_EQ(codec.nAudioCodec, c.wideBand ? 0x1020u : 0u);
        EXPECT_EQ(codec.nAudioSubType, c.subType);
    }
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
}

TEST(AmrClip, BadMagicHeaderByteOrShortFileFailsEveryQuery) {
    const struct {
        const char* magic;
        int header;  // first frame header byte, -1 for none
        size_t bytes;
        int32_t result;
    } cases[] = {
        {"#!AMR\n", 7 << 3, 40, MM_E_FAIL},  // quality bit 0
        {"#!AMR\n", 7 << 3 | 5, 40, MM_E_FAIL},  // low bits set
        {"#!AMR\n", 0x80 | 7 << 3 | 4, 40, MM_E_FAIL},  // bit 7 set
        {"#!AMR\n", 9 << 3 | 4, 40, MM_E_FAIL},  // narrow-band 9..14 reserved
        {"#!AMR\n", 14 << 3 | 4, 40, MM_E_FAIL},
        {"#!AMR-WB\n", 10 << 3 | 4, 40, MM_E_FAIL},  // wide-band 10..14 reserved
        {"#!AMR\n", 7 << 3 | 4, 8, MM_E_FAIL},  // 15 bytes in all
        {"#!AMR-WB_MC1.0\n", -1, 1, MM_E_FAIL},  // first frame past a 16-byte file
        {"#!AMR_X\n", -1, 40, MM_E_UNSUPPORTED},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::Message() << c.magic << c.header);
        Bytes b;
        b.str(c.magic);
        if (c.header >= 0) b.u8(static_cast<uint32_t>(c.header));
        std::string path = SpeechFile("bad.amr", b.zeros(c.bytes));
        _MMClipInfo clip{};
        EXPECT_EQ(metainfo::AMR_GetClipInfo(path.c_str(), &clip), c.result);
        _MM_MIMETYPE mime{};
        EXPECT_EQ(metainfo::AMR_GetMIMEType(path.c_str(), &mime), c.result);
        EXPECT_EQ(mime.pszMimeType, nullptr);
        _MM_CODECTYPE codec{};
        EXPECT_EQ(metainfo::AMR_GetCodecType(path.c_str(), &codec), c.result);
        unsigned char* data = nullptr;
        int size = 0;
        EXPECT_EQ(metainfo::AMR_GetAudioData2Buf(path.c_str(), 0, 1, &data, &size), c.result);
        EXPECT_EQ(data, nullptr);
    }
    _MMClipInfo clip{};
    EXPECT_EQ(metainfo::AMR_GetClipInfo("/no/such/file.amr", &clip), MM_E_FAIL);
    EXPECT_EQ(metainfo::AMR_GetClipInfo(nullptr, &clip), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::AMR_GetClipInfo(SpeechFile("bad.amr", {}).c_str(), nullptr), MM_E_INVALIDARG);
}

TEST(AmrBlockSize, DropsOneOutlierAtEachEnd) {
    Bytes b;
    b.raw(AmrFrame(false, 7)).raw(AmrFrame(false, 7)).raw(AmrFrame(false, 7)).raw(AmrFrame(false, 0));
    EXPECT_EQ(metainfo::Get_avBlockSize(b.data().data(), 0, b.size(), 1), 32);  // (109 - 32 - 13) / 2
    EXPECT_EQ(metainfo::Get_avBlockSize(b.data().data() + 64, 0, 45, 1), 22);  // two blocks: 45 / 2
    EXPECT_EQ(metainfo::Get_avBlockSize(nullptr, 0, 100, 1), 0);
}

TEST(AmrBlockSize, NoBlockSizeFailsTheClip) {
    // Reserved frames of size 0 after a valid one never advance the walk,
    // which stops after 4096 blocks; a multi-channel file of 0 channels has
    // empty blocks.
    Bytes stuck;
    stuck.str("#!AMR\n").raw(AmrFrame(false, 7)).u8(12 << 3 | 4).zeros(100);
    EXPECT_EQ(metainfo::Get_avBlockSize(stuck.data().data() + 6, 0, stuck.size() - 6, 1), 0);
    for (const std::vector<uint8_t>& file : {stuck.data(), AmrFile(false, 7, 10, 0x10 /* low 4 bits 0 */)}) {
        _MMClipInfo clip{};
        EXPECT_EQ(metainfo::AMR_GetClipInfo(SpeechFile("none.amr", file).c_str(), &clip), MM_E_FAIL);
    }
}

TEST(EvrcClip, FiftyFullRatePacketsAreOneSecondAt9256) {
    std::string path = SpeechFile("speech.evc", EvrcFile(SpeechPackets(4, 22, 50)));  // 7 + 50 * 23 bytes
    _MMClipInfo clip;
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_EVRC, &clip), MM_OK);
    EXPECT_EQ(ClipSummary(clip), "evc size=1157 dur=1000 bps=9256 audio=1 abps=9256 hz=8000");
}

TEST(EvrcClip, PacketsBySizeOfTheirRateOver50GiveTheDurationAndBitrate) {
    // Blank (0), eighth (1: 2 bytes), half (3: 10 bytes) and rate 5 (no payload).
    Bytes mixed = SpeechPackets(0, 0, 30).raw(SpeechPackets(1, 2, 30)).raw(SpeechPackets(3, 10, 30));
    const struct {
        Bytes packets;
        uint32_t duration, bitrate;
    } cases[] = {
        {mixed.raw(SpeechPackets(5, 0, 10)), 2, 467 * 8 / 2},
        {SpeechPackets(4, 22, 49), 0, 0},  // under one second: no bit rate, and no fault
        {Bytes(), 0, 0},
    };
    for (const auto& c : cases) {
        _MMClipInfo clip{};
        clip.nChannels = 7;  // the record is not cleared first
        ASSERT_EQ(metainfo::EVRC_GetClipInfo(SpeechFile("speech.evc", EvrcFile(c.packets)).c_str(), &clip), MM_OK);
        EXPECT_EQ(clip.nDuration, c.duration);
        EXPECT_EQ(clip.nBitrate, c.bitrate);
        EXPECT_EQ(clip.nChannels, 7u);
    }
}

TEST(EvrcClip, QuarterRateHighRatesMissingFilesAndExtensionsFail) {
    _MMClipInfo clip{};
    for (uint8_t rate : {uint8_t{2}, uint8_t{6}, uint8_t{0xFF}}) {
        std::string path = SpeechFile("bad.evc", EvrcFile(SpeechPackets(4, 22, 3).raw(SpeechPackets(rate, 5, 1))));
        EXPECT_EQ(metainfo::EVRC_GetClipInfo(path.c_str(), &clip), MM_E_FAIL) << int(rate);
    }
    std::string noExtension = SpeechFile("speech", EvrcFile(SpeechPackets(4, 22, 5)));
    EXPECT_EQ(metainfo::EVRC_GetClipInfo(noExtension.c_str(), &clip), MM_E_FAIL);
    EXPECT_EQ(metainfo::EVRC_GetClipInfo("/no/such/file.evc", &clip), -1);
    EXPECT_EQ(metainfo::EVRC_GetClipInfo(nullptr, &clip), MM_E_INVALIDARG);
}

TEST(EvrcClip, CodecIsEvrcWithoutOpeningTheFile) {
    _MM_CODECTYPE codec;
    codec.nVideoCodec = 5;
    EXPECT_EQ(metainfo::EVRC_GetCodecType("/no/such/file.evc", &codec), MM_OK);
    EXPECT_EQ(codec.nAudioCodec, 0x8001u);
    EXPECT_EQ(codec.nVideoCodec, 0u);
    EXPECT_EQ(metainfo::EVRC_GetCodecType("/no/such/file.evc", nullptr), MM_E_INVALIDARG);
}

namespace {

std::vector<uint8_t> Qcp(const std::vector<Bytes>& chunks) { return RiffForm("QLCM", chunks); }
Bytes Data(const Bytes& packets) { return SpeechChunk("data", packets); }

// Cuts from a 60-second 12.2 kbit/s file: 1600 bytes per second after the 6-byte magic.
struct AmrExtract : ::testing::Test {
    void SetUp() override {
        source = AmrFile(false, 7, 3000);
        // Mark each frame with its index so that a wrong offset shows.
        for (size_t i = 0; i < 3000; ++i) source[6 + i * 32 + 1] = static_cast<uint8_t>(i);
        path = dir.Write("speech.amr", source);
    }
    TempDir dir;
    std::vector<uint8_t> source;
    std::string path;
};

// Cuts from three seconds of 8 kHz 16-bit mono: 16000 bytes a second from offset 36.
struct WaveExtract : ::testing::Test {
    void SetUp() override {
        source = CanonicalWave(1, 1, 8000, 16, 48000);
        for (size_t i = 44; i < source.size(); ++i) source[i] = static_cast<uint8_t>(i * 7);
        path = dir.Write("tone.wav", source);
    }
    TempDir dir;
    std::vector<uint8_t> source;
    std::string path;
};
}  // namespace

TEST(QcpClip, FmtBitrateGivesDurationAndFields) {
    std::vector<uint8_t> file = Qcp({QcpFmtChunk(kQcelpGuid1, 13000), Data(SpeechPackets(4, 34, 500))});
    _MMClipInfo clip;
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(SpeechFile("speech.qcp", file).c_str(), MEDIA_TYPE_QCP, &clip), MM_OK);
    // 17678 bytes * 8 / 13000 = 10 s; no channel count.
    EXPECT_EQ(ClipSummary(clip), "qcp size=17678 dur=10000 bps=13000 audio=1 abps=13000 hz=8000 bits=16 spf=160");
}

TEST(QcpClip, DurationFromVratElseBitrateElseCountedDataPackets) {
    const struct {
        std::vector<Bytes> chunks;
        int32_t result;
        uint32_t duration;
    } cases[] = {
        // 1234 / 50; the odd-sized chunk before "fmt " gets no pad byte.
        {{SpeechChunk("labl", Bytes().str("abc")), QcpFmtChunk(kQcelpGuid2, 13000), QcpVratChunk(1234),
          Data(SpeechPackets(4, 34, 10))},
         MM_OK,
         24},
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
    std::string early =
        SpeechFile("early.qcp", Qcp({Data(SpeechPackets(4, 22, 100).u8(3)), SpeechChunk("fmt ", Bytes().zeros(150))}));
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
    })
        .join();
}

TEST(QcpClip, CodecCodesByGuid) {
    const std::pair<std::vector<uint8_t>, uint32_t> cases[] = {{kQcelpGuid1, 0x7001},
                                                               {kQcelpGuid2, 0x7001},
                                                               {kEvrcGuid, 0x8001},
                                                               {kSmvGuid, 0x9001},
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
    EXPECT_EQ(ClipSummary(clip), "qcp size=13 audio=1");
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

TEST(WaveFormat, DataOffsetIsTheDataIdPlusEarlyChunksAndWalksStayInTheBuffer) {
    std::vector<uint8_t> notWave = CanonicalWave(1, 1, 8000, 8, 8);
    std::memcpy(notWave.data() + 8, "AVI ", 4);
    const struct {
        std::vector<uint8_t> file;
        int32_t result;
        uint32_t offset;
    } cases[] = {
        {CanonicalWave(1, 1, 8000, 16, 100), MM_OK, 36},
        // "data" id at 12 + 18 + 24 + 12 = 66, the 10 bytes of LIST (no pad) counted again.
        {RiffForm("WAVE", {SpeechChunk("LIST", Bytes().str("INFOabcdef")), SpeechChunk("fmt ", WaveFmtBody(1, 1, 8, 8)),
                           SpeechChunk("fact", Bytes().le32(1)), SpeechChunk("data", Bytes().zeros(8))}),
         MM_OK, 76},
        {notWave, MM_E_UNSUPPORTED, 0},
        {RiffForm("WAVE", {SpeechChunk("data", Bytes().zeros(40))}), MM_E_UNSUPPORTED, 0},
        {RiffForm("WAVE", {SpeechChunk("fmt ", WaveFmtBody(1, 1, 8000, 8)), SpeechChunk("junk", Bytes().zeros(40))}),
         MM_E_UNSUPPORTED, 0},
        {Bytes().str("RIFF").le32(100).str("WAVE").str("junk").le32(0xFFFFFFF0u).zeros(40), MM_E_UNSUPPORTED, 0},
        {Bytes().str("RIFF").le32(100).str("WAVE").str("fmt ").le32(16).le16(1), MM_E_UNSUPPORTED, 0},  // cut fields
    };
    for (const auto& c : cases) {
        metainfo::_FormatChunk fmt;
        EXPECT_EQ(metainfo::ParseFormatChunk(c.file.data(), c.file.size(), &fmt), c.result) << &c - cases;
        EXPECT_EQ(fmt.nDataOffset, c.offset) << &c - cases;
    }
}

TEST(WaveFormat, ClipInfoFromTheFormatAndTheDataOffset) {
    // (64044 - 36) / 32000 s, truncated; 40 ms of samples a frame.
    _MMClipInfo clip;
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(SpeechFile("tone.wav", CanonicalWave(1, 1, 16000, 16, 64000)).c_str(),
                                            MEDIA_TYPE_WAVE, &clip),
              MM_OK);
    EXPECT_EQ(ClipSummary(clip),
              "wav size=64044 dur=2000 bps=256000 audio=1 abps=256000 hz=16000 ch=1 bits=16 spf=640");
}

TEST(WaveFormat, ZeroByteRateHasNoDurationAndAnEmptyRange) {
    std::string zero = SpeechFile("zero.wav", CanonicalWave(1, 0, 0, 16, 400));
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::WAVE_GetClipInfo(zero.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 0u);
    unsigned char* data = nullptr;
    int size = -1;
    ASSERT_EQ(metainfo::WAVE_GetAudioData2Buf(zero.c_str(), 0, 1, &data, &size), MM_OK);
    EXPECT_EQ(size, 0);
    MM_MediaExtractor_FreeBuffer(data);
}

TEST(WaveFormat, MimeAndCodecByTagWithTheL16Quirk) {
    const struct {
        uint16_t tag, bits;
        const char* text;
        uint32_t length, codec;
    } cases[] = {
        {1, 8, "audio/L8", 8, 0x1030},    {1, 16, "audio/L16", 9, 0x1030}, {6, 8, "audio/pcma", 10, 0x1032},
        {7, 8, "audio/pcmu", 10, 0x1033}, {1, 24, "audio/L16", 9, 0x1030}, {2, 4, "audio/L16", 9, 0x1031},
        {6, 16, "audio/L16", 9, 0x1032},
    };
    _MM_MIMETYPE mime{};  // kept across files: each answer releases the one before
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::Message() << c.tag << "/" << c.bits);
        std::string path = SpeechFile("m.wav", CanonicalWave(c.tag, 2, 8000, c.bits, 64));
        ASSERT_EQ(metainfo::WAVE_GetMIMEType(path.c_str(), &mime), MM_OK);
        EXPECT_STREQ(mime.pszMimeType, c.text);
        EXPECT_EQ(mime.nMimeLength, c.length);
        _MM_CODECTYPE codec;
        ASSERT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), MEDIA_TYPE_WAVE, &codec), MM_OK);
        EXPECT_EQ(codec.nAudioCodec, c.codec);
    }
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
}

TEST(WaveFormat, FloatAndExtensibleTagsAreUnsupportedEverywhere) {
    for (uint16_t tag : {uint16_t{3}, uint16_t{0xFFFE}}) {
        std::string path = SpeechFile("f.wav", CanonicalWave(tag, 1, 8000, 32, 64));
        _MMClipInfo clip;
        EXPECT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_WAVE, &clip), MM_E_UNSUPPORTED);
        _MM_CODECTYPE codec;
        EXPECT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), MEDIA_TYPE_WAVE, &codec), MM_E_UNSUPPORTED);
        _MM_MIMETYPE mime{};
        EXPECT_EQ(MM_MediaExtractor_GetMIMEType(path.c_str(), &mime), MM_E_UNSUPPORTED);
        unsigned char* data = nullptr;
        int size = 0;
        EXPECT_EQ(MM_MediaExtractor_GetAudioData(path.c_str(), 0, 1, &data, &size), MM_E_UNSUPPORTED);
    }
}

TEST(WaveFormat, ShortFilesFailAndMissingFilesAnswerOne) {
    std::vector<uint8_t> file = CanonicalWave(1, 1, 8000, 8, 0);
    _MMClipInfo clip{};
    EXPECT_EQ(metainfo::WAVE_GetClipInfo(SpeechFile("44.wav", file).c_str(), &clip), MM_OK);
    file.pop_back();
    EXPECT_EQ(metainfo::WAVE_GetClipInfo(SpeechFile("43.wav", file).c_str(), &clip), MM_E_FAIL);
    EXPECT_EQ(metainfo::WAVE_GetClipInfo("/no/such/file.wav", &clip), 1);
    EXPECT_EQ(metainfo::WAVE_GetClipInfo(nullptr, &clip), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::WAVE_GetClipInfo(SpeechFile("44.wav", file).c_str(), nullptr), MM_E_INVALIDARG);
}

TEST_F(AmrExtract, BufferHoldsWholeSecondsCutToTheDuration) {
    const struct {
        int start, end;
        int32_t result;
        int size;
    } cases[] = {
        {10, 20, MM_OK, 16000},       {50, 100, MM_OK, 16000},
        {60, 61, MM_OK, 0},  // start at the duration: an empty buffer, still allocated
        {61, 62, MM_E_INVALIDARG, 0}, {5, 5, MM_E_INVALIDARG, 0},
        {-1, 5, MM_E_INVALIDARG, 0},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.start);
        unsigned char* data = nullptr;
        int size = -1;
        ASSERT_EQ(MM_MediaExtractor_GetAudioData(path.c_str(), c.start, c.end, &data, &size), c.result);
        EXPECT_EQ(data != nullptr, c.result == MM_OK);
        if (c.result != MM_OK) continue;
        EXPECT_EQ(size, c.size);
        EXPECT_TRUE(std::equal(data, data + size, source.begin() + 6 + c.start * 1600));
        MM_MediaExtractor_FreeBuffer(data);
    }
    unsigned char* data = nullptr;
    int size = 0;
    EXPECT_EQ(metainfo::AMR_GetAudioData2Buf(path.c_str(), 0, 5, nullptr, &size), MM_E_INVALIDARG);
    EXPECT_EQ(metainfo::AMR_GetAudioData2Buf(nullptr, 0, 5, &data, &size), MM_E_INVALIDARG);
}

TEST_F(AmrExtract, FileKeepsTheMagicOfItsKindAndTheRange) {
    std::string out = dir.PathOf("cut.amr");
    ASSERT_EQ(AMR_GetAudioData2File(path.c_str(), 1, 3, out.c_str()), MM_OK);
    std::vector<uint8_t> expected = Bytes().str("#!AMR\n").data();
    expected.insert(expected.end(), source.begin() + 6 + 1600, source.begin() + 6 + 3 * 1600);
    EXPECT_EQ(ReadFileBytes(out), expected);
    std::string wide = dir.Write("speech.awb", AmrFile(true, 2, 250));
    ASSERT_EQ(AMR_GetAudioData2File(wide.c_str(), 2, 4, out.c_str()), MM_OK);
    std::vector<uint8_t> written = ReadFileBytes(out);
    ASSERT_EQ(written.size(), 9u + 2u * 50u * 33u);
    EXPECT_EQ(std::string(written.begin(), written.begin() + 9), "#!AMR-WB\n");
    EXPECT_EQ(AMR_GetAudioData2File(path.c_str(), 0, 1, dir.PathOf("no/such/dir.amr").c_str()), MM_E_FAIL);
}

TEST_F(AmrExtract, CutFileIsAcceptedByFfprobeWithTheRequestedDuration) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffprobe not installed";
    std::string out = dir.PathOf("cut.amr");
    ASSERT_EQ(AMR_GetAudioData2File(path.c_str(), 5, 15, out.c_str()), MM_OK);
    EXPECT_NEAR(FfprobePlayTime(out), 10.0, 0.021);
}

TEST_F(WaveExtract, BufferFromTheDataIdCutToTheDuration) {
    const struct {
        int start, end;
        int32_t result;
    } cases[] = {
        {0, 1, MM_OK},  // begins with the 8 bytes of the "data" chunk header
        {2, 10, MM_OK}, {4, 10, MM_E_INVALIDARG}, {2, 2, MM_E_INVALIDARG}, {-1, 2, MM_E_INVALIDARG},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.start);
        unsigned char* data = nullptr;
        int size = 0;
        ASSERT_EQ(MM_MediaExtractor_GetAudioData(path.c_str(), c.start, c.end, &data, &size), c.result);
        EXPECT_EQ(data != nullptr, c.result == MM_OK);
        if (c.result != MM_OK) continue;
        ASSERT_EQ(size, 16000);
        EXPECT_TRUE(std::equal(data, data + size, source.begin() + 36 + c.start * 16000));
        MM_MediaExtractor_FreeBuffer(data);
    }
    int size = 0;
    EXPECT_EQ(metainfo::WAVE_GetAudioData2Buf(path.c_str(), 0, 2, nullptr, &size), MM_E_INVALIDARG);
}

TEST_F(WaveExtract, FileCopiesTheHeaderChunksThenTheRange) {
    std::string out = dir.PathOf("cut.wav");
    ASSERT_EQ(WAVE_GetAudioData2File(path.c_str(), 1, 2, out.c_str()), MM_OK);
    Bytes expected;
    expected.str("RIFF").le32(16000 + 36 - 8).raw({source.begin() + 8, source.begin() + 36});
    expected.str("data").le32(16000).raw({source.begin() + 36 + 16000, source.begin() + 36 + 32000});
    EXPECT_EQ(ReadFileBytes(out), expected.data());
    EXPECT_EQ(WAVE_GetAudioData2File(path.c_str(), 0, 1, dir.PathOf("no/such/cut.wav").c_str()), MM_E_FAIL);
}

TEST_F(WaveExtract, CutFileIsAcceptedByFfprobeWithTheRequestedDuration) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffprobe not installed";
    std::string out = dir.PathOf("cut.wav");
    ASSERT_EQ(WAVE_GetAudioData2File(path.c_str(), 1, 3, out.c_str()), MM_OK);
    EXPECT_NEAR(FfprobePlayTime(out), 2.0, 0.05);
}

TEST(WaveCorpus, EveryFileIsAnsweredWithoutAFaultOrALeak) {
    std::string corpus = CorpusDir();
    if (corpus.empty()) GTEST_SKIP() << testing_support::NoCorpusReason();
    TempDir dir;
    int before = OpenDescriptors();
    int files = 0;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(corpus)) {
        if (!entry.is_regular_file() || entry.path().extension() != ".wav") continue;
        SCOPED_TRACE(entry.path().string());
        const char* p = entry.path().c_str();
        ++files;
        _MMClipInfo clip{};
        metainfo::WAVE_GetClipInfo(p, &clip);
        _MM_CODECTYPE codec{};
        metainfo::WAVE_GetCodecType(p, &codec);
        _MM_MIMETYPE mime{};
        metainfo::WAVE_GetMIMEType(p, &mime);
        MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
        unsigned char* data = nullptr;
        int size = 0;
        metainfo::WAVE_GetAudioData2Buf(p, 0, 1, &data, &size);
        MM_MediaExtractor_FreeBuffer(data);
        WAVE_GetAudioData2File(p, 0, 2, dir.PathOf("cut.wav").c_str());
    }
    EXPECT_GT(files, 0);
    EXPECT_EQ(OpenDescriptors(), before);
}

TEST(WaveCorpus, KnownFilesGiveTheirFormats) {
    std::string corpus = CorpusDir();
    if (corpus.empty()) GTEST_SKIP() << testing_support::NoCorpusReason();
    _MM_CODECTYPE codec{};
    ASSERT_EQ(metainfo::WAVE_GetCodecType((corpus + "/taglib/alaw.wav").c_str(), &codec), MM_OK);
    EXPECT_EQ(codec.nAudioCodec, 0x1032u);
    _MMClipInfo clip{};
    EXPECT_EQ(metainfo::WAVE_GetClipInfo((corpus + "/taglib/float64.wav").c_str(), &clip), MM_E_UNSUPPORTED);
    EXPECT_EQ(metainfo::WAVE_GetClipInfo((corpus + "/taglib/segfault.wav").c_str(), &clip), MM_E_FAIL);
    ASSERT_EQ(metainfo::WAVE_GetClipInfo((corpus + "/mutagen/silence-2s-PCM-44100-16-ID3v23.wav").c_str(), &clip),
              MM_OK);
    EXPECT_EQ(clip.nDuration, 2u);
    EXPECT_EQ(clip.nSampleRate, 44100u);
    EXPECT_EQ(clip.nChannels, 2u);
}
