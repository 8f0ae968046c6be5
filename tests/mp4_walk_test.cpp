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

ByteVec AudioTrak(uint32_t duration = 10000) {
    return Trak("soun", 1000, duration, Join({Stsd({AacEntry()}), Stsz(100, 10)}));
}

ByteVec VideoTrak() {
    return Trak("vide", 1000, 10000, Join({Stsd({VisualEntry("mp4v", 320, 240, Esds(0x20, 500000))}), Stsz(1000, 300)}),
                320, 240);
}

class Mp4Walk : public ::testing::Test {
protected:
    TempDir dir;
    _MMClipInfo clip{};

    int32_t Clip(const ByteVec& file, const std::string& name = "clip.mp4") {
        std::memset(&clip, 0, sizeof clip);
        return MP4_GetClipInfo(dir.Write(name, file).c_str(), &clip);
    }
    Mp4ClipWalk Refined(const ByteVec& file) { return WalkClip(dir.Write("tracks.mp4", file), true); }
};

}  // namespace

TEST_F(Mp4Walk, FirstBoxMustBeFtypOrMdat) {
    EXPECT_EQ(Clip(Join({Box("free", ByteVec(8, 0)), Box("moov", Mvhd(0, 1000, 5000))})), -2);
    EXPECT_EQ(Clip(Join({Box("mdat", ByteVec(8, 0)), Box("moov", Mvhd(0, 1000, 5000)), Box("free")})), MM_OK);
    EXPECT_EQ(clip.nDuration, 5u) << "a file starting with mdat is walked from offset 0";
}

TEST_F(Mp4Walk, BoxSizesMustStayBelowTheFileSize) {
    EXPECT_EQ(Clip(Box("ftyp", ByteVec(24, 0))), MM_E_FAIL) << "a box as long as the file is refused";
    EXPECT_EQ(Clip(Bytes().be32(0).str("ftyp").zeros(24)), MM_E_FAIL) << "size 0";
    // A top-level box claiming more than the file ends the walk quietly.
    EXPECT_EQ(Clip(Movie(Mvhd(0, 1000, 7000), Bytes().be32(0x7FFFFFF0).str("mdat").zeros(8))), MM_OK);
    EXPECT_EQ(clip.nDuration, 7u);
}

TEST_F(Mp4Walk, SixtyFourBitSizesUseTheirLowerWord) {
    // An upper word of 1 is ignored: the box still ends after its lower word.
    ByteVec high = Join({Ftyp(), Bytes().be32(1).str("mdat").be32(1).be32(24).zeros(8).data(),
                         Box("moov", Join({Mvhd(0, 1000, 6000), AudioTrak(6000)})), Box("free", ByteVec(8, 0))});
    ASSERT_EQ(Clip(high), MM_OK);
    EXPECT_EQ(clip.nDuration, 6u);
    EXPECT_EQ(clip.bHasAudio, 1u);
}

TEST_F(Mp4Walk, VersionOneHeadersTakeTheUpperWords) {
    ASSERT_EQ(Clip(Movie(Mvhd(1, 1, 0xFFFFFFFFull, 0x1234567800000000ull))), MM_OK);
    EXPECT_EQ(clip.nDuration, 0u) << "a duration below 2^32 units has an upper word of 0";
    EXPECT_EQ(clip.nReserved1, 0x12345678u);
}

TEST_F(Mp4Walk, DurationIsTheLargestOfMovieAndMediaHeaders) {
    ASSERT_EQ(Clip(Movie(Join({Mvhd(0, 1000, 4000, 11), AudioTrak(12500)}))), MM_OK);
    EXPECT_EQ(clip.nDuration, 12u);
    EXPECT_EQ(clip.nReserved1, 0u) << "the creation time of the last header read (the mdhd's)";
    ASSERT_EQ(Clip(Movie(Mvhd(0, 0, 17))), MM_OK);
    EXPECT_EQ(clip.nDuration, 17u) << "a timescale of 0 leaves the raw duration";
}

TEST_F(Mp4Walk, ClipInfoTakesFileSizeBitrateAndFormatName) {
    ByteVec file = Movie(Join({Mvhd(0, 1000, 2000), AudioTrak(2000)}));
    ASSERT_EQ(Clip(file, "Song.M4A"), MM_OK);
    EXPECT_EQ(clip.nBitrate, file.size() * 8 / 2);
    EXPECT_STREQ(clip.szFormat, "M4A");
    EXPECT_EQ(clip.nAudioBitrate, 128000u) << "the esds value comes first and is kept";
    EXPECT_EQ(Clip(file, "noextension"), MM_E_FAIL);
    EXPECT_EQ(clip.nSampleRate, 44100u) << "the copied fields stay";
}

