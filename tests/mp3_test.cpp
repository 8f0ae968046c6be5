// MPEG audio: frame headers, leading tags, the frame-pair rule, stream kinds,
// durations and the slot answers.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstring>
#include <string>
#include <tuple>

#include "core/file_access.h"
#include "metainfo/metainfo.h"
#include "mp3/mp3_frame.h"
#include "mp3/mp3_info.h"
#include "support/bytes.h"
#include "support/id3_builder.h"
#include "support/mp3_builder.h"
#include "support/summary.h"

using namespace testing_support;
using namespace metainfo;

namespace {

using Data = std::vector<uint8_t>;

Data Cat(std::initializer_list<Data> parts) {
    Bytes b;
    for (const Data& p : parts) b.raw(p);
    return b.data();
}

// Clip information and audio information of one file. Default frames:
// MPEG-1 Layer III, 128 kbit/s, 44100 Hz, stereo, 417 bytes.
struct Probe {
    _MMClipInfo clip;
    _MP3AudioInfo info;
    int32_t clipResult, infoResult;
    explicit Probe(const Data& file) {
        TempDir dir;
        const std::string path = dir.Write("s.mp3", file);
        std::memset(&clip, 0xAB, sizeof clip);
        std::memset(&info, 0, sizeof info);
        clipResult = MP3_GetClipInfo(path.c_str(), &clip);
        infoResult = GetMediaInfo_MP3(path.c_str(), &info, INFO_MP3_AUDIO);
    }
    ~Probe() { delete[] info.xingToc; }
};

Data Then20Frames(const Data& first, const Mp3Shape& shape = {}) { return Cat({first, Mp3Frames(20, shape)}); }

std::string InfoSummary(const Probe& p) {
    if (p.infoResult != MM_OK) return std::to_string(p.infoResult);
    const _MP3AudioInfo& i = p.info;
    char text[256];
    std::snprintf(text, sizeof text, "kind=%u tag=%u avg=%u dur=%u spf=%u xing=%u/%x frames=%u bytes=%u q=%d toc=%d vbri=%x/%u",
                  i.headerKind, i.tagBytes, i.avgBitRate, i.duration, i.samplesPerFrame, i.xingOffset, i.xingFlags,
                  i.totalFrames, i.totalBytes, i.quality, i.xingToc != nullptr ? i.xingToc[50] : -1, i.vbriDelay,
                  i.vbriFramesPerEntry);
    return text;
}

}  // namespace

TEST(Mp3Frame, SizesFieldsAndRejectedHeaders) {
    // {version, layer, bitrateIndex, samplingIndex, padding}
    const struct { Mp3Shape shape; int size; } sizes[] = {
        {{}, 417}, {{3, 3, 9, 0, 1}, 418}, {{3, 1, 1, 1, 1}, (32000 * 12 / 48000 + 1) * 4},
        {{2, 3, 8}, 64000 * 72 / 22050}, {{0, 3, 1, 2}, 72}};
    uint32_t signature = 0;
    for (const auto& c : sizes) EXPECT_EQ(MP3GetFrameSize(Mp3Header(c.shape).data(), &signature, nullptr), c.size);
    const Data bad[] = {
        {0xFE, 0xFB, 0x90, 0x00},  // no sync
        {0xFF, 0xCB, 0x90, 0x00},  // sync bits incomplete
        {0xFF, 0xEB, 0x90, 0x00},  // reserved version
        {0xFF, 0xF9, 0x90, 0x00},  // layer bits 00
        {0xFF, 0xFB, 0xF0, 0x00},  // bit rate index 15
        {0xFF, 0xFB, 0x9C, 0x00},  // sampling index 3
        {0xFF, 0xFB, 0x00, 0x00},  // free format
    };
    for (const Data& h : bad) EXPECT_EQ(MP3GetFrameSize(h.data(), &signature, nullptr), MM_E_FAIL);
    _FrameHeader_Info info{};
    ASSERT_GT(MP3GetFrameSize(Mp3Header({2, 2, 9, 1, 0, 3, true}).data(), &signature, &info), 0);
    EXPECT_EQ(std::make_tuple(info.versionId, info.layerIndex, info.channelMode, info.protectionBit),
              std::make_tuple(2, 1, 3, 0));
    EXPECT_EQ(std::make_tuple(info.sampleRate, info.bitRate, info.samplesPerFrame), std::make_tuple(24000u, 80000u, 1152u));
    EXPECT_EQ(signature, 1u << 4 | 2u << 6 | 1u << 2);  // LSF Layer II index 9 is 80 kbit/s
}

