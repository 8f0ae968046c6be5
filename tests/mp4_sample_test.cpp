// Sample descriptions: which entry is read, codec codes from the decoder
// configurations, and what "stsz" adds.
#include <gtest/gtest.h>

#include "mp4/mp4_file.h"
#include "mp4/mp4_internal.h"
#include "support/mp4_builder.h"

using namespace testing_support;
using namespace metainfo;

namespace {

// Most significant bit first, as the configuration syntax is written.
class BitWriter {
public:
    BitWriter& put(uint32_t value, int bits) {
        for (int i = bits - 1; i >= 0; --i) {
            if (used_ % 8 == 0) bytes_.push_back(0);
            if ((value >> i) & 1) bytes_.back() |= static_cast<uint8_t>(0x80 >> (used_ % 8));
            ++used_;
        }
        return *this;
    }
    ByteVec bytes() const { return bytes_; }

private:
    ByteVec bytes_;
    int used_ = 0;
};

// objectType, frequency index, channels (an empty GA configuration follows when asked).
BitWriter Asc(uint32_t objectType, uint32_t frequencyIndex, uint32_t channels) {
    BitWriter w;
    w.put(objectType, 5).put(frequencyIndex, 4).put(channels, 4);
    return w;
}

class Mp4Sample : public ::testing::Test {
protected:
    TempDir dir;

    Mp4ClipWalk Walk(const ByteVec& trak, uint32_t movieMs = 10000) {
        return WalkClip(dir.Write("s.mp4", Movie(Join({Mvhd(0, 1000, movieMs), trak}))));
    }
    Mp4ClipWalk Audio(const ByteVec& entry, const ByteVec& extra = {}) {
        return Walk(Trak("soun", 1000, 10000, Join({Stsd({entry}), extra})));
    }
    Mp4ClipWalk Video(const ByteVec& entry, const ByteVec& extra = {}, uint32_t movieMs = 10000) {
        return Walk(Trak("vide", 1000, 1000, Join({Stsd({entry}), extra}), 1, 1), movieMs);
    }
    MP4TrackNode AacNode(const ByteVec& config) {
        Mp4ClipWalk r = Audio(AudioEntry("mp4a", 2, 16, 44100, Esds(0x40, 96000, config)));
        EXPECT_EQ(r.nodes.size(), 1u);
        return r.nodes.empty() ? MP4TrackNode{} : r.nodes[0];
    }
};

constexpr uint32_t kAac = 0x4008, kAacPlus = 0x4009, kLc = 0x2102, kNoDefine = 0xFFFF;

}  // namespace

TEST_F(Mp4Sample, OnlyTheFirstSampleEntryCountsAndIsRead) {
    ByteVec two = Stsd({AudioEntry("samr", 1, 16, 8000, Box("damr", Bytes().str("vndr").u8(0).be16(0x81FF).u8(0).u8(3))),
                        AudioEntry("mp4a", 2, 16, 48000, Esds(0x40, 1, {0x11, 0x90}))});
    Mp4ClipWalk r = Walk(Trak("soun", 1000, 10000, two));
    EXPECT_EQ(r.clip.bHasAudio, 1u);
    EXPECT_EQ(r.clip.nSampleRate, 8000u);
    EXPECT_EQ(r.clip.nBitsPerSample, 3u) << "frames per sample of damr";
    EXPECT_EQ(r.nodes.at(0).codec, 0x4005u);
}

TEST_F(Mp4Sample, AacObjectTypesGiveCodecAndProfile) {
    struct Case { uint32_t objectType; uint32_t codec, profile; } cases[] = {
        {1, kAac, 0x2101}, {2, kAac, kLc}, {3, kAac, 0x2103}, {4, kAac, kNoDefine}, {17, kAac, kNoDefine}};
    for (const Case& c : cases) {
        MP4TrackNode node = AacNode(Asc(c.objectType, 3, 2).put(0, 3).bytes());
        EXPECT_EQ(node.codec, c.codec) << c.objectType;
        EXPECT_EQ(node.codecDetail, c.profile) << c.objectType;
    }
    MP4TrackNode explicitSbr = AacNode(Asc(5, 6, 2).put(3, 4).put(2, 5).put(0, 3).bytes());
    EXPECT_EQ(explicitSbr.codec, kAacPlus);
    EXPECT_EQ(explicitSbr.codecDetail, kLc);
}

