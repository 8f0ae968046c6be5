// MP4 files built box by box: the walk and its size rules, the movie, media and track
// headers, sample descriptions, user-data metadata and the maker box. Real files (some
// of them hostile) are in the corpus test.
#include <gtest/gtest.h>
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <string>
#include <tuple>

#include "core/file_access.h"
#include "core/thread_state.h"
#include "metainfo/metainfo.h"
#include "metainfo/mp4.h"
#include "mp4/mp4_file.h"
#include "mp4/mp4_internal.h"
#include "support/aac_builder.h"
#include "support/bytes.h"
#include "support/golden.h"
#include "support/id3_builder.h"
#include "support/mp4_builder.h"
#include "support/summary.h"

using namespace testing_support;
using namespace metainfo;

namespace {

ByteVec AacEntry() { return AudioEntry("mp4a", 2, 16, 44100, Esds(0x40, 128000, {0x12, 0x10})); }
ByteVec AudioTrak(uint32_t duration = 10000) {
    return Trak("soun", 1000, duration, Join({Stsd({AacEntry()}), Stsz(100, 10)}));
}
ByteVec VideoTrak() {
    return Trak("vide", 1000, 10000, Join({Stsd({VisualEntry("mp4v", 320, 240, Esds(0x20, 500000))}), Stsz(1000, 300)}),
                320, 240);
}

// A movie of one track of the sample entry (and what follows it in "stbl").
ByteVec Audio(const ByteVec& entry, const ByteVec& extra = {}) {
    return Movie(Join({Mvhd(0, 1000, 10000), Trak("soun", 1000, 10000, Join({Stsd({entry}), extra}))}));
}
ByteVec Video(const ByteVec& entry, const ByteVec& extra = {}, uint32_t movieMs = 10000) {
    return Movie(Join({Mvhd(0, 1000, movieMs), Trak("vide", 1000, 1000, Join({Stsd({entry}), extra}), 1, 1)}));
}
ByteVec OneTrak(const ByteVec& trak) { return Movie(Join({Mvhd(0, 1000, 10000), trak})); }

// objectType, frequency index, channels of an audio configuration; more fields may follow.
BitWriter Asc(uint32_t objectType, uint32_t frequencyIndex, uint32_t channels) {
    BitWriter w;
    w.put(objectType, 5).put(frequencyIndex, 4).put(channels, 4);
    return w;
}
ByteVec AacWith(const BitWriter& config) {
    return Audio(AudioEntry("mp4a", 2, 16, 44100, Esds(0x40, 96000, config.bytes())));
}

// The clip record, then each track node: kind, codec/detail in hex, bit rate.
std::string Summary(const Mp4ClipWalk& w) {
    std::string s = ClipSummary(w.clip);
    for (const auto& n : w.nodes) {
        char text[64];
        std::snprintf(text, sizeof text, " | %u %x/%x %u", n.kind, n.codec, n.codecDetail, n.bitrate);
        s += text;
    }
    return s;
}

ByteVec MetaBox(const ByteVec& children) { return FullBox("meta", 0, 0, Join({Hdlr("mdir"), children})); }
ByteVec Ilst(const ByteVec& items) { return Box("ilst", items); }
// An iTunes text item: the type's first byte is the copyright sign.
const std::string kC = "\xA9";
ByteVec Item(const std::string& type, const std::string& s) {
    return IlstItem(kC + type, 1, ByteVec(s.begin(), s.end()));
}
ByteVec Udta(const ByteVec& children) { return Box("udta", children); }

ByteVec Modl(const std::string& body) { return FullBox("modl", 0, 0, ByteVec(body.begin(), body.end())); }
ByteVec Thub(const ByteVec& image, uint32_t declared) {
    return FullBox("thub", 0, 0, Bytes().be32(0xCAFE).be32(declared).raw(image));
}
ByteVec Thub(const ByteVec& image) { return Thub(image, static_cast<uint32_t>(image.size())); }
ByteVec Salb(const std::string& text) { return FullBox("salb", 0, 0, Bytes().be16(0x15C7).str(text)); }
ByteVec Mkr(const ByteVec& children) { return FullBox("@mkr", 0, 0, children); }
const ByteVec kImage = {0xFF, 0xD8, 0xFF, 0xE0, 1, 2, 3, 4, 5, 0xFF, 0xD9};

std::string Str(const unsigned char* p, uint32_t n) {
    return p ? std::string(reinterpret_cast<const char*>(p), n) : "";
}

class Mp4 : public ::testing::Test {
protected:
    TempDir dir;
    _MMClipInfo clip{};
    _MMMetaInfo meta{};
    _MAKERINFO maker{};