TEST_F(Mp4Walk, TrackTypeBitsAndCodecOfFirstTracks) {
    std::string path = dir.Write("av.mp4", Movie(Join({Mvhd(0, 1000, 10000), VideoTrak(), AudioTrak()})));
    int bits = 0;
    EXPECT_EQ(MP4_GetTrackType(path.c_str(), &bits), MM_OK);
    EXPECT_EQ(bits, 17);
    _MM_CODECTYPE codec;
    std::memset(&codec, 0xFF, sizeof codec);
    ASSERT_EQ(MP4_GetCodecType(path.c_str(), &codec), MM_OK);
    EXPECT_EQ(codec.nAudioSubType, 0x2102u);
    EXPECT_EQ(codec.nVideoCodec, 0x4001u);
    EXPECT_EQ(codec.nAudioProfile, 0u) << "cleared";
    std::string bare = dir.Write("bare.mp4", Movie(Mvhd(0, 1000, 1000)));
    EXPECT_EQ(MP4_GetCodecType(bare.c_str(), &codec), MM_E_FAIL) << "no track";
}

TEST_F(Mp4Walk, HandlerAfterStblStillDecidesTheTrackKind) {
    ByteVec stbl = Box("stbl", Stsd({AacEntry()}));
    ByteVec late = Box("mdia", Join({Box("minf", stbl), Mdhd(0, 1000, 3000), Hdlr("soun")}));
    Mp4ClipWalk walk = Refined(Movie(Join({Mvhd(0, 1000, 3000), Box("trak", late)})));
    EXPECT_EQ(walk.nodes.at(0).codec, 0x4008u);
    // Without a handler the sample table is not read.
    ByteVec none = Box("mdia", Join({Mdhd(0, 1000, 3000), Box("minf", stbl)}));
    walk = Refined(Movie(Join({Mvhd(0, 1000, 3000), Box("trak", none)})));
    EXPECT_EQ(walk.clip.bHasAudio, 0u);
    EXPECT_EQ(walk.nodes.at(0).codec, 0u);
}

TEST_F(Mp4Walk, RefineNumbersTracksOnlyWithASecondEntryOfAKind) {
    for (const auto& n : Refined(Movie(Join({Mvhd(0, 1000, 10000), VideoTrak(), AudioTrak()}))).nodes) {
        EXPECT_EQ(n.ordinal, 0u);
    }
    Mp4ClipWalk three = Refined(Movie(Join({Mvhd(0, 1000, 10000), AudioTrak(), VideoTrak(), AudioTrak()})));
    ASSERT_EQ(three.nodes.size(), 3u);
    for (uint32_t i = 0; i < 3; ++i) EXPECT_EQ(three.nodes[i].ordinal, i);
    EXPECT_EQ(three.nodes[1].kind, 16u);
    EXPECT_EQ(three.clip.bHasAudio, 2u);
}

TEST_F(Mp4Walk, FirstTrackDeclaringASizeSetsIt) {
    ByteVec traks = Join({Trak("soun", 1000, 1000, {}), Trak("hint", 1000, 1000, {}, 176, 144),
                          Trak("hint", 1000, 1000, {}, 640, 480)});
    ASSERT_EQ(Clip(Movie(Join({Mvhd(0, 1000, 1000), traks}))), MM_OK);
    EXPECT_EQ(clip.nWidth, 176u);
    EXPECT_EQ(clip.nHeight, 144u);
}

TEST_F(Mp4Walk, DescriptorFormWalksAndLeavesTheDescriptorOpen) {
    std::string path = dir.Write("fd.mp4", Movie(Join({Mvhd(0, 1000, 10000), AudioTrak()})));
    int fd = ::open(path.c_str(), O_RDONLY);
    ASSERT_GT(fd, 0);
    _MM_CODECTYPE codec{};
    EXPECT_EQ(MP4_GetCodecTypeEx(fd, &codec), MM_OK);
    EXPECT_EQ(codec.nAudioCodec, 0x4008u);
    EXPECT_EQ(::lseek(fd, 0, SEEK_SET), 0) << "the caller's descriptor is still open";
    ::close(fd);
    EXPECT_EQ(MP4_GetMediaInfoFd(0, kModeClip, nullptr), -1) << "0 is no descriptor";
}

