// The box walk: header and size rules, movie/media/track headers, the track
// list and the public entry points of MP4 files.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <cstring>

#include "metainfo/metainfo.h"
#include "metainfo/mp4.h"
#include "mp4/mp4_file.h"
#include "core/thread_state.h"
#include "mp4/mp4_internal.h"
#include "support/mp4_builder.h"

using namespace testing_support;
using namespace metainfo;

namespace {

ByteVec AacEntry() { return AudioEntry("mp4a", 2, 16, 44100, Esds(0x40, 128000, {0x12, 0x10})); }

ByteVec AudioTrak(uint32_t timescale = 1000, uint32_t duration = 10000) {
    return Trak("soun", timescale, duration, Join({Stsd({AacEntry()}), Stsz(100, 10)}));
}

ByteVec VideoTrak(uint32_t timescale = 1000, uint32_t duration = 10000) {
    return Trak("vide", timescale, duration, Join({Stsd({VisualEntry("mp4v", 320, 240, Esds(0x20, 500000))}),
                                                   Stsz(1000, 300)}),
                320, 240);
}

// ftyp, moov(mvhd, traks...), then an mdat that gives the file some body.
ByteVec Movie(const ByteVec& mvhd, const ByteVec& traks, const ByteVec& tail = Box("mdat", ByteVec(64, 0))) {
    return Join({Ftyp(), Box("moov", Join({mvhd, traks})), tail});
}

class Mp4Walk : public ::testing::Test {
protected:
    TempDir dir;

    int32_t Clip(const ByteVec& file, _MMClipInfo* clip, const std::string& name = "clip.mp4") {
        std::memset(clip, 0, sizeof *clip);
        return MP4_GetClipInfo(dir.Write(name, file).c_str(), clip);
    }
    // Runs a clip walk and hands the track list to check before it is freed.
    template <typename Check>
    int32_t Tracks(const ByteVec& file, Check check) {
        _ME_ClipInfoEx info;
        std::memset(&info, 0, sizeof info);
        int32_t result = MP4_GetMediaInfo(dir.Write("tracks.mp4", file).c_str(), kModeClip, &info);
        RefineClipInfo(&info);
        check(info);
        FreeTrackList(&info);
        return result;
    }
};

std::vector<MP4TrackNode*> Nodes(const _ME_ClipInfoEx& info) {
    std::vector<MP4TrackNode*> out;
    if (info.tracks == nullptr) return out;
    ListNode* n = &info.tracks->link;
    do {
        out.push_back(reinterpret_cast<MP4TrackNode*>(n));
        n = n->next;
    } while (n != &info.tracks->link);
    return out;
}

}  // namespace

TEST_F(Mp4Walk, FirstBoxMustBeFtypOrMdat) {
    _MMClipInfo clip;
    EXPECT_EQ(Clip(Join({Box("free", ByteVec(8, 0)), Box("moov", Mvhd(0, 1000, 5000))}), &clip), -2);
    EXPECT_EQ(Clip(Join({Box("mdat", ByteVec(8, 0)), Box("moov", Mvhd(0, 1000, 5000)), Box("free")}), &clip),
              MM_OK);
    EXPECT_EQ(clip.nDuration, 5u) << "a file starting with mdat is walked from offset 0";
}

