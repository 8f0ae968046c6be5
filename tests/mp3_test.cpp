// MPEG audio and ID3: frame headers, leading tags, the frame-pair rule, stream kinds,
// durations and the slot answers; ID3 tags (frame table, first frame wins, encodings,
// genres, time stamps, pictures, unsynchronisation, v1 and the fallback between them);
// range extraction; and the real MPEG audio and ID3 files of the corpus.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <string>
#include <tuple>

#include "core/file_access.h"
#include "metainfo/extract.h"
#include "metainfo/metainfo.h"
#include "mp3/id3.h"
#include "mp3/id3_frames.h"
#include "mp3/mp3_extract.h"
#include "mp3/mp3_frame.h"
#include "mp3/mp3_info.h"
#include "support/bytes.h"
#include "support/ffprobe.h"
#include "support/golden.h"
#include "support/id3_builder.h"
#include "support/mp3_builder.h"
#include "support/summary.h"

using namespace testing_support;
using namespace metainfo;

namespace {

using Data = std::vector<uint8_t>;

// Clip information and audio information of one file. Default frames:
// MPEG-1 Layer III, 128 kbit/s, 44100 Hz, stereo, 417 bytes.
struct Mp3Probe {
    _MMClipInfo clip;
    _MP3AudioInfo info;
    int32_t clipResult, infoResult;
    explicit Mp3Probe(const Data& file) {
        TempDir dir;
        const std::string path = dir.Write("s.mp3", file);
        std::memset(&clip, 0xAB, sizeof clip);
        std::memset(&info, 0, sizeof info);
        clipResult = MP3_GetClipInfo(path.c_str(), &clip);
        infoResult = GetMediaInfo_MP3(path.c_str(), &info, INFO_MP3_AUDIO);
    }
    ~Mp3Probe() { delete[] info.xingToc; }
};

Data Then20Frames(const Data& first, const Mp3Shape& shape = {}) { return Join({first, Mp3Frames(20, shape)}); }

std::string InfoSummary(const Mp3Probe& p) {
    if (p.infoResult != MM_OK) return std::to_string(p.infoResult);
    const _MP3AudioInfo& i = p.info;
    char text[256];
    std::snprintf(
        text, sizeof text, "kind=%u tag=%u avg=%u dur=%u spf=%u xing=%u/%x frames=%u bytes=%u q=%d toc=%d vbri=%x/%u",
        i.headerKind, i.tagBytes, i.avgBitRate, i.duration, i.samplesPerFrame, i.xingOffset, i.xingFlags, i.totalFrames,
        i.totalBytes, i.quality, i.xingToc != nullptr ? i.xingToc[50] : -1, i.vbriDelay, i.vbriFramesPerEntry);
    return text;
}

using Frames = std::vector<Data>;

std::string Item(const _MMMetaItem& item) {
    return std::string(reinterpret_cast<const char*>(item.szData), item.nLength);
}

struct Meta {
    _MMMetaInfo meta;
    int32_t result = 0;
    Meta() { std::memset(&meta, 0, sizeof meta); }
    explicit Meta(const Data& file, int pictureLimit = 1) : Meta() {
        TempDir dir;
        result = ID3_GetMetaInfo(dir.Write("t.mp3", file).c_str(), &meta, pictureLimit);
    }
    Meta(const Meta&) = delete;
    ~Meta() { delete[] meta.pPicture; }
    std::string Text(int kind) const { return Item(meta.aItems[kind]); }
};

// The result and items of a file's tags on one line, then the picture's first bytes.
std::string Tags(const Data& file, int pictureLimit) {
    const Meta m(file, pictureLimit);
    std::string s = std::to_string(m.result) + " " + MetaSummary(m.meta);
    for (uint32_t i = 0; m.meta.pPicture != nullptr && i < std::min(m.meta.nPictureSize, 8u); ++i) {
        char hex[4];
        std::snprintf(hex, sizeof hex, " %02x", m.meta.pPicture[i]);
        s += hex;
    }
    return s;
}

Data Text3(const std::string& id, const std::string& text) { return Id3Frame(3, id, TextBody(0, text)); }

// A v2 tag of the frames, then a few audio frames.
Data Tagged(int version, const Frames& frames, size_t padding = 16, uint8_t flags = 0) {
    return Bytes().raw(Id3Tag(version, frames, padding, flags)).raw(Mp3Frames(6)).data();
}

// Runs one step of the v2 parser on the tag at `offset`, with the bound an embedding box gives it.
int32_t ParseAt(const Data& file, long offset, uint32_t bound, Meta* m,
                int32_t (*parse)(int, ID3_MetaInfo*) = ParseID3V2) {
    TempDir dir;
    const int h = MEx_fopen(dir.Write("box.bin", file).c_str(), "rb");
    if (h == 0 || MEx_fseek(h, offset, SEEK_SET) != 0) return -1;
    ID3_MetaInfo ctx = {&m->meta, bound, 0, 1, 0, 0};
    const int32_t result = parse(h, &ctx);
    MEx_fclose(h);
    return result;
}

constexpr uint32_t kFrame = 417;  // MPEG-1 Layer III, 128 kbit/s, 44100 Hz
constexpr int kFrames = 1152;  // 480,384 bytes: 30 s at 16,000 bytes/s

struct Buffer {
    unsigned char* data = nullptr;
    int size = 0;
    int32_t result = 0;
    Buffer(const std::string& path, int start, int end) {
        result = MP3_GetAudioData2Buf(path.c_str(), start, end, &data, &size);
    }
    Buffer(const Buffer&) = delete;
    ~Buffer() { MM_MediaExtractor_FreeBuffer(data); }
};

// Seconds of audio a decoder finds in the file (frames counted by ffprobe), or -1
// when ffmpeg cannot decode it cleanly.
double DecodedSeconds(const std::string& path) {
    if (RunShell("/usr/bin/ffmpeg -nostdin -v error -i '" + path + "' -f null - 2>&1 && echo ok") != "ok\n") return -1;
    const std::string out = RunShell(
        "/usr/bin/ffprobe -v error -count_frames -select_streams a:0 -show_entries "
        "stream=nb_read_frames,sample_rate -of csv=p=0 '" +
        path + "'");
    unsigned rate = 0, frames = 0;
    if (std::sscanf(out.c_str(), "%u,%u", &rate, &frames) != 2 || rate == 0) return -1;
    return frames * 1152.0 / rate;
}

// Header kind and Xing offset from the audio-information request, or {0, 0} on failure.
std::pair<uint32_t, uint32_t> VbrHeaderOf(const std::string& path) {
    _MP3AudioInfo info;
    std::memset(&info, 0, sizeof info);
    const bool ok = GetMediaInfo_MP3(path.c_str(), &info, INFO_MP3_AUDIO) == MM_OK;
    delete[] info.xingToc;
    return ok ? std::make_pair(info.headerKind, info.xingOffset) : std::make_pair(0u, 0u);
}

// Every query a caller can make of an MP3 file, none of which may fault. Returns the
// size of the first two seconds' audio, or -1 when they cannot be cut.
int AskEverything(const std::string& path, const std::string& out) {
    int type = MEDIA_TYPE_UNKNOWN;
    MM_MediaExtractor_DetectMediaType(path.c_str(), &type);
    _MMClipInfo clip;
    MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_MP3, &clip);
    _MM_CODECTYPE codec;
    MM_MediaExtractor_GetCodecType(path.c_str(), MEDIA_TYPE_MP3, &codec);
    _MM_MIMETYPE mime{};
    MM_MediaExtractor_GetMIMEType(path.c_str(), &mime);
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
    _MMMetaInfo meta;
    MM_MediaExtractor_GetMetaInfo(path.c_str(), MEDIA_TYPE_MP3, &meta);
    MM_MediaExtractor_FreeMetaInfo(&meta);
    std::memset(&meta, 0, sizeof meta);
    ID3_GetMetaInfo(path.c_str(), &meta, 0x7FFFFFFF);  // every picture the file holds
    MM_MediaExtractor_FreeMetaInfo(&meta);
    VbrHeaderOf(path);
    const Buffer b(path, 0, 2);
    MP3_GetAudioData2File(path.c_str(), 0, 100, out.c_str());  // the end is clamped to the duration
    return b.result == MM_OK ? b.size : -1;
}
}  // namespace

