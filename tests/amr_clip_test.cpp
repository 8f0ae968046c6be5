// AMR storage files: kinds, frame header checks, mode tables, the average
// block size and the queries answered from them.
#include <gtest/gtest.h>

#include "metainfo/metainfo.h"
#include "speech/amr.h"
#include "support/speech_builder.h"

using namespace testing_support;

TEST(AmrClip, EachFileKindAnswersItsRatesMimeAndCodec) {
    const struct {
        bool wideBand;
        int frameType;
        uint32_t frames, channels, subType;
        const char* clip;
    } cases[] = {
        // 3000 frames of 32 bytes: (96006 - 6) / 32 / 50 = 60 s.
        {false, 7, 3000, 0, 0, "amr size=96006 dur=60000 bps=12200/12200 hz=8000 ch=1 bits=16 spf=160 av=1/0"},
        {true, 8, 500, 0, 0x1021, "awb size=30509 dur=10000 bps=23850/23850 hz=16000 ch=1 bits=16 spf=320 av=1/0"},
        // Wide-band 9 is a SID frame, 15 carries no data (and runs off the code table).
        {true, 9, 250, 0, 0x1022, "awb size=1509 dur=5000 bps=1750/1750 hz=16000 ch=1 bits=16 spf=320 av=1/0"},
        {true, 15, 200, 0, 0, "awb size=209 dur=4000 bps=40/40 hz=16000 ch=1 bits=16 spf=320 av=1/0"},
        // Multi-channel: one frame per channel in each 20 ms block, the frame
        // headers after the 4-byte channel description.
        {false, 7, 200, 2, 0, "amr size=6416 dur=2000 bps=12200/12200 hz=8000 ch=2 bits=16 spf=160 av=1/0"},
        {true, 0, 300, 3, 0x1019, "awb size=5419 dur=2000 bps=6600/6600 hz=16000 ch=3 bits=16 spf=320 av=1/0"},
    };
    _MM_MIMETYPE mime{};  // kept across files: each answer releases the one before
    for (const auto& c : cases) {
        SCOPED_TRACE(c.clip);
        std::string path = SpeechFile("speech.amr", AmrFile(c.wideBand, c.frameType, c.frames, c.channels));
        int type = c.wideBand ? MEDIA_TYPE_AMR_WB : MEDIA_TYPE_AMR_NB;
        _MMClipInfo clip;
        ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), type, &clip), MM_OK);
        EXPECT_EQ(AudioSummary(clip), c.clip);
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
        {"#!AMR\n", 7 << 3, 40, MM_E_FAIL},             // quality bit 0
        {"#!AMR\n", 7 << 3 | 5, 40, MM_E_FAIL},         // low bits set
        {"#!AMR\n", 0x80 | 7 << 3 | 4, 40, MM_E_FAIL},  // bit 7 set
        {"#!AMR\n", 9 << 3 | 4, 40, MM_E_FAIL},         // narrow-band 9..14 reserved
        {"#!AMR\n", 14 << 3 | 4, 40, MM_E_FAIL},
        {"#!AMR-WB\n", 10 << 3 | 4, 40, MM_E_FAIL},     // wide-band 10..14 reserved
        {"#!AMR\n", 7 << 3 | 4, 8, MM_E_FAIL},          // 15 bytes in all
        {"#!AMR-WB_MC1.0\n", -1, 1, MM_E_FAIL},         // first frame past a 16-byte file
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
    EXPECT_EQ(metainfo::Get_avBlockSize(b.data().data() + 64, 0, 45, 1), 22);   // two blocks: 45 / 2
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
