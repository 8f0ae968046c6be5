// RealMedia: the header chunks and the five answers of media type 2, from
// byte-built files and from files written by ffmpeg (checked against ffprobe).
#include <gtest/gtest.h>

#include <cmath>
#include <cstdlib>
#include <cstring>
#include <string>

#include "metainfo/metainfo.h"
#include "realmedia/rm_parser.h"
#include "support/bytes.h"
#include "support/ffprobe.h"
#include "support/golden.h"
#include "support/rm_builder.h"
#include "support/summary.h"

using namespace testing_support;
using namespace metainfo;

namespace {

RmStream AudioStream(const std::string& fourcc = "cook", uint16_t rate = 44100, uint16_t channels = 2) {
    RmStream s;
    s.typeData = RaHeaderV4(rate, 16, channels, fourcc);
    return s;
}

RmStream VideoStream(const std::string& fourcc = "RV40") {
    RmStream s;
    s.number = 1;
    s.name = "Video Stream";
    s.mime = "video/x-pn-realvideo";
    s.maxBitRate = 200000;
    s.durationMs = 4000;
    s.typeData = RvHeader(fourcc, 320, 240, 15);
    return s;
}

RmProps Props(uint16_t streams, uint32_t durationMs = 5000, uint16_t version = 0) {
    RmProps p;
    p.numStreams = streams;
    p.durationMs = durationMs;
    p.version = version;
    return p;
}

RmStream With(RmStream s, uint32_t durationMs, const std::string& name = "", const std::string& mime = "") {
    s.durationMs = durationMs;
    if (!name.empty()) s.name = name;
    if (!mime.empty()) s.mime = mime;
    return s;
}

// The slot answers of one file on one line: clip (whole seconds), codec, track mask, metadata.
std::string Describe(const std::string& path) {
    _MMClipInfo clip{};
    _MM_CODECTYPE codec{};
    _MMMetaInfo meta{};
    int mask = 0x100;  // cleared first
    const int32_t clipResult = RM_GetClipInfo(path.c_str(), &clip);
    const int32_t codecResult = RM_GetCodecType(path.c_str(), &codec);
    const int32_t trackResult = RM_GetTrackType(path.c_str(), &mask);
    const int32_t metaResult = RM_GetMetaInfo(path.c_str(), &meta, 1);
    std::string s = (clipResult == 0 ? ClipSummary(clip) : std::to_string(clipResult)) + " | " +
                    (codecResult == 0 ? CodecSummary(codec) : std::to_string(codecResult)) + " | track " +
                    std::to_string(trackResult) + "/" + std::to_string(mask) + " | meta " + std::to_string(metaResult) +
                    " " + MetaSummary(meta);
    MM_MediaExtractor_FreeMetaInfo(&meta);
    return s;
}

}  // namespace