    int32_t Clip(const ByteVec& file, const std::string& name = "clip.mp4") {
        std::memset(&clip, 0, sizeof clip);
        return MP4_GetClipInfo(dir.Write(name, file).c_str(), &clip);
    }
    std::string Walk(const ByteVec& file) { return Summary(WalkClip(dir.Write("s.mp4", file))); }
    std::string Meta(const ByteVec& moovChildren, const ByteVec& topLevel = {}) {
        MM_MediaExtractor_FreeMetaInfo(&meta);
        std::memset(&meta, 0, sizeof meta);
        ByteVec file = Movie(Join({Mvhd(0, 1000, 1000), moovChildren}), Join({topLevel, Box("mdat", ByteVec(16, 0))}));
        const int32_t result = MP4_GetMetaInfo(dir.Write("m.m4a", file).c_str(), &meta, 1);
        return result == MM_OK ? MetaSummary(meta) : std::to_string(result);
    }
    // The maker box in the movie's user data, or in a top-level one.
    int32_t Maker(const ByteVec& mkr, bool topLevel = false) {
        FreeMaker();
        ByteVec udta = Udta(mkr);
        return MP4_GetMakerInfo(
            dir.Write("cam.3gp", Movie(Join({Mvhd(0, 1000, 1000), topLevel ? ByteVec{} : udta}),
                                       Join({topLevel ? udta : ByteVec{}, Box("mdat", ByteVec(16, 0))})))
                .c_str(),
            &maker);
    }
    std::string MakerText() const {
        return "valid=" + std::to_string(maker.nValid) + " model=" + Str(maker.pPhoneModel, maker.nPhoneModelSize) +
               " thumb=" + std::to_string(maker.pThumbnail != nullptr ? maker.nThumbnailSize : 0) +
               " album=" + Str(maker.pSmartAlbum, maker.nSmartAlbumSize);
    }
    void FreeMaker() {
        MM_MediaExtractor_FreeBuffer(maker.pPhoneModel);
        MM_MediaExtractor_FreeBuffer(maker.pThumbnail);
        MM_MediaExtractor_FreeBuffer(maker.pSmartAlbum);
        std::memset(&maker, 0, sizeof maker);
    }
    void TearDown() override {
        MM_MediaExtractor_FreeMetaInfo(&meta);
        FreeMaker();
    }
};

}  // namespace

