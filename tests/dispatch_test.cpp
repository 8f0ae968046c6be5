// The exported interface: detection from the first bytes, the extension check and
// detection over the corpus; argument checks, the records it clears, the answer of each
// type's slots, freeing; the records' layout and the codec names.
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstring>
#include <string>
#include <thread>
#include <vector>

#include "aac/aac_frame.h"
#include "asf/asf_guids.h"
#include "core/byte_reader.h"
#include "core/codes.h"
#include "core/file_access.h"
#include "core/unsync.h"
#include "metainfo/metainfo.h"
#include "support/bytes.h"
#include "support/golden.h"
#include "support/aac_builder.h"
#include "support/mp3_builder.h"
#include "support/mp4_builder.h"

using namespace metainfo;
using testing_support::Bytes;
using testing_support::TempDir;

namespace {

class Dispatch : public ::testing::Test {
protected:
    TempDir dir;
    std::string midi = dir.Write("tune.mid", Bytes().str("MThd").be32(6).zeros(120));
    std::string wave = dir.Write("tone.wav", Bytes().str("RIFF").le32(120).str("WAVE").zeros(116));
    std::string mp4 = dir.Write("clip.mp4", Bytes().be32(16).str("ftypisom").zeros(112));
    std::string missing = dir.PathOf("missing.wav");
};

// A file of the given head padded with zeros to a full probe.
std::vector<uint8_t> Head(const Bytes& head) {
    Bytes b = head;
    if (b.size() < 128) b.zeros(128 - b.size());
    return b.data();
}

Bytes Riff(const char* form) { return Bytes().str("RIFF").le32(100).str(form); }

Bytes AsfHead() {
    Bytes b;
    for (uint8_t v : metainfo::ASF_Header_Object) b.u8(v);
    return b;
}

Bytes Mp3Stream(int frames = 3) { return Bytes(testing_support::Mp3Frames(frames)); }
Bytes AdtsStream() { return Bytes(testing_support::SilentAdts(3)); }

int Detect(const std::string& path) {
    int type = -1;
    EXPECT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK) << path;
    return type;
}
}  // namespace