TEST(Rm, AnswersOfEachFileShape) {
    RmStream multiAudio, multiVideo = VideoStream("RV30"), second = AudioStream("sipr", 8000, 1), stub = AudioStream(),
                         stubVideo = VideoStream();
    multiAudio.typeData = RmMulti(3, RaHeaderV5(22050, 16, 1, "atrc"));
    multiVideo.typeData = RmMulti(2, RvHeader("RV30", 64, 48, 10));
    second.number = 1;
    second.mime = "audio/x-second";
    stub.typeData = Bytes().u8(0x2E).u8(0x72).u8(0x61).u8(0xFD).be16(4);  // too short for the header it announces
    stubVideo.typeData = Bytes().str("MLTI").be16(0xFFFF);
    Bytes badCont = RmCont("Title", "Author", "", "");
    badCont.data()[10 + 2 + 5 + 1] = 0x40;  // the author's length runs past the chunk
    // An ID3v1 tag: "TAG", title, artist, album, year, comment, then genre 8 (Jazz).
    const Bytes tag = Bytes().str("TAG").str("Tagged").zeros(24 + 30 + 30 + 4 + 30).u8(8);
    const struct {
        const char* name;
        std::vector<uint8_t> file;
    } cases[] = {
        // Audio and video fields come from their first streams; the audio bit rate is the
        // stream's maximum.
        {"audio and video",
         RmFile(Props(2), {RmCont("t", "a", "c", "x"), RmMdpr(AudioStream()), RmMdpr(VideoStream())})},
        // Two audio streams are counted but the first describes the audio.
        {"two audio", RmFile(Props(2), {RmMdpr(AudioStream()), RmMdpr(second)})},
        // Logical streams and lower-case names are neither audio nor video; a stream naming
        // both counts as audio, but its data is video data, which read as audio says nothing.
        {"logical, lower-case, both", RmFile(Props(3), {RmMdpr(With(AudioStream(), 5000, "", "logical-fileinfo")),
                                                        RmMdpr(With(AudioStream(), 5000, "audio stream")),
                                                        RmMdpr(With(VideoStream(), 4000, "Audio+Video"))})},
        {"logical and lower-case", RmFile(Props(2), {RmMdpr(With(AudioStream(), 5000, "", "logical-fileinfo")),
                                                     RmMdpr(With(AudioStream(), 5000, "audio stream"))})},
        // A short PROP duration falls back to the longer stream.
        {"short prop", RmFile(Props(2, 999), {RmMdpr(With(AudioStream(), 7999)), RmMdpr(VideoStream())})},
        {"all short", RmFile(Props(2, 999), {RmMdpr(With(AudioStream(), 900)), RmMdpr(With(VideoStream(), 999))})},
        // Codecs from the FourCC table in both type data forms; a multi-rate video header is
        // read where its substream's size word stands.
        {"multi-rate audio", RmFile(Props(1), {RmMdpr(multiAudio)})},
        {"sipr", RmFile(Props(1), {RmMdpr(AudioStream("sipr"))})},
        {"raac", RmFile(Props(1), {RmMdpr(AudioStream("raac"))})},
        {"dnet", RmFile(Props(1), {RmMdpr(AudioStream("dnet"))})},
        {"RV10", RmFile(Props(1), {RmMdpr(VideoStream("RV10"))})},
        {"RV20", RmFile(Props(1), {RmMdpr(VideoStream("RV20"))})},
        {"multi-rate video", RmFile(Props(1), {RmMdpr(multiVideo)})},
        {"stub type data", RmFile(Props(2), {RmMdpr(stub), RmMdpr(stubVideo)})},
        // Properties with a version decode no streams.
        {"prop version 1", RmFile(Props(1, 5000, 1), {RmMdpr(AudioStream())})},
        // The content description: Latin-1 texts cut to 128 bytes; damage keeps the items
        // before it; a versioned one is not read.
        {"content", RmFile(Props(1), {RmCont("Title", "Author", "(c) 2009", "Note"), RmMdpr(AudioStream())})},
        {"long title", RmFile(Props(1), {RmCont(std::string(300, 'x'), "", "", "")})},
        {"damaged content", RmFile(Props(1), {badCont})},
        {"versioned content", RmFile(Props(1), {RmChunk("CONT", Bytes().be16(1).be16(5).str("Title").zeros(6))})},
        // Without a content description an ID3v1 tag at the end is read.
        {"neither content nor tag", RmFile(Props(1), {RmMdpr(AudioStream())})},
        {"tag", Bytes().raw(RmFile(Props(1), {RmMdpr(AudioStream())})).raw(tag).data()},
        {"content and tag",
         Bytes().raw(RmFile(Props(1), {RmCont("Content", "", "", ""), RmMdpr(AudioStream())})).raw(tag).data()},
    };
    TempDir dir;
    Golden golden("rm", "answers");
    for (const auto& c : cases) golden.Check(c.name, Describe(dir.Write("clip.rm", c.file)));
    golden.Check("missing", Describe(dir.PathOf("missing.rm")));
    // Through the public interface a duration is never under a second, and a missing
    // description with a tag is no failure.
    const std::string path = dir.Write("clip.rm", cases[5].file);
    _MMClipInfo clip;
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_REALMEDIA, &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 1000u);
    _MMMetaInfo meta;
    EXPECT_NE(MM_MediaExtractor_GetMetaInfo(dir.Write("none.rm", cases[19].file).c_str(), MEDIA_TYPE_REALMEDIA, &meta),
              MM_OK);
    ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(dir.Write("tag.rm", cases[20].file).c_str(), MEDIA_TYPE_REALMEDIA, &meta),
              MM_OK);
    EXPECT_EQ(MetaSummary(meta), "title=3:Tagged genre=3:Jazz");
    MM_MediaExtractor_FreeMetaInfo(&meta);
    // The reader releases an earlier string in the record before handing out new ones
    // (the public interface clears the record, so ask the reader).
    _MM_MIMETYPE mime{};
    mime.pszMimeType = new char[4]{'o', 'l', 'd', 0};
    ASSERT_EQ(RM_GetMIMEType(dir.Write("av.rm", cases[0].file).c_str(), &mime), MM_OK);
    EXPECT_STREQ(mime.pszMimeType, "audio/x-pn-realaudio");
    EXPECT_STREQ(mime.pszVideoMimeType, "video/x-pn-realvideo");
    MM_MediaExtractor_FreeBuffer(mime.pszVideoMimeType);
    mime.pszVideoMimeType = nullptr;
    ASSERT_EQ(RM_GetMIMEType(dir.Write("two.rm", cases[1].file).c_str(), &mime), MM_OK);
    EXPECT_STREQ(mime.pszMimeType, "audio/x-pn-realaudio");
    EXPECT_EQ(mime.pszVideoMimeType, nullptr);
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
}