TEST_F(Mp4, ClipOfEachFileShape) {
    const ByteVec song = Movie(Join({Mvhd(0, 1000, 2000), AudioTrak(2000)}));
    const struct {
        const char* name;
        ByteVec file;
        const char* path;
    } cases[] = {
        // The first box must be ftyp or mdat; a file starting with mdat is walked from offset 0.
        {"free first", Join({Box("free", ByteVec(8, 0)), Box("moov", Mvhd(0, 1000, 5000))}), "clip.mp4"},
        {"mdat first", Join({Box("mdat", ByteVec(8, 0)), Box("moov", Mvhd(0, 1000, 5000)), Box("free")}), "clip.mp4"},
        // Box sizes stay below the file size: a box as long as the file, or of size 0, is refused;
        // a top-level box claiming more than the file ends the walk quietly.
        {"as long as the file", Box("ftyp", ByteVec(24, 0)), "clip.mp4"},
        {"size 0", Bytes().be32(0).str("ftyp").zeros(24), "clip.mp4"},
        {"beyond the file", Movie(Mvhd(0, 1000, 7000), Bytes().be32(0x7FFFFFF0).str("mdat").zeros(8)), "clip.mp4"},
        // Headers cut short: missing bytes read as 0 (a 64-bit size of 0 is refused); the walk
        // stops at a last header the file does not hold whole, rather than going back to it.
        {"cut 64-bit size", Bytes().be32(1), "clip.mp4"},
        {"cut last header", Join({Ftyp(), Bytes().be32(3).u8(0x80).data()}), "clip.m4a"},
        // A 64-bit size's upper word of 1 is ignored: the box ends after its lower word.
        {"64-bit size",
         Join({Ftyp(), Bytes().be32(1).str("mdat").be32(1).be32(24).zeros(8).data(),
               Box("moov", Join({Mvhd(0, 1000, 6000), AudioTrak(6000)})), Box("free", ByteVec(8, 0))}),
         "clip.mp4"},
        // Version 1 takes the upper words: below 2^32 units a duration is 0; c1 is the creation time.
        {"version 1", Movie(Mvhd(1, 1, 0xFFFFFFFFull, 0x1234567800000000ull)), "clip.mp4"},
        // The largest of movie and media durations; the creation time of the last header read (the mdhd's).
        {"media longer", Movie(Join({Mvhd(0, 1000, 4000, 11), AudioTrak(12500)})), "clip.mp4"},
        {"timescale 0 leaves the raw duration", Movie(Mvhd(0, 0, 17)), "clip.mp4"},
        // Bit rate from the file size, format from the extension; the esds bit rate comes first and is kept.
        {"format", song, "Song.M4A"},
        {"no extension: the copied fields stay", song, "noextension"},
        // The first track declaring a size sets it.
        {"sized tracks",
         Movie(Join({Mvhd(0, 1000, 1000), Trak("soun", 1000, 1000, {}), Trak("hint", 1000, 1000, {}, 176, 144),
                     Trak("hint", 1000, 1000, {}, 640, 480)})),
         "clip.mp4"},
    };
    Golden golden("mp4", "clips");
    for (const auto& c : cases) {
        const int32_t result = Clip(c.file, c.path);
        golden.Check(c.name, std::to_string(result) + " " + ClipSummary(clip));
    }
}

TEST_F(Mp4, TrackTypesCodecsAndTheDescriptorForm) {
    std::string path = dir.Write("av.mp4", Movie(Join({Mvhd(0, 1000, 10000), VideoTrak(), AudioTrak()})));
    int bits = 0;
    EXPECT_EQ(MP4_GetTrackType(path.c_str(), &bits), MM_OK);
    EXPECT_EQ(bits, 17);
    _MM_CODECTYPE codec;
    std::memset(&codec, 0xFF, sizeof codec);
    ASSERT_EQ(MP4_GetCodecType(path.c_str(), &codec), MM_OK);
    EXPECT_EQ(CodecSummary(codec), "a=4008/0/2102 v=4001/0/0");  // cleared first
    EXPECT_EQ(MP4_GetCodecType(dir.Write("bare.mp4", Movie(Mvhd(0, 1000, 1000))).c_str(), &codec), MM_E_FAIL)
        << "no track";
    // The descriptor form walks and leaves the caller's descriptor open.
    int fd = ::open(path.c_str(), O_RDONLY);
    ASSERT_GT(fd, 0);
    EXPECT_EQ(MP4_GetCodecTypeEx(fd, &codec), MM_OK);
    EXPECT_EQ(codec.nVideoCodec, 0x4001u);
    EXPECT_EQ(::lseek(fd, 0, SEEK_SET), 0);
    ::close(fd);
    EXPECT_EQ(MP4_GetMediaInfoFd(0, kModeClip, nullptr), -1) << "0 is no descriptor";
    // Refining numbers tracks only with a second entry of a kind.
    for (const auto& n : WalkClip(path, true).nodes) EXPECT_EQ(n.ordinal, 0u);
    Mp4ClipWalk three = WalkClip(
        dir.Write("three.mp4", Movie(Join({Mvhd(0, 1000, 10000), AudioTrak(), VideoTrak(), AudioTrak()}))), true);
    ASSERT_EQ(three.nodes.size(), 3u);
    for (uint32_t i = 0; i < 3; ++i) EXPECT_EQ(three.nodes[i].ordinal, i);
    EXPECT_EQ(three.nodes[1].kind, 16u);
    EXPECT_EQ(three.clip.bHasAudio, 2u);
}