// Up to three chained tags are skipped (a footer adds ten bytes); then two
// consecutive frames within what was read make a stream.
TEST(Mp3Sync, TagsAreSkippedAndTwoConsecutiveFramesMakeAStream) {
    const Data tag = Id3v2Tag(3, Data(20, 0x11));  // 30 bytes
    const Data footer = Cat({Id3v2Tag(4, Data(20, 0x11), 0x10), Data(10, 0)});
    const Data frames = Mp3Frames(3);
    const struct { const char* name; Data file; int32_t result; long position; } tags[] = {
        {"untagged", frames, MM_OK, 0},           {"two tags", Cat({tag, tag, frames}), MM_OK, 60},
        {"footer", Cat({footer, frames}), MM_OK, 40}, {"fourth tag stays", Cat({tag, tag, tag, tag, frames}), MM_OK, 90},
        {"9 bytes", Bytes().str("ID3").zeros(6).data(), MM_E_FAIL, -1},
        {"10 bytes", Bytes().str("ID3").zeros(7).data(), MM_OK, 0}};
    TempDir dir;
    for (const auto& c : tags) {
        const int h = MEx_fopen(dir.Write("t.mp3", c.file).c_str(), "rb");
        EXPECT_EQ(CheckID3Header(h), c.result) << c.name;
        if (c.position >= 0) { EXPECT_EQ(MEx_ftell(h), c.position) << c.name; }
        MEx_fclose(h);
    }
    Mp3Shape other;
    other.samplingIndex = 1;
    Data noise(5000);
    for (size_t i = 0; i < noise.size(); ++i) noise[i] = static_cast<uint8_t>(i * 131 + 7);
    const struct { const char* name; Data file; int32_t result; uint32_t offset; } streams[] = {
        {"after a tag", Cat({Id3v2Tag(3, Data(100, 0)), Data(7, 0), Mp3Frames(2)}), MM_OK, 117},
        {"undecodable candidate skipped", Cat({{0xFF, 0xFB, 0xF0, 0x00, 0, 0, 0}, Mp3Frames(2)}), MM_OK, 7},
        {"sampling rate changes", Cat({Mp3Frame({}), Mp3Frame(other), Mp3Frames(6)}), MM_E_UNSUPPORTED, 0},
        {"second header past the file", Cat({Data(10, 0), Mp3Frame({})}), MM_E_UNSUPPORTED, 0},
        {"pair beyond the bytes read", Cat({Data(4000, 0), Mp3Frames(2)}), MM_E_UNSUPPORTED, 0},
        {"noise", noise, MM_E_UNSUPPORTED, 0},
        {"3 bytes after the tag", Cat({Id3v2Tag(3, Data(20, 0)), Data(3, 0)}), MM_E_FAIL, 0},
    };
    for (const auto& c : streams) {
        const std::string path = dir.Write("s.mp3", c.file);
        const int h = MEx_fopen(path.c_str(), "rb");
        _FrameHeader_Info info{};
        EXPECT_EQ(VerifyMP3(h, nullptr, &info), c.result) << c.name;
        MEx_fclose(h);
        int type = 0;
        EXPECT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK) << c.name;
        EXPECT_EQ(type == MEDIA_TYPE_MP3, c.result == MM_OK) << c.name;
        if (c.result != MM_OK) continue;
        EXPECT_EQ(std::tie(info.firstFrameOffset, info.frameSize, info.bitRate), std::make_tuple(c.offset, 417u, 128000u));
    }
    EXPECT_EQ(Probe(streams[2].file).clipResult, MM_E_UNSUPPORTED);
}