TEST_F(Mp4Walk, BoxSizesMustStayBelowTheFileSize) {
    _MMClipInfo clip;
    ByteVec whole = Box("ftyp", ByteVec(24, 0));
    EXPECT_EQ(Clip(whole, &clip), MM_E_FAIL) << "a box as long as the file is refused";
    EXPECT_EQ(Clip(Bytes().be32(0).str("ftyp").zeros(24), &clip), MM_E_FAIL) << "size 0";
    // A top-level box claiming more than the file ends the walk quietly.
    ByteVec file = Movie(Mvhd(0, 1000, 7000), {}, Bytes().be32(0x7FFFFFF0).str("mdat").zeros(8));
    EXPECT_EQ(Clip(file, &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 7u);
}

TEST_F(Mp4Walk, SixtyFourBitSizesUseTheirLowerWord) {
    _MMClipInfo clip;
    ByteVec file = Join({Ftyp(), Box64("mdat", ByteVec(40, 0)), Box("moov", Join({Mvhd(0, 1000, 9000), AudioTrak()}))});
    ASSERT_EQ(Clip(file, &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 10u);
    EXPECT_EQ(clip.bHasAudio, 1u);
    // An upper word of 1 is ignored: the box still ends after its lower word.
    ByteVec high = Join({Ftyp(), Bytes().be32(1).str("mdat").be32(1).be32(24).zeros(8).data(),
                         Box("moov", Mvhd(0, 1000, 6000)), Box("free", ByteVec(8, 0))});
    ASSERT_EQ(Clip(high, &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 6u);
}

TEST_F(Mp4Walk, VersionOneHeadersTakeTheUpperWords) {
    _MMClipInfo clip;
    ASSERT_EQ(Clip(Movie(Mvhd(1, 1, 0xFFFFFFFFull, 0x1234567800000000ull), {}), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 0u) << "a duration below 2^32 units has an upper word of 0";
    EXPECT_EQ(clip.nReserved1, 0x12345678u);
    ASSERT_EQ(Clip(Movie(Mvhd(1, 1, 5ull << 32), {}), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 5u);
}

TEST_F(Mp4Walk, DurationIsTheLargestOfMovieAndMediaHeaders) {
    _MMClipInfo clip;
    ASSERT_EQ(Clip(Movie(Mvhd(0, 1000, 4000, 11), AudioTrak(1000, 12500)), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 12u);
    EXPECT_EQ(clip.nReserved1, 0u) << "the creation time of the last header read (the mdhd's)";
    ASSERT_EQ(Clip(Movie(Mvhd(0, 1000, 40000), AudioTrak(1000, 12500)), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 40u);
    ASSERT_EQ(Clip(Movie(Mvhd(0, 0, 17), {}), &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 17u) << "a timescale of 0 leaves the raw duration";
}

TEST_F(Mp4Walk, ClipInfoTakesFileSizeBitrateAndFormatName) {
    _MMClipInfo clip;
    ByteVec file = Movie(Mvhd(0, 1000, 2000), AudioTrak(1000, 2000));
    ASSERT_EQ(Clip(file, &clip, "Song.M4A"), MM_OK);
    EXPECT_EQ(clip.nFileSize, file.size());
    EXPECT_EQ(clip.nBitrate, file.size() * 8 / 2);
    EXPECT_STREQ(clip.szFormat, "M4A");
    EXPECT_EQ(clip.nSampleRate, 44100u);
    EXPECT_EQ(clip.nChannels, 2u);
    EXPECT_EQ(clip.nAudioBitrate, 128000u) << "the esds value comes first and is kept";
    EXPECT_EQ(Clip(file, &clip, "noextension"), MM_E_FAIL);
    EXPECT_EQ(clip.nSampleRate, 44100u) << "the copied fields stay";
}

TEST_F(Mp4Walk, TrackTypeBitsAndCodecOfFirstTracks) {
    ByteVec file = Movie(Mvhd(0, 1000, 10000), Join({VideoTrak(), AudioTrak()}));
    std::string path = dir.Write("av.mp4", file);
    int bits = 0;
    EXPECT_EQ(MP4_GetTrackType(path.c_str(), &bits), MM_OK);
    EXPECT_EQ(bits, 17);
    _MM_CODECTYPE codec;
    std::memset(&codec, 0xFF, sizeof codec);
    ASSERT_EQ(MP4_GetCodecType(path.c_str(), &codec), MM_OK);
    EXPECT_EQ(codec.nAudioCodec, 0x4008u);
    EXPECT_EQ(codec.nAudioSubType, 0x2102u);
    EXPECT_EQ(codec.nVideoCodec, 0x4001u);
    EXPECT_EQ(codec.nAudioProfile, 0u);
    EXPECT_EQ(codec.nVideoLevel, 0u);

    std::string bare = dir.Write("bare.mp4", Movie(Mvhd(0, 1000, 1000), {}));
    EXPECT_EQ(MP4_GetCodecType(bare.c_str(), &codec), MM_E_FAIL) << "no track";
    std::string free = dir.Write("free.mp4", Join({Box("free", ByteVec(8, 0)), Box("free", ByteVec(8, 0))}));
    EXPECT_EQ(MP4_GetCodecType(free.c_str(), &codec), MM_E_FAIL) << "a failed walk";
}

TEST_F(Mp4Walk, HandlerAfterStblStillDecidesTheTrackKind) {
    // stbl comes before hdlr: the minf walk waits for the handler type.
    ByteVec stbl = Box("stbl", Stsd({AacEntry()}));
    ByteVec mdia = Box("mdia", Join({Box("minf", stbl), Mdhd(0, 1000, 3000), Hdlr("soun")}));
    ByteVec file = Movie(Mvhd(0, 1000, 3000), Box("trak", mdia));
    Tracks(file, [](const _ME_ClipInfoEx& info) {
        auto nodes = Nodes(info);
        ASSERT_EQ(nodes.size(), 1u);
        EXPECT_EQ(nodes[0]->kind, 1u);
        EXPECT_EQ(nodes[0]->codec, 0x4008u);
    });
    // Without a handler the sample table is not read.
    ByteVec noHandler = Movie(Mvhd(0, 1000, 3000),
                              Box("trak", Box("mdia", Join({Mdhd(0, 1000, 3000), Box("minf", stbl)}))));
    Tracks(noHandler, [](const _ME_ClipInfoEx& info) {
        EXPECT_EQ(info.clip.bHasAudio, 0u);
        EXPECT_EQ(Nodes(info).at(0)->codec, 0u);
    });
}

TEST_F(Mp4Walk, RefineNumbersTracksOnlyWithASecondEntryOfAKind) {
    Tracks(Movie(Mvhd(0, 1000, 10000), Join({VideoTrak(), AudioTrak()})), [](const _ME_ClipInfoEx& info) {
        for (MP4TrackNode* n : Nodes(info)) EXPECT_EQ(n->ordinal, 0u);
    });
    Tracks(Movie(Mvhd(0, 1000, 10000), Join({AudioTrak(), VideoTrak(), AudioTrak()})), [](const _ME_ClipInfoEx& info) {
        auto nodes = Nodes(info);
        ASSERT_EQ(nodes.size(), 3u);
        for (uint32_t i = 0; i < 3; ++i) EXPECT_EQ(nodes[i]->ordinal, i);
        EXPECT_EQ(nodes[0]->kind, 1u);
        EXPECT_EQ(nodes[1]->kind, 16u);
        EXPECT_EQ(info.clip.bHasAudio, 2u);
    });
}

TEST_F(Mp4Walk, FirstTrackDeclaringASizeSetsIt) {
    _MMClipInfo clip;
    ByteVec a = Trak("soun", 1000, 1000, {}, 0, 0);
    ByteVec b = Trak("hint", 1000, 1000, {}, 176, 144);
    ByteVec c = Trak("hint", 1000, 1000, {}, 640, 480);
    ASSERT_EQ(Clip(Movie(Mvhd(0, 1000, 1000), Join({a, b, c})), &clip), MM_OK);
    EXPECT_EQ(clip.nWidth, 176u);
    EXPECT_EQ(clip.nHeight, 144u);
}

TEST_F(Mp4Walk, DescriptorFormWalksAndLeavesTheDescriptorOpen) {
    std::string path = dir.Write("fd.mp4", Movie(Mvhd(0, 1000, 10000), AudioTrak()));
    int fd = ::open(path.c_str(), O_RDONLY);
    ASSERT_GT(fd, 0);
    _MM_CODECTYPE codec;
    std::memset(&codec, 0, sizeof codec);
    EXPECT_EQ(MP4_GetCodecTypeEx(fd, &codec), MM_OK);
    EXPECT_EQ(codec.nAudioCodec, 0x4008u);
    EXPECT_EQ(::lseek(fd, 0, SEEK_SET), 0) << "the caller's descriptor is still open";
    EXPECT_EQ(MP4_GetCodecTypeEx(fd, &codec), MM_OK);
    ::close(fd);
    EXPECT_EQ(MP4_GetMediaInfoFd(0, kModeClip, nullptr), -1) << "0 is no descriptor";
    EXPECT_EQ(MP4_GetCodecTypeEx(0, &codec), MM_E_FAIL) << "a failed walk";
    EXPECT_NE(MP4_GetCodecTypeEx(-5, &codec), MM_OK);
}

TEST_F(Mp4Walk, OverallBitrateProductWrapsIn32Bits) {
    // A sparse file of exactly 512 MiB: size x 8 is 2^32, which wraps to 0.
    std::string path = dir.Write("big.mp4", Movie(Mvhd(0, 1, 100), {}));
    ASSERT_EQ(::truncate(path.c_str(), 512ll << 20), 0);
    _MMClipInfo clip;
    std::memset(&clip, 0, sizeof clip);
    ASSERT_EQ(MP4_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nFileSize, 512u << 20);
    EXPECT_EQ(clip.nBitrate, 0u);
}

TEST_F(Mp4Walk, FilesOfTwoGibibytesAreRefused) {
    std::string path = dir.Write("huge.mp4", Movie(Mvhd(0, 1, 100), {}));
    ASSERT_EQ(::truncate(path.c_str(), 2048ll << 20), 0);
    _MMClipInfo clip;
    std::memset(&clip, 0, sizeof clip);
    EXPECT_EQ(MP4_GetClipInfo(path.c_str(), &clip), MM_E_FAIL);
    int fd = ::open(path.c_str(), O_RDONLY);
    ASSERT_GT(fd, 0);
    _MM_CODECTYPE codec;
    EXPECT_EQ(MP4_GetCodecTypeEx(fd, &codec), MM_E_FAIL);
    ::close(fd);
}

TEST_F(Mp4Walk, HostileSizesNeverReachPastTheFile) {
    // Children that claim nearly the whole file, inside a small file: each
    // reader reads what the file holds and no more.
    const uint32_t big = 0x7FFFFFF0;
    std::vector<ByteVec> files = {
        Join({Ftyp(), Bytes().be32(200).str("moov").be32(180).str("mvhd").zeros(20).data(), ByteVec(300, 0)}),
        Join({Ftyp(), Box("moov", Bytes().be32(60).str("trak").be32(52).str("mdia").be32(44).str("mdhd").u8(1).zeros(20)),
              ByteVec(200, 0)}),
        Join({Bytes().be32(big).str("ftyp").zeros(16).data()}),
        Join({Ftyp(), Box("moov", Join({Mvhd(0, 1000, 1000),
                                          Trak("soun", 1000, 1000, Bytes().be32(100).str("stsz").zeros(12).be32(big).data())})),
              ByteVec(100, 0)}),
        Join({Ftyp(), Box("moov", Join({Mvhd(0, 1000, 1000),
                                          Trak("vide", 1000, 1000, Stsd({Bytes().be32(big).str("avc1").zeros(90).data()}))})),
              ByteVec(100, 0)}),
    };
    for (size_t i = 0; i < files.size(); ++i) {
        std::string path = dir.Write("hostile" + std::to_string(i) + ".mp4", files[i]);
        _MMClipInfo clip;
        _MM_CODECTYPE codec;
        _MMMetaInfo meta;
        _MAKERINFO maker;
        int bits = 0;
        std::memset(&meta, 0, sizeof meta);
        std::memset(&maker, 0, sizeof maker);
        MP4_GetClipInfo(path.c_str(), &clip);
        MP4_GetCodecType(path.c_str(), &codec);
        MP4_GetTrackType(path.c_str(), &bits);
        MP4_GetMetaInfo(path.c_str(), &meta, 1);
        MP4_GetMakerInfo(path.c_str(), &maker);
        EXPECT_EQ(maker.nValid, 0u) << i;
        MM_MediaExtractor_FreeMetaInfo(&meta);
    }
}

TEST_F(Mp4Walk, PublicInterfaceAnswersForMp4) {
    std::string path = dir.Write("pub.mp4", Movie(Mvhd(0, 1000, 4500), AudioTrak(1000, 4500)));
    int type = 0;
    ASSERT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK);
    ASSERT_EQ(type, MEDIA_TYPE_MP4);
    _MMClipInfo clip;
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), type, &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 4000u);
    _MM_CODECTYPE codec;
    ASSERT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), type, &codec), MM_OK);
    EXPECT_EQ(codec.nAudioCodec, 0x4008u);
    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(path.c_str(), type, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO);
    _MAKERINFO maker;
    std::memset(&maker, 0, sizeof maker);
    EXPECT_EQ(MM_MediaExtractor_GetMakerInfo(path.c_str(), &maker), MM_OK);
    EXPECT_EQ(maker.nValid, 0u);
    EXPECT_EQ(maker.pThumbnail, nullptr);
}

TEST(Mp4BoxHeader, HeaderLengthsFollowSizeAndType) {
    _MP4BOX box;
    ByteVec plain = Box("moov", ByteVec(4, 0));
    EXPECT_EQ(AnaBox(plain.data(), plain.size(), &box), 8);
    EXPECT_EQ(box.size, 12u);
    ByteVec large = Box64("mdat", ByteVec(4, 0));
    EXPECT_EQ(AnaBox(large.data(), large.size(), &box), 16);
    EXPECT_EQ(box.size, 20u) << "the lower word of the 64-bit size";
    ByteVec uuid = Box("uuid", ByteVec(20, 0x11));
    EXPECT_EQ(AnaBox(uuid.data(), uuid.size(), &box), 12) << "the 16-byte user type counts as 4";
    EXPECT_EQ(box.userType[15], 0x11);
    ByteVec empty = Bytes().be32(0).str("free").data();
    EXPECT_EQ(AnaBox(empty.data(), empty.size(), &box), 1);
    EXPECT_EQ(box.type, 0u) << "nothing read after a size of 0";
    EXPECT_EQ(AnaBox(plain.data(), 7, &box), 0) << "too short to hold a header";
    _MP4FULLBOX full;
    ByteVec fb = FullBox("mvhd", 1, 0x000203, ByteVec(4, 0));
    EXPECT_EQ(AnaFullBox(fb.data(), fb.size(), &full), 12);
    EXPECT_EQ(full.version, 1u);
    EXPECT_EQ(full.flags, 0x203u);
}

TEST(Mp4BoxHeader, FileTypeBrandsAreBoundedByTheBox) {
    s_mp4FileSize = 1000;
    _FILETYPEBOX ftyp;
    std::memset(&ftyp, 0, sizeof ftyp);
    ByteVec box = Box("ftyp", Bytes().str("M4A ").be32(0).str("M4A ").str("mp42").str("is"));
    EXPECT_EQ(AnaFileType(box.data(), box.size(), &ftyp), MM_OK);
    EXPECT_EQ(ftyp.majorBrand, FourCC("M4A "));
    EXPECT_EQ(ftyp.brandCount, 2u) << "a partial brand is not read";
    ByteVec bare = Box("ftyp", Bytes().str("isom").be32(0));
    EXPECT_EQ(AnaFileType(bare.data(), bare.size(), &ftyp), MM_E_FAIL) << "no room for brands";
    // A size far beyond the bytes given.
    ByteVec lying = Bytes().be32(900).str("ftyp").str("isom").be32(0).str("mp41").data();
    EXPECT_EQ(AnaFileType(lying.data(), lying.size(), &ftyp), MM_OK);
    EXPECT_EQ(ftyp.brandCount, 1u);
    delete[] ftyp.compatibleBrands;
}