TEST(Mp3Frame, SizesFieldsAndRejectedHeaders) {
    // {version, layer, bitrateIndex, samplingIndex, padding}
    const struct {
        Mp3Shape shape;
        int size;
    } sizes[] = {{{}, 417},
                 {{3, 3, 9, 0, 1}, 418},
                 {{3, 1, 1, 1, 1}, (32000 * 12 / 48000 + 1) * 4},
                 {{2, 3, 8}, 64000 * 72 / 22050},
                 {{0, 3, 1, 2}, 72}};
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
    EXPECT_EQ(std::make_tuple(info.sampleRate, info.bitRate, info.samplesPerFrame),
              std::make_tuple(24000u, 80000u, 1152u));
    EXPECT_EQ(signature, 1u << 4 | 2u << 6 | 1u << 2);  // LSF Layer II index 9 is 80 kbit/s
}

// Up to three chained tags are skipped (a footer adds ten bytes); then two
// consecutive frames within what was read make a stream.
TEST(Mp3Sync, TagsAreSkippedAndTwoConsecutiveFramesMakeAStream) {
    const Data tag = Id3v2Tag(3, Data(20, 0x11));  // 30 bytes
    const Data footer = Join({Id3v2Tag(4, Data(20, 0x11), 0x10), Data(10, 0)});
    const Data frames = Mp3Frames(3);
    const struct {
        const char* name;
        Data file;
        int32_t result;
        long position;
    } tags[] = {{"untagged", frames, MM_OK, 0},
                {"two tags", Join({tag, tag, frames}), MM_OK, 60},
                {"footer", Join({footer, frames}), MM_OK, 40},
                {"fourth tag stays", Join({tag, tag, tag, tag, frames}), MM_OK, 90},
                {"9 bytes", Bytes().str("ID3").zeros(6).data(), MM_E_FAIL, -1},
                {"10 bytes", Bytes().str("ID3").zeros(7).data(), MM_OK, 0}};
    TempDir dir;
    for (const auto& c : tags) {
        const int h = MEx_fopen(dir.Write("t.mp3", c.file).c_str(), "rb");
        EXPECT_EQ(CheckID3Header(h), c.result) << c.name;
        if (c.position >= 0) {
            EXPECT_EQ(MEx_ftell(h), c.position) << c.name;
        }
        MEx_fclose(h);
    }
    Mp3Shape other;
    other.samplingIndex = 1;
    Data noise(5000);
    for (size_t i = 0; i < noise.size(); ++i) noise[i] = static_cast<uint8_t>(i * 131 + 7);
    const struct {
        const char* name;
        Data file;
        int32_t result;
        uint32_t offset;
    } streams[] = {
        {"after a tag", Join({Id3v2Tag(3, Data(100, 0)), Data(7, 0), Mp3Frames(2)}), MM_OK, 117},
        {"undecodable candidate skipped", Join({{0xFF, 0xFB, 0xF0, 0x00, 0, 0, 0}, Mp3Frames(2)}), MM_OK, 7},
        {"sampling rate changes", Join({Mp3Frame({}), Mp3Frame(other), Mp3Frames(6)}), MM_E_UNSUPPORTED, 0},
        {"second header past the file", Join({Data(10, 0), Mp3Frame({})}), MM_E_UNSUPPORTED, 0},
        {"pair beyond the bytes read", Join({Data(4000, 0), Mp3Frames(2)}), MM_E_UNSUPPORTED, 0},
        {"noise", noise, MM_E_UNSUPPORTED, 0},
        {"3 bytes after the tag", Join({Id3v2Tag(3, Data(20, 0)), Data(3, 0)}), MM_E_FAIL, 0},
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
        EXPECT_EQ(std::tie(info.firstFrameOffset, info.frameSize, info.bitRate),
                  std::make_tuple(c.offset, 417u, 128000u));
    }
    EXPECT_EQ(Mp3Probe(streams[2].file).clipResult, MM_E_UNSUPPORTED);
}