TEST_F(Mp4Sample, OnlyTheSyncExtensionSignalsSbrAt22050Hz) {
    EXPECT_EQ(AacNode(Asc(2, 7, 2).put(0, 3).bytes()).codec, kAac) << "implicit SBR only doubles the rate";
    MP4TrackNode node = AacNode(Asc(2, 7, 2).put(0, 3).put(0x2B7, 11).put(5, 5).put(1, 1).put(3, 4).bytes());
    EXPECT_EQ(node.codec, kAacPlus);
    EXPECT_EQ(node.codecDetail, kLc);
    EXPECT_EQ(AacNode(Asc(2, 7, 2).put(0, 3).put(0x2B7, 11).put(5, 5).put(0, 1).bytes()).codec, kAac)
        << "sbrPresentFlag 0";
}

TEST_F(Mp4Sample, BadAudioConfigurationsStillNameAac) {
    EXPECT_EQ(AacNode(Asc(2, 13, 2).bytes()).codec, kAac) << "frequency index 13";
    EXPECT_EQ(AacNode(Asc(2, 4, 9).bytes()).codec, kAac) << "channel configuration 9";
    // A program configuration with a long comment runs past the few bytes given.
    ByteVec pce = Asc(2, 4, 0).put(0, 3).put(0, 4).put(1, 2).put(4, 4).put(15, 4).put(15, 4).put(15, 4)
                      .put(3, 2).put(7, 3).put(15, 4).put(1, 1).put(3, 4).bytes();
    EXPECT_EQ(AacNode(pce).codec, kAac);
}

TEST_F(Mp4Sample, FrameRateIsSamplesPerWholeSecond) {
    ByteVec entry = VisualEntry("mp4v", 176, 144, Esds(0x20, 64000));
    Mp4ClipWalk ten = Video(entry, Stsz(500, 300), 10000);
    EXPECT_EQ(ten.clip.nFrameRate, 30u);
    EXPECT_EQ(ten.clip.nVideoBitrate, 64000u) << "the esds value came first";
    EXPECT_EQ(ten.nodes.at(0).bitrate, 500u * 300 * 8 / 10) << "stsz replaces the node's bit rate";
    EXPECT_EQ(ten.nodes.at(0).codec, 0x4001u);
    EXPECT_EQ(Video(entry, Stsz(500, 300), 9900).clip.nFrameRate, 33u);
}

TEST_F(Mp4Sample, SampleSizeTableSumsEntriesWhenSizeIsZero) {
    Mp4ClipWalk r = Audio(AudioEntry("mp4a", 1, 16, 8000, Esds(0x40, 0, {0x15, 0x88})), Stsz(0, 3, {1000, 2000, 2000}));
    EXPECT_EQ(r.clip.nAudioBitrate, 5000u * 8 / 10);
    // A count far beyond the table: only the entries the box holds are summed.
    Mp4ClipWalk hostile = Audio(AudioEntry("mp4a", 1, 16, 8000), Stsz(0, 0xFFFFFFF0u, {800}));
    EXPECT_EQ(hostile.clip.nAudioBitrate, 800u * 8 / 10);
}

TEST_F(Mp4Sample, SpeechEntriesHaveFixedValues) {
    for (const char* type : {"secw", "sevc", "secb"}) {
        Mp4ClipWalk r = Audio(AudioEntry(type, 2, 8, 44100));
        EXPECT_EQ(r.nodes.at(0).codec, 0x8001u) << type;
        EXPECT_EQ(r.clip.nSampleRate, 8000u);
        EXPECT_EQ(r.clip.nChannels, 1u);
        EXPECT_EQ(r.clip.nBitsPerSample, 16u);
    }
    EXPECT_EQ(Audio(AudioEntry("sqcp", 1, 16, 8000)).nodes.at(0).codec, 0x7001u);
    EXPECT_EQ(Audio(AudioEntry("sawp", 2, 16, 16000)).nodes.at(0).codec, 0x4007u);
}

