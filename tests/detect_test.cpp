// Detection from the first bytes, the extension check, and detection over the
// real files of the corpus, hostile ones included.
#include <gtest/gtest.h>

#include <sys/stat.h>

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <set>
#include <string>
#include <vector>

#include "aac/aac_frame.h"
#include "asf/asf_guids.h"
#include "core/file_access.h"
#include "metainfo/metainfo.h"
#include "support/bytes.h"
#include "support/media.h"

using testing_support::Bytes;
using testing_support::TempDir;

namespace {

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

Bytes Mp3Stream(int frames = 3) {
    Bytes b;
    for (int i = 0; i < frames; ++i) b.raw(testing_support::Mp3Frame({}));
    return b;
}

Bytes AdtsStream() {
    Bytes b;
    for (int i = 0; i < 3; ++i) b.raw(testing_support::AdtsFrame({}, testing_support::SilentAacBlock()));
    return b;
}

int Detect(const std::string& path) {
    int type = -1;
    EXPECT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK) << path;
    return type;
}

}  // namespace

TEST(Detect, EverySignatureGivesItsMediaType) {
    TempDir dir;
    const struct { const char* name; Bytes head; int type; } cases[] = {
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
    const struct { std::vector<const char*> extensions; Bytes content; } groups[] = {
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
            EXPECT_NE(MM_MediaExtractor_CheckMediaType(dir.Write(name + "z" + ext, Head(Bytes().str("JUNK"))).c_str()), MM_OK)
                << ext;
        }
    }
    // A sixteen-byte WAVE file matches only WAVE extensions; unlisted extensions and
    // Sun audio fail even when detected; a path without a dot has no extension.
    const Bytes wave = Bytes().str("RIFF").le32(8).str("WAVE").zeros(4);
    const struct { const char* name; std::vector<uint8_t> file; int32_t result; } cases[] = {
        {"a.wav", wave.data(), MM_OK},
        {"b.WAV", wave.data(), MM_OK},
        {"c.avi", wave.data(), MM_E_UNSUPPORTED},
        {"a.snd", Head(Bytes().str(".snd")), MM_E_UNSUPPORTED},
        {"a.ogg", Head(Mp3Stream()), MM_E_UNSUPPORTED},
        {"nodot", Head(Bytes().str("#!AMR\n")), MM_E_NOEXTENSION},
    };
    ASSERT_EQ(dir.path().find('.'), std::string::npos) << "temporary folder must not contain a dot";
    for (const auto& c : cases) EXPECT_EQ(MM_MediaExtractor_CheckMediaType(dir.Write(c.name, c.file).c_str()), c.result) << c.name;
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

TEST(Corpus, DetectionAnswersEveryReadableFileAndKnowsTheObviousOnes) {
    const std::string root = testing_support::CorpusDir();
    if (root.empty()) GTEST_SKIP() << "no corpus beside the project";
    const std::set<std::string> mp3 = {"/mutagen/silence-44-s.mp3", "/mutagen/silence-44-s-v1.mp3", "/mutagen/xing.mp3",
                                       "/mutagen/vbri.mp3", "/mutagen/lame.mp3", "/mutagen/silence-44-s-mpeg2.mp3",
                                       "/mutagen/silence-44-s-mpeg25.mp3", "/taglib/lame_cbr.mp3", "/taglib/lame_vbr.mp3"};
    size_t mp3Found = 0;
    for (const char* sub : {"/mutagen", "/taglib"}) {
        for (const auto& entry : std::filesystem::directory_iterator(root + sub)) {
            if (!entry.is_regular_file()) continue;
            const std::string path = entry.path().string(), name = sub + ("/" + entry.path().filename().string());
            std::string ext = entry.path().extension().string();
            for (char& c : ext) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
            int type = -1;
            const int32_t result = MM_MediaExtractor_DetectMediaType(path.c_str(), &type);
            MM_MediaExtractor_CheckMediaType(path.c_str());
            if (entry.file_size() < 16) {
                EXPECT_EQ(result, MM_E_FAIL) << path;
                continue;
            }
            ASSERT_EQ(result, MM_OK) << path;
            if (mp3.count(name) != 0) {
                ++mp3Found;
                EXPECT_EQ(type, MEDIA_TYPE_MP3) << path;
            } else if (ext == ".m4a" || ext == ".mp4" || ext == ".3g2" || ext == ".m4b" || ext == ".m4v") {
                // MP4 is known by a leading "ftyp" or "mdat"; the 64bit files open with "moov".
                if (path.find("64bit") == std::string::npos) { EXPECT_EQ(type, MEDIA_TYPE_MP4) << path; }
            } else if (ext == ".wma") {
                EXPECT_EQ(type, MEDIA_TYPE_ASF) << path;
            } else if (ext == ".wav" && path.find("rf64") == std::string::npos) {
                EXPECT_EQ(type, MEDIA_TYPE_WAVE) << path;
            } else if (ext == ".mid") {
                EXPECT_EQ(type, MEDIA_TYPE_MIDI) << path;
            }
        }
    }
    EXPECT_EQ(mp3Found, mp3.size());
}
