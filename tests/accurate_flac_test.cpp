// FLAC files and APE tags as the accurate interface reads them: metadata
// blocks built one by one, and MP3 files whose APE tag fills what ID3 lacks.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "metainfo/metainfo.h"
#include "support/bytes.h"
#include "support/flac_builder.h"
#include "support/id3_builder.h"
#include "support/mp3_builder.h"

using namespace testing_support;

namespace {

constexpr uint8_t kInfo = 0, kPadding = 1, kComments = 4, kPicture = 6;
const Bytes kPng{0x89, 'P', 'N', 'G', 1, 2};

struct Row {
    const char* name;
    Bytes file;
    std::string summary;
};

Bytes Flac(const std::vector<Bytes>& blocks, const Bytes& before = Bytes()) {
    Bytes b = before;
    b.str("fLaC");
    for (const Bytes& block : blocks) b.raw(block);
    return b.fill(300, 0xAA);  // frames
}

void Check(const std::vector<Row>& rows, const char* name) {
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        TempDir dir;
        EXPECT_EQ(ProbeSummary(dir.Write(name, row.file.data())), row.summary);
    }
}

TEST(AccurateFlac, FactsOfBuiltStreams) {
    const std::vector<Row> rows = {
        {"every comment, a picture, padding",
         Flac({FlacBlock(kInfo, FlacStreamInfo(44100, 2, 16, 132300)),
               FlacBlock(kComments, VorbisComments({"TITLE=T", "artist=A", "ALBUM=Al", "ALBUMARTIST=AA", "GENRE=Rock",
                                                    "DATE=2019-05-02", "TRACKNUMBER=3", "TRACKTOTAL=11",
                                                    "DISCNUMBER=1/2", "DESCRIPTION=D", "COMPOSER=C", "foo=bar",
                                                    "ARTIST=B", "METADATA_BLOCK_PICTURE=AAAA", "novalue"})),
               FlacBlock(kPicture, FlacPicture(3, "image/png", "front", kPng)),
               FlacBlock(kPadding, Bytes().zeros(9), true)}),
         "flac audio/flac 3000 | flac 44100x2x16 800 | T;A;B;Al;AA;Rock;2019-05-02;2019;3/11;1/2;D;C FOO=bar | "
         "image/png 3 front 6 89504e47"},
        {"24-bit behind two ID3v2 tags",
         Flac({FlacBlock(kInfo, FlacStreamInfo(96000, 1, 24, 48000), true)},
              Bytes(Join({Id3Tag(3, {}), Id3Tag(4, {})}))),
         "flac audio/flac 500 | flac 96000x1x24 4800 | ;;;;;;0;0/0;0/0;;"},
        {"an ID3v2 tag ahead fills what the Vorbis comment lacks",
         Flac({FlacBlock(kInfo, FlacStreamInfo(8000, 1, 16, 8000)),
               FlacBlock(kComments, VorbisComments({"TITLE=T"}), true)},
              Bytes(Join({Id3Tag(3, {Id3Frame(3, "TIT2", TextBody(0, "Id3 title")),
                                     Id3Frame(3, "TPE1", TextBody(0, "Id3 artist"))})}))),
         "flac audio/flac 1000 | flac 8000x1x16 2400 | T;Id3 artist;;;;;0;0/0;0/0;;"},
        {"no sample count: length unknown; blocks after the last one are frames",
         Flac({FlacBlock(kInfo, FlacStreamInfo(8000, 1, 8, 0), true),
               FlacBlock(kComments, VorbisComments({"TITLE=X"}))}),
         "flac audio/flac -1~ | flac 8000x1x8 0 | ;;;;;;0;0/0;0/0;;"},
        {"a picture larger than its block is left out",
         Flac({FlacBlock(kInfo, FlacStreamInfo(8000, 1, 16, 8000)),
               FlacBlock(kPicture, Bytes(FlacPicture(0, "image/png", "", kPng)).patch_be32(37, 99), true)}),
         "flac audio/flac 1000 | flac 8000x1x16 2400 | ;;;;;;0;0/0;0/0;;"},
        {"a block past the end of the file",
         Flac({FlacBlock(kInfo, FlacStreamInfo(8000, 1, 16, 8000)), Bytes().u8(kPadding).be24(0xFFFFFF)}), "error 8"},
        {"no STREAMINFO", Flac({FlacBlock(kPadding, Bytes().zeros(4), true)}), "error 8"},
    };
    Check(rows, "f.flac");
    // The C interface answers for FLAC files as it always has.
    TempDir dir;
    int type = -1;
    const std::string path = dir.Write("f.flac", rows[0].file.data());
    EXPECT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK);
    EXPECT_EQ(type, MEDIA_TYPE_UNKNOWN);
}