// Which entry is read, the codec codes of the decoder configurations, and what "stsz" adds.
TEST_F(Mp4, SampleDescriptions) {
    const ByteVec mp4v = VisualEntry("mp4v", 176, 144, Esds(0x20, 64000));
    const ByteVec avcC =
        Box("avcC",
            Bytes().u8(1).u8(66).u8(0).u8(30).u8(0xFF).u8(0xE1).be16(4).be32(0x6742001E).u8(1).be16(2).be16(0x68CE));
    // A QCP format chunk after three bytes: its rate, bit rate and sample size replace the configuration's.
    const ByteVec qcp = Bytes()
                            .u8(0)
                            .u8(0)
                            .u8(0)
                            .str("fmt ")
                            .le32(150)
                            .u8(1)
                            .u8(0)
                            .zeros(16)
                            .le16(1)
                            .zeros(80)
                            .le16(13300)
                            .le16(35)
                            .le16(160)
                            .le16(8000)
                            .le16(16)
                            .le32(0)
                            .zeros(36)
                            .data();
    const ByteVec stbl = Box("stbl", Stsd({AacEntry()}));
    const struct {
        const char* name;
        ByteVec file;
    } cases[] = {
        // Only the first entry counts and is read (damr: frames per sample as bits).
        {"samr then mp4a",
         OneTrak(Trak(
             "soun", 1000, 10000,
             Stsd({AudioEntry("samr", 1, 16, 8000, Box("damr", Bytes().str("vndr").u8(0).be16(0x81FF).u8(0).u8(3))),
                   AudioEntry("mp4a", 2, 16, 48000, Esds(0x40, 1, {0x11, 0x90}))})))},
        // Frame rate is samples per whole second; with a bit rate from the sample entry the
        // sizes are not summed.
        {"frame rate 10 s", Video(mp4v, Stsz(500, 300))},
        {"frame rate 9.9 s", Video(mp4v, Stsz(500, 300), 9900)},
        // A zero sample size sums the entries; a count far beyond the table sums what the box holds.
        {"stsz entries",
         Audio(AudioEntry("mp4a", 1, 16, 8000, Esds(0x40, 0, {0x15, 0x88})), Stsz(0, 3, {1000, 2000, 2000}))},
        {"stsz hostile count", Audio(AudioEntry("mp4a", 1, 16, 8000), Stsz(0, 0xFFFFFFF0u, {800}))},
        {"stsz of 40000 entries",
         Audio(AudioEntry("mp4a", 1, 16, 8000), Stsz(0, 40000, std::vector<uint32_t>(40000, 25)))},
        // Speech entries have fixed values.
        {"secw", Audio(AudioEntry("secw", 2, 8, 44100))},
        {"sevc", Audio(AudioEntry("sevc", 2, 8, 44100))},
        {"secb", Audio(AudioEntry("secb", 2, 8, 44100))},
        {"sqcp", Audio(AudioEntry("sqcp", 1, 16, 8000))},
        {"sawp", Audio(AudioEntry("sawp", 2, 16, 16000))},
        {"qcelp in esds", Audio(AudioEntry("mp4a", 1, 16, 44100, Esds(0xE1, 13000, qcp)))},
        // avc1 needs avcC for its codec but always gives the size; btrt's average bit rate.
        {"avc1 bare", Video(VisualEntry("avc1", 640, 360))},
        {"avc1 full", Video(VisualEntry("avc1", 1280, 720,
                                        Join({Box("pasp", Bytes().be32(1).be32(1)), avcC,
                                              Box("btrt", Bytes().be32(0).be32(900000).be32(750000))})))},
        {"avc1 wild lengths",
         Video(VisualEntry("avc1", 320, 240,
                           Box("avcC", Bytes().u8(1).u8(66).u8(0).u8(30).u8(0xFF).u8(0xFF).be16(0xFFFF).zeros(4))))},
        {"avc1 child of size 0", Video(VisualEntry("avc1", 320, 240, Bytes().be32(0).str("pasp").zeros(8)))},
        {"s263 bitr", Video(VisualEntry("s263", 176, 144,
                                        Box("d263", Join({Bytes().str("vndr").u8(0).u8(10).u8(0).data(),
                                                          Box("bitr", Bytes().be32(64000).be32(128000))}))))},
        // Malformed configurations leave no codec; unknown entries are neither read nor counted.
        {"wave instead of esds", Audio(AudioEntry("mp4a", 2, 16, 44100, Box("wave", ByteVec(20, 0))))},
        {"endless descriptor length",
         Audio(AudioEntry("mp4a", 2, 16, 44100, FullBox("esds", 0, 0, ByteVec(40, 0x80))))},
        {"tx3g", OneTrak(Trak("text", 1000, 1000, Stsd({Box("tx3g", ByteVec(40, 0))})))},
        // A handler after stbl still decides the kind; without one the sample table is not read.
        {"late handler",
         OneTrak(Box("trak", Box("mdia", Join({Box("minf", stbl), Mdhd(0, 1000, 3000), Hdlr("soun")}))))},
        {"no handler", OneTrak(Box("trak", Box("mdia", Join({Mdhd(0, 1000, 3000), Box("minf", stbl)}))))},
    };
    Golden golden("mp4", "sample descriptions");
    for (const auto& c : cases) golden.Check(c.name, Walk(c.file));
    // AAC object types give codec and profile; only the sync extension with sbrPresentFlag 1
    // signals SBR (implicit SBR only doubles the rate); bad configurations still name AAC,
    // a program configuration whose long comment runs past the bytes given too.
    const struct {
        BitWriter config;
    } configs[] = {
        {Asc(2, 3, 2).put(0, 3)},
        {Asc(1, 3, 2).put(0, 3)},
        {Asc(3, 3, 2).put(0, 3)},
        {Asc(4, 3, 2).put(0, 3)},
        {Asc(17, 3, 2).put(0, 3)},
        {Asc(5, 6, 2).put(3, 4).put(2, 5).put(0, 3)},
        {Asc(2, 7, 2).put(0, 3)},
        {Asc(2, 7, 2).put(0, 3).put(0x2B7, 11).put(5, 5).put(1, 1).put(3, 4)},
        {Asc(2, 7, 2).put(0, 3).put(0x2B7, 11).put(5, 5).put(0, 1)},
        {Asc(2, 13, 2)},
        {Asc(2, 4, 9)},
        {Asc(2, 4, 0)
             .put(0, 3)
             .put(0, 4)
             .put(1, 2)
             .put(4, 4)
             .put(15, 4)
             .put(15, 4)
             .put(15, 4)
             .put(3, 2)
             .put(7, 3)
             .put(15, 4)
             .put(1, 1)
             .put(3, 4)},
    };
    for (const auto& c : configs) {
        const MP4TrackNode node = WalkClip(dir.Write("aac.mp4", AacWith(c.config))).nodes.at(0);
        char text[32];
        std::snprintf(text, sizeof text, "%x/%x", node.codec, node.codecDetail);
        golden.Check("config " + std::to_string(&c - configs), text);
    }
    // Entries whose fixed fields lie past the end of the stsd box.
    for (const char* type : {"mp4a", "samr", "sawp", "mp4v", "s263", "avc1"}) {
        ByteVec stsd = FullBox("stsd", 0, 0, Bytes().be32(1).be32(200).str(type).zeros(4));
        EXPECT_EQ(WalkClip(dir.Write("short.mp4", OneTrak(Trak("soun", 1000, 1000, stsd)))).result, MM_OK) << type;
    }
}