TEST_F(Mp4Sample, QcelpConfigurationInEsdsNamesQcelp) {
    // Three bytes, then a QCP format chunk whose rate, bit rate and sample size
    // replace what the decoder configuration said.
    ByteVec chunk = Bytes().u8(0).u8(0).u8(0).str("fmt ").le32(150).u8(1).u8(0).zeros(16).le16(1).zeros(80)
                        .le16(13300).le16(35).le16(160).le16(8000).le16(16).le32(0).zeros(36).data();
    Mp4ClipWalk r = Audio(AudioEntry("mp4a", 1, 16, 44100, Esds(0xE1, 13000, chunk)));
    EXPECT_EQ(r.nodes.at(0).codec, 0x7001u);
    EXPECT_EQ(r.clip.nAudioBitrate, 13300u);
    EXPECT_EQ(r.clip.nSampleRate, 8000u);
    EXPECT_EQ(r.clip.nBitsPerSample, 16u);
}

TEST_F(Mp4Sample, Avc1NeedsAvcCButAlwaysGivesTheSize) {
    Mp4ClipWalk bare = Video(VisualEntry("avc1", 640, 360));
    EXPECT_EQ(bare.clip.nHeight, 360u);
    EXPECT_EQ(bare.nodes.at(0).codec, 0u);

    ByteVec avcC = Box("avcC", Bytes().u8(1).u8(66).u8(0).u8(30).u8(0xFF).u8(0xE1).be16(4).be32(0x6742001E)
                                   .u8(1).be16(2).be16(0x68CE));
    ByteVec btrt = Box("btrt", Bytes().be32(0).be32(900000).be32(750000));
    Mp4ClipWalk full = Video(VisualEntry("avc1", 1280, 720, Join({Box("pasp", Bytes().be32(1).be32(1)), avcC, btrt})));
    EXPECT_EQ(full.nodes.at(0).codec, 0x4004u);
    EXPECT_EQ(full.clip.nVideoBitrate, 750000u) << "the average bit rate of btrt";
    // Parameter-set lengths pointing far past the entry.
    ByteVec wild = Box("avcC", Bytes().u8(1).u8(66).u8(0).u8(30).u8(0xFF).u8(0xFF).be16(0xFFFF).zeros(4));
    EXPECT_EQ(Video(VisualEntry("avc1", 320, 240, wild)).nodes.at(0).codec, 0x4004u);
    // A child of size 0 before any avcC.
    EXPECT_EQ(Video(VisualEntry("avc1", 320, 240, Bytes().be32(0).str("pasp").zeros(8))).nodes.at(0).codec, 0u);
}

TEST_F(Mp4Sample, H263TakesTheBitrateOfItsBitrBox) {
    ByteVec d263 = Box("d263", Join({Bytes().str("vndr").u8(0).u8(10).u8(0).data(),
                                     Box("bitr", Bytes().be32(64000).be32(128000))}));
    Mp4ClipWalk r = Video(VisualEntry("s263", 176, 144, d263));
    EXPECT_EQ(r.nodes.at(0).codec, 0x4003u);
    EXPECT_EQ(r.clip.nVideoBitrate, 64000u);
}

TEST_F(Mp4Sample, MalformedDecoderConfigurationsLeaveNoCodec) {
    EXPECT_EQ(Audio(AudioEntry("mp4a", 2, 16, 44100, Box("wave", ByteVec(20, 0)))).nodes.at(0).codec, 0u);
    // Descriptor lengths whose continuation bits run to the end of the box.
    Mp4ClipWalk r = Audio(AudioEntry("mp4a", 2, 16, 44100, FullBox("esds", 0, 0, ByteVec(40, 0x80))));
    EXPECT_EQ(r.clip.bHasAudio, 1u);
    // Unknown entries are neither read nor counted.
    Mp4ClipWalk text = Walk(Trak("text", 1000, 1000, Stsd({Box("tx3g", ByteVec(40, 0))})));
    EXPECT_EQ(text.clip.bHasAudio + text.clip.bHasVideo, 0u);
}

TEST_F(Mp4Sample, ShortEntriesAreBoundedByTheBox) {
    // Entries whose fixed fields lie past the end of the stsd box.
    for (const char* type : {"mp4a", "samr", "sawp", "mp4v", "s263", "avc1"}) {
        ByteVec stsd = FullBox("stsd", 0, 0, Bytes().be32(1).be32(200).str(type).zeros(4));
        EXPECT_EQ(Walk(Trak("soun", 1000, 1000, stsd)).result, MM_OK) << type;
    }
}