TEST_F(Mp4Walk, BitrateProductWrapsAt512MiBAndFilesOf2GiBAreRefused) {
    std::string path = dir.Write("big.mp4", Movie(Mvhd(0, 1, 100)));
    ASSERT_EQ(::truncate(path.c_str(), 512ll << 20), 0);
    ASSERT_EQ(MP4_GetClipInfo(path.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nFileSize, 512u << 20);
    EXPECT_EQ(clip.nBitrate, 0u) << "size x 8 is 2^32, which wraps to 0";
    ASSERT_EQ(::truncate(path.c_str(), 2048ll << 20), 0);
    EXPECT_EQ(MP4_GetClipInfo(path.c_str(), &clip), MM_E_FAIL);
}

TEST_F(Mp4Walk, HostileSizesNeverReachPastTheFile) {
    // Children that claim nearly the whole file, inside a small file: each
    // reader reads what the file holds and no more.
    const uint32_t big = 0x7FFFFFF0;
    std::vector<ByteVec> files = {
        Join({Ftyp(), Bytes().be32(200).str("moov").be32(180).str("mvhd").zeros(20).data(), ByteVec(300, 0)}),
        Movie(Bytes().be32(60).str("trak").be32(52).str("mdia").be32(44).str("mdhd").u8(1).zeros(20), ByteVec(200, 0)),
        Bytes().be32(big).str("ftyp").zeros(16).data(),
        Movie(Join({Mvhd(0, 1000, 1000), Trak("soun", 1000, 1000, Bytes().be32(100).str("stsz").zeros(12).be32(big))}),
              ByteVec(100, 0)),
        Movie(Join({Mvhd(0, 1000, 1000), Trak("vide", 1000, 1000, Stsd({Bytes().be32(big).str("avc1").zeros(90)}))}),
              ByteVec(100, 0)),
    };
    for (size_t i = 0; i < files.size(); ++i) {
        std::string path = dir.Write("hostile" + std::to_string(i) + ".mp4", files[i]);
        _MM_CODECTYPE codec;
        _MMMetaInfo meta{};
        _MAKERINFO maker{};
        int bits = 0;
        MP4_GetClipInfo(path.c_str(), &clip);
        MP4_GetCodecType(path.c_str(), &codec);
        MP4_GetTrackType(path.c_str(), &bits);
        MP4_GetMetaInfo(path.c_str(), &meta, 1);
        MP4_GetMakerInfo(path.c_str(), &maker);
        EXPECT_EQ(maker.nValid, 0u) << i;
        MM_MediaExtractor_FreeMetaInfo(&meta);
    }
}

TEST(Mp4BoxHeader, HeaderLengthsFollowSizeAndType) {
    _MP4BOX box;
    ByteVec uuid = Box("uuid", ByteVec(20, 0x11));
    EXPECT_EQ(AnaBox(uuid.data(), uuid.size(), &box), 12) << "the 16-byte user type counts as 4";
    ByteVec empty = Bytes().be32(0).str("free").data();
    EXPECT_EQ(AnaBox(empty.data(), empty.size(), &box), 1) << "nothing read after a size of 0";
    EXPECT_EQ(AnaBox(uuid.data(), 7, &box), 0) << "too short to hold a header";
}

TEST(Mp4BoxHeader, FileTypeBrandsAreBoundedByTheBox) {
    s_mp4FileSize = 1000;
    _FILETYPEBOX ftyp{};
    ByteVec box = Box("ftyp", Bytes().str("M4A ").be32(0).str("M4A ").str("mp42").str("is"));
    EXPECT_EQ(AnaFileType(box.data(), box.size(), &ftyp), MM_OK);
    EXPECT_EQ(ftyp.brandCount, 2u) << "a partial brand is not read";
    delete[] ftyp.compatibleBrands;
    ftyp = _FILETYPEBOX{};
    ByteVec bare = Box("ftyp", Bytes().str("isom").be32(0));
    EXPECT_EQ(AnaFileType(bare.data(), bare.size(), &ftyp), MM_E_FAIL) << "no room for brands";
    // A size far beyond the bytes given.
    ByteVec lying = Bytes().be32(900).str("ftyp").str("isom").be32(0).str("mp41").data();
    EXPECT_EQ(AnaFileType(lying.data(), lying.size(), &ftyp), MM_OK);
    EXPECT_EQ(ftyp.brandCount, 1u);
    delete[] ftyp.compatibleBrands;
}