// Stream kind and sizes of one file from the clip and the audio-information requests.
TEST(Mp3Stream, KindDurationAndRatesOfEachStreamShape) {
    Mp3Shape low, high, mono, lsf, lsfMono, mpeg25, mpeg25Mono;
    low.bitrateIndex = 1;  // 32 kbit/s
    high.bitrateIndex = 14;  // 320 kbit/s
    mono.channelMode = lsfMono.channelMode = mpeg25Mono.channelMode = 3;
    lsf.version = lsfMono.version = 2;
    mpeg25.version = mpeg25Mono.version = 0;
    lsf.bitrateIndex = lsfMono.bitrateIndex = mpeg25.bitrateIndex = mpeg25Mono.bitrateIndex = 8;
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
    const struct {
        const char* name;
        Data file;
    } cases[] = {
        // 1,600,000 audio bytes from the first frame, then an ID3v1 tag that is not audio.
        {"cbr", Join({Mp3Frames(3836), Data(1600000 - 3836 * 417, 0), Id3v1Titled("")})},
        // The sampled rate drops the largest and smallest: kept, 32 and 320 kbit/s would raise it.
        {"sampled", Join({Mp3Frames(2), Mp3Frame(high), Mp3Frame(low), Mp3Frames(10)})},
        // Duration from the frame count, 3828 * 1152 / 44100; with a table the sampled average stays.
        {"xing", Then20Frames(XingFrame(xing))},
        // No frame count: the clip request reads 0xFFFFFFFF frames; no table: the average is recomputed.
        {"xing bytes only", Then20Frames(XingFrame(bytesOnly))},
        {"xing of 0 frames", Then20Frames(XingFrame(zero))},
        // Xing stands at 21 for MPEG-1 mono and MPEG-2 stereo, at 13 for MPEG-2 mono; "Info" is not read.
        {"xing mono", Then20Frames(XingFrame({}, mono), mono)},
        {"xing lsf", Then20Frames(XingFrame({}, lsf), lsf)},
        {"xing lsf mono", Then20Frames(XingFrame({}, lsfMono), lsfMono)},
        {"info", Then20Frames(XingFrame(info))},
        // VBRI: 16-bit fields little-endian, the scale word as quality, 1000 * 1152 / 44100.
        {"vbri", Then20Frames(VbriFrame(vbri))},
        // MPEG-2.5 halves the samples per frame for stereo only.
        {"mpeg-2.5", Mp3Frames(12, mpeg25)},
        {"mpeg-2.5 mono", Mp3Frames(12, mpeg25Mono)},
        {"15 bytes", Join({Mp3Header({}), Data(11, 0)})},
    };
    Golden golden("mp3", "streams");
    for (const auto& c : cases) {
        const Mp3Probe p(c.file);
        golden.Check(c.name, (p.clipResult == MM_OK ? ClipSummary(p.clip) : std::to_string(p.clipResult)) + " | " +
                                 InfoSummary(p));
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
    const std::string tiny = dir.Write("short.mp3", Join({Mp3Header({}), Data(11, 0)}));
    _MM_CODECTYPE codec{};
    _MM_MIMETYPE none{};
    EXPECT_EQ(MP3_GetMIMEType(tiny.c_str(), &none), MM_E_FAIL);
    EXPECT_EQ(none.pszMimeType, nullptr);
    EXPECT_EQ(MP3_GetCodecType(tiny.c_str(), &codec), MM_E_FAIL);
    EXPECT_EQ(GetMediaInfo_MP3(nullptr, &mask, INFO_CLIPINFO), MM_E_INVALIDARG);
}

// One row per tag: the result and the items the reader fills, with the picture's first bytes.
// Each frame of the table fills its item (TXXX none); the first frame wins; text is cut to 128 bytes.
// A failed v2 parse keeps its items unless v1 replaces them whole; v2 wins over v1 (the
// reader counts the header's ten bytes against the tag size: without padding the last frame
// overruns the tag and the v2 parse fails). v2.4's encoding byte decides the code, v2.3
// keeps Latin-1 for any but UTF-16, whose little-endian text is delivered big-endian; a
// UTF-8 mark gives UTF-8. Genre numbers below 148 become names (UTF-16 is compacted
// first). TDRC is split by body size counting the encoding byte; a size outside the list
// fills nothing, and a year already read keeps TDRC out. Comments skip language and
// description; the description's terminator is the first zero pair at any offset, so one
// ending in a character with a zero high byte ends a byte early. Pictures are read only
// within the limit; v2.2 has three-letter ids and a picture format; an unsynchronised
// tag is restored (frame sizes count the bytes as stored) and its picture format counts
// the zero; v2.4 frames carry their own unsync and data length indicator; v2.3 extended
// headers are skipped with or without unsync; v1 fields are trimmed and the track byte
// is signed. Hostile sizes fail the tag; zero-size frames cost only their header and a
// picture without a MIME terminator is dropped.
TEST(Id3Tags, ItemsOfEachTag) {
    Frames table = {Text3("TIT2", std::string(300, 'x')),
                    Text3("TIT2", "Second"),
                    Text3("TXXX", "skipped"),
                    Text3("TPE2", "Band"),
                    Id3Frame(3, "PCNT", {0, 0, 1, 2}),
                    Id3Frame(3, "POPM", {'a', '@', 'b', 0, 196, 0})};
    for (const char* id :
         {"TPE1", "TALB", "TYER", "TCOP", "TCOM", "TRCK", "TLAN", "TFLT", "TPE3", "TPUB", "TDAT", "TIME"})
        table.push_back(Text3(id, id));
    const auto broken = Id3Tag(3, {Text3("TCOM", "Composer"), Text3("TPE1", "Artist name")}, 0);
    const auto v1 = Id3v1Titled("V1 title");
    const auto frames = Mp3Frames(6);
    auto tit2 = [](int version, const Data& body) { return Tagged(version, {Id3Frame(version, "TIT2", body)}); };
    auto tcon = [](const Data& body) { return Tagged(3, {Id3Frame(3, "TCON", body)}); };
    auto comm = [](uint8_t encoding, const Data& afterLanguage) {
        return Tagged(3, {Id3Frame(3, "COMM", Bytes().u8(encoding).str("eng").raw(afterLanguage).data())});
    };
    const Data jpeg = {0xFF, 0xD8, 0xFF, 0xE0, 1, 2, 3}, unsyncPicture = {0xFF, 0xD8, 0xFF, 0x00, 0xFF};
    const auto apic = Tagged(3, {Id3Frame(3, "APIC", ApicBody("image/jpeg", jpeg, "cover"))});
    const auto large = Tagged(3, {Id3Frame(3, "APIC", ApicBody("image/png", Data(600000 - 13)))});
    const auto unsync24 = Bytes().syncsafe32(5).raw(Unsynchronise(TextBytes(0, {'x', 0xFF, 0x00, 'y'}))).data();
    const auto extended = Bytes().be32(6).zeros(6).raw(Text3("TIT2", "Ext")).zeros(30).data();
    Data truncated = Id3v2Tag(4, Id3Frame(4, "TIT2", TextBody(0, std::string(200, 'a'))));
    truncated.resize(100);  // the tag claims more than the file holds
    auto hugeFrame = [&](uint32_t size) {
        return Join({Id3v2Tag(3, Bytes().str("TIT2").be32(size).zeros(42).data()), frames});
    };
    const struct {
        const char* name;
        Data file;
        int limit;
    } cases[] = {
        {"frame table", Tagged(3, table), 1},
        {"failed v2", Join({broken, frames}), 1},
        {"replaced by v1", Join({broken, frames, v1}), 1},
        {"v2 over v1", Join({Tagged(3, {Text3("TIT2", "V2 title")}), v1}), 1},
        {"no tag", frames, 1},
        {"v2.4 utf-8", tit2(4, TextBody(3, "T\xC3\xA9")), 1},
        {"v2.4 utf-16be", tit2(4, TextBytes(2, {0, 'A'})), 1},
        {"v2.4 encoding 7", tit2(4, TextBody(7, "x")), 1},
        {"v2.3 encoding 3", tit2(3, TextBody(3, "T\xC3\xA9")), 1},
        {"v2.3 utf-16", tit2(3, TextBytes(1, {0xFF, 0xFE, 'H', 0, 'i', 0})), 1},
        {"v2.3 utf-16 odd", tit2(3, TextBytes(1, {0xFF, 0xFE, 'H', 0, 'i'})), 1},
        {"v2.3 utf-8 mark", tit2(3, TextBytes(1, {0xEF, 0xBB, 0xBF, 'U'})), 1},
        {"(17)Rock", tcon(TextBody(0, "(17)Rock")), 1},
        {"(17)", tcon(TextBody(0, "(17)")), 1},
        {"Rock", tcon(TextBody(0, "Rock")), 1},
        {"(255)", tcon(TextBody(0, "(255)")), 1},
        {"(-1)", tcon(TextBody(0, "(-1)")), 1},
        {"(147)", tcon(TextBody(0, "(147)")), 1},
        {"(67)", tcon(TextBody(0, "(67)")), 1},
        {"utf-16 (17)", tcon(TextBytes(1, {0xFF, 0xFE, '(', 0, '1', 0, '7', 0, ')', 0})), 1},
        {"utf-16be (8)", tcon(TextBytes(1, {0xFE, 0xFF, 0, '(', 0, '8', 0, ')'})), 1},
        {"tdrc 9", Tagged(4, {Id3Frame(4, "TDRC", TextBody(0, "2004-05-0"))}), 1},
        {"tdrc 13", Tagged(4, {Id3Frame(4, "TDRC", Bytes().str("2004-05-06T12").data())}), 1},
        {"tdrc 5", Tagged(4, {Id3Frame(4, "TDRC", TextBody(0, "2004"))}), 1},
        {"tyer first", Tagged(3, {Text3("TYER", "1999"), Id3Frame(3, "TDRC", {'2', '0', '0', '4'})}), 1},
        {"comment", comm(0, Bytes().str("desc").u8(0).str("Comment").data()), 1},
        {"comment utf-16", comm(1, {0xFF, 0xFE, 0, 0, 0xFF, 0xFE, 'O', 0, 'K', 0}), 1},
        {"comment early end", comm(1, {0xFF, 0xFE, 'd', 0, 0, 0, 0xFF, 0xFE, 'O', 0}), 1},
        {"picture", apic, 1},
        {"picture, limit 0", apic, 0},
        {"large picture", large, 1},
        {"large picture within the limit", large, 600000},
        {"v2.2",
         Tagged(2, {Id3Frame22("TT2", TextBody(0, "Two")), Id3Frame22("TCO", TextBody(0, "(0)")),
                    Id3Frame22("PIC", Bytes().u8(0).str("PNG").u8(0).str("d").u8(0).u8(9).data())}),
         1},
        {"unsynchronised",
         Tagged(3,
                {Id3Frame(3, "TIT2", Unsynchronise(TextBytes(0, {'a', 0xFF, 'b'}))),
                 Id3Frame(3, "APIC", Unsynchronise(ApicBody("image/jpeg", unsyncPicture)))},
                16, 0x80),
         1},
        {"v2.4 frame unsync", Tagged(4, {Id3Frame(4, "TIT2", unsync24, 0x03)}), 1},
        {"extended header", Join({Id3v2Tag(3, extended, 0x40), frames}), 1},
        {"extended header, unsync", Join({Id3v2Tag(3, extended, 0xC0), frames}), 1},
        {"v1", Join({frames, Id3v1({"Title  \t", "Artist", "Album", "2001", "Note", 200, 17})}), 1},
        {"v1 track 0, genre 148", Join({frames, Id3v1({"T", "", "", "", "", 0, 148})}), 1},
        {"truncated", truncated, 1},
        {"huge tag", Bytes().str("ID3").u8(3).zeros(2).syncsafe32(0x0FFFFFFF).raw(frames).data(), 1},
        {"frame beyond the tag", hugeFrame(0x7FFFFFF0u), 1},
        {"negative frame", hugeFrame(0x80000001u), 1},
        {"empty frames",
         Tagged(3, {Id3Frame(3, "TIT2", {}), Id3Frame(3, "APIC", {}), Id3Frame(3, "APIC", TextBody(0, "image/png")),
                    Text3("TIT2", "ok")}),
         1},
    };
    Golden golden("mp3", "tags");
    for (const auto& c : cases) golden.Check(c.name, Tags(c.file, c.limit));
    uint8_t shortBody[] = {1, 2, 3};  // below four bytes there is no indicator to drop
    EXPECT_EQ(RemoveDataLengthIndicator(shortBody, 3), 3u);
}

TEST(Id3Tags, EmbeddedTagIsParsedOnAnOpenHandleWithinItsBound) {
    const Data tag = Id3Tag(4, {Id3Frame(4, "TIT2", TextBody(0, "Inside"))});
    const auto file = Bytes().zeros(100).raw(tag).zeros(50).data();
    Meta m, tight, shortHeader;
    EXPECT_EQ(ParseAt(file, 100, static_cast<uint32_t>(tag.size()), &m), 0);
    EXPECT_EQ(m.Text(META_TITLE), "Inside");
    EXPECT_EQ(ParseAt(file, 100, 10, &tight), 1);
    EXPECT_EQ(ParseAt({'I', 'D', '3', 3, 0}, 0, 100, &shortHeader, ParseV2Header), kID3ShortHeader);
}

TEST(Id3Tags, ShortFrameBodyEndsAVersion24TagOnly) {
    // A bound beyond what the file still holds: a v2.4 frame cut short fails
    // the tag, a v2.3 one keeps what was read.
    for (int version : {3, 4}) {
        Data file = Id3Tag(
            version, {Id3Frame(version, "TIT2", TextBody(0, "From v2")), Id3Frame(version, "PRIV", Data(400, 1))});
        file.resize(file.size() - 300);
        Meta m;
        EXPECT_EQ(ParseAt(file, 0, 100000, &m), version == 4 ? 1 : 0) << version;
        EXPECT_EQ(m.Text(META_TITLE), "From v2");
    }
}

TEST(Id3Tags, AacFilesTakeTheirTagsFromId3) {
    TempDir dir;
    const std::string path = dir.Write("a.aac", Tagged(3, {Text3("TIT2", "AAC")}));
    _MMMetaInfo meta;
    ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(path.c_str(), MEDIA_TYPE_AAC, &meta), MM_OK);
    EXPECT_EQ(Item(meta.aItems[META_TITLE]), "AAC");
    MM_MediaExtractor_FreeMetaInfo(&meta);
}