TEST_F(Mp4, BitrateProductWrapsAt512MiBAndFilesOf2GiBAreRefused) {
    std::string path = dir.Write("big.mp4", Movie(Mvhd(0, 1, 100)));
    ASSERT_EQ(::truncate(path.c_str(), 512ll << 20), 0);
    ASSERT_EQ(MP4_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nFileSize, 512u << 20);
    EXPECT_EQ(clip.nBitrate, 0u) << "size x 8 is 2^32, which wraps to 0";
    ASSERT_EQ(::truncate(path.c_str(), 2048ll << 20), 0);
    EXPECT_EQ(MP4_GetClipInfo(path.c_str(), &clip), MM_E_FAIL);
}

TEST_F(Mp4, HostileSizesNeverReachPastTheFile) {
    // Children that claim nearly the whole file, inside a small file: each
    // reader reads what the file holds and no more.
    const uint32_t big = 0x7FFFFFF0;
    const ByteVec files[] = {
        Join({Ftyp(), Bytes().be32(200).str("moov").be32(180).str("mvhd").zeros(20).data(), ByteVec(300, 0)}),
        Movie(Bytes().be32(60).str("trak").be32(52).str("mdia").be32(44).str("mdhd").u8(1).zeros(20), ByteVec(200, 0)),
        Bytes().be32(big).str("ftyp").zeros(16).data(),
        Movie(Join({Mvhd(0, 1000, 1000), Trak("soun", 1000, 1000, Bytes().be32(100).str("stsz").zeros(12).be32(big))}),
              ByteVec(100, 0)),
        Movie(Join({Mvhd(0, 1000, 1000), Trak("vide", 1000, 1000, Stsd({Bytes().be32(big).str("avc1").zeros(90)}))}),
              ByteVec(100, 0)),
    };
    for (const ByteVec& file : files) {
        std::string path = dir.Write("hostile.mp4", file);
        _MM_CODECTYPE codec;
        int bits = 0;
        MP4_GetClipInfo(path.c_str(), &clip);
        MP4_GetCodecType(path.c_str(), &codec);
        MP4_GetTrackType(path.c_str(), &bits);
        MP4_GetMetaInfo(path.c_str(), &meta, 1);
        MM_MediaExtractor_FreeMetaInfo(&meta);
        FreeMaker();
        MP4_GetMakerInfo(path.c_str(), &maker);
        EXPECT_EQ(maker.nValid, 0u) << &file - files;
    }
}