TEST(Rm, FileHeaderPropertiesAndCountedPartsAreChecked) {
    const std::vector<uint8_t> good = RmFile(Props(1), {RmMdpr(AudioStream())});
    RmStream audio = AudioStream();
    Bytes bad = RmMdpr(audio);  // the type data length claims more than the chunk holds
    bad.patch_be32(8 + 2 + 2 + 7 * 4 + 1 + audio.name.size() + 1 + audio.mime.size(), 0x7FFFFFFF);
    // A stream header cut off by the end of the file is a short read.
    std::vector<uint8_t> late = RmFile(Props(1), {RmCont("", "", "", std::string(300, 'c')), RmMdpr(AudioStream())});
    const size_t mdprAt = 18 + 50 + 8 + 2 + 8 + 300;
    ASSERT_EQ(std::memcmp(late.data() + mdprAt, "MDPR", 4), 0);
    late.resize(mdprAt + 60);
    struct Case {
        const char* what;
        size_t at;
        uint32_t value;
        bool word;
        int32_t expected;
    } cases[] = {
        {"as written", 0, 0, false, 0},
        {"not .RMF", 1, 'X', false, -1},
        {"header size as long as the file", 4, static_cast<uint32_t>(good.size()), true, -1},
        {"file version 2", 9, 2, false, -2},
        {"file version 1", 9, 1, false, 0},
        {"header count 2", 14, 2, true, -2},
        {"PROP missing", 18, 'Q', false, -2},
        {"MDPR of 9 bytes", 18 + 50 + 4, 9, true, -3},
        {"more headers than the file holds", 14, 20, true, -3},
    };
    TempDir dir;
    _MMClipInfo clip;
    for (const Case& c : cases) {
        Bytes file(good);
        if (c.word) {
            file.patch_be32(c.at, c.value);
        } else if (c.at != 0) {
            file.data()[c.at] = static_cast<uint8_t>(c.value);
        }
        EXPECT_EQ(RM_GetMediaInfo(dir.Write("h.rm", file).c_str(), 2, &clip), c.expected) << c.what;
    }
    EXPECT_EQ(RM_GetMediaInfo(dir.Write("late.rm", late).c_str(), 2, &clip), -4);
    EXPECT_EQ(RM_GetMediaInfo(dir.Write("bad.rm", RmFile(Props(1), {bad})).c_str(), 2, &clip), -3);
    Bytes badCont = RmCont("Title", "Author", "", "");
    badCont.data()[10 + 2 + 5 + 1] = 0x40;  // the author's length runs past the chunk
    _MMMetaInfo meta{};
    EXPECT_EQ(RM_GetMediaInfo(dir.Write("cont.rm", RmFile(Props(1), {badCont})).c_str(), 1, &meta), -3);
    // Every truncation of a full file, for every request.
    std::vector<uint8_t> full =
        RmFile(Props(2), {RmCont("T", "A", "C", "X"), RmMdpr(AudioStream()), RmMdpr(VideoStream())});
    for (size_t n = 0; n < full.size(); ++n) {
        const std::string p =
            dir.Write("cut.rm", std::vector<uint8_t>(full.begin(), full.begin() + static_cast<long>(n)));
        Describe(p);
        _MM_MIMETYPE mime{};
        RM_GetMIMEType(p.c_str(), &mime);
        MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
        MM_MediaExtractor_FreeBuffer(mime.pszVideoMimeType);
    }
}