TEST(Mp3Extract, PositionsMoveToTheNextSyncAndTheEndIsCutAtTheDuration) {
    TempDir dir;
    const std::string path = dir.Write("cbr.mp3", Mp3Frames(kFrames));
    const Buffer b(path, 10, 20);
    ASSERT_EQ(b.result, MM_OK);
    // 160,000 and 320,000 moved to the frames at 384 and 768.
    EXPECT_EQ(b.size, static_cast<int>(320256 - 160128));
    ASSERT_NE(b.data, nullptr);
    EXPECT_EQ(b.data[0], 0xFF);
    EXPECT_EQ(b.data[kFrame], 0xFF);
    // A source without leading or trailing tags gives a file of the same bytes.
    ASSERT_EQ(MP3_GetAudioData2File(path.c_str(), 10, 20, dir.PathOf("out.mp3").c_str()), MM_OK);
    EXPECT_EQ(ReadFileBytes(dir.PathOf("out.mp3")), std::vector<uint8_t>(b.data, b.data + b.size));
    unsigned char* pub = nullptr;
    int size = 0;
    ASSERT_EQ(MM_MediaExtractor_GetAudioData(path.c_str(), 10, 20, &pub, &size), MM_OK);
    EXPECT_EQ(size, b.size);
    MM_MediaExtractor_FreeBuffer(pub);

    const struct {
        int start, end;
        int32_t result;
        int size;
    } ranges[] = {{20, 1000, MM_OK, static_cast<int>(kFrames * kFrame - 320256)},
                  {30, 40, MM_E_FAIL, 0},  // starting at the very end leaves no frame
                  {31, 40, MM_E_INVALIDARG, 0},
                  {-1, 5, MM_E_INVALIDARG, 0},
                  {5, 5, MM_E_INVALIDARG, 0}};
    for (const auto& r : ranges) {
        const Buffer cut(path, r.start, r.end);
        EXPECT_EQ(cut.result, r.result) << r.start;
        EXPECT_EQ(cut.data != nullptr, r.result == MM_OK) << r.start;
        if (r.result == MM_OK) {
            EXPECT_EQ(cut.size, r.size);
        }
    }
    EXPECT_EQ(MP3_GetAudioData2Buf(path.c_str(), 0, 5, nullptr, &size), MM_E_INVALIDARG);
    EXPECT_EQ(MP3_GetAudioData2File(path.c_str(), 0, 5, nullptr), MM_E_INVALIDARG);
    VbriFields vbri;  // VBRI streams cannot be cut
    vbri.frames = kFrames;
    EXPECT_EQ(
        Buffer(dir.Write("vbri.mp3", Bytes().raw(VbriFrame(vbri)).raw(Mp3Frames(kFrames - 1)).data()), 1, 2).result,
        MM_E_FAIL);
}