// Stream kind and sizes of one file from the clip and the audio-information requests.
TEST(Mp3Stream, KindDurationAndRatesOfEachStreamShape) {
    Mp3Shape low, high, mono, lsf, lsfMono, mpeg25, mpeg25Mono, mpeg2Mono;
    low.bitrateIndex = 1;    // 32 kbit/s
    high.bitrateIndex = 14;  // 320 kbit/s
    mono.channelMode = lsfMono.channelMode = mpeg25Mono.channelMode = mpeg2Mono.channelMode = 3;
    lsf.version = lsfMono.version = mpeg2Mono.version = 2;
    mpeg25.version = mpeg25Mono.version = 0;
    lsf.bitrateIndex = lsfMono.bitrateIndex = mpeg25.bitrateIndex = mpeg25Mono.bitrateIndex = mpeg2Mono.bitrateIndex = 8;
    XingFields xing, bytesOnly, zero, info;
    xing.frames = 3828;
    xing.bytes = 1600000;
    bytesOnly.flags = 0x2;
    zero.flags = 0x1;
    info.tag = "Info";
    VbriFields vbri;
    vbri.frames = 1000;
    vbri.bytes = 400000;
    vbri.framesPerEntry = 100;
    vbri.scale = 3;
    const struct { const char* name; Data file; const char* clip; const char* info; } cases[] = {
        // 1,600,000 audio bytes from the first frame, then an ID3v1 tag that is not audio.
        {"cbr", Cat({Mp3Frames(3836), Data(1600000 - 3836 * 417, 0), Id3v1Titled("")}),
         "mp3 size=1600128 dur=100 bps=128000 audio=1 abps=128000 hz=44100 ch=2 bits=16 spf=2304",
         "kind=1 tag=128 avg=128000 dur=100 spf=1152 xing=0/0 frames=0 bytes=0 q=0 toc=-1 vbri=0/0"},
        // The sampled rate drops the largest and smallest: kept, 32 and 320 kbit/s would raise it.
        {"sampled", Cat({Mp3Frames(2), Mp3Frame(high), Mp3Frame(low), Mp3Frames(10)}),
         "mp3 size=6152 bps=128000 audio=1 abps=128000 hz=44100 ch=2 bits=16 spf=2304",
         "kind=1 tag=0 avg=128000 dur=0 spf=1152 xing=0/0 frames=0 bytes=0 q=0 toc=-1 vbri=0/0"},
        // Duration from the frame count, 3828 * 1152 / 44100; with a table the sampled average stays.
        {"xing", Then20Frames(XingFrame(xing)),
         "mp3 size=8757 dur=99 bps=707 audio=1 abps=707 hz=44100 ch=2 bits=16 spf=2304",
         "kind=2 tag=0 avg=128000 dur=99 spf=1152 xing=36/f frames=3828 bytes=1600000 q=57 toc=128 vbri=0/0"},
        // No frame count: the clip request reads 0xFFFFFFFF frames; no table: the average is recomputed.
        {"xing bytes only", Then20Frames(XingFrame(bytesOnly)),
         "mp3 size=8757 dur=97391 audio=1 hz=44100 ch=2 bits=16 spf=2304",
         "kind=2 tag=0 avg=0 dur=0 spf=1152 xing=36/2 frames=0 bytes=0 q=-1 toc=-1 vbri=0/0"},
        {"xing of 0 frames", Then20Frames(XingFrame(zero)),
         "mp3 size=8757 audio=1 hz=44100 ch=2 bits=16 spf=2304",
         "kind=2 tag=0 avg=0 dur=0 spf=1152 xing=36/1 frames=0 bytes=0 q=-1 toc=-1 vbri=0/0"},
        // Xing stands at 21 for MPEG-1 mono and MPEG-2 stereo, at 13 for MPEG-2 mono; "Info" is not read.
        {"xing mono", Then20Frames(XingFrame({}, mono), mono),
         "mp3 size=8757 audio=1 hz=44100 ch=1 bits=16 spf=1152",
         "kind=2 tag=0 avg=128000 dur=0 spf=1152 xing=21/f frames=0 bytes=0 q=57 toc=128 vbri=0/0"},
        {"xing lsf", Then20Frames(XingFrame({}, lsf), lsf),
         "mp3 size=4368 audio=1 hz=22050 ch=2 bits=16 spf=2304",
         "kind=2 tag=0 avg=64000 dur=0 spf=576 xing=21/f frames=0 bytes=0 q=57 toc=128 vbri=0/0"},
        {"xing lsf mono", Then20Frames(XingFrame({}, lsfMono), lsfMono),
         "mp3 size=4368 audio=1 hz=22050 ch=1 bits=16 spf=1152",
         "kind=2 tag=0 avg=64000 dur=0 spf=576 xing=13/f frames=0 bytes=0 q=57 toc=128 vbri=0/0"},
        {"info", Then20Frames(XingFrame(info)),
         "mp3 size=8757 bps=128000 audio=1 abps=128000 hz=44100 ch=2 bits=16 spf=2304",
         "kind=1 tag=0 avg=128000 dur=0 spf=1152 xing=0/0 frames=0 bytes=0 q=0 toc=-1 vbri=0/0"},
        // VBRI: 16-bit fields little-endian, the scale word as quality, 1000 * 1152 / 44100.
        {"vbri", Then20Frames(VbriFrame(vbri)),
         "mp3 size=8757 dur=26 bps=2694 audio=1 abps=2694 hz=44100 ch=2 bits=16 spf=2304",
         "kind=3 tag=0 avg=128000 dur=26 spf=1152 xing=0/0 frames=1000 bytes=400000 q=3 toc=-1 vbri=102/100"},
        // MPEG-2.5 halves the samples per frame for stereo only.
        {"mpeg-2.5", Mp3Frames(12, mpeg25),
         "mp3 size=5004 bps=64000 audio=1 abps=64000 hz=11025 ch=2 bits=16 spf=288",
         "kind=1 tag=0 avg=64000 dur=0 spf=576 xing=0/0 frames=0 bytes=0 q=0 toc=-1 vbri=0/0"},
        {"mpeg-2.5 mono", Mp3Frames(12, mpeg25Mono),
         "mp3 size=5004 bps=64000 audio=1 abps=64000 hz=11025 ch=1 bits=16 spf=576",
         "kind=1 tag=0 avg=64000 dur=0 spf=576 xing=0/0 frames=0 bytes=0 q=0 toc=-1 vbri=0/0"},
        {"mpeg-2 mono", Mp3Frames(12, mpeg2Mono),
         "mp3 size=2496 bps=64000 audio=1 abps=64000 hz=22050 ch=1 bits=16 spf=1152",
         "kind=1 tag=0 avg=64000 dur=0 spf=576 xing=0/0 frames=0 bytes=0 q=0 toc=-1 vbri=0/0"},
        {"mpeg-1 mono", Mp3Frames(12, mono),
         "mp3 size=5004 bps=128000 audio=1 abps=128000 hz=44100 ch=1 bits=16 spf=1152",
         "kind=1 tag=0 avg=128000 dur=0 spf=1152 xing=0/0 frames=0 bytes=0 q=0 toc=-1 vbri=0/0"},
        {"15 bytes", Cat({Mp3Header({}), Data(11, 0)}), "-2147467259", "-2147467259"},
    };
    for (const auto& c : cases) {
        const Probe p(c.file);
        EXPECT_EQ(p.clipResult == MM_OK ? ClipSummary(p.clip) : std::to_string(p.clipResult), c.clip) << c.name;
        EXPECT_EQ(InfoSummary(p), c.info) << c.name;
    }
}

