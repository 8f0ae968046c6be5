// ASF facts of the accurate interface over headers built object by object:
// what each stream, attribute and picture reads as, beside the MM_ clip
// answer of the same file, and how broken objects are bounded.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "asf/asf_facts.h"
#include "asf/asf_header.h"
#include "metainfo/metainfo.h"
#include "support/asf_builder.h"
#include "support/bytes.h"

using namespace testing_support;
using namespace metainfo;

namespace {

constexpr uint16_t kText = 0, kBinary = 1, kDword = 3, kWord = 5;
constexpr uint64_t kPlay = 63430000;  // 6.343 s, of which 3 s preroll

std::vector<uint8_t> Text(const std::string& s) { return Utf16(s).data(); }
std::vector<uint8_t> Number(uint32_t v, int bytes) {
    Bytes b;
    for (int i = 0; i < bytes; ++i) b.u8(v >> (8 * i));
    return b.data();
}

std::string File(const TempDir& dir, const std::vector<Bytes>& objects) {
    Bytes file = AsfHeader(objects);
    file.raw(AsfGuid("75B22636-668E-11CF-A6D9-00AA0062CE6C")).le64(50).fill(26, 0);
    return dir.Write("f.asf", file.data());
}

std::string Summary(const MediaFacts& f) {
    std::string s = f.mime + " " + std::to_string(f.durationUs) + (f.durationExact ? "" : "~");
    for (const StreamFacts& t : f.streams) {
        s += " | " + t.codec + (t.profile.empty() ? "" : "/" + t.profile) + " ";
        s += t.kind == StreamFacts::kAudio ? std::to_string(t.sampleRate) + "x" + std::to_string(t.channels) + "x" +
                                                 std::to_string(t.bitsPerSample)
                                           : std::to_string(t.width) + "x" + std::to_string(t.height) + "@" +
                                                 std::to_string(t.frameRateNum) + "/" + std::to_string(t.frameRateDen);
        s += " " + std::to_string(t.bitRate);
    }
    const TagFacts& g = f.tags;
    s += " | " + g.title + ";" + g.artist + ";" + g.album + ";" + g.albumArtist + ";" + g.genre + ";" + g.date + ";" +
         std::to_string(g.year) + ";" + std::to_string(g.track) + "/" + std::to_string(g.trackTotal) + ";" +
         std::to_string(g.disc) + "/" + std::to_string(g.discTotal) + ";" + g.comment + ";" + g.composer;
    for (const auto& e : g.extra) s += " " + e.first + "=" + e.second;
    for (const PictureFacts& p : f.pictures) {
        s += " | " + p.mime + " " + std::to_string(p.type) + " " + p.description + " " + std::to_string(p.size);
    }
    return s;
}

struct Row {
    const char* name;
    std::vector<Bytes> objects;
    std::string facts;
    std::string clip;  // the MM_ clip answer: whole seconds, whole frames per second
};

TEST(AccurateAsf, FactsOfBuiltHeaders) {
    const Bytes picture = AsfWmPicture(3, "image/png", "front", Bytes{0x89, 'P', 'N', 'G'});
    const std::vector<Row> rows = {
        {"wma with every tag object",
         {AsfFileProperties(0, kPlay, 3000, 64000), AsfAudioStream(1, 0x0161, 44100, 2, 64000),
          AsfContentDescription("T", "A", "(c) X", "D", "high"),
          AsfExtContentDescription({{"WM/AlbumTitle", kText, Text("Al")},
                                    {"WM/AlbumArtist", kText, Text("AA")},
                                    {"WM/Genre", kText, Text("Rock")},
                                    {"WM/Year", kText, Text("2021")},
                                    {"WM/TrackNumber", kText, Text("3/11")},
                                    {"WM/PartOfSet", kText, Text("1/2")},
                                    {"WM/Composer", kText, Text("C")},
                                    {"WM/OriginalArtist", kText, Text("OA")},
                                    {"WM/BeatsPerMinute", kDword, Number(120, 4)},
                                    {"WM/MCDI", kBinary, {1, 2, 3}}})},
         "audio/x-ms-wma 3343000 | wmav2 44100x2x0 64000 | T;A;Al;AA;Rock;2021;2021;3/11;1/2;D;C "
         "Copyright=(c) X Rating=high WM/OriginalArtist=OA WM/BeatsPerMinute=120",
         "3s 0fps"},
        {"wmv: frame time and rates from the header extension, zero-based track, genre id",
         {AsfFileProperties(0, kPlay, 3000, 328000), AsfVideoStream(2, "WMV3", 320, 240, {0x4E, 0x00, 0, 0}),
          AsfAudioStream(1, 0x0162, 48000, 6, 0), AsfStreamBitrates({{1, 96000}, {2, 150000}}),
          AsfHeaderExtension({AsfExtStreamProperties(2, 333667),
                              AsfMetadata({{"WM/GenreID", kText, Text("13")}, {"WM/Track", kDword, Number(4, 4)}}),
                              AsfMetadata({{"IsVBR", kWord, Number(1, 2)}}, true)})},
         "video/x-ms-wmv 3343000 | wmv3/Main 320x240@10000000/333667 200000 | wmapro 48000x6x0 96000 | "
         ";;;;13;;0;5/0;0/0;; IsVBR=1",
         "3s 29fps"},
        {"pcm and vc1; play time within the preroll is unknown",
         {AsfFileProperties(0, 20000000, 3000, 0), AsfAudioStream(1, 0x0001, 8000, 1, 384000, 24),
          AsfVideoStream(2, "wvc1", 64, 48)},
         "video/x-ms-wmv -1~ | pcm_s24le 8000x1x24 384000 | vc1/Advanced 64x48@0/0 0 | ;;;;;;0;0/0;0/0;;",
         "4294967295s 0fps"},
        {"picture and a descriptor running past its object",
         {AsfFileProperties(0, kPlay, 3000, 0),
          AsfExtContentDescription({{"WM/Picture", kBinary, picture.data()}, {"Title", kText, Text("T")}}),
          AsfObject(asf_guid::kExtContentDescription,
                    Bytes().le16(1).le16(4).raw(Utf16("A", false)).le16(0).le16(200))},
         "audio/x-ms-wma 3343000 | T;;;;;;0;0/0;0/0;; | image/png 3 front 4",
         "3s 0fps"},
    };
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        TempDir dir;
        const std::string path = File(dir, row.objects);
        MediaFacts f;
        ASSERT_EQ(AsfFacts(path.c_str(), MEDIA_TYPE_ASF, &f), MM_OK);
        EXPECT_EQ(Summary(f), row.facts);
        const double size = static_cast<double>(ReadFileBytes(path).size());
        if (f.durationUs > 0) {
            EXPECT_NEAR(static_cast<double>(f.bitRate), size * 8e6 / static_cast<double>(f.durationUs), 1.0);
        }
        for (const PictureFacts& p : f.pictures) {
            const std::vector<uint8_t> bytes = ReadFileBytes(path);
            ASSERT_LE(p.offset + p.size, bytes.size());
            EXPECT_EQ(std::vector<uint8_t>(bytes.begin() + static_cast<long>(p.offset),
                                           bytes.begin() + static_cast<long>(p.offset + p.size)),
                      (std::vector<uint8_t>{0x89, 'P', 'N', 'G'}));
        }
        _MMClipInfo clip{};
        ASSERT_EQ(ASF_GetClipInfo(path.c_str(), &clip), 0);
        EXPECT_EQ(std::to_string(clip.nDuration) + "s " + std::to_string(clip.nFrameRate) + "fps", row.clip);
    }
}

TEST(AccurateAsf, BrokenHeadersFail) {
    const std::vector<std::vector<Bytes>> broken = {
        // An object reaching past the Header Object.
        {AsfFileProperties(0, kPlay, 3000, 0), AsfObject(asf_guid::kPadding, Bytes().zeros(8), 4000)},
        // An object smaller than its own header would never move the walk on.
        {AsfObject(asf_guid::kPadding, Bytes(), 8)},
    };
    for (const auto& objects : broken) {
        TempDir dir;
        MediaFacts f;
        EXPECT_EQ(AsfFacts(File(dir, objects).c_str(), MEDIA_TYPE_ASF, &f), MM_E_FAIL);
    }
    TempDir dir;
    MediaFacts f;
    EXPECT_EQ(AsfFacts(dir.Write("x.asf", Bytes().zeros(64)).c_str(), MEDIA_TYPE_ASF, &f), MM_E_FAIL);
}

}  // namespace
