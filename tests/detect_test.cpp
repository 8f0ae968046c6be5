#include <gtest/gtest.h>

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
std::vector<uint8_t> Head(const Bytes& head, size_t total = 128) {
    Bytes b = head;
    if (b.size() < total) b.zeros(total - b.size());
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

Bytes AdtsStream(int frames = 3) {
    Bytes b;
    for (int i = 0; i < frames; ++i) b.raw(testing_support::AdtsFrame({}, testing_support::SilentAacBlock()));
    return b;
}

int Detect(const std::string& path) {
    int type = -1;
    EXPECT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK) << path;
    return type;
}

struct SignatureCase {
    const char* name;
    Bytes head;
    int type;
};

}  // namespace

TEST(Detect, EverySignatureGivesItsMediaType) {
    TempDir dir;
    const SignatureCase cases[] = {
        {"ftyp", Bytes().be32(24).str("ftypisom"), MEDIA_TYPE_MP4},
        {"mdat", Bytes().be32(8).str("mdat"), MEDIA_TYPE_MP4},
        {"asf", AsfHead(), MEDIA_TYPE_ASF},
        {"rm", Bytes().str(".RMF"), MEDIA_TYPE_REALMEDIA},
        {"smf", Bytes().str("MThd"), MEDIA_TYPE_MIDI},
        {"smaf", Bytes().str("MMMD"), MEDIA_TYPE_MIDI},
        {"xmf", Bytes().str("XMF_2.00"), MEDIA_TYPE_MIDI},
        {"imelody", Bytes().str("BEGIN:IMELODY\r\n"), MEDIA_TYPE_MIDI},
        {"snd", Bytes().str(".snd"), MEDIA_TYPE_SND},
        {"avi", Riff("AVI "), MEDIA_TYPE_AVI},
        {"wave", Riff("WAVE"), MEDIA_TYPE_WAVE},
        {"qcp", Riff("QLCM"), MEDIA_TYPE_QCP},
        {"evrc", Bytes().str("#!EVRC\n"), MEDIA_TYPE_EVRC},
        {"amr", Bytes().str("#!AMR\n"), MEDIA_TYPE_AMR_NB},
        {"awb", Bytes().str("#!AMR-WB\n"), MEDIA_TYPE_AMR_WB},
        {"mp3", Mp3Stream(), MEDIA_TYPE_MP3},
        {"adts", AdtsStream(), MEDIA_TYPE_AAC},
        {"adif", Bytes().str("ADIF"), MEDIA_TYPE_AAC},
        {"other-riff", Riff("CDXA"), MEDIA_TYPE_UNKNOWN},
        {"zeros", Bytes(), MEDIA_TYPE_UNKNOWN},
    };
    for (const SignatureCase& c : cases) {
        EXPECT_EQ(Detect(dir.Write(c.name, Head(c.head))), c.type) << c.name;
    }
}

TEST(Detect, ImelodyIsAlwaysTakenByTheMidiFamily) {
    TempDir dir;
    EXPECT_EQ(Detect(dir.Write("tune.imy", Head(Bytes().str("BEGIN:IMELODY")))), MEDIA_TYPE_MIDI);
}

TEST(Detect, MP3IsTriedBeforeTheAmrSignatures) {
    TempDir dir;
    Bytes amrLookingLikeMp3 = Bytes().str("#!AMR\n").raw(Mp3Stream());
    EXPECT_EQ(Detect(dir.Write("voice.amr", amrLookingLikeMp3)), MEDIA_TYPE_MP3);
}

