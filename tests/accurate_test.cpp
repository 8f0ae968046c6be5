// The accurate interface beside the MM_ one: where the two differ by design,
// each row states both answers; and mi_probe's results on files that are not
// media.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <functional>

#include "metainfo/metainfo.h"
#include "metainfo/probe.h"
#include "support/bytes.h"
#include "support/id3_builder.h"
#include "support/media.h"
#include "support/speech_builder.h"

namespace {

using testing_support::Bytes;
using testing_support::TempDir;

// n MPEG-1 Layer III frames (128 kbit/s, 44.1 kHz, stereo); the first carries
// a Xing or Info header with a LAME tag when vbrTag is set.
std::vector<uint8_t> Mp3Stream(int frames, const char* vbrTag, uint32_t stated, uint32_t delay, uint32_t padding) {
    testing_support::Mp3FrameLayout shape;
    Bytes out;
    std::vector<uint8_t> first = testing_support::Mp3Frame(shape);
    if (vbrTag != nullptr) {
        Bytes xing;
        xing.str(vbrTag).be32(0xF).be32(stated).be32(static_cast<uint32_t>(first.size()) * stated).zeros(100).be32(0);
        xing.str("LAME3.100").zeros(12).u8(delay >> 4).u8((delay & 0xF) << 4 | padding >> 8).u8(padding & 0xFF);
        std::copy(xing.data().begin(), xing.data().end(), first.begin() + 36);
    }
    out.raw(first);
    for (int i = 1; i < frames; ++i) out.raw(testing_support::Mp3Frame(shape));
    return out.data();
}

std::vector<uint8_t> AdpcmWave(bool withFact) {
    Bytes fmt;  // MS ADPCM, 8 kHz mono, 256-byte blocks of 500 samples
    fmt.le16(2).le16(1).le32(8000).le32(4096).le16(256).le16(4).le16(32).le16(500).zeros(30);
    std::vector<Bytes> chunks = {testing_support::SpeechChunk("fmt ", fmt)};
    if (withFact) chunks.push_back(testing_support::SpeechChunk("fact", Bytes().le32(76800)));
    chunks.push_back(testing_support::SpeechChunk("data", Bytes().zeros(154 * 256)));
    return testing_support::RiffForm("WAVE", chunks);
}

std::vector<uint8_t> Rf64Wave() {
    Bytes ds64;
    ds64.le64(0).le64(19200).le64(4800).le32(0);
    Bytes body;
    body.str("WAVE").raw(testing_support::SpeechChunk("ds64", ds64));
    body.raw(testing_support::SpeechChunk("fmt ", testing_support::WaveFmtBody(1, 2, 48000, 16)));
    body.str("data").le32(0xFFFFFFFFu).zeros(19200);
    Bytes file;
    file.str("RF64").le32(0xFFFFFFFFu).raw(body);
    return file.data();
}

// ADTS frames (44.1 kHz LC stereo) with an ID3 tag after the first.
std::vector<uint8_t> AdtsWithTagBetween(int frames) {
    Bytes out;
    testing_support::AdtsFields shape;
    for (int i = 0; i < frames; ++i) {
        out.raw(testing_support::AdtsFrame(shape, std::vector<uint8_t>(200, 0)));
        if (i == 0) out.raw(testing_support::Id3Tag(3, {testing_support::Id3Frame(3, "TIT2", {0, 'x'})}));
    }
    return out.data();
}

struct QuirkRow {
    const char* name;
    std::function<std::vector<uint8_t>()> build;
    int contractDurationMs;  // the MM_ clip information's; -1: type not detected
    int64_t durationMs;
    bool exact;
    const char* codec;
    const char* profile;
    uint32_t sampleRate;
};

void PrintTo(const QuirkRow& row, std::ostream* os) { *os << row.name; }

class AccurateVsContract : public ::testing::TestWithParam<QuirkRow> {};

TEST_P(AccurateVsContract, BothAnswersStand) {
    const QuirkRow& row = GetParam();
    TempDir dir;
    const std::string path = dir.Write(row.name, row.build());
    int type = MEDIA_TYPE_UNKNOWN;
    ASSERT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK);
    if (row.contractDurationMs < 0) {
        EXPECT_EQ(type, MEDIA_TYPE_UNKNOWN);
    } else {
        _MMClipInfo clip{};
        ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), type, &clip), MM_OK);
        EXPECT_EQ(clip.nDuration, static_cast<uint32_t>(row.contractDurationMs));
    }
    mi_info* info = nullptr;
    ASSERT_EQ(mi_probe(path.c_str(), &info), MI_OK);
    EXPECT_EQ(info->duration_ms, row.durationMs);
    EXPECT_EQ(info->duration_exact != 0, row.exact);
    ASSERT_EQ(info->stream_count, 1u);
    EXPECT_STREQ(info->streams[0].codec, row.codec);
    EXPECT_STREQ(info->streams[0].profile, row.profile);
    EXPECT_EQ(info->streams[0].sample_rate, row.sampleRate);
    mi_info_free(info);
}