TEST(Mp3Extract, FileCarriesTagsAndAXingFrameForTheRange) {
    TempDir dir;
    const std::vector<uint8_t> tag = Id3v2Tag(3, std::vector<uint8_t>(20, 0));  // 30 bytes
    XingFields xing;
    xing.frames = kFrames;
    xing.bytes = kFrames * kFrame;
    const auto file =
        Bytes().raw(tag).raw(XingFrame(xing)).raw(Mp3Frames(kFrames - 1)).raw(Id3v1Titled("Trailing")).data();
    const std::string out = dir.PathOf("out.mp3");
    ASSERT_EQ(MP3_GetAudioData2File(dir.Write("xing.mp3", file).c_str(), 10, 20, out.c_str()), MM_OK);
    const std::vector<uint8_t> cut = ReadFileBytes(out);

    // Table entries 33 and 67 (84 and 171) of 480,384 bytes, counted from the
    // file start, moved to the frames at 157,656 and 321,120.
    const uint32_t span = 321120 - 157656;
    ASSERT_EQ(cut.size(), 30 + kFrame + span + 128);
    EXPECT_TRUE(std::equal(tag.begin(), tag.end(), cut.begin()));
    const uint8_t* x = cut.data() + 30;
    EXPECT_EQ(std::memcmp(x, file.data() + 30, 40), 0);  // header, side information, "Xing"
    const auto fields = Bytes().be32(0xF).be32(383).be32(span).data();  // lrint(10 * 44100 / 1152) frames
    EXPECT_EQ(std::memcmp(x + 40, fields.data(), 12), 0);
    EXPECT_EQ(std::memcmp(x + 52, file.data() + 30 + 52, 100), 0);  // the source's table as it stands
    EXPECT_EQ(x[155], 57);  // quality
    EXPECT_EQ(x[156], 0);  // padding up to the source frame's size
    EXPECT_EQ(std::memcmp(cut.data() + 30 + kFrame, file.data() + 157656, span), 0);
    EXPECT_EQ(std::memcmp(cut.data() + cut.size() - 128, "TAGTrailing", 11), 0);
}

