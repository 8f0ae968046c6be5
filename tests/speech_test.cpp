// Speech and PCM files: AMR storage files, EVRC, QCP and WAVE; their clip, MIME and
// codec answers (each speech type's track answer is audio without reading the file:
// see the dispatch table test); range extraction from AMR and WAVE files into a buffer
// or a new file that players accept; every WAVE file of the corpus.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstring>
#include <thread>

#include "metainfo/extract.h"
#include "metainfo/metainfo.h"
#include "metainfo/probe.h"
#include "speech/amr.h"
#include "speech/evrc.h"
#include "speech/qcp.h"
#include "speech/qcp_format.h"
#include "speech/wave.h"
#include "support/golden.h"
#include "support/speech_builder.h"
#include "support/summary.h"

using namespace testing_support;
using namespace metainfo;

namespace {

using Data = std::vector<uint8_t>;

std::vector<uint8_t> Qcp(const std::vector<Bytes>& chunks) { return RiffForm("QLCM", chunks); }
Bytes DataChunk(const Bytes& packets) { return SpeechChunk("data", packets); }

// The answers for a file of a type on one line: clip and codec (public), the MIME
// type slot (one record kept across calls: each answer releases the one before;
// 1 for no slot) and the audio data slot's first second.
std::string Answers(const Data& bytes, int type, const std::string& name) {
    const std::string path = SpeechFile(name, bytes);
    const char* p = path.c_str();
    static _MM_MIMETYPE mime{};
    _MMClipInfo clip;
    _MM_CODECTYPE codec;
    int32_t r = MM_MediaExtractor_GetClipInfo(p, type, &clip);
    std::string s = r == MM_OK ? ClipSummary(clip) : Hex(r);
    r = MM_MediaExtractor_GetCodecType(p, type, &codec);
    s += " | " + (r == MM_OK ? "" : Hex(r) + " ") + CodecSummary(codec);
    r = MM_GetMIMEType[type] != nullptr ? MM_GetMIMEType[type](p, &mime) : 1;
    s += " | " + (r == MM_OK ? mime.pszMimeType + std::string("/") + std::to_string(mime.nMimeLength) : Hex(r));
    unsigned char* data = nullptr;
    int size = -1;
    r = MM_GetAudioData[type] != nullptr ? MM_GetAudioData[type](p, 0, 1, &data, &size) : 1;
    s += " | " + (r == MM_OK ? "cut " + std::to_string(size) : Hex(r));
    MM_MediaExtractor_FreeBuffer(data);
    return s;
}

// Cuts from a 60-second 12.2 kbit/s AMR file (1600 bytes per second after the
// 6-byte magic) and from three seconds of 8 kHz 16-bit mono WAVE (16000 bytes a
// second from offset 36), each byte marked so that a wrong offset shows.
struct Extract : ::testing::Test {
    void SetUp() override {
        amrSource = AmrFile(false, 7, 3000);
        for (size_t i = 0; i < 3000; ++i) amrSource[6 + i * 32 + 1] = static_cast<uint8_t>(i);
        amr = dir.Write("speech.amr", amrSource);
        waveSource = CanonicalWave(1, 1, 8000, 16, 48000);
        for (size_t i = 44; i < waveSource.size(); ++i) waveSource[i] = static_cast<uint8_t>(i * 7);
        wave = dir.Write("tone.wav", waveSource);
    }
    TempDir dir;
    Data amrSource, waveSource;
    std::string amr, wave;
};
}  // namespace