TEST_F(Dispatch, NullArgumentsAreInvalid) {
    int mask = 0;
    _MMClipInfo clip;
    _MMMetaInfo meta;
    _MM_CODECTYPE codec;
    _MM_MIMETYPE mime;
    unsigned char* data = nullptr;
    int size = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(nullptr, 5, &mask), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(midi.c_str(), 5, nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_GetClipInfo(nullptr, 5, &clip), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_GetClipInfo(midi.c_str(), 5, nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_GetMetaInfo(nullptr, 5, &meta), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_GetMetaInfo(midi.c_str(), 5, nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_GetCodecType(nullptr, 5, &codec), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_GetCodecType(midi.c_str(), 5, nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_GetMIMEType(nullptr, &mime), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_GetMIMEType(midi.c_str(), nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_GetAudioData(nullptr, 0, 1, &data, &size), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_GetAudioData(midi.c_str(), 0, 1, nullptr, &size), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_GetAudioData(midi.c_str(), 0, 1, &data, nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_FreeMetaInfo(nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_GetMakerInfo(nullptr, nullptr), MM_E_INVALIDARG);
}

// What each type's slots answer for a MIDI file, records filled with garbage first:
// track result/mask, codec result/audio codec/video level, clip result/duration
// (milliseconds, at least one second once a slot ran)/file size, metadata
// result/title length/picture: every record is cleared first. Empty slots
// answer "not supported", except the track type, which answers audio.
TEST_F(Dispatch, EachTypeSlotAnswers) {
    testing_support::Golden golden("dispatch", "slots");
    for (int type : {-1, 0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15, 16, 254, 255, 256}) {
        int mask = 0x5A;
        _MM_CODECTYPE codec;
        _MMClipInfo clip;
        _MMMetaInfo meta;
        std::memset(&codec, 0xFF, sizeof codec);
        std::memset(&clip, 0xAB, sizeof clip);
        std::memset(&meta, 0x11, sizeof meta);
        const int32_t track = MM_MediaExtractor_GetTrackType(midi.c_str(), type, &mask);
        const int32_t codecResult = MM_MediaExtractor_GetCodecType(midi.c_str(), type, &codec);
        const int32_t clipResult = MM_MediaExtractor_GetClipInfo(midi.c_str(), type, &clip);
        const int32_t metaResult = MM_MediaExtractor_GetMetaInfo(midi.c_str(), type, &meta);
        char line[160];
        std::snprintf(line, sizeof line, "%x/%x %x/%x/%x %x/%u/%u %x/%u/%d", static_cast<unsigned>(track),
                      static_cast<unsigned>(mask), static_cast<unsigned>(codecResult), codec.nAudioCodec,
                      codec.nVideoLevel, static_cast<unsigned>(clipResult), clip.nDuration, clip.nFileSize,
                      static_cast<unsigned>(metaResult), meta.aItems[0].nLength, meta.pPicture != nullptr);
        golden.Check(std::to_string(type), line);
        MM_MediaExtractor_FreeMetaInfo(&meta);
    }
    EXPECT_EQ(MM_MediaExtractor_GetCodecTypeEx(midi.c_str(), MEDIA_TYPE_MIDI, nullptr), MM_E_UNSUPPORTED);
}

TEST_F(Dispatch, PathOnlyQueriesDetectTheTypeFirst) {
    _MM_MIMETYPE mime{};
    EXPECT_EQ(MM_MediaExtractor_GetMIMEType(mp4.c_str(), &mime), MM_E_UNSUPPORTED);
    EXPECT_EQ(mime.pszMimeType, nullptr);
    EXPECT_EQ(MM_MediaExtractor_GetMIMEType(missing.c_str(), &mime), MM_E_FAIL);
    unsigned char* data = nullptr;
    int size = 0;
    EXPECT_EQ(MM_MediaExtractor_GetAudioData(midi.c_str(), 0, 1, &data, &size), MM_E_UNSUPPORTED);
    EXPECT_EQ(MM_MediaExtractor_GetAudioData(missing.c_str(), 0, 1, &data, &size), MM_E_FAIL);
    EXPECT_EQ(data, nullptr);
    // The maker information of anything but MP4 leaves the record untouched.
    _MAKERINFO maker;
    std::memset(&maker, 0x5C, sizeof maker);
    EXPECT_EQ(MM_MediaExtractor_GetMakerInfo(wave.c_str(), &maker), MM_OK);
    EXPECT_EQ(maker.nValid, 0x5C5C5C5Cu);
    EXPECT_EQ(MM_MediaExtractor_GetMakerInfo(missing.c_str(), &maker), MM_E_FAIL);
}

TEST_F(Dispatch, FreeingIsSafeAndIdempotent) {
    _MMMetaInfo meta;
    std::memset(&meta, 0, sizeof meta);
    meta.pPicture = new unsigned char[16];
    meta.nPictureSize = 16;
    meta.aItems[3].nLength = 4;
    EXPECT_EQ(MM_MediaExtractor_FreeMetaInfo(&meta), MM_OK);
    EXPECT_EQ(meta.pPicture, nullptr);
    EXPECT_EQ(meta.aItems[3].nLength, 0u);
    EXPECT_EQ(MM_MediaExtractor_FreeMetaInfo(&meta), MM_OK);
    EXPECT_EQ(MM_MediaExtractor_FreeClipInfo(nullptr), MM_OK);
    MM_MediaExtractor_FreeBuffer(nullptr);
    MM_MediaExtractor_FreeBuffer(new unsigned char[3]);
    EXPECT_EQ(MM_MediaExtractor_GetVideoData(nullptr, 0, 0, nullptr, nullptr), MM_OK);
    for (int slot = 0; slot < MM_MEDIA_SLOTS; ++slot) EXPECT_EQ(MM_GetVideoData[slot], nullptr);
}

// Offsets that callers compile against (the sizes are asserted in the header).
TEST(Records, LayoutsAndCodecNames) {
    EXPECT_EQ(offsetof(_MMClipInfo, nFileSize), 128u);
    EXPECT_EQ(offsetof(_MMClipInfo, nFrameRate), 188u);
    EXPECT_EQ(offsetof(_MMMetaItem, nLength), 132u);
    EXPECT_EQ(offsetof(_MMMetaInfo, pPicture), 2312u);
    EXPECT_LT(offsetof(_MMMetaInfo, nPlayCount), offsetof(_MMMetaInfo, stAlbumArtist));
    EXPECT_LT(offsetof(_MMMetaInfo, stAlbumArtist), offsetof(_MMMetaInfo, nReserved));
    EXPECT_LT(offsetof(_MM_MIMETYPE, nMimeLength), offsetof(_MM_MIMETYPE, pszVideoMimeType));
    EXPECT_LT(offsetof(_MAKERINFO, nThumbnailSize), offsetof(_MAKERINFO, pPhoneModel));
    // Names as the binding hands them out, blanks and misspellings included; AMR
    // frame-type sub-codes have none.
    EXPECT_STREQ(CodecName(0x1001), "CODEC_MP3_LAYER1");
    EXPECT_STREQ(CodecName(0x1030), "CODEC_WAVE_PCM  ");
    EXPECT_STREQ(CodecName(0x1032), "CODEC_WAVE_ALAW ");
    EXPECT_STREQ(CodecName(0x5010), "CODEC_WMV9_PEOFILE_SIMPLE");
    EXPECT_STREQ(CodecName(0x400A), "CODEC_MP4AUDIO_MP4A_AAC_PLUS_V2");
    EXPECT_EQ(CodecName(0), nullptr);
    EXPECT_EQ(CodecName(0x1011), nullptr);
}

TEST(Records, ByteReaderAndSync) {
    const uint8_t data[] = {0x01, 0x02, 0x03, 0x04, 0x05, 0x06, 0x07, 0x08, 0x09};
    ByteReader r(data, sizeof data);
    uint32_t be = 0;
    uint16_t le = 0;
    ASSERT_TRUE(r.BE32(&be));
    EXPECT_EQ(be, 0x01020304u);
    ASSERT_TRUE(r.LE16(&le));
    EXPECT_EQ(le, 0x0605);
    uint32_t tooFar = 0xDEAD;
    EXPECT_FALSE(r.LE32(&tooFar));
    EXPECT_EQ(tooFar, 0xDEADu) << "a failed read writes nothing";
    EXPECT_EQ(r.position(), 6u) << "and does not move";
    EXPECT_FALSE(r.Skip(4));
    EXPECT_TRUE(r.Skip(3));
    EXPECT_TRUE(r.empty());
    EXPECT_FALSE(r.Seek(10));
    EXPECT_TRUE(r.Seek(0));
    EXPECT_TRUE(r.Tag("\x01\x02", 2));
    EXPECT_EQ(ReadLE64(data), 0x0807060504030201ull);
    EXPECT_EQ(ReadBE64(data), 0x0102030405060708ull);
    const uint8_t syncsafe[] = {0x00, 0x00, 0x02, 0x01};
    EXPECT_EQ(ReadSyncsafe32(syncsafe), 257u);
    // Unsynchronisation drops the zero after each FF but looks no further.
    const struct {
        std::vector<uint8_t> in, out;
    } cases[] = {{{0xFF, 0x00}, {0xFF}},
                 {{0xFF, 0x00, 0x00}, {0xFF, 0x00}},
                 {{0xFF, 0xFF, 0x00}, {0xFF, 0xFF, 0x00}},
                 {{0x12, 0xFF, 0x00, 0xE0, 0xFF}, {0x12, 0xFF, 0xE0, 0xFF}}};
    for (auto c : cases) {
        c.in.resize(static_cast<size_t>(Sync(c.in.data(), static_cast<int>(c.in.size()))));
        EXPECT_EQ(c.in, c.out);
    }
    EXPECT_EQ(Sync(nullptr, 4), 0);
}

TEST(Detect, EverySignatureGivesItsMediaType) {
    TempDir dir;
    const struct {
        const char* name;
        Bytes head;
        int type;
    } cases[] = {
        {"ftyp", Bytes().be32(24).str("ftypisom"), MEDIA_TYPE_MP4},
        {"mdat", Bytes().be32(8).str("mdat"), MEDIA_TYPE_MP4},
        {"asf", AsfHead(), MEDIA_TYPE_ASF},
        {"rm", Bytes().str(".RMF"), MEDIA_TYPE_REALMEDIA},
        {"smf", Bytes().str("MThd"), MEDIA_TYPE_MIDI},
        {"smaf", Bytes().str("MMMD"), MEDIA_TYPE_MIDI},
        {"xmf", Bytes().str("XMF_2.00"), MEDIA_TYPE_MIDI},
        {"imelody", Bytes().str("BEGIN:IMELODY\r\n"), MEDIA_TYPE_MIDI},
        {"tune.imy", Bytes().str("BEGIN:IMELODY"), MEDIA_TYPE_MIDI},  // iMelody is always taken by the MIDI family
        {"snd", Bytes().str(".snd"), MEDIA_TYPE_SND},
        {"avi", Riff("AVI "), MEDIA_TYPE_AVI},
        {"wave", Riff("WAVE"), MEDIA_TYPE_WAVE},
        {"qcp", Riff("QLCM"), MEDIA_TYPE_QCP},
        {"evrc", Bytes().str("#!EVRC\n"), MEDIA_TYPE_EVRC},
        {"amr", Bytes().str("#!AMR\n"), MEDIA_TYPE_AMR_NB},
        {"awb", Bytes().str("#!AMR-WB\n"), MEDIA_TYPE_AMR_WB},
        {"mp3", Mp3Stream(), MEDIA_TYPE_MP3},
        {"voice.amr", Bytes().str("#!AMR\n").raw(Mp3Stream()), MEDIA_TYPE_MP3},  // MP3 is tried before AMR
        {"adts", AdtsStream(), MEDIA_TYPE_AAC},
        {"adif", Bytes().str("ADIF"), MEDIA_TYPE_AAC},
        {"other-riff", Riff("CDXA"), MEDIA_TYPE_UNKNOWN},
        {"zeros", Bytes(), MEDIA_TYPE_UNKNOWN},
    };
    for (const auto& c : cases) EXPECT_EQ(Detect(dir.Write(c.name, Head(c.head))), c.type) << c.name;
}

TEST(Detect, ShortMissingAndNullInputsFail) {
    TempDir dir;
    int type = -1;
    std::string shortFile = dir.Write("short.wav", Bytes().str("RIFF").le32(0).str("WAVE").zeros(3));
    EXPECT_EQ(MM_MediaExtractor_DetectMediaType(shortFile.c_str(), &type), MM_E_FAIL);
    EXPECT_EQ(MM_MediaExtractor_CheckMediaType(shortFile.c_str()), MM_E_FAIL);
    EXPECT_EQ(MM_MediaExtractor_DetectMediaType(dir.PathOf("missing.wav").c_str(), &type), MM_E_FAIL);
    EXPECT_EQ(MM_MediaExtractor_DetectMediaType(nullptr, &type), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_DetectMediaType(shortFile.c_str(), nullptr), MM_E_INVALIDARG);
    EXPECT_EQ(MM_MediaExtractor_CheckMediaType(nullptr), MM_E_INVALIDARG);
}

TEST(CheckMediaType, EveryExtensionGroupAcceptsItsContentAndRejectsOther) {
    TempDir dir;
    const struct {
        std::vector<const char*> extensions;
        Bytes content;
    } groups[] = {
        {{".mp3", ".mpga"}, Mp3Stream()},
        {{".aac"}, AdtsStream()},
        {{".wma", ".wmv", ".asf"}, AsfHead()},
        {{".rm", ".ram", ".rmvb", ".ra", ".rv"}, Bytes().str(".RMF")},
        {{".m4a", ".mp4", ".3ga", ".3gp"}, Bytes().be32(16).str("ftypmp42")},
        {{".mid", ".midi", ".smf", ".mmf", ".xmf", ".xmf0", ".xmf1", ".mxmf", ".imy"}, Bytes().str("MMMD")},
        {{".wav", ".WAV"}, Riff("WAVE")},
        {{".avi"}, Riff("AVI ")},
        {{".qcp"}, Riff("QLCM")},
        {{".evc"}, Bytes().str("#!EVRC\n")},
        {{".amr"}, Bytes().str("#!AMR\n")},
        {{".awb"}, Bytes().str("#!AMR-WB\n")},
    };
    int n = 0;
    for (const auto& g : groups) {
        for (const char* ext : g.extensions) {
            std::string name = "f" + std::to_string(n++);
            EXPECT_EQ(MM_MediaExtractor_CheckMediaType(dir.Write(name + ext, Head(g.content)).c_str()), MM_OK) << ext;
            EXPECT_NE(MM_MediaExtractor_CheckMediaType(dir.Write(name + "z" + ext, Head(Bytes().str("JUNK"))).c_str()),
                      MM_OK)
                << ext;
        }
    }
    // A sixteen-byte WAVE file matches only WAVE extensions; unlisted extensions and
    // Sun audio fail even when detected; a path without a dot has no extension.
    const Bytes wave = Bytes().str("RIFF").le32(8).str("WAVE").zeros(4);
    const struct {
        const char* name;
        std::vector<uint8_t> file;
        int32_t result;
    } cases[] = {
        {"a.wav", wave.data(), MM_OK},
        {"b.WAV", wave.data(), MM_OK},
        {"c.avi", wave.data(), MM_E_UNSUPPORTED},
        {"a.snd", Head(Bytes().str(".snd")), MM_E_UNSUPPORTED},
        {"a.ogg", Head(Mp3Stream()), MM_E_UNSUPPORTED},
        {"nodot", Head(Bytes().str("#!AMR\n")), MM_E_NOEXTENSION},
    };
    ASSERT_EQ(dir.path().find('.'), std::string::npos) << "temporary folder must not contain a dot";
    for (const auto& c : cases)
        EXPECT_EQ(MM_MediaExtractor_CheckMediaType(dir.Write(c.name, c.file).c_str()), c.result) << c.name;
    EXPECT_EQ(Detect(dir.PathOf("a.wav")), MEDIA_TYPE_WAVE);
    EXPECT_EQ(Detect(dir.PathOf("nodot")), MEDIA_TYPE_AMR_NB);
    // The ".aac" check passes the AAC check's result through, whatever the file is detected as.
    const std::string mp3 = dir.Write("song.aac", Mp3Stream(6));
    const int h = metainfo::MEx_fopen(mp3.c_str(), "rb");
    uint8_t probe[128] = {0};
    metainfo::MEx_fread(probe, 1, sizeof probe, h);
    const int32_t expected = metainfo::VerifyAAC(h, probe);
    metainfo::MEx_fclose(h);
    EXPECT_EQ(MM_MediaExtractor_CheckMediaType(mp3.c_str()), expected);
    EXPECT_EQ(Detect(mp3), MEDIA_TYPE_MP3);
}

// Clip information and codec of raw AAC share one walk of the frames, and an
// MP4 codec query takes the clip walk's answer: a file rewritten between the
// queries is walked anew, whether it had settled before (its times change) or
// was written moments ago (a rewrite may keep its times).
TEST(SharedWalk, AFileRewrittenBetweenQueriesIsWalkedAnew) {
    using testing_support::AdtsFrames;
    using testing_support::AdtsLayout;
    namespace mp4 = testing_support;
    auto m4a = [](uint8_t config) {
        const auto entry = mp4::AudioEntry("mp4a", 2, 16, 44100, mp4::Esds(0x40, 96000, {config, 0x10}));
        return mp4::Movie(
            mp4::Join({mp4::Mvhd(0, 1000, 10000),
                       mp4::Trak("soun", 1000, 10000, mp4::Join({mp4::Stsd({entry}), mp4::Stsz(100, 10)}))}));
    };
    const std::vector<size_t> sizes(60, 200);
    struct Version {
        std::vector<uint8_t> bytes;
        uint32_t rate, audioCodec, audioSubType;
    };
    const struct {
        const char* name;
        int type;
        Version a, b;
    } kCases[] = {
        {"aac",
         MEDIA_TYPE_AAC,
         {AdtsFrames(AdtsLayout(4, 2), sizes), 44100, CODEC_AAC_ADTS, PROFILE_AAC_LC},
         {AdtsFrames(AdtsLayout(4, 2), sizes, 13), 88200, CODEC_AAC_PLUS_V1_ADTS, PROFILE_AAC_LC}},
        {"m4a",
         MEDIA_TYPE_MP4,
         {m4a(0x12), 44100, CODEC_MP4AUDIO_MP4A_AAC, PROFILE_AAC_LC},
         {m4a(0x0A), 44100, CODEC_MP4AUDIO_MP4A_AAC, PROFILE_AAC_MAIN}},
    };
    TempDir dir;
    for (const auto& c : kCases) {
        ASSERT_EQ(c.a.bytes.size(), c.b.bytes.size()) << c.name;
        dir.Write(std::string("settled.") + c.name, c.a.bytes);
    }
    // Files this much older than their first read are trusted by their times.
    std::this_thread::sleep_for(std::chrono::milliseconds(2200));
    for (const auto& c : kCases) {
        for (const char* age : {"settled.", "fresh."}) {
            SCOPED_TRACE(std::string(age) + c.name);
            const std::string path = dir.PathOf(age + std::string(c.name));
            if (std::string(age) == "fresh.") dir.Write(age + std::string(c.name), c.a.bytes);
            // Clip information of one version, then the other written and its codec asked.
            for (const Version* now : {&c.a, &c.b}) {
                const Version& next = now == &c.a ? c.b : c.a;
                _MMClipInfo clip{};
                ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), c.type, &clip), MM_OK);
                EXPECT_EQ(clip.nSampleRate, now->rate);
                dir.Write(age + std::string(c.name), next.bytes);
                _MM_CODECTYPE codec{};
                ASSERT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), c.type, &codec), MM_OK);
                EXPECT_EQ(codec.nAudioCodec, next.audioCodec);
                EXPECT_EQ(codec.nAudioSubType, next.audioSubType);
            }
        }
    }
}