TEST(Mp4Boxes, HeaderLengthsAndFileTypeBrandsAreBoundedByTheBox) {
    _MP4BOX box;
    ByteVec uuid = Box("uuid", ByteVec(20, 0x11));
    EXPECT_EQ(AnaBox(uuid.data(), uuid.size(), &box), 12) << "the 16-byte user type counts as 4";
    ByteVec empty = Bytes().be32(0).str("free").data();
    EXPECT_EQ(AnaBox(empty.data(), empty.size(), &box), 1) << "nothing read after a size of 0";
    EXPECT_EQ(AnaBox(uuid.data(), 7, &box), 0) << "too short to hold a header";
    s_mp4FileSize = 1000;
    const struct {
        ByteVec box;
        int32_t result;
        uint32_t brands;
    } cases[] = {
        {Box("ftyp", Bytes().str("M4A ").be32(0).str("M4A ").str("mp42").str("is")), MM_OK,
         2},  // a partial brand is not read
        {Box("ftyp", Bytes().str("isom").be32(0)), MM_E_FAIL, 0},  // no room for brands
        {Bytes().be32(900).str("ftyp").str("isom").be32(0).str("mp41").data(), MM_OK, 1},  // a size beyond the bytes
    };
    for (const auto& c : cases) {
        _FILETYPEBOX ftyp{};
        EXPECT_EQ(AnaFileType(c.box.data(), c.box.size(), &ftyp), c.result);
        EXPECT_EQ(ftyp.brandCount, c.brands);
        delete[] ftyp.compatibleBrands;
    }
}