// ffmpeg's RealMedia audio FourCCs are not in the table; durations are whole
// seconds, never less than one through the public interface.
TEST(RmFfmpeg, HeadersAgreeWithFfprobe) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg not installed";
    const struct {
        const char* name;
        const char* args;
        uint32_t videoCodec;
    } variants[] = {{"rv10_real144",
                     "-f lavfi -i testsrc=d=2:s=176x144:r=25 -f lavfi -i sine=d=2:sample_rate=8000 -c:v rv10 "
                     "-c:a real_144 -ac 1",
                     0x3010},
                    {"real144_only", "-f lavfi -i sine=d=2:sample_rate=8000 -c:a real_144 -ac 1", 0}};
    TempDir dir;
    for (const auto& v : variants) {
        SCOPED_TRACE(v.name);
        const std::string path = dir.PathOf(std::string(v.name) + ".rm");
        if (!FfmpegWrite(std::string(v.args) + " -metadata title=Probe -metadata author=Writer -f rm", path)) continue;
        const bool video = v.videoCodec != 0;
        int type = 0;
        ASSERT_EQ(MM_MediaExtractor_DetectMediaType(path.c_str(), &type), MM_OK);
        ASSERT_EQ(type, MEDIA_TYPE_REALMEDIA);
        _MMClipInfo clip{};
        ASSERT_EQ(MM_MediaExtractor_GetClipInfo(path.c_str(), type, &clip), MM_OK);
        const uint32_t seconds = static_cast<uint32_t>(std::floor(std::atof(Probe(path, "format=duration").c_str())));
        EXPECT_EQ(clip.nDuration, (seconds == 0 ? 1 : seconds) * 1000);
        EXPECT_EQ(clip.bHasAudio, 1u);
        EXPECT_EQ(clip.nSampleRate, std::stoul(Probe(path, "stream=sample_rate", "-select_streams a:0")));
        int mask = 0;
        EXPECT_EQ(MM_MediaExtractor_GetTrackType(path.c_str(), type, &mask), MM_OK);
        EXPECT_EQ(mask, video ? (TRACK_AUDIO | TRACK_VIDEO) : TRACK_AUDIO);
        _MM_CODECTYPE codec{};
        EXPECT_EQ(MM_MediaExtractor_GetCodecType(path.c_str(), type, &codec), MM_OK);
        EXPECT_EQ(std::make_pair(codec.nAudioCodec, codec.nVideoCodec), std::make_pair(0u, v.videoCodec));
        _MM_MIMETYPE mime{};
        EXPECT_EQ(MM_MediaExtractor_GetMIMEType(path.c_str(), &mime), MM_OK);
        EXPECT_STREQ(mime.pszMimeType, "audio/x-pn-realaudio");
        if (video) {
            EXPECT_STREQ(mime.pszVideoMimeType, "video/x-pn-realvideo");
            EXPECT_EQ(clip.nWidth, std::stoul(Probe(path, "stream=width", "-select_streams v:0")));
            EXPECT_EQ(clip.nHeight, std::stoul(Probe(path, "stream=height", "-select_streams v:0")));
            EXPECT_EQ(clip.nFrameRate, 25u);
        }
        MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
        MM_MediaExtractor_FreeBuffer(mime.pszVideoMimeType);
        _MMMetaInfo meta{};
        ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(path.c_str(), type, &meta), MM_OK);
        EXPECT_EQ(MetaSummary(meta), "title=3:Probe artist=3:Writer");
        MM_MediaExtractor_FreeMetaInfo(&meta);
    }
}