TEST(Mp3Extract, CutFilesDecodeForTheRequestedSpan) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg is not installed";
    TempDir dir;
    const double frame = 1152.0 / 44100;
    const struct {
        std::string options;
        double tolerance;
    } cases[] = {
        {"-b:a 128k", frame},
        {"-q:a 4", 30 * 0.01 + 2 * frame},  // the Xing table has 1% steps: each cut may move by half a step
    };
    for (const auto& c : cases) {
        const std::string source = dir.PathOf("source.mp3"), out = dir.PathOf("cut.mp3");
        if (!FfmpegWrite("-f lavfi -i sine=frequency=440:duration=30 -c:a libmp3lame " + c.options, source))
            GTEST_SKIP() << "ffmpeg cannot encode MP3 here";
        ASSERT_EQ(MP3_GetAudioData2File(source.c_str(), 10, 20, out.c_str()), MM_OK) << c.options;
        EXPECT_NEAR(DecodedSeconds(out), 10.0, c.tolerance) << c.options;
    }
    const std::string corpus = CorpusDir();
    for (const char* name : {"mutagen/xing.mp3", "mutagen/silence-44-s.mp3"}) {
        if (corpus.empty()) break;
        const std::string out = dir.PathOf("corpus.mp3");
        ASSERT_EQ(MP3_GetAudioData2File((corpus + "/" + name).c_str(), 1, 2, out.c_str()), MM_OK) << name;
        EXPECT_GT(DecodedSeconds(out), 0.5) << name;
    }
}