// User data: 3GPP text boxes, iTunes items and the order in which they overwrite each other.
TEST_F(Mp4, UserDataMetadata) {
    const ByteVec ilst = MetaBox(Ilst(Item("nam", "From ilst")));
    const ByteVec titl = Udta(TextBox("titl", "From titl"));
    const ByteVec tag =
        Id3Tag(4, {Id3Frame(4, "TIT2", TextBody(3, "Embedded")), Id3Frame(4, "TPE1", TextBody(0, "Band"))});
    const struct {
        const char* name;
        ByteVec moov, topLevel;
    } cases[] = {
        // The performer beats the author unless empty.
        {"perf", Udta(Join({TextBox("auth", "Writer"), TextBox("perf", "Singer")})), {}},
        {"empty perf", Udta(Join({TextBox("perf", ""), TextBox("auth", "Writer")})), {}},
        // albm's last byte is its track number; yrrc is a 16-bit year read little-endian; dscp is dropped.
        {"text boxes",
         Udta(Join({TextBox("titl", "Name"), FullBox("albm", 0, 0, Bytes().be16(0x15C7).str("Record").u8(0).u8(4)),
                    TextBox("gnre", "Jazz"), FullBox("yrrc", 0, 0, Bytes().be16(2009)), TextBox("dscp", "dropped"),
                    FullBox("loci", 0, 0, ByteVec(20, 0))})),
         {}},
        // Byte order marks choose the encoding and stay.
        {"marks",
         Udta(Join({FullBox("titl", 0, 0, Bytes().be16(0).u8(0xFE).u8(0xFF).be16('A')),
                    FullBox("cprt", 0, 0, Bytes().be16(0).u8(0xFF).u8(0xFE).le16('B'))})),
         {}},
        // Long texts are cut to 128 bytes.
        {"long titl", Udta(TextBox("titl", std::string(200, 'x'))), {}},
        {"long nam", MetaBox(Ilst(Item("nam", std::string(300, 'y')))), {}},
        // Artist, year, genre and a 4-byte binary track; cmt and covr are not read; a later
        // item replaces an earlier one whole.
        {"itunes",
         Udta(MetaBox(Ilst(
             Join({Item("ART", "Band"), Item("day", "2001-02-03"), IlstItem("gnre", 0, {0, 1}),
                   IlstItem("trkn", 0, {0, 0, 0, 7, 0, 12, 0, 0}), Item("cmt", "skipped"),
                   IlstItem("covr", 13, ByteVec(50, 0xFF)), Item("nam", "First longer"), Item("nam", "Second")})))),
         {}},
        // Genre numbers count from 1: 0 and 148 stay raw, the last name is out of reach.
        {"gnre 0", MetaBox(Ilst(IlstItem("gnre", 0, {0, 0}))), {}},
        {"gnre 148", MetaBox(Ilst(IlstItem("gnre", 0, {0, 148}))), {}},
        {"gnre 147", MetaBox(Ilst(IlstItem("gnre", 0, {0, 147}))), {}},
        // User data overwrites items read before it, a top-level udta too.
        {"ilst then udta", Join({ilst, titl}), {}},
        {"udta then ilst", Join({titl, ilst}), {}},
        {"top-level udta", ilst, titl},
        // An embedded ID3 tag fills the items; an empty tag or box fails alone.
        {"ID32", MetaBox(FullBox("ID32", 0, 0, Join({Bytes().be16(0x15C7).data(), tag}))), {}},
        {"empty ID32 tag",
         MetaBox(Join({FullBox("ID32", 0, 0, Bytes().be16(0x15C7).str("ID3").u8(4).u8(0).u8(0).syncsafe32(0)),
                       Ilst(Item("ART", "Kept"))})),
         {}},
        {"empty ID32 box", MetaBox(Join({FullBox("ID32", 0, 0, {}), Ilst(Item("ART", "Kept"))})), {}},
        // A child of size 0 ends the udta walk with a failure: nothing is copied.
        {"udta child of size 0", Udta(Join({TextBox("titl", "Lost"), Bytes().be32(0).str("junk").data()})), {}},
        // Boxes too short for their language field are skipped.
        {"short text boxes",
         Udta(Join({FullBox("titl", 0, 0, {}), FullBox("albm", 0, 0, {1}), TextBox("perf", "P")})),
         {}},
        // data shorter than its header, trkn without its bytes, data claiming more than the
        // file, an item of size 0.
        {"hostile items",
         MetaBox(Ilst(Join({Box(kC + "nam", Box("data", {1, 2})), IlstItem("trkn", 0, {0, 0}),
                            Box(kC + "alb", Bytes().be32(0x7FFFFF00).str("data").zeros(8)),
                            Bytes().be32(0).str(kC + "ART").data()}))),
         {}},
        // A meta without its version word (QuickTime style) is misread, harmlessly.
        {"quicktime meta", Udta(Box("meta", Join({Hdlr("mdir"), Ilst(Item("nam", "x"))}))), {}},
    };
    Golden golden("mp4", "user data");
    for (const auto& c : cases) {
        golden.Check(c.name, Meta(c.moov, c.topLevel));
        if (&c == cases + 6) {
            EXPECT_EQ(meta.aItems[META_TITLE].szData[6], 0) << "nothing of the earlier title is left";
        }
    }
}