TEST(Mp3Stream, CodecFollowsTheLayerAndMimeReplacesTheOldString) {
    TempDir dir;
    for (int layer = 1; layer <= 3; ++layer) {
        Mp3Shape shape;
        shape.layer = layer;
        shape.crc = true;  // MPEG-1 Layer I without CRC starts FF FF, never a sync candidate
        _MM_CODECTYPE codec{};
        ASSERT_EQ(MP3_GetCodecType(dir.Write("c.mp3", Mp3Frames(8, shape)).c_str(), &codec), MM_OK);
        EXPECT_EQ(codec.nAudioCodec, 0x1000u + static_cast<uint32_t>(layer));
    }
    const std::string path = dir.Write("m.mp3", Mp3Frames(8));
    _MM_MIMETYPE mime{};
    mime.pszMimeType = new char[4]{'o', 'l', 'd', 0};  // released by the query
    ASSERT_EQ(MP3_GetMIMEType(path.c_str(), &mime), MM_OK);
    EXPECT_STREQ(mime.pszMimeType, "audio/mp3");
    EXPECT_EQ(mime.nMimeLength, 9u);
    delete[] mime.pszMimeType;
    int mask = 0;
    EXPECT_EQ(MP3_GetTrackType("/no/such/file.mp3", &mask), MM_OK);  // the file is never opened
    EXPECT_EQ(mask, TRACK_AUDIO);
    EXPECT_EQ(GetMediaInfo_MP3(path.c_str(), &mask, INFO_METADATA), MM_E_FAIL);
    // Files shorter than sixteen bytes fail every request.
    const std::string tiny = dir.Write("short.mp3", Cat({Mp3Header({}), Data(11, 0)}));
    _MM_CODECTYPE codec{};
    _MM_MIMETYPE none{};
    EXPECT_EQ(MP3_GetMIMEType(tiny.c_str(), &none), MM_E_FAIL);
    EXPECT_EQ(none.pszMimeType, nullptr);
    EXPECT_EQ(MP3_GetCodecType(tiny.c_str(), &codec), MM_E_FAIL);
    EXPECT_EQ(GetMediaInfo_MP3(nullptr, &mask, INFO_CLIPINFO), MM_E_INVALIDARG);
}
