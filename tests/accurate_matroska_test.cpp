// Matroska and WebM facts of the accurate interface over files built element
// by element: streams, tags and pictures, the ways a Segment may end early or
// leave its size open, and how a missing Duration is found.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "metainfo/metainfo.h"
#include "metainfo/probe.h"
#include "support/bytes.h"
#include "support/ebml_builder.h"

using namespace testing_support;

namespace {

constexpr uint32_t kSegment = 0x18538067, kSeekHead = 0x114D9B74, kInfo = 0x1549A966, kTracks = 0x1654AE6B;
constexpr uint32_t kTags = 0x1254C367, kAttachments = 0x1941A469, kCues = 0x1C53BB6B, kCluster = 0x1F43B675;

Bytes Info(double duration, bool single = false) {
    Bytes b = EbmlUint(0x2AD7B1, 1000000);
    if (duration >= 0) b.raw(EbmlFloat(0x4489, duration, single));
    return Ebml(kInfo, b.raw(EbmlText(0x7BA9, "Segment title")));
}

Bytes Video(const std::string& codec, const Bytes& priv, uint64_t ns, uint32_t w, uint32_t h) {
    return Ebml(0xAE, Bytes()
                          .raw(EbmlUint(0x83, 1))
                          .raw(EbmlText(0x86, codec))
                          .raw(Ebml(0x63A2, priv))
                          .raw(EbmlUint(0x23E383, ns))
                          .raw(Ebml(0xE0, Bytes().raw(EbmlUint(0xB0, w)).raw(EbmlUint(0xBA, h)))));
}

Bytes Audio(const std::string& codec, const Bytes& priv, double rate, uint32_t channels, uint32_t depth = 0) {
    Bytes audio = Bytes().raw(EbmlFloat(0xB5, rate)).raw(EbmlUint(0x9F, channels));
    if (depth != 0) audio.raw(EbmlUint(0x6264, depth));
    return Ebml(
        0xAE, Bytes().raw(EbmlUint(0x83, 2)).raw(EbmlText(0x86, codec)).raw(Ebml(0x63A2, priv)).raw(Ebml(0xE1, audio)));
}

Bytes SimpleTag(const std::string& name, const std::string& value) {
    return Ebml(0x67C8, Bytes().raw(EbmlText(0x45A3, name)).raw(EbmlText(0x4487, value)));
}

Bytes Tags() {
    const Bytes file = Ebml(0x7373, Bytes()
                                        .raw(Ebml(0x63C0, EbmlUint(0x68CA, 50)))
                                        .raw(SimpleTag("TITLE", "Song"))
                                        .raw(SimpleTag("ARTIST", " Band "))
                                        .raw(SimpleTag("DATE", "2021-05-01"))
                                        .raw(SimpleTag("PART_NUMBER", "3"))
                                        .raw(SimpleTag("TOTAL_PARTS", "12"))
                                        .raw(SimpleTag("ENCODER", "Lavf")));
    const Bytes track =
        Ebml(0x7373, Bytes().raw(Ebml(0x63C0, EbmlUint(0x63C5, 7))).raw(SimpleTag("TITLE", "Track's own")));
    return Ebml(kTags, Bytes().raw(track).raw(file));
}

Bytes Attachment(const std::string& name, const std::string& mime) {
    const Bytes file = Bytes()
                           .raw(EbmlText(0x466E, name))
                           .raw(EbmlText(0x4660, mime))
                           .raw(Ebml(0x465C, Bytes().fill(20, 0xAB)))
                           .raw(EbmlUint(0x46AE, 99));
    return Ebml(kAttachments, Ebml(0x61A7, file));
}

Bytes Cluster(uint64_t timecode, int16_t last, bool unknownSize = false) {
    const Bytes block = Bytes().u8(0x81).be16(static_cast<uint16_t>(last)).u8(0x80).fill(8, 0);
    return Ebml(kCluster, Bytes().raw(EbmlUint(0xE7, timecode)).raw(Ebml(0xA3, block)), unknownSize);
}

Bytes Seek(uint32_t id, uint64_t position) {
    return Ebml(0x4DBB, Bytes().raw(EbmlUint(0x53AB, id)).raw(Ebml(0x53AC, Bytes().be64(position))));
}

const Bytes kAvcC{0x01, 0x64, 0x00, 0x1F, 0xFF};  // High, level 3.1
const Bytes kLc{0x12, 0x10};  // AAC LC, 44.1 kHz, stereo
const Bytes kVp9{}, kOpus{'O', 'p', 'u', 's', 'H', 'e', 'a', 'd'};

Bytes Mkv(const std::string& doc, const std::vector<Bytes>& children, bool unknownSize = false) {
    Bytes body;
    for (const Bytes& c : children) body.raw(c);
    return Bytes().raw(EbmlDocHeader(doc)).raw(Ebml(kSegment, body, unknownSize));
}

// Duration missing: a SeekHead (of fixed 16-byte entries) points at the Cues
// and Tags past the Cluster.
Bytes WithCues() {
    const Bytes tracks = Ebml(kTracks, Audio("A_OPUS", kOpus, 48000, 2));
    const Bytes cluster = Cluster(0, 0), info = Info(-1);
    const Bytes cues = Ebml(kCues, Bytes().raw(Ebml(0xBB, EbmlUint(0xB3, 0))).raw(Ebml(0xBB, EbmlUint(0xB3, 4000))));
    const uint64_t seekHeadSize = Ebml(kSeekHead, Bytes().raw(Seek(kCues, 0)).raw(Seek(kTags, 0))).size();
    const uint64_t cuesAt = seekHeadSize + info.size() + tracks.size() + cluster.size();
    const Bytes seekHead = Ebml(kSeekHead, Bytes().raw(Seek(kCues, cuesAt)).raw(Seek(kTags, cuesAt + cues.size())));
    return Mkv("matroska", {seekHead, info, tracks, cluster, cues, Tags()});
}

std::string Summary(const mi_info& f) {
    std::string s =
        std::string(f.format) + " " + f.mime + " " + std::to_string(f.duration_ms) + (f.duration_exact ? "" : "~");
    for (size_t i = 0; i < f.stream_count; ++i) {
        const mi_stream& t = f.streams[i];
        s += std::string(" | ") + t.codec + "/" + (t.profile ? t.profile : "") + "/" + std::to_string(t.level) + " ";
        s += t.kind == MI_STREAM_AUDIO ? std::to_string(t.sample_rate) + "x" + std::to_string(t.channels) + "x" +
                                             std::to_string(t.bits_per_sample)
                                       : std::to_string(t.width) + "x" + std::to_string(t.height) + "@" +
                                             std::to_string(t.frame_rate_num) + "/" + std::to_string(t.frame_rate_den);
    }
    s += std::string(" | ") + (f.title ? f.title : "") + ";" + (f.artist ? f.artist : "") + ";" +
         (f.date ? f.date : "") + ";" + std::to_string(f.year) + ";" + std::to_string(f.track) + "/" +
         std::to_string(f.track_total);
    for (size_t i = 0; i < f.tag_count; ++i) s += std::string(" ") + f.tags[i].key + "=" + f.tags[i].value;
    for (size_t i = 0; i < f.picture_count; ++i) {
        s += std::string(" | ") + f.pictures[i].mime + " " + std::to_string(f.pictures[i].type) + " " +
             f.pictures[i].description + " " + std::to_string(f.pictures[i].size);
    }
    return s;
}

struct Row {
    const char* name;
    Bytes file;
    int result;
    std::string facts;
};

TEST(AccurateMatroska, FileFacts) {
    const Bytes avc = Video("V_MPEG4/ISO/AVC", kAvcC, 33366667, 640, 360);
    const Bytes tracks = Ebml(kTracks, Bytes().raw(avc).raw(Audio("A_AAC", kLc, 44100, 2)));
    const Bytes vp9 = Video("V_VP9", kVp9, 40000000, 320, 240);
    const Bytes flac = Ebml(kTracks, Audio("A_FLAC", Bytes(), 96000, 2, 24));
    // A TrackEntry whose size passes the end of Tracks is left out.
    Bytes cut = Ebml(kTracks, Bytes().raw(Audio("A_PCM/INT/LIT", Bytes(), 8000, 1, 16)).raw(avc));
    cut.data()[4] = static_cast<uint8_t>(0x80 | (cut.size() - 5 - 10));
    const Bytes void1M = Ebml(0xEC, Bytes().zeros(1 << 20));
    const Bytes badHeader = Bytes().u8(0x1A).u8(0x45).u8(0xDF).u8(0xA3).u8(0x00).fill(40, 0);
    const std::vector<Row> rows = {
        {"h264 and AAC with tags and a cover",
         Mkv("matroska", {Info(2500), tracks, Tags(), Attachment("cover.png", "image/png"),
                          Attachment("notes.txt", "text/plain"), Cluster(0, 0)}),
         MI_OK,
         "matroska video/x-matroska 2500 | h264/High/31 640x360@30000/1001 | aac/LC/-1 44100x2x0 | "
         "Song;Band;2021-05-01;2021;3/12 ENCODER=Lavf | image/png 3 cover.png 20"},
        {"WebM VP9 and Opus, Duration in 4 bytes",
         Mkv("webm", {Info(1234.5, true), Ebml(kTracks, Bytes().raw(vp9).raw(Audio("A_OPUS", kOpus, 48000, 6))),
                      Cluster(0, 0)}),
         MI_OK, "webm video/webm 1235 | vp9//-1 320x240@25/1 | opus//-1 48000x6x0 | Segment title;;;0;0/0"},
        {"unknown-size Segment and Cluster", Mkv("matroska", {Info(1000), flac, Cluster(0, 0, true)}, true), MI_OK,
         "matroska audio/x-matroska 1000 | flac//-1 96000x2x24 | Segment title;;;0;0/0"},
        {"no Duration: the Cues past the Cluster", WithCues(), MI_OK,
         "matroska audio/x-matroska 4000~ | opus//-1 48000x2x0 | Song;Band;2021-05-01;2021;3/12 ENCODER=Lavf"},
        {"no Duration nor Cues: the last Cluster", Mkv("webm", {Info(-1), flac, Cluster(0, 0), Cluster(5000, 20)}),
         MI_OK, "webm audio/webm 5020~ | flac//-1 96000x2x24 | Segment title;;;0;0/0"},
        {"no Duration, Clusters of unknown size",
         Mkv("webm", {Info(-1), flac, Cluster(0, 0, true), Cluster(3000, 7, true)}, true), MI_OK,
         "webm audio/webm 3007~ | flac//-1 96000x2x24 | Segment title;;;0;0/0"},
        // Over 1 MiB only the last 60 KiB is searched for the last Cluster.
        {"no Duration, over 1 MiB: the last Cluster near the end",
         Mkv("webm", {Info(-1), flac, Cluster(0, 0), void1M, Cluster(9000, 40)}), MI_OK,
         "webm audio/webm 9040~ | flac//-1 96000x2x24 | Segment title;;;0;0/0"},
        {"no Duration, over 1 MiB: no Cluster near the end",
         Mkv("webm", {Info(-1), flac, Cluster(0, 0), Cluster(9000, 40), void1M}), MI_OK,
         "webm audio/webm -1~ | flac//-1 96000x2x24 | Segment title;;;0;0/0"},
        {"a TrackEntry past its parent", Mkv("matroska", {Info(10), cut}), MI_OK,
         "matroska audio/x-matroska 10 | pcm_s16le//-1 8000x1x16 | Segment title;;;0;0/0"},
        {"an EBML size of no length", badHeader, MI_E_NOT_MEDIA, ""},
        {"a Segment of neither Info nor Tracks", Mkv("matroska", {Cluster(0, 0)}), MI_E_DAMAGED, ""},
    };
    TempDir dir;
    for (const Row& row : rows) {
        SCOPED_TRACE(row.name);
        const std::string path = dir.Write("f.mkv", row.file.data());
        mi_info* info = nullptr;
        ASSERT_EQ(mi_probe(path.c_str(), &info), row.result);
        if (info == nullptr) continue;
        EXPECT_EQ(Summary(*info), row.facts);
        if (info->picture_count > 0) {
            std::vector<uint8_t> bytes(64);
            size_t size = 0;
            ASSERT_EQ(mi_picture_copy(path.c_str(), info, 0, bytes.data(), bytes.size(), &size), MI_OK);
            EXPECT_EQ(std::vector<uint8_t>(bytes.begin(), bytes.begin() + static_cast<long>(size)),
                      std::vector<uint8_t>(20, 0xAB));
        }
        mi_info_free(info);
    }
}

// The C interface answers for these files as it did before they were read.
TEST(AccurateMatroska, ContractUnchanged) {
    TempDir dir;
    const std::string path = dir.Write("f.mkv", Mkv("matroska", {Info(2500), Cluster(0, 0)}).data());
    int type = -1;
    EXPECT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK);
    EXPECT_EQ(type, MEDIA_TYPE_UNKNOWN);
}

}  // namespace
