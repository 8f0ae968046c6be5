// The accurate interface over MP4 / 3GPP / QuickTime files built box by box:
// codecs in ffprobe's words, profiles, rates, edit-list durations, frame rates,
// tags and cover offsets; and where a quirk switch parts the answers, the MM_
// answer as it always was.
#include <gtest/gtest.h>

#include <string>

#include "core/codes.h"
#include "mp4/mp4_facts.h"
#include "mp4/mp4_file.h"
#include "support/aac_builder.h"
#include "support/mp4_accurate_builder.h"

using namespace testing_support;
using namespace metainfo;

namespace {

// Audio configurations: (object type, rate index, channels, ...).
ByteVec AscLc44() { return PackBits({{2, 5}, {4, 4}, {1, 4}, {0, 3}}); }
ByteVec AacEntry(const ByteVec& asc, uint16_t channels = 2) {
    return AudioEntry("mp4a", channels, 16, 44100, Esds(0x40, 96000, asc));
}

ByteVec AudioFile(const ByteVec& entry, const std::string& brand = "M4A ", const ByteVec& more = {}) {
    return Join({Ftyp(brand),
                 Box("moov", Join({Mvhd(0, 1000, 3300),
                                   TimedTrak("soun", 44100, 146554, entry, 144, 1024, 200, Edts(3300, 1024)), more})),
                 Box("mdat", ByteVec(144 * 200, 0))});
}

// 22.05 kHz LC whose first frame (where "stco" points) carries SBR data.
ByteVec ImplicitSbrFile() {
    const ByteVec entry = AacEntry(PackBits({{2, 5}, {7, 4}, {2, 4}, {0, 3}}));
    const auto moov = [&](uint32_t chunk) {
        const ByteVec stco = FullBox("stco", 0, 0, Bytes().be32(1).be32(chunk));
        return Box("moov",
                   Join({Mvhd(0, 1000, 3300), TimedTrak("soun", 44100, 146554, entry, 144, 1024, 200, {}, stco)}));
    };
    const ByteVec ftyp = Ftyp("M4A ");
    ByteVec samples = AacBlock(true, 13);
    samples.resize(144 * 200);
    return Join({ftyp, moov(static_cast<uint32_t>(ftyp.size() + moov(0).size() + 8)), Box("mdat", samples)});
}

ByteVec VideoFile(const ByteVec& entry, uint32_t timescale, uint32_t delta, const std::string& brand = "isom") {
    return Join(
        {Ftyp(brand),
         Box("moov", Join({Mvhd(0, 1000, 2002), TimedTrak("vide", timescale, 60 * delta, entry, 60, delta, 500)})),
         Box("mdat", ByteVec(60 * 500, 0))});
}

ByteVec Avc(uint8_t profile, uint8_t constraints, uint8_t level) {
    return VisualEntry("avc1", 160, 120, Box("avcC", Bytes{1, profile, constraints, level, 0xFF, 0xE0, 0}));
}

ByteVec Hevc(uint8_t profile, uint8_t level) {
    Bytes hvcc;
    hvcc.u8(1).u8(profile).be32(0x60000000).zeros(6).u8(level).zeros(10);
    return VisualEntry("hvc1", 1920, 1080, Box("hvcC", hvcc));
}

// A QuickTime version-1 sound entry whose "esds" lies inside "wave".
ByteVec QuickTimeAac() {
    Bytes b;
    b.zeros(6).be16(1).be16(1).zeros(6).be16(2).be16(16).be16(0xFFFE).be16(0).be16(44100).be16(0).zeros(16);
    b.raw(Box("wave", Join({Box("frma", Bytes().str("mp4a")), Esds(0x40, 0, AscLc44())})));
    return Box("mp4a", b);
}

std::string Describe(const MediaFacts& f) {
    std::string s = f.mime + " " + std::to_string(f.durationUs);
    for (const StreamFacts& st : f.streams) {
        s += " | " + st.codec + "/" + st.profile + "/" + std::to_string(st.level) + " ";
        if (st.kind == StreamFacts::kAudio) {
            s += std::to_string(st.sampleRate) + "Hz " + std::to_string(st.channels) + "ch " +
                 std::to_string(st.bitsPerSample) + "b";
        } else {
            s += std::to_string(st.width) + "x" + std::to_string(st.height) + " " + std::to_string(st.frameRateNum) +
                 "/" + std::to_string(st.frameRateDen);
        }
        s += " " + std::to_string(st.bitRate);
    }
    return s;
}

class AccurateMp4Test : public ::testing::Test {
protected:
    TempDir dir;
    MediaFacts Facts(const ByteVec& file, const char* name = "f.mp4") {
        MediaFacts f;
        EXPECT_EQ(Mp4Facts(dir.Write(name, file).c_str(), MEDIA_TYPE_MP4, &f), MM_OK);
        return f;
    }
};

TEST_F(AccurateMp4Test, StreamsInFfprobeTerms) {
    // 144 samples of 200 bytes over the 146554 ticks of the media.
    const std::string aacRate = std::to_string(144ull * 200 * 8 * 44100 / 146554);
    const struct {
        const char* name;
        ByteVec file;
        std::string want;
    } rows[] = {
        // The edit list cuts the priming: the movie header says 3.3 s.
        {"lc", AudioFile(AacEntry(AscLc44())), "audio/mp4 3300000 | aac/LC/-1 44100Hz 1ch 0b " + aacRate},
        // Hierarchical SBR: the extension rate, as decoded.
        {"he-aac", AudioFile(AacEntry(PackBits({{5, 5}, {7, 4}, {2, 4}, {4, 4}, {2, 5}, {0, 3}}))),
         "audio/mp4 3300000 | aac/HE-AAC/-1 44100Hz 2ch 0b " + aacRate},
        // Backward-compatible SBR and PS after an LC core: two channels out of one.
        {"he-aac-v2",
         AudioFile(AacEntry(
             PackBits({{2, 5}, {7, 4}, {1, 4}, {0, 3}, {0x2B7, 11}, {5, 5}, {1, 1}, {4, 4}, {0x548, 11}, {1, 1}}))),
         "audio/mp4 3300000 | aac/HE-AACv2/-1 44100Hz 2ch 0b " + aacRate},
        // 22.05 kHz LC states no SBR: its own rate, not twice it.
        {"lc-22k", AudioFile(AacEntry(PackBits({{2, 5}, {7, 4}, {2, 4}, {0, 3}}))),
         "audio/mp4 3300000 | aac/LC/-1 22050Hz 2ch 0b " + aacRate},
        // ... unless its first frame carries SBR (implicit signalling).
        {"implicit-sbr", ImplicitSbrFile(), "audio/mp4 3300000 | aac/HE-AAC/-1 44100Hz 2ch 0b " + aacRate},
        {"mp3-in-esds", AudioFile(AudioEntry("mp4a", 2, 16, 44100, Esds(0x6B, 128000))),
         "audio/mp4 3300000 | mp3//-1 44100Hz 2ch 0b " + aacRate},
        {"quicktime-v1", AudioFile(QuickTimeAac(), "qt  "),
         "video/quicktime 3300000 | aac/LC/-1 44100Hz 1ch 0b " + aacRate},
        // 48 kHz, 3/2 with LFE, 448 kbit/s: the nominal rate.
        {"ac3", AudioFile(AudioEntry("ac-3", 2, 16, 48000, Box("dac3", Bytes{0x10, 0x3D, 0xE0}))),
         "audio/mp4 3300000 | ac3//-1 48000Hz 6ch 0b 448000"},
        {"sowt", AudioFile(AudioEntry("sowt", 2, 16, 44100), "qt  "),
         "video/quicktime 3300000 | pcm_s16le//-1 44100Hz 2ch 16b " + aacRate},
        {"alac",
         AudioFile(AudioEntry(
             "alac", 2, 16, 44100,
             FullBox(
                 "alac", 0, 0,
                 Bytes().be32(4096).u8(0).u8(24).u8(40).u8(10).u8(14).u8(2).be16(255).be32(0).be32(0).be32(96000)))),
         "audio/mp4 3300000 | alac//-1 96000Hz 2ch 24b " + aacRate},
        {"h264-29.97", VideoFile(Avc(66, 0x40, 30), 30000, 1001),
         "video/mp4 2002000 | h264/Constrained Baseline/30 160x120 30000/1001 119880"},
        {"h264-high", VideoFile(Avc(100, 0, 31), 12800, 512), "video/mp4 2002000 | h264/High/31 160x120 25/1 100000"},
        {"hevc-main10", VideoFile(Hevc(2, 93), 90000, 3600),
         "video/mp4 2002000 | hevc/Main 10/93 1920x1080 25/1 100000"},
        {"mpeg4-asp", VideoFile(VisualEntry("mp4v", 352, 288, Esds(0x20, 0, {0, 0, 1, 0xB0, 0xF3})), 25, 1),
         "video/mp4 2002000 | mpeg4/Advanced Simple Profile/3 352x288 25/1 100000"},
        {"3gp-h263", VideoFile(VisualEntry("s263", 176, 144), 15360, 1024, "3gp4"),
         "video/3gpp 2002000 | h263//-1 176x144 15/1 60000"},
    };
    for (const auto& row : rows) EXPECT_EQ(Describe(Facts(row.file)), row.want) << row.name;
}

// A fragmented file: an empty track and "mvex", then a segment index when
// given, one fragment (43 samples of 1024 ticks from 2 s on) and, when
// given, the random access box that names it.
ByteVec Fragmented(bool withSidx, bool withMfra, uint32_t mfroSize = 0) {
    const ByteVec moov =
        Box("moov", Join({Mvhd(0, 1000, 0), TimedTrak("soun", 44100, 0, AacEntry(AscLc44()), 0, 1024, 0),
                          Box("mvex", FullBox("trex", 0, 0, Bytes().be32(0).be32(1).zeros(12)))}));
    const ByteVec sidx = withSidx ? FullBox("sidx", 0, 0,
                                            Bytes()
                                                .be32(1)
                                                .be32(1000)
                                                .be32(0)
                                                .be32(0)
                                                .be16(0)
                                                .be16(2)
                                                .be32(100)
                                                .be32(1500)
                                                .be32(0x90000000u)
                                                .be32(100)
                                                .be32(1250)
                                                .be32(0x90000000u))
                                  : ByteVec{};
    const ByteVec traf =
        Box("traf", Join({FullBox("tfhd", 0, 0x08, Bytes().be32(0).be32(1024)),
                          FullBox("tfdt", 1, 0, Bytes().be64(88200)), FullBox("trun", 0, 0, Bytes().be32(43))}));
    const ByteVec head = Join({Ftyp("iso5"), moov, sidx});
    const ByteVec moof = Box("moof", Join({FullBox("mfhd", 0, 0, Bytes().be32(1)), traf}));
    const ByteVec tfra =
        FullBox("tfra", 1, 0, Bytes().be32(0).be32(0).be32(1).be64(88200).be64(head.size()).u8(1).u8(1).u8(1));
    const uint32_t mfraSize = static_cast<uint32_t>(8 + tfra.size() + 16);
    const ByteVec mfra =
        Box("mfra", Join({tfra, FullBox("mfro", 0, 0, Bytes().be32(mfroSize != 0 ? mfroSize : mfraSize))}));
    return Join({head, moof, Box("mdat", ByteVec(64, 0)), withMfra ? mfra : ByteVec{}});
}

TEST_F(AccurateMp4Test, DurationWithoutMovieHeaderTime) {
    const struct {
        const char* name;
        ByteVec file;
        int64_t durationUs;
    } rows[] = {
        {"the longest track",
         Join({Ftyp(),
               Box("moov", Join({Mvhd(0, 1000, 0), TimedTrak("soun", 8000, 20000, AacEntry(AscLc44()), 20, 1000, 10),
                                 TimedTrak("soun", 1000, 4000, AacEntry(AscLc44()), 4, 1000, 10)})),
               Box("mdat", ByteVec(16, 0))}),
         4000000},
        // (88200 + 43 * 1024) / 44100 s, over the index's 2.75 s.
        {"the last fragment mfra names", Fragmented(true, true), 2998458},
        {"the segment index", Fragmented(true, false), 2750000},
        {"neither", Fragmented(false, false), -1},
        {"mfro sizes past the file", Fragmented(false, true, 0x7FFFFFF0u), -1},
    };
    for (const auto& row : rows) EXPECT_EQ(Facts(row.file).durationUs, row.durationUs) << row.name;
}

// Object type 29 opens the configuration: the contract does not read it.
TEST_F(AccurateMp4Test, ParametricStereoConfigurationQuirk) {
    const ByteVec file = AudioFile(AacEntry(PackBits({{29, 5}, {6, 4}, {1, 4}, {3, 4}, {2, 5}, {0, 3}}), 1));
    const std::string path = dir.Write("ps.m4a", file);
    _MM_CODECTYPE codec{};
    ASSERT_EQ(MP4_GetCodecType(path.c_str(), &codec), MM_OK);
    EXPECT_EQ(codec.nAudioCodec, static_cast<uint32_t>(CODEC_MP4AUDIO_MP4A_AAC));
    EXPECT_EQ(codec.nAudioSubType, static_cast<uint32_t>(CODEC_NODEFINE));
    EXPECT_EQ(Describe(Facts(file)), "audio/mp4 3300000 | aac/HE-AACv2/-1 48000Hz 2ch 0b " +
                                         std::to_string(144ull * 200 * 8 * 44100 / 146554));
}

TEST_F(AccurateMp4Test, ItemListAndCover) {
    const ByteVec png = {0x89, 'P', 'N', 'G', 13, 10, 26, 10, 1, 2, 3};
    const ByteVec items =
        Join({IlstItem("\xA9nam", 1, Bytes().str(" Title ")), IlstItem("aART", 1, Bytes().str("AA")),
              IlstItem("gnre", 0, Bytes().be16(18)),
              IlstItem("\xA9"
                       "day",
                       1, Bytes().str("2019-05-01")),
              IlstItem("trkn", 0, Bytes().be16(0).be16(3).be16(11).be16(0)),
              IlstItem("disk", 0, Bytes().be16(0).be16(1).be16(2)), IlstItem("tmpo", 21, Bytes().be16(120)),
              FreeformItem("com.apple.iTunes", "MOOD", "Calm"), IlstItem("covr", 14, png)});
    const ByteVec file = AudioFile(AacEntry(AscLc44()), "M4A ", Box("udta", ItemList(items)));
    const MediaFacts f = Facts(file);
    const TagFacts& t = f.tags;
    EXPECT_EQ(t.title + "|" + t.albumArtist + "|" + t.genre + "|" + t.date, "Title|AA|Rock|2019-05-01");
    EXPECT_EQ(t.year, 2019);
    EXPECT_EQ(std::to_string(t.track) + "/" + std::to_string(t.trackTotal) + " " + std::to_string(t.disc) + "/" +
                  std::to_string(t.discTotal),
              "3/11 1/2");
    ASSERT_EQ(t.extra.size(), 2u);
    EXPECT_EQ(t.extra[0].first + "=" + t.extra[0].second + " " + t.extra[1].first + "=" + t.extra[1].second,
              "tmpo=120 MOOD=Calm");
    ASSERT_EQ(f.pictures.size(), 1u);
    EXPECT_EQ(f.pictures[0].mime, "image/png");
    EXPECT_EQ(f.pictures[0].type, 3);
    ASSERT_EQ(f.pictures[0].size, png.size());
    EXPECT_EQ(ByteVec(file.begin() + static_cast<long>(f.pictures[0].offset),
                      file.begin() + static_cast<long>(f.pictures[0].offset + png.size())),
              png);
}

TEST_F(AccurateMp4Test, GppTextBoxes) {
    const ByteVec udta =
        Box("udta",
            Join({TextBox("titl", "Clip"), TextBox("perf", "Singer"), FullBox("yrrc", 0, 0, Bytes().be16(2007)),
                  FullBox("albm", 0, 0, Bytes().be16(0x15C7).raw(ByteVec{0xFE, 0xFF, 0, 'A', 0, 'l'}).u8(0).u8(0))}));
    const MediaFacts f = Facts(AudioFile(AacEntry(AscLc44()), "3gp6", udta), "c.3gp");
    EXPECT_EQ(f.mime, "audio/3gpp");
    EXPECT_EQ(f.tags.title + "|" + f.tags.artist + "|" + f.tags.album + "|" + std::to_string(f.tags.year),
              "Clip|Singer|Al|2007");
}

TEST_F(AccurateMp4Test, BrokenFirstBoxFails) {
    MediaFacts f;
    EXPECT_EQ(Mp4Facts(dir.Write("x.mp4", Box("abcd", ByteVec(16, 0))).c_str(), MEDIA_TYPE_MP4, &f), MM_E_FAIL);
}

}  // namespace