INSTANTIATE_TEST_SUITE_P(
    Quirks, AccurateVsContract,
    ::testing::Values(
        // 40 frames of 1152 samples less 576 + 1000 of LAME delay and padding.
        QuirkRow{"xing_lame.mp3", [] { return Mp3Stream(41, "Xing", 40, 576, 1000); }, 1000, 1009, true, "mp3", nullptr,
                 44100},
        // Info (a constant-rate LAME header) is not looked for by the MM_ side,
        // which estimates from the bit rate.
        QuirkRow{"info_lame.mp3", [] { return Mp3Stream(41, "Info", 40, 576, 1000); }, 1000, 1009, true, "mp3", nullptr,
                 44100},
        // No VBR header: a short stream's frames are counted.
        QuirkRow{"cbr.mp3", [] { return Mp3Stream(100, nullptr, 0, 0, 0); }, 2000, 2612, true, "mp3", nullptr, 44100},
        // 76800 samples in the fact chunk; without it, 154 blocks of 500.
        QuirkRow{"fact.wav", [] { return AdpcmWave(true); }, 9000, 9600, true, "adpcm_ms", nullptr, 8000},
        QuirkRow{"blocks.wav", [] { return AdpcmWave(false); }, 9000, 9625, true, "adpcm_ms", nullptr, 8000},
        QuirkRow{"rf64.wav", Rf64Wave, -1, 100, true, "pcm_s16le", nullptr, 48000},
        // 5 frames of 1024 samples, the tag after the first stepped over.
        QuirkRow{"tag_between.aac", [] { return AdtsWithTagBetween(5); }, -1, 116, true, "aac", "LC", 44100},
        // 123 frames of 20 ms, counted.
        QuirkRow{"count.amr", [] { return testing_support::AmrFile(false, 7, 123); }, 2000, 2460, true, "amr_nb",
                 nullptr, 8000}),
    [](const ::testing::TestParamInfo<QuirkRow>& param) {
        std::string name = param.param.name;
        for (char& c : name) c = std::isalnum(static_cast<unsigned char>(c)) ? c : '_';
        return name;
    });

struct CutRow {
    const char* name;
    std::function<std::vector<uint8_t>()> build;
    int64_t startMs, endMs;
    size_t bytes;  // of the cut file
    int64_t durationMs;  // of the cut file, probed again
};

