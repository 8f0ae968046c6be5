// Ogg facts of the accurate interface over pages built in code: each codec's
// headers, packets that run over pages, pictures in comments, and the play
// time from the last whole page.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "metainfo/metainfo.h"
#include "metainfo/probe.h"
#include "support/bytes.h"
#include "support/flac_builder.h"
#include "support/ogg_builder.h"

using namespace testing_support;

namespace {

Bytes Prefixed(const std::string& prefix, const Bytes& body) { return Bytes().str(prefix).raw(body); }
Bytes Audio(size_t n) { return Bytes().fill(n, 0x55); }

// Theora 3.2.1: 10x8 macroblocks, 160x120, 25/1 fps, aspect 1:1, keyframe shift 6.
Bytes TheoraIdPacket() {
    return Bytes().str("\x80theora").raw(Bytes{3,  2, 1, 0, 10, 0, 8, 0, 0, 160, 0, 0, 120, 0, 0, 0, 0,     0,
                                               25, 0, 0, 0, 1,  0, 0, 1, 0, 0,   1, 0, 0,   0, 0, 0, 6 << 5});
}

const std::vector<std::string> kTags = {"TITLE=T",     "ARTIST=Ar",       "album=Al",         "ALBUMARTIST=AA",
                                        "GENRE=Rock",  "DATE=2019-02-03", "TRACKNUMBER=3/11", "DISCNUMBER=1",
                                        "DISCTOTAL=2", "DESCRIPTION=D",   "COMPOSER=C",       "mood=Happy"};
const std::string kTagSummary = " | T;Ar;Al;AA;Rock;2019-02-03;2019;3/11;1/2;D;C MOOD=Happy";

Bytes Vorbis(size_t segmentsPerPage, const std::vector<std::string>& tags, uint64_t granule) {
    return OggStreamPages(7,
                          {VorbisIdPacket(2, 44100, 128000), Prefixed("\x03vorbis", VorbisComments(tags)),
                           Prefixed("\x05vorbis", Audio(40)), Audio(300), Audio(20)},
                          segmentsPerPage, granule);
}

std::string Summary(const mi_info& f) {
    std::string s = std::string(f.format) + " " + f.mime + " " + std::to_string(f.duration_ms);
    for (size_t i = 0; i < f.stream_count; ++i) {
        const mi_stream& t = f.streams[i];
        s += " | " + std::string(t.codec) + " " + std::to_string(t.sample_rate) + "x" + std::to_string(t.channels) +
             "x" + std::to_string(t.bits_per_sample) + " " + std::to_string(t.bit_rate);
    }
    if (f.title == nullptr) return s;
    auto text = [](const char* t) { return std::string(t == nullptr ? "" : t); };
    s += " | " + text(f.title) + ";" + text(f.artist) + ";" + text(f.album) + ";" + text(f.album_artist) + ";" +
         text(f.genre) + ";" + text(f.date) + ";" + std::to_string(f.year) + ";" + std::to_string(f.track) + "/" +
         std::to_string(f.track_total) + ";" + std::to_string(f.disc) + "/" + std::to_string(f.disc_total) + ";" +
         text(f.comment) + ";" + text(f.composer);
    for (size_t i = 0; i < f.tag_count; ++i) s += " " + std::string(f.tags[i].key) + "=" + f.tags[i].value;
    for (size_t i = 0; i < f.picture_count; ++i) {
        const mi_picture& p = f.pictures[i];
        s += " | " + std::string(p.mime) + " " + std::to_string(p.type) + " " + p.description + " " +
             std::to_string(p.size);
    }
    return s;
}

struct Row {
    const char* name;
    Bytes file;
    std::string facts;  // or the probe's failure
};

TEST(AccurateOgg, FactsOfBuiltPages) {
    const std::string picture = Base64Picture(3, "image/png", "front", {0x89, 'P', 'N', 'G', 1, 2});
    Bytes truncated = Vorbis(255, {"TITLE=T"}, 88200);
    truncated.raw(OggStreamPages(7, {Audio(500)}, 255, 441000)).data().resize(truncated.size() - 100);
    const std::vector<Row> rows = {
        {"vorbis with every tag", Vorbis(255, kTags, 132300),
         "ogg audio/ogg 3000 | vorbis 44100x2x0 128000" + kTagSummary},
        {"vorbis headers over one-segment pages", Vorbis(1, kTags, 132300),
         "ogg audio/ogg 3000 | vorbis 44100x2x0 128000" + kTagSummary},
        {"comment packet over pages of two segments", Vorbis(2, {"TITLE=" + std::string(700, 'x')}, 44100),
         "ogg audio/ogg 1000 | vorbis 44100x2x0 128000 | " + std::string(700, 'x') + ";;;;;;0;0/0;0/0;;"},
        {"opus: the pre-skip comes off the last granule; the output gain told",
         OggStreamPages(9,
                        {OpusHeadPacket(2, 312, 44100, -896), Prefixed("OpusTags", VorbisComments(kTags)), Audio(90)},
                        255, 96312),
         "ogg audio/ogg 2000 | opus 48000x2x0 0" + kTagSummary + " output_gain=-3.50 dB"},
        {"opus with a picture in its comments",
         OggStreamPages(9,
                        {OpusHeadPacket(1, 0, 48000),
                         Prefixed("OpusTags", VorbisComments({"TITLE=P", "METADATA_BLOCK_PICTURE=" + picture}))},
                        255, 24000),
         "ogg audio/ogg 500 | opus 48000x1x0 0 | P;;;;;;0;0/0;0/0;; | image/png 3 front 6"},
        {"flac mapping, then its comment block",
         OggStreamPages(
             3, {FlacMappingPacket(32000, 1, 24), FlacBlock(4, VorbisComments(kTags), true), Bytes{0xFF, 0xF8, 0}}, 255,
             48000),
         "ogg audio/ogg 1500 | flac 32000x1x24 0" + kTagSummary},
        {"theora's frames (keyframe 99, one after it) outlast the vorbis stream",
         Bytes(OggStreamPages(5, {TheoraIdPacket()}, 255, (99 << 6) + 1)).raw(Vorbis(255, {"TITLE=T"}, 44100)),
         "ogg video/ogg 4000 | theora 0x0x0 0 | vorbis 44100x2x0 128000 | T;;;;;;0;0/0;0/0;;"},
        {"a last page cut short: the page before it counts", truncated,
         "ogg audio/ogg 2000 | vorbis 44100x2x0 128000 | T;;;;;;0;0/0;0/0;;"},
        {"no codec this reader knows", OggStreamPages(5, {Bytes().str("\x7Funknown").zeros(40)}, 255, 0), "8"},
    };
    TempDir dir;
    for (const Row& row : rows) {
        const std::string path = dir.Write("f.ogg", row.file.data());
        mi_info* info = nullptr;
        const int result = mi_probe(path.c_str(), &info);
        EXPECT_EQ(result == MI_OK ? Summary(*info) : std::to_string(result), row.facts) << row.name;
        mi_info_free(info);
    }
}

// The picture's bytes lie in base64 over four pages: the copy decodes them again.
TEST(AccurateOgg, PictureCopiedFromComments) {
    std::vector<uint8_t> png(600, 0x42);
    png[0] = 0x89;
    const Bytes comments = VorbisComments({"METADATA_BLOCK_PICTURE=" + Base64Picture(3, "image/png", "", png)});
    TempDir dir;
    const std::string path = dir.Write(
        "f.opus", OggStreamPages(9, {OpusHeadPacket(1, 0, 48000), Prefixed("OpusTags", comments)}, 1, 0).data());
    mi_info* info = nullptr;
    ASSERT_EQ(mi_probe(path.c_str(), &info), MI_OK);
    std::vector<uint8_t> out(1000);
    size_t size = 0;
    ASSERT_EQ(info->picture_count, 1u);
    EXPECT_EQ(mi_picture_copy(path.c_str(), info, 0, out.data(), out.size(), &size), MI_OK);
    out.resize(size);
    EXPECT_EQ(out, png);
    mi_info_free(info);
}

TEST(AccurateOgg, ContractAnswersUnchanged) {
    TempDir dir;
    const std::string path = dir.Write("f.ogg", Vorbis(255, kTags, 44100).data());
    int type = -1;
    EXPECT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK);
    EXPECT_EQ(type, MEDIA_TYPE_UNKNOWN);
}

}  // namespace