TEST(AccurateFlac, ApeTagsFillWhatId3Lacks) {
    const Bytes audio(Mp3Frames(40));
    const Bytes id3(Id3Tag(3, {Id3Frame(3, "TIT2", TextBody(0, "Id3 title"))}));
    const Bytes ape = ApeTag({{"Title", Bytes().str("Ape title")},
                              {"ARTIST", Bytes().str("A")},
                              {"Album Artist", Bytes().str("AA")},
                              {"Year", Bytes().str("2001-02")},
                              {"Track", Bytes().str("3/11")},
                              {"Disc", Bytes().str("2")},
                              {"Mood", Bytes().str("calm")},
                              {"Cover Art (Front)", Bytes().str("cover.png").u8(0).raw(kPng), true},
                              {"Cover Art (Back)", Bytes().str("no separator"), true}});
    const Bytes bigCover = Bytes().str("c.png").u8(0).raw(kPng).zeros(40000);
    const std::vector<Row> rows = {
        {"ID3v2, APEv2, ID3v1", Bytes(Join({id3.data(), audio.data(), ape.data(), Id3v1Titled("V1")})),
         "mp3 audio/mpeg 1045 | mp3 44100x2x0 128000 | Id3 title;A;;AA;;2001-02;2001;3/11;2/0;; Mood=calm | "
         "image/png 3 cover.png 6 89504e47"},
        {"an APE tag ranks above the ID3v1 tag after it", Bytes(Join({audio.data(), ape.data(), Id3v1Titled("V1")})),
         "mp3 audio/mpeg 1045 | mp3 44100x2x0 128000 | Ape title;A;;AA;;2001-02;2001;3/11;2/0;; Mood=calm | "
         "image/png 3 cover.png 6 89504e47"},
        // Over 1 MiB of frames the length comes from the stream's bytes: both tags are left out.
        {"APEv2 then ID3v1 (as mutagen writes them), no ID3v2",
         Bytes(Join({Mp3Frames(2600),
                     ApeTag({{"Artist", Bytes().str("A")}, {"Cover Art (Front)", bigCover, true}}).data(),
                     Id3v1Titled("V1")})),
         "mp3 audio/mpeg 67763~ | mp3 44100x2x0 128000 | V1;A;;;;;0;0/0;0/0;; | image/png 3 c.png 40006 89504e47"},
        {"APEv1 alone at the end", Bytes(Join({audio.data(), ApeTag({{"Title", Bytes().str("T1")}}, 1000)})),
         "mp3 audio/mpeg 1045 | mp3 44100x2x0 128000 | T1;;;;;;0;0/0;0/0;;"},
        {"a tag size past the start of the file",
         Bytes(Join({audio.data(), Bytes().str("APETAGEX").le32(2000).le32(0x7FFFFFFF).le32(1).zeros(12).data()})),
         "mp3 audio/mpeg 1045 | mp3 44100x2x0 128000 | ;;;;;;0;0/0;0/0;;"},
    };
    Check(rows, "f.mp3");
}

}  // namespace