// The maker box "@mkr": phone model, thumbnail and smart album.
TEST_F(Mp4, MakerBox) {
    std::vector<ByteVec> children = {Modl("PX-100"), Thub(kImage), Salb("Holiday")};
    std::vector<size_t> order = {0, 1, 2};
    do {  // children in any order
        ASSERT_EQ(Maker(Mkr(Join({children[order[0]], children[order[1]], children[order[2]]}))), MM_OK);
        EXPECT_EQ(MakerText(), "valid=1 model=PX-100 thumb=11 album=Holiday");
        EXPECT_EQ(ByteVec(maker.pThumbnail, maker.pThumbnail + maker.nThumbnailSize), kImage);
    } while (std::next_permutation(order.begin(), order.end()));
    const struct {
        const char* name;
        ByteVec mkr;
        bool topLevel;
    } cases[] = {
        {"top-level user data", Mkr(Modl("M")), true},
        {"no maker box", {}, false},
        {"thumbnail larger than its box",
         Join({Mkr(Join({Thub(kImage, 200), Modl("PX")})), Box("free", ByteVec(400, 0))}), false},
        {"short children",
         Mkr(Join({FullBox("salb", 0, 0, {0}), FullBox("thub", 0, 0, {1, 2}), FullBox("modl", 0, 0, {}), Salb("ok")})),
         false},
        // A child of size 0 ends the box with a failure: the record stays as it was.
        {"child of size 0", Mkr(Join({Modl("PX"), Bytes().be32(0).str("salb").data()})), false},
    };
    Golden golden("mp4", "maker");
    for (const auto& c : cases) {
        const int32_t result = Maker(c.mkr, c.topLevel);
        golden.Check(c.name, std::to_string(result) + " " + MakerText());
    }
    // Two maker boxes: the later one replaces the earlier, nothing leaks.
    FreeMaker();
    std::string two = dir.Write("two.mp4", Movie(Join({Mvhd(0, 1000, 1000), Udta(Mkr(Modl("first")))}),
                                                 Join({Udta(Mkr(Thub(kImage))), Box("mdat", {})})));
    ASSERT_EQ(MM_MediaExtractor_GetMakerInfo(two.c_str(), &maker), MM_OK);
    EXPECT_EQ(MakerText(), "valid=1 model= thumb=11 album=");
    // An unknown child spoils the whole box: the record is untouched; the box reader reports -9.
    _MAKERINFO marked;
    std::memset(&marked, 0x5A, sizeof marked);
    const _MAKERINFO before = marked;
    ByteVec mkr = Mkr(Join({Box("zzzz", ByteVec(4, 0)), Modl("PX"), Thub(kImage)}));
    EXPECT_EQ(MP4_GetMakerInfo(dir.Write("zzzz.3gp", Movie(Join({Mvhd(0, 1000, 1000), Udta(mkr)}))).c_str(), &marked),
              MM_OK);
    EXPECT_EQ(std::memcmp(&marked, &before, sizeof marked), 0);
    ByteVec raw = Join({Mkr(Join({Modl("PX"), Box("zzzz", ByteVec(4, 0))})), ByteVec(64, 0)});
    const int h = MEx_fopen(dir.Write("raw.bin", raw).c_str(), "rb");
    s_mp4FileSize = static_cast<uint32_t>(raw.size());
    EXPECT_EQ(AnaMaker(h, &maker), -9);
    MEx_fclose(h);
}