// Whole frames (blocks) that play within the range, found by walking them.
TEST(AccurateInterface, CutsWholeFramesOfTheRange) {
    const CutRow rows[] = {
        // Frames of 1024 samples at 44.1 kHz, 23.2 ms each: the 5th to the 9th.
        {"frames.aac", [] { return AdtsWithTagBetween(50); }, 100, 200, 5 * 207, 116},
        // 20 ms frames of 32 bytes after the 6-byte magic.
        {"frames.amr", [] { return testing_support::AmrFile(false, 7, 123); }, 1000, 1500, 6 + 25 * 32, 500},
        // 26.1 ms frames of 417 bytes.
        {"frames.mp3", [] { return Mp3Stream(100, nullptr, 0, 0, 0); }, 0, 100, 4 * 417, 104},
        // 2000 samples of 16-bit mono at 8 kHz behind a 44-byte header.
        {"samples.wav", [] { return testing_support::CanonicalWave(1, 1, 8000, 16, 16000); }, 250, 500, 44 + 4000, 250},
    };
    TempDir dir;
    for (const CutRow& row : rows) {
        const std::string path = dir.Write(row.name, row.build());
        const std::string out = dir.PathOf(std::string("cut-") + row.name);
        ASSERT_EQ(mi_cut(path.c_str(), row.startMs, row.endMs, out.c_str()), MI_OK) << row.name;
        EXPECT_EQ(testing_support::ReadFileBytes(out).size(), row.bytes) << row.name;
        mi_info* info = nullptr;
        ASSERT_EQ(mi_probe(out.c_str(), &info), MI_OK) << row.name;
        EXPECT_EQ(info->duration_ms, row.durationMs) << row.name;
        mi_info_free(info);
        EXPECT_EQ(mi_cut(path.c_str(), 60000, 61000, out.c_str()), MI_E_ARGUMENT) << "past the end";
    }
    EXPECT_EQ(mi_cut(dir.PathOf("frames.mp3").c_str(), 500, 500, dir.PathOf("x").c_str()), MI_E_ARGUMENT);
}

// A Standard MIDI File: header (format, division) and tracks of events.
std::vector<uint8_t> Smf(uint16_t format, uint16_t division, const std::vector<Bytes>& tracks) {
    Bytes b;
    b.str("MThd").be32(6).be16(format).be16(static_cast<uint16_t>(tracks.size())).be16(division);
    for (const Bytes& t : tracks) b.str("MTrk").be32(static_cast<uint32_t>(t.data().size())).raw(t);
    return b.data();
}

const Bytes kEndOfTrack = Bytes{0, 0xFF, 0x2F, 0};

// One quarter note (96 ticks at 120 beats a minute: 500 ms), by running status.
Bytes OneNote() { return Bytes{0, 0x90, 60, 96, 0x60, 60, 0}.raw(kEndOfTrack); }

// Every event walked through the tempo map; the MM_ side gives no play time.
TEST(AccurateInterface, MidiPlayTimeThroughTheTempoMap) {
    // Track 0: a name, 4 beats/s to tick 192, then 1 beat/s. Track 1: a SysEx,
    // a program change, notes up to tick 384.
    const Bytes tempoMap = Bytes{0, 0xFF, 0x03, 4}
                               .str("Song")
                               .raw(Bytes{0, 0xFF, 0x51, 3, 0x03, 0xD0, 0x90})
                               .raw(Bytes{0x81, 0x40, 0xFF, 0x51, 3, 0x0F, 0x42, 0x40})
                               .raw(kEndOfTrack);
    const Bytes notes =
        Bytes{0, 0xF0, 3, 0x7E, 0x7F, 0xF7, 0, 0xC0, 5, 0, 0x90, 60, 96, 0x83, 0x00, 0x80, 60, 0}.raw(kEndOfTrack);
    const struct {
        const char* name;
        std::vector<uint8_t> bytes;
        int64_t durationMs;
        const char* title;
    } rows[] = {
        {"one note", Smf(0, 96, {OneNote()}), 500, ""},
        {"tempo changes in another track", Smf(1, 96, {tempoMap, notes}), 2500, "Song"},
        // 25 frames a second of 40 ticks: 96 ticks are 96 ms.
        {"SMPTE time", Smf(0, 0xE728, {OneNote()}), 96, ""},
        {"a track cut inside a note", Smf(0, 96, {Bytes{0, 0x90, 60, 96, 0x60, 0x80}}), 500, ""},
    };
    TempDir dir;
    for (const auto& row : rows) {
        const std::string path = dir.Write("tune.mid", row.bytes);
        mi_info* info = nullptr;
        ASSERT_EQ(mi_probe(path.c_str(), &info), MI_OK) << row.name;
        EXPECT_STREQ(info->format, "midi") << row.name;
        EXPECT_EQ(info->duration_ms, row.durationMs) << row.name;
        EXPECT_STREQ(info->title != nullptr ? info->title : "", row.title) << row.name;
        mi_info_free(info);
        _MMClipInfo clip{};
        EXPECT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_MIDI, &clip), MM_E_NOTIMPL) << row.name;
    }
}