TEST(Detect, Mp3BehindAnId3TagIsFound) {
    TempDir dir;
    Bytes file = Bytes().raw(testing_support::Id3v2Tag(3, std::vector<uint8_t>(300, 0))).raw(Mp3Stream());
    EXPECT_EQ(Detect(dir.Write("tagged", file)), MEDIA_TYPE_MP3);
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

TEST(CheckMediaType, SixteenByteWaveMatchesOnlyWaveExtensionsInAnyCase) {
    TempDir dir;
    Bytes wave = Bytes().str("RIFF").le32(8).str("WAVE").zeros(4);
    EXPECT_EQ(Detect(dir.Write("x.wav", wave)), MEDIA_TYPE_WAVE);
    EXPECT_EQ(MM_MediaExtractor_CheckMediaType(dir.Write("a.wav", wave).c_str()), MM_OK);
    EXPECT_EQ(MM_MediaExtractor_CheckMediaType(dir.Write("b.WAV", wave).c_str()), MM_OK);
    EXPECT_EQ(MM_MediaExtractor_CheckMediaType(dir.Write("c.avi", wave).c_str()), MM_E_UNSUPPORTED);
}

TEST(CheckMediaType, EveryExtensionGroupAcceptsItsContentAndRejectsOther) {
    TempDir dir;
    struct Group {
        std::vector<const char*> extensions;
        Bytes content;
    };
    const Group groups[] = {
        {{".mp3", ".mpga"}, Mp3Stream()},
        {{".aac"}, AdtsStream()},
        {{".wma", ".wmv", ".asf"}, AsfHead()},
        {{".rm", ".ram", ".rmvb", ".ra", ".rv"}, Bytes().str(".RMF")},
        {{".m4a", ".mp4", ".3ga", ".3gp"}, Bytes().be32(16).str("ftypmp42")},
        {{".mid", ".midi", ".smf", ".mmf", ".xmf", ".xmf0", ".xmf1", ".mxmf", ".imy"}, Bytes().str("MMMD")},
        {{".wav"}, Riff("WAVE")},
        {{".avi"}, Riff("AVI ")},
        {{".qcp"}, Riff("QLCM")},
        {{".evc"}, Bytes().str("#!EVRC\n")},
        {{".amr"}, Bytes().str("#!AMR\n")},
        {{".awb"}, Bytes().str("#!AMR-WB\n")},
    };
    int n = 0;
    for (const Group& g : groups) {
        for (const char* ext : g.extensions) {
            std::string name = "f" + std::to_string(n++);
            EXPECT_EQ(MM_MediaExtractor_CheckMediaType(dir.Write(name + ext, Head(g.content)).c_str()), MM_OK) << ext;
            EXPECT_NE(MM_MediaExtractor_CheckMediaType(dir.Write(name + "z" + ext, Head(Bytes().str("JUNK"))).c_str()),
                      MM_OK)
                << ext;
        }
    }
}

TEST(CheckMediaType, UnlistedExtensionsAndSndFailEvenWhenDetected) {
    TempDir dir;
    EXPECT_EQ(MM_MediaExtractor_CheckMediaType(dir.Write("a.snd", Head(Bytes().str(".snd"))).c_str()),
              MM_E_UNSUPPORTED);
    EXPECT_EQ(MM_MediaExtractor_CheckMediaType(dir.Write("a.ogg", Head(Mp3Stream())).c_str()), MM_E_UNSUPPORTED);
}

TEST(CheckMediaType, APathWithoutADotHasNoExtensionButIsStillDetected) {
    TempDir dir;
    std::string path = dir.Write("nodot", Head(Bytes().str("#!AMR\n")));
    ASSERT_EQ(path.find('.'), std::string::npos) << "temporary folder must not contain a dot";
    EXPECT_EQ(MM_MediaExtractor_CheckMediaType(path.c_str()), MM_E_NOEXTENSION);
    EXPECT_EQ(Detect(path), MEDIA_TYPE_AMR_NB);
}

TEST(CheckMediaType, AacExtensionPassesTheAacVerifierResultThrough) {
    TempDir dir;
    std::string path = dir.Write("song.aac", Mp3Stream(6));
    int h = metainfo::MEx_fopen(path.c_str(), "rb");
    ASSERT_NE(h, 0);
    uint8_t probe[128] = {0};
    metainfo::MEx_fread(probe, 1, sizeof probe, h);
    int32_t expected = metainfo::VerifyAAC(h, probe);
    metainfo::MEx_fclose(h);
    EXPECT_EQ(MM_MediaExtractor_CheckMediaType(path.c_str()), expected);
    EXPECT_EQ(Detect(path), MEDIA_TYPE_MP3);
}