TEST(Mp3Robustness, DamagedCopiesOfATaggedXingFileAreAnsweredWithoutFault) {
    // Deterministic byte damage over a file with every structure the readers
    // walk: v2.3 tag with text and picture, Xing frame, frames, v1 tag.
    const auto apic = ApicBody("image/png", std::vector<uint8_t>(64, 0xFF), "d");
    const auto comm = TextBytes(1, {'e', 'n', 'g', 0xFF, 0xFE, 0, 0, 0xFF, 0xFE, 'c', 0});
    XingFields xing;
    xing.frames = 40;
    xing.bytes = 40 * 417;
    const std::vector<uint8_t> source =
        Bytes()
            .raw(Id3Tag(
                3, {Id3Frame(3, "TIT2", TextBody(0, "Title")), Id3Frame(3, "APIC", apic), Id3Frame(3, "COMM", comm),
                    Id3Frame(3, "TCON", TextBody(0, "(17)")), Id3Frame(3, "TDRC", TextBody(0, "2004-05-0"))}))
            .raw(XingFrame(xing))
            .raw(Mp3Frames(39))
            .raw(Id3v1Titled("v1"))
            .data();
    TempDir dir;
    uint32_t seed = 12345;
    auto next = [&seed]() { return (seed = seed * 1103515245u + 12345u) >> 8; };
    for (int round = 0; round < 150; ++round) {
        std::vector<uint8_t> damaged = source;
        for (int e = 1 + static_cast<int>(next() % 8); e > 0; --e) {
            // Most damage lands in the first kilobyte, where the tag and first frames are.
            const size_t span = (next() & 1) ? 1024 : damaged.size();
            damaged[next() % span] = static_cast<uint8_t>(next());
        }
        if (round % 10 == 0) damaged.resize(next() % damaged.size());
        AskEverything(dir.Write("damaged.mp3", damaged), dir.PathOf("out.mp3"));
    }
}