TEST(AccurateInterface, ResultsForWhatIsNotMedia) {
    TempDir dir;
    const std::string text = dir.Write("notes.txt", Bytes().str("just some words, nothing more\n").data());
    const std::string empty = dir.Write("empty.mp3", {});
    const std::string locked = dir.Write("locked.mp3", Mp3Stream(4, nullptr, 0, 0, 0));
    ::chmod(locked.c_str(), 0);
    const bool root = ::geteuid() == 0;
    const struct {
        std::string path;
        int result;
    } rows[] = {
        {dir.PathOf("missing.mp3"), MI_E_NOT_FOUND},
        {dir.path(), MI_E_IS_DIRECTORY},
        {empty, MI_E_EMPTY},
        {text, MI_E_NOT_MEDIA},
        {"", MI_E_ARGUMENT},
        {locked, root ? MI_OK : MI_E_ACCESS},
    };
    for (const auto& row : rows) {
        mi_info* info = reinterpret_cast<mi_info*>(&dir);  // must be reset
        EXPECT_EQ(mi_probe(row.path.c_str(), &info), row.result) << row.path;
        EXPECT_EQ(info == nullptr, row.result != MI_OK) << row.path;
        mi_info_free(info);
    }
    EXPECT_EQ(mi_probe(text.c_str(), nullptr), MI_E_ARGUMENT);
    EXPECT_STREQ(mi_result_text(MI_E_NOT_MEDIA), "not a media file");
}

TEST(AccurateInterface, PictureBytesAreCopiedAndAChangedFileRefused) {
    const std::vector<uint8_t> picture = {0x89, 'P', 'N', 'G', 1, 2, 3, 0xFF, 0x00, 4};
    Bytes file;
    file.raw(testing_support::Id3Tag(
        3, {testing_support::Id3Frame(3, "APIC", testing_support::ApicBody("image/png", picture, "front"))}));
    file.raw(Mp3Stream(4, nullptr, 0, 0, 0));
    TempDir dir;
    const std::string path = dir.Write("cover.mp3", file.data());
    mi_info* info = nullptr;
    ASSERT_EQ(mi_probe(path.c_str(), &info), MI_OK);
    ASSERT_EQ(info->picture_count, 1u);
    EXPECT_STREQ(info->pictures[0].mime, "image/png");
    size_t size = 0;
    EXPECT_EQ(mi_picture_copy(path.c_str(), info, 0, nullptr, 0, &size), MI_E_BUFFER);
    ASSERT_EQ(size, picture.size());
    std::vector<uint8_t> copy(size);
    EXPECT_EQ(mi_picture_copy(path.c_str(), info, 0, copy.data(), copy.size(), &size), MI_OK);
    EXPECT_EQ(copy, picture);
    EXPECT_EQ(mi_picture_copy(path.c_str(), info, 1, copy.data(), copy.size(), &size), MI_E_ARGUMENT);
    file.u8(0);  // one byte more: not the file that was probed
    dir.Write("cover.mp3", file.data());
    EXPECT_EQ(mi_picture_copy(path.c_str(), info, 0, copy.data(), copy.size(), &size), MI_E_IO);
    mi_info_free(info);
}

}  // namespace