// AMR: 3000 frames of 32 bytes are (96006 - 6) / 32 / 50 = 60 s; wide-band 9 is a
// SID frame, 15 carries no data (and runs off the code table); multi-channel files
// hold one frame per channel in each 20 ms block after the 4-byte channel
// description; a narrow-band file has no codec answer. EVRC: 50 full-rate packets
// are one second. QCP: 17678 bytes * 8 / 13000 = 10 s, no channel count; codecs by
// GUID (the data chunk is not walked for a codec query). WAVE: (64044 - 36) / 32000
// s, truncated, 40 ms of samples a frame; MIME types by tag with the L16 quirk;
// float and extensible tags are unsupported everywhere.
TEST(Speech, PublicAnswersOfEachFile) {
    const Data qcp = Qcp({QcpFmtChunk(kQcelpGuid1, 13000), DataChunk(SpeechPackets(4, 34, 500))});
    auto guid = [](const Data& g) { return Qcp({QcpFmtChunk(g, 0), DataChunk(Bytes().u8(0xFF))}); };
    auto wave = [](uint16_t tag, uint16_t bits) { return CanonicalWave(tag, 2, 8000, bits, 64); };
    const struct {
        const char* name;
        int type;
        Data file;
    } cases[] = {
        {"speech.amr", MEDIA_TYPE_AMR_NB, AmrFile(false, 7, 3000)},
        {"speech.amr", MEDIA_TYPE_AMR_WB, AmrFile(true, 8, 500)},
        {"speech.amr", MEDIA_TYPE_AMR_WB, AmrFile(true, 9, 250)},
        {"speech.amr", MEDIA_TYPE_AMR_WB, AmrFile(true, 15, 200)},
        {"speech.amr", MEDIA_TYPE_AMR_NB, AmrFile(false, 7, 200, 2)},
        {"speech.amr", MEDIA_TYPE_AMR_WB, AmrFile(true, 0, 300, 3)},
        {"speech.evc", MEDIA_TYPE_EVRC, EvrcFile(SpeechPackets(4, 22, 50))},
        {"speech.qcp", MEDIA_TYPE_QCP, qcp},
        {"c.qcp", MEDIA_TYPE_QCP, guid(kQcelpGuid1)},
        {"c.qcp", MEDIA_TYPE_QCP, guid(kQcelpGuid2)},
        {"c.qcp", MEDIA_TYPE_QCP, guid(kEvrcGuid)},
        {"c.qcp", MEDIA_TYPE_QCP, guid(kSmvGuid)},
        {"c.qcp", MEDIA_TYPE_QCP, guid(Data(16, 0x11))},
        {"tone.wav", MEDIA_TYPE_WAVE, CanonicalWave(1, 1, 16000, 16, 64000)},
        {"zero.wav", MEDIA_TYPE_WAVE, CanonicalWave(1, 0, 0, 16, 400)},
        {"m.wav", MEDIA_TYPE_WAVE, wave(1, 8)},
        {"m.wav", MEDIA_TYPE_WAVE, wave(1, 16)},
        {"m.wav", MEDIA_TYPE_WAVE, wave(6, 8)},
        {"m.wav", MEDIA_TYPE_WAVE, wave(7, 8)},
        {"m.wav", MEDIA_TYPE_WAVE, wave(1, 24)},
        {"m.wav", MEDIA_TYPE_WAVE, wave(2, 4)},
        {"m.wav", MEDIA_TYPE_WAVE, wave(6, 16)},
        {"f.wav", MEDIA_TYPE_WAVE, CanonicalWave(3, 1, 8000, 32, 64)},
        {"f.wav", MEDIA_TYPE_WAVE, CanonicalWave(0xFFFE, 1, 8000, 32, 64)},
    };
    Golden golden("speech", "answers");
    for (const auto& c : cases) golden.Check(c.name + std::to_string(&c - cases), Answers(c.file, c.type, c.name));
}

// Slot answers of files each reader rejects or sizes its own way. AMR: a bad magic,
// frame header byte or size fails every query. The block size drops one outlier at
// each end; reserved frames of size 0 after a valid one never advance the walk, and a
// multi-channel file of 0 channels has empty blocks: no block size fails the clip.
// EVRC: packets by the size of their rate over 50 give the duration and bit rate, blank
// (0), eighth (1: 2 bytes), half (3: 10 bytes) and rate 5 (no payload); under one
// second no bit rate; the record is not cleared first; quarter rate, high rates,
// missing files and extensions fail; the codec is EVRC without opening the file. QCP:
// the duration comes from "vrat", else the bit rate, else the counted data packets
// (QCELP rate octets 4 and 1 skip 34 and 3 bytes; EVRC inside QCP also takes the
// quarter rate); a RIFF without chunks reports the file size only, also cut short.
// WAVE: a zero byte rate has no duration; 44 bytes are enough, 43 fail.
TEST(Speech, SlotAnswersOfEachFile) {
    auto amr = [](const char* magic, int header, size_t bytes) {
        Bytes b;
        b.str(magic);
        if (header >= 0) b.u8(static_cast<uint32_t>(header));
        return b.zeros(bytes).data();
    };
    const Data stuck = Bytes().str("#!AMR\n").raw(AmrFrame(false, 7)).u8(12 << 3 | 4).zeros(100).data();
    auto evrc = [](const Bytes& packets) { return EvrcFile(packets); };
    Data cut = Qcp({QcpFmtChunk(kQcelpGuid1, 13000)});
    cut.resize(cut.size() - 10);  // the "fmt " chunk runs past the end
    Data wave43 = CanonicalWave(1, 1, 8000, 8, 0);
    wave43.pop_back();
    const struct {
        const char* name;
        int type;
        Data file;
    } cases[] = {
        {"quality 0.amr", MEDIA_TYPE_AMR_NB, amr("#!AMR\n", 7 << 3, 40)},
        {"low bits.amr", MEDIA_TYPE_AMR_NB, amr("#!AMR\n", 7 << 3 | 5, 40)},
        {"bit 7.amr", MEDIA_TYPE_AMR_NB, amr("#!AMR\n", 0x80 | 7 << 3 | 4, 40)},
        {"nb 9.amr", MEDIA_TYPE_AMR_NB, amr("#!AMR\n", 9 << 3 | 4, 40)},
        {"nb 14.amr", MEDIA_TYPE_AMR_NB, amr("#!AMR\n", 14 << 3 | 4, 40)},
        {"wb 10.amr", MEDIA_TYPE_AMR_WB, amr("#!AMR-WB\n", 10 << 3 | 4, 40)},
        {"15 bytes.amr", MEDIA_TYPE_AMR_NB, amr("#!AMR\n", 7 << 3 | 4, 8)},
        {"mc past the end.amr", MEDIA_TYPE_AMR_WB, amr("#!AMR-WB_MC1.0\n", -1, 1)},
        {"other magic.amr", MEDIA_TYPE_AMR_NB, amr("#!AMR_X\n", -1, 40)},
        {"stuck.amr", MEDIA_TYPE_AMR_NB, stuck},
        {"no channels.amr", MEDIA_TYPE_AMR_NB, AmrFile(false, 7, 10, 0x10 /* low 4 bits 0 */)},
        {"rates.evc", MEDIA_TYPE_EVRC,
         evrc(SpeechPackets(0, 0, 30)
                  .raw(SpeechPackets(1, 2, 30))
                  .raw(SpeechPackets(3, 10, 30))
                  .raw(SpeechPackets(5, 0, 10)))},
        {"49.evc", MEDIA_TYPE_EVRC, evrc(SpeechPackets(4, 22, 49))},
        {"empty.evc", MEDIA_TYPE_EVRC, evrc(Bytes())},
        {"quarter.evc", MEDIA_TYPE_EVRC, evrc(SpeechPackets(4, 22, 3).raw(SpeechPackets(2, 5, 1)))},
        {"rate 6.evc", MEDIA_TYPE_EVRC, evrc(SpeechPackets(4, 22, 3).raw(SpeechPackets(6, 5, 1)))},
        {"rate 255.evc", MEDIA_TYPE_EVRC, evrc(SpeechPackets(4, 22, 3).raw(SpeechPackets(0xFF, 5, 1)))},
        {"speech", MEDIA_TYPE_EVRC, evrc(SpeechPackets(4, 22, 5))},
        // The odd-sized chunk before "fmt " gets no pad byte.
        {"vrat.qcp", MEDIA_TYPE_QCP,
         Qcp({SpeechChunk("labl", Bytes().str("abc")), QcpFmtChunk(kQcelpGuid2, 13000), QcpVratChunk(1234),
              DataChunk(SpeechPackets(4, 34, 10))})},
        {"counted.qcp", MEDIA_TYPE_QCP,
         Qcp({QcpFmtChunk(kQcelpGuid1, 0), DataChunk(SpeechPackets(4, 34, 60).raw(SpeechPackets(1, 3, 90)))})},
        {"evrc counted.qcp", MEDIA_TYPE_QCP,
         Qcp({QcpFmtChunk(kEvrcGuid, 0), DataChunk(SpeechPackets(4, 22, 50).raw(SpeechPackets(2, 5, 49)))})},
        {"qcelp rate 8.qcp", MEDIA_TYPE_QCP, Qcp({QcpFmtChunk(kQcelpGuid1, 0), DataChunk(Bytes().u8(8).zeros(40))})},
        {"evrc rate 6.qcp", MEDIA_TYPE_QCP, Qcp({QcpFmtChunk(kEvrcGuid, 0), DataChunk(Bytes().u8(6).zeros(40))})},
        {"tiny.qcp", MEDIA_TYPE_QCP, Bytes().str("RIFF").le32(5).str("QLCM").u8('x').data()},
        {"bare.qcp", MEDIA_TYPE_QCP, Bytes().str("RIFF").u8(1).data()},
        {"notriff.qcp", MEDIA_TYPE_QCP, Bytes().str("RIFX").le32(4).str("QLCM").zeros(20).data()},
        {"huge.qcp", MEDIA_TYPE_QCP, Bytes().str("RIFF").le32(4).str("QLCM").str("junk").le32(1000).zeros(20).data()},
        {"short.qcp", MEDIA_TYPE_QCP, cut},
        {"noextension", MEDIA_TYPE_QCP, Qcp({QcpFmtChunk(kQcelpGuid1, 13000)})},
        {"zero.wav", MEDIA_TYPE_WAVE, CanonicalWave(1, 0, 0, 16, 400)},
        {"44.wav", MEDIA_TYPE_WAVE, CanonicalWave(1, 1, 8000, 8, 0)},
        {"43.wav", MEDIA_TYPE_WAVE, wave43},
    };
    Golden golden("speech", "slots");
    const int before = OpenDescriptors();
    for (const auto& c : cases) {
        const uint8_t fill = c.type == MEDIA_TYPE_EVRC ? 0xAB : 0;  // EVRC leaves what it does not read
        golden.Check(c.name, SlotAnswers(SpeechFile(c.name, c.file), c.type, false, 1, fill));
    }
    for (int type : {MEDIA_TYPE_AMR_NB, MEDIA_TYPE_EVRC, MEDIA_TYPE_QCP, MEDIA_TYPE_WAVE}) {
        golden.Check("missing " + std::to_string(type), SlotAnswers("/no/such/file", type));
        _MMClipInfo clip{};
        EXPECT_EQ(MM_GetClipInfo[type](nullptr, &clip), MM_E_INVALIDARG);
        EXPECT_EQ(MM_GetClipInfo[type](SpeechFile("44.wav", CanonicalWave(1, 1, 8000, 8, 0)).c_str(), nullptr),
                  MM_E_INVALIDARG);
    }
    EXPECT_EQ(OpenDescriptors(), before);
    _MM_CODECTYPE codec;
    EXPECT_EQ(EVRC_GetCodecType("/no/such/file.evc", nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(QCP_GetCodecType(SpeechFile("short.qcp", cut).c_str(), nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(QCP_GetCodecType(SpeechFile("short.qcp", cut).c_str(), &codec), MM_E_FAIL);
}

// Two blocks of four drop one outlier at each end.
TEST(AmrClip, BlockSizeDropsOutliers) {
    const Data b =
        Bytes().raw(AmrFrame(false, 7)).raw(AmrFrame(false, 7)).raw(AmrFrame(false, 7)).raw(AmrFrame(false, 0));
    EXPECT_EQ(Get_avBlockSize(b.data(), 0, b.size(), 1), 32);  // (109 - 32 - 13) / 2
    EXPECT_EQ(Get_avBlockSize(b.data() + 64, 0, 45, 1), 22);  // two blocks: 45 / 2
    EXPECT_EQ(Get_avBlockSize(nullptr, 0, 100, 1), 0);
    const Data stuck = Bytes().str("#!AMR\n").raw(AmrFrame(false, 7)).u8(12 << 3 | 4).zeros(100).data();
    EXPECT_EQ(Get_avBlockSize(stuck.data() + 6, 0, stuck.size() - 6, 1), 0);
}

TEST(QcpClip, DataBeforeFmtIsWalkedWithThePreviousFilesCodec) {
    // The walk of "data" runs to the end of the file, so it also reads the
    // "fmt " chunk behind it: a last half-rate packet (10 bytes) covers that
    // chunk's header, and its zeroed body counts as 148 blank packets.
    std::string early = SpeechFile(
        "early.qcp", Qcp({DataChunk(SpeechPackets(4, 22, 100).u8(3)), SpeechChunk("fmt ", Bytes().zeros(150))}));
    std::string evrc = SpeechFile("evrc.qcp", Qcp({QcpFmtChunk(kEvrcGuid, 0), DataChunk(Bytes().u8(4))}));
    std::string qcelp = SpeechFile("qcelp.qcp", Qcp({QcpFmtChunk(kQcelpGuid1, 13000)}));
    std::string smv = SpeechFile("smv.qcp", Qcp({QcpFmtChunk(kSmvGuid, 0), DataChunk(Bytes().u8(4))}));
    auto duration = [](const std::string& path, int32_t result) {
        _MMClipInfo clip{};
        EXPECT_EQ(QCP_GetClipInfo(path.c_str(), &clip), result) << path;
        return clip.nDuration;
    };
    std::thread([&] {  // a thread of its own, whose codec state starts empty
        // SMV sets no codec state, so its packets cannot be walked.
        duration(smv, MM_E_FAIL);
        _MM_CODECTYPE codec{};
        ASSERT_EQ(QCP_GetCodecType(smv.c_str(), &codec), MM_OK);
        EXPECT_EQ(codec.nAudioCodec, 0x9001u);
        duration(early, MM_E_FAIL);
        duration(evrc, MM_OK);
        // The accurate answer depends on the file alone, and leaves the state be.
        mi_info* info = nullptr;
        EXPECT_EQ(mi_probe(smv.c_str(), &info), MI_E_DAMAGED);
        EXPECT_EQ(duration(early, MM_OK), 4u);  // 249 packets
        // After a QCELP file the same bytes are sized by the QCELP table
        // (a full-rate octet takes 34 bytes): 743 packets.
        ASSERT_EQ(QCP_GetCodecType(qcelp.c_str(), &codec), MM_OK);
        EXPECT_EQ(duration(early, MM_OK), 14u);
    })
        .join();
}

TEST(QcpFormat, DecodesABufferAndReadsFieldsPastItsEndAsZero) {
    Bytes chunk = QcpFmtChunk(kEvrcGuid, 9600);
    _QCPFMT fmt;
    ASSERT_EQ(parseFMTInfo(chunk.data().data(), chunk.size(), &fmt), MM_OK);
    EXPECT_EQ(fmt.nPacketSize, 35);
    EXPECT_EQ(fmt.nNumRates, 5u);
    EXPECT_EQ(fmt.rateMap[0].nWordSize, 4);
    EXPECT_EQ(CodecOfGuid(fmt.codecGuid), QcpCodec::kEvrc);
    EXPECT_STREQ(fmt.szCodecName, "speech");
    ASSERT_EQ(parseFMTInfo(chunk.data().data(), 110, &fmt), MM_OK);
    EXPECT_EQ(fmt.nAvgBitrate, 9600);
    EXPECT_EQ(fmt.nSamplingRate, 0);
    EXPECT_EQ(parseFMTInfo(nullptr, 10, &fmt), MM_E_INVALIDARG);
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
        _FormatChunk fmt;
        EXPECT_EQ(ParseFormatChunk(c.file.data(), c.file.size(), &fmt), c.result) << &c - cases;
        EXPECT_EQ(fmt.nDataOffset, c.offset) << &c - cases;
    }
}

// AMR buffers hold whole seconds cut to the duration (a start at the duration gives
// an empty buffer, still allocated); WAVE buffers start at the "data" id, so the
// first second begins with the chunk header.
TEST_F(Extract, BuffersHoldWholeSecondsCutToTheDuration) {
    const struct {
        bool wave;
        int start, end;
        int32_t result;
        int size;
    } cases[] = {
        {false, 10, 20, MM_OK, 16000},       {false, 50, 100, MM_OK, 16000},    {false, 60, 61, MM_OK, 0},
        {false, 61, 62, MM_E_INVALIDARG, 0}, {false, 5, 5, MM_E_INVALIDARG, 0}, {false, -1, 5, MM_E_INVALIDARG, 0},
        {true, 0, 1, MM_OK, 16000},          {true, 2, 10, MM_OK, 16000},       {true, 4, 10, MM_E_INVALIDARG, 0},
        {true, 2, 2, MM_E_INVALIDARG, 0},    {true, -1, 2, MM_E_INVALIDARG, 0},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(testing::Message() << c.wave << " " << c.start);
        unsigned char* data = nullptr;
        int size = -1;
        const std::string& path = c.wave ? wave : amr;
        ASSERT_EQ(MM_MediaExtractor_GetAudioData(path.c_str(), c.start, c.end, &data, &size), c.result);
        EXPECT_EQ(data != nullptr, c.result == MM_OK);
        if (c.result != MM_OK) continue;
        EXPECT_EQ(size, c.size);
        const auto from = c.wave ? waveSource.begin() + 36 + c.start * 16000 : amrSource.begin() + 6 + c.start * 1600;
        EXPECT_TRUE(std::equal(data, data + size, from));
        MM_MediaExtractor_FreeBuffer(data);
    }
    unsigned char* data = nullptr;
    int size = 0;
    EXPECT_EQ(AMR_GetAudioData2Buf(amr.c_str(), 0, 5, nullptr, &size), MM_E_INVALIDARG);
    EXPECT_EQ(AMR_GetAudioData2Buf(nullptr, 0, 5, &data, &size), MM_E_INVALIDARG);
    EXPECT_EQ(WAVE_GetAudioData2Buf(wave.c_str(), 0, 2, nullptr, &size), MM_E_INVALIDARG);
    ASSERT_EQ(
        WAVE_GetAudioData2Buf(SpeechFile("zero.wav", CanonicalWave(1, 0, 0, 16, 400)).c_str(), 0, 1, &data, &size),
        MM_OK);
    EXPECT_EQ(size, 0);  // a zero byte rate gives an empty range
    MM_MediaExtractor_FreeBuffer(data);
}

// AMR files keep the magic of their kind and the range; WAVE files copy the header
// chunks, then the range; both are accepted by ffprobe with the requested duration.
TEST_F(Extract, FilesKeepTheirHeadersAndTheRange) {
    const std::string out = dir.PathOf("cut.amr");
    ASSERT_EQ(AMR_GetAudioData2File(amr.c_str(), 1, 3, out.c_str()), MM_OK);
    EXPECT_EQ(ReadFileBytes(out),
              Bytes().str("#!AMR\n").raw({amrSource.begin() + 1606, amrSource.begin() + 4806}).data());
    ASSERT_EQ(AMR_GetAudioData2File(dir.Write("speech.awb", AmrFile(true, 2, 250)).c_str(), 2, 4, out.c_str()), MM_OK);
    const Data written = ReadFileBytes(out);
    ASSERT_EQ(written.size(), 9u + 2u * 50u * 33u);
    EXPECT_EQ(std::string(written.begin(), written.begin() + 9), "#!AMR-WB\n");
    EXPECT_EQ(AMR_GetAudioData2File(amr.c_str(), 0, 1, dir.PathOf("no/such/dir.amr").c_str()), MM_E_FAIL);
    const std::string cut = dir.PathOf("cut.wav");
    ASSERT_EQ(WAVE_GetAudioData2File(wave.c_str(), 1, 2, cut.c_str()), MM_OK);
    Bytes expected;
    expected.str("RIFF").le32(16000 + 36 - 8).raw({waveSource.begin() + 8, waveSource.begin() + 36});
    expected.str("data").le32(16000).raw({waveSource.begin() + 36 + 16000, waveSource.begin() + 36 + 32000});
    EXPECT_EQ(ReadFileBytes(cut), expected.data());
    EXPECT_EQ(WAVE_GetAudioData2File(wave.c_str(), 0, 1, dir.PathOf("no/such/cut.wav").c_str()), MM_E_FAIL);
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffprobe not installed";
    ASSERT_EQ(AMR_GetAudioData2File(amr.c_str(), 5, 15, out.c_str()), MM_OK);
    EXPECT_NEAR(FfprobePlayTime(out), 10.0, 0.021);
    ASSERT_EQ(WAVE_GetAudioData2File(wave.c_str(), 1, 3, cut.c_str()), MM_OK);
    EXPECT_NEAR(FfprobePlayTime(cut), 2.0, 0.05);
}
