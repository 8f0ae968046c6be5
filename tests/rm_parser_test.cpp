// RealMedia header chunks and the five answers of media type 2.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "metainfo/metainfo.h"
#include "realmedia/rm_parser.h"
#include "support/bytes.h"
#include "support/id3_builder.h"
#include "support/rm_builder.h"

using namespace testing_support;
using metainfo::RM_GetMediaInfo;

namespace {

RmStream AudioStream(const std::string& fourcc = "cook", uint16_t rate = 44100, uint16_t channels = 2) {
    RmStream s;
    s.typeSpecific = RaHeaderV4(rate, 16, channels, fourcc);
    return s;
}

RmStream VideoStream(const std::string& fourcc = "RV40", uint16_t w = 320, uint16_t h = 240, uint16_t fps = 15) {
    RmStream s;
    s.number = 1;
    s.name = "Video Stream";
    s.mime = "video/x-pn-realvideo";
    s.maxBitRate = 200000;
    s.durationMs = 4000;
    s.typeSpecific = RvHeader(fourcc, w, h, fps);
    return s;
}

RmProps Props(uint16_t streams, uint32_t durationMs = 5000) {
    RmProps p;
    p.numStreams = streams;
    p.durationMs = durationMs;
    return p;
}

std::string Item(const _MMMetaInfo& meta, int kind) {
    return std::string(reinterpret_cast<const char*>(meta.aItems[kind].szData), meta.aItems[kind].nLength);
}

}  // namespace

TEST(RmClipInfo, AudioAndVideoFieldsComeFromTheirFirstStreams) {
    TempDir dir;
    std::string path = dir.Write("clip.rm", RmFile(Props(2), {RmCont("t", "a", "c", "x"), RmMdpr(AudioStream()),
                                                              RmMdpr(VideoStream())}));
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::RM_GetClipInfo(path.c_str(), &clip), 0);
    EXPECT_EQ(clip.nDuration, 5u);
    EXPECT_EQ(clip.nBitrate, 48000u);
    EXPECT_EQ(clip.bHasAudio, 1u);
    EXPECT_EQ(clip.bHasVideo, 1u);
    EXPECT_EQ(clip.nAudioBitrate, 32000u) << "the stream's maximum bit rate";
    EXPECT_EQ(clip.nSampleRate, 44100u);
    EXPECT_EQ(clip.nChannels, 2u);
    EXPECT_EQ(clip.nBitsPerSample, 16u);
    EXPECT_EQ(clip.nVideoBitrate, 200000u);
    EXPECT_EQ(clip.nWidth, 320u);
    EXPECT_EQ(clip.nHeight, 240u);
    EXPECT_EQ(clip.nFrameRate, 15u);
    EXPECT_STREQ(clip.szFormat, "rm");
    EXPECT_EQ(clip.nFileSize, ReadFileBytes(path).size());

    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(path.c_str(), MEDIA_TYPE_REALMEDIA, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO | TRACK_VIDEO);
}

TEST(RmClipInfo, TwoAudioStreamsAreCountedButTheFirstDescribesTheAudio) {
    TempDir dir;
    RmStream second = AudioStream("sipr", 8000, 1);
    second.number = 1;
    second.mime = "audio/x-second";
    std::string path = dir.Write("two.rm", RmFile(Props(2), {RmMdpr(AudioStream()), RmMdpr(second)}));
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::RM_GetClipInfo(path.c_str(), &clip), 0);
    EXPECT_EQ(clip.bHasAudio, 2u);
    EXPECT_EQ(clip.nSampleRate, 44100u);
    _MM_CODECTYPE codec{};
    EXPECT_EQ(metainfo::RM_GetCodecType(path.c_str(), &codec), 0);
    EXPECT_EQ(codec.nAudioCodec, 0x3002u) << "cook";
    _MM_MIMETYPE mime{};
    EXPECT_EQ(metainfo::RM_GetMIMEType(path.c_str(), &mime), 0);
    EXPECT_STREQ(mime.pszMimeType, "audio/x-pn-realaudio");
    EXPECT_EQ(mime.pszVideoMimeType, nullptr);
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
}

TEST(RmClipInfo, LogicalStreamsAndLowerCaseNamesAreNotAudioOrVideo) {
    TempDir dir;
    RmStream logical = AudioStream();
    logical.mime = "logical-fileinfo";
    RmStream lower = AudioStream();
    lower.name = "audio stream";
    RmStream both = VideoStream();
    both.name = "Audio+Video";
    std::string path = dir.Write("odd.rm", RmFile(Props(3), {RmMdpr(logical), RmMdpr(lower), RmMdpr(both)}));
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::RM_GetClipInfo(path.c_str(), &clip), 0);
    EXPECT_EQ(clip.bHasAudio, 1u) << "only the stream naming both counts as audio";
    EXPECT_EQ(clip.bHasVideo, 1u);
    EXPECT_EQ(clip.nSampleRate, 0u) << "its data is video data, read as audio it says nothing";
    EXPECT_EQ(clip.nWidth, 320u);

    std::string none = dir.Write("none.rm", RmFile(Props(2), {RmMdpr(logical), RmMdpr(lower)}));
    int mask = 0x100;
    EXPECT_EQ(metainfo::RM_GetTrackType(none.c_str(), &mask), 0);
    EXPECT_EQ(mask, 0) << "cleared first, no stream flagged";
}

TEST(RmClipInfo, ShortPropDurationFallsBackToTheLongerStream) {
    TempDir dir;
    RmStream audio = AudioStream();
    audio.durationMs = 7999;
    std::string path = dir.Write("short.rm", RmFile(Props(2, 999), {RmMdpr(audio), RmMdpr(VideoStream())}));
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::RM_GetClipInfo(path.c_str(), &clip), 0);
    EXPECT_EQ(clip.nDuration, 7u);

    audio.durationMs = 900;
    RmStream video = VideoStream();
    video.durationMs = 999;
    std::string tiny = dir.Write("tiny.rm", RmFile(Props(2, 999), {RmMdpr(audio), RmMdpr(video)}));
    std::memset(&clip, 0, sizeof clip);
    ASSERT_EQ(metainfo::RM_GetClipInfo(tiny.c_str(), &clip), 0);
    EXPECT_EQ(clip.nDuration, 0u);
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(tiny.c_str(), MEDIA_TYPE_REALMEDIA, &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 1000u);
}

TEST(RmCodecType, FourccTableAndBothTypeSpecificForms) {
    TempDir dir;
    RmStream audio;
    audio.typeSpecific = RmMulti(3, RaHeaderV5(22050, 16, 1, "atrc"));
    RmStream video = VideoStream("RV20");
    std::string path = dir.Write("multi.rm", RmFile(Props(2), {RmMdpr(audio), RmMdpr(video)}));
    _MM_CODECTYPE codec{};
    ASSERT_EQ(metainfo::RM_GetCodecType(path.c_str(), &codec), 0);
    EXPECT_EQ(codec.nAudioCodec, 0x3003u);
    EXPECT_EQ(codec.nVideoCodec, 0x3020u);
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::RM_GetClipInfo(path.c_str(), &clip), 0);
    EXPECT_EQ(clip.nSampleRate, 22050u);
    EXPECT_EQ(clip.nChannels, 1u);

    // A multi-rate video header is read where its substream's size word stands.
    RmStream multiVideo = VideoStream("RV30");
    multiVideo.typeSpecific = RmMulti(2, RvHeader("RV30", 64, 48, 10));
    std::string mv = dir.Write("mv.rm", RmFile(Props(1), {RmMdpr(multiVideo)}));
    std::memset(&codec, 0, sizeof codec);
    ASSERT_EQ(metainfo::RM_GetCodecType(mv.c_str(), &codec), 0);
    EXPECT_EQ(codec.nVideoCodec, 0u);

    for (const char* fourcc : {"sipr", "raac", "dnet", "lpcJ"}) {
        std::string p = dir.Write("a.rm", RmFile(Props(1), {RmMdpr(AudioStream(fourcc))}));
        std::memset(&codec, 0, sizeof codec);
        ASSERT_EQ(metainfo::RM_GetCodecType(p.c_str(), &codec), 0);
        uint32_t expected = std::strcmp(fourcc, "sipr") == 0 ? 0x3001u : std::strcmp(fourcc, "raac") == 0 ? 0x3004u : 0u;
        EXPECT_EQ(codec.nAudioCodec, expected) << fourcc;
    }
    for (const char* fourcc : {"RV10", "RV30", "RV40"}) {
        std::string p = dir.Write("v.rm", RmFile(Props(1), {RmMdpr(VideoStream(fourcc))}));
        std::memset(&codec, 0, sizeof codec);
        ASSERT_EQ(metainfo::RM_GetCodecType(p.c_str(), &codec), 0);
        EXPECT_EQ(codec.nVideoCodec, 0x3000u + 0x10u * static_cast<uint32_t>(fourcc[2] - '0')) << fourcc;
    }
}

TEST(RmMimeType, AudioAndVideoMimeTypesAreHandedOut) {
    TempDir dir;
    std::string path = dir.Write("av.rm", RmFile(Props(2), {RmMdpr(AudioStream()), RmMdpr(VideoStream())}));
    _MM_MIMETYPE mime{};
    ASSERT_EQ(MM_MediaExtractor_GetMIMEType(path.c_str(), &mime), MM_OK);
    EXPECT_STREQ(mime.pszMimeType, "audio/x-pn-realaudio");
    EXPECT_EQ(mime.nMimeLength, 20u);
    EXPECT_STREQ(mime.pszVideoMimeType, "video/x-pn-realvideo");
    EXPECT_EQ(mime.nVideoMimeLength, 20u);
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
    MM_MediaExtractor_FreeBuffer(mime.pszVideoMimeType);
}

TEST(RmMetaInfo, ContentDescriptionFillsTitleAuthorCopyrightComment) {
    TempDir dir;
    std::string path = dir.Write("cont.rm", RmFile(Props(1), {RmCont("Title", "Author", "(c) 2009", "Note"),
                                                              RmMdpr(AudioStream())}));
    _MMMetaInfo meta{};
    ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(path.c_str(), MEDIA_TYPE_REALMEDIA, &meta), MM_OK);
    EXPECT_EQ(Item(meta, META_TITLE), "Title");
    EXPECT_EQ(Item(meta, META_ARTIST), "Author");
    EXPECT_EQ(Item(meta, META_COPYRIGHT), "(c) 2009");
    EXPECT_EQ(Item(meta, META_COMMENT), "Note");
    EXPECT_EQ(meta.aItems[META_TITLE].nEncoding, static_cast<uint32_t>(ENCODING_LATIN1));
    EXPECT_EQ(meta.aItems[META_ALBUM].nLength, 0u);

    std::string longTitle(300, 'x');
    std::string lp = dir.Write("long.rm", RmFile(Props(1), {RmCont(longTitle, "", "", "")}));
    std::memset(&meta, 0, sizeof meta);
    ASSERT_EQ(RM_GetMediaInfo(lp.c_str(), 1, &meta), 0);
    EXPECT_EQ(meta.aItems[META_TITLE].nLength, 128u);
}

TEST(RmMetaInfo, MalformedContentKeepsTheItemsBeforeTheDamage) {
    TempDir dir;
    Bytes cont = RmCont("Title", "Author", "", "");
    cont.data()[10 + 2 + 5 + 1] = 0x40;  // author length runs past the chunk
    std::string path = dir.Write("bad.rm", RmFile(Props(1), {cont}));
    _MMMetaInfo meta{};
    EXPECT_EQ(RM_GetMediaInfo(path.c_str(), 1, &meta), -3);
    EXPECT_EQ(Item(meta, META_TITLE), "Title");
    EXPECT_EQ(meta.aItems[META_ARTIST].nLength, 0u);
    EXPECT_EQ(metainfo::RM_GetMetaInfo(path.c_str(), &meta, 1), 1);

    Bytes versioned = RmChunk("CONT", Bytes().be16(1).be16(5).str("Title").zeros(6));
    std::string vp = dir.Write("v1.rm", RmFile(Props(1), {versioned}));
    std::memset(&meta, 0, sizeof meta);
    EXPECT_EQ(RM_GetMediaInfo(vp.c_str(), 1, &meta), 0);
    EXPECT_EQ(meta.aItems[META_TITLE].nLength, 0u);
}

TEST(RmMetaInfo, WithoutContentAndWithoutTagTheQueryFails) {
    TempDir dir;
    std::string path = dir.Write("bare.rm", RmFile(Props(1), {RmMdpr(AudioStream())}));
    _MMMetaInfo meta{};
    EXPECT_NE(RM_GetMediaInfo(path.c_str(), 1, &meta), 0);
    EXPECT_EQ(metainfo::RM_GetMetaInfo(path.c_str(), &meta, 1), 1);
}

TEST(RmMetaInfo, WithoutContentAnId3v1TagAtTheEndIsRead) {
    TempDir dir;
    Id3v1Spec tag;
    tag.title = "Tagged";
    tag.artist = "Someone";
    tag.genre = 8;  // Jazz
    Bytes file = Bytes().raw(RmFile(Props(1), {RmMdpr(AudioStream())})).raw(Id3v1(tag));
    std::string path = dir.Write("tagged.rm", file);
    _MMMetaInfo meta{};
    ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(path.c_str(), MEDIA_TYPE_REALMEDIA, &meta), MM_OK);
    EXPECT_EQ(Item(meta, META_TITLE), "Tagged");
    EXPECT_EQ(Item(meta, META_ARTIST), "Someone");
    EXPECT_EQ(Item(meta, META_GENRE), "Jazz");

    Bytes both = Bytes().raw(RmFile(Props(1), {RmCont("Content", "", "", ""), RmMdpr(AudioStream())})).raw(Id3v1(tag));
    std::string bp = dir.Write("both.rm", both);
    std::memset(&meta, 0, sizeof meta);
    ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(bp.c_str(), MEDIA_TYPE_REALMEDIA, &meta), MM_OK);
    EXPECT_EQ(Item(meta, META_TITLE), "Content") << "the content description comes first";
}

TEST(RmHeaders, FileHeaderAndPropertiesAreChecked) {
    TempDir dir;
    _MMClipInfo clip{};
    std::vector<uint8_t> good = RmFile(Props(1), {RmMdpr(AudioStream())});
    ASSERT_EQ(RM_GetMediaInfo(dir.Write("g.rm", good).c_str(), 2, &clip), 0);

    Bytes notRm(good);
    notRm.data()[1] = 'X';
    EXPECT_EQ(RM_GetMediaInfo(dir.Write("n.rm", notRm).c_str(), 2, &clip), -1);

    Bytes hugeHeader(good);
    hugeHeader.patch_be32(4, static_cast<uint32_t>(good.size()));
    EXPECT_EQ(RM_GetMediaInfo(dir.Write("h.rm", hugeHeader).c_str(), 2, &clip), -1);

    Bytes version(good);
    version.data()[9] = 2;
    EXPECT_EQ(RM_GetMediaInfo(dir.Write("v.rm", version).c_str(), 2, &clip), -2);
    version.data()[9] = 1;
    EXPECT_EQ(RM_GetMediaInfo(dir.Write("v1.rm", version).c_str(), 2, &clip), 0);

    Bytes count(good);
    count.patch_be32(14, 2);
    EXPECT_EQ(RM_GetMediaInfo(dir.Write("c.rm", count).c_str(), 2, &clip), -2);

    Bytes noProp(good);
    noProp.data()[18] = 'Q';
    EXPECT_EQ(RM_GetMediaInfo(dir.Write("p.rm", noProp).c_str(), 2, &clip), -2);

    Bytes tinyChunk(good);
    tinyChunk.patch_be32(18 + 50 + 4, 9);  // the MDPR
    EXPECT_EQ(RM_GetMediaInfo(dir.Write("t.rm", tinyChunk).c_str(), 2, &clip), -3);

    Bytes extraHeaders(good);
    extraHeaders.patch_be32(14, 20);  // more headers than the file holds
    EXPECT_EQ(RM_GetMediaInfo(dir.Write("e.rm", extraHeaders).c_str(), 2, &clip), -3);

    // A stream header cut off by the end of the file is a short read.
    std::vector<uint8_t> late = RmFile(Props(1), {RmCont("", "", "", std::string(300, 'c')), RmMdpr(AudioStream())});
    size_t mdprAt = 18 + 50 + 8 + 2 + 8 + 300;
    ASSERT_EQ(std::memcmp(late.data() + mdprAt, "MDPR", 4), 0);
    late.resize(mdprAt + 60);
    EXPECT_EQ(RM_GetMediaInfo(dir.Write("late.rm", late).c_str(), 2, &clip), -4);

    EXPECT_EQ(RM_GetMediaInfo(dir.PathOf("missing.rm").c_str(), 2, &clip), -1);
    EXPECT_EQ(metainfo::RM_GetClipInfo(dir.PathOf("missing.rm").c_str(), &clip), -1);
    int mask = 5;
    EXPECT_EQ(metainfo::RM_GetTrackType(dir.PathOf("missing.rm").c_str(), &mask), 1);
    EXPECT_EQ(mask, 0);
}

TEST(RmHeaders, PropertiesWithAVersionDecodeNoStreams) {
    TempDir dir;
    RmProps props = Props(1);
    props.version = 1;
    std::string path = dir.Write("pv.rm", RmFile(props, {RmMdpr(AudioStream())}));
    _MMClipInfo clip{};
    ASSERT_EQ(metainfo::RM_GetClipInfo(path.c_str(), &clip), 0);
    EXPECT_EQ(clip.bHasAudio, 0u);
    EXPECT_EQ(clip.nBitrate, 0u);
}

TEST(RmHostile, CountedPartsBeyondTheirChunkAndTruncationsAreRejected) {
    TempDir dir;
    _MMClipInfo clip{};
    RmStream audio = AudioStream();
    Bytes mdpr = RmMdpr(audio);
    // The type-specific length claims more than the chunk holds.
    Bytes bad(mdpr);
    size_t lenAt = 8 + 2 + 2 + 7 * 4 + 1 + audio.name.size() + 1 + audio.mime.size();
    bad.patch_be32(lenAt, 0x7FFFFFFF);
    EXPECT_EQ(RM_GetMediaInfo(dir.Write("b.rm", RmFile(Props(1), {bad})).c_str(), 2, &clip), -3);

    // Type-specific data too short for the header it announces.
    RmStream stub = AudioStream();
    stub.typeSpecific = Bytes().u8(0x2E).u8(0x72).u8(0x61).u8(0xFD).be16(4);
    RmStream stubVideo = VideoStream();
    stubVideo.typeSpecific = Bytes().str("MLTI").be16(0xFFFF);
    std::memset(&clip, 0, sizeof clip);
    EXPECT_EQ(RM_GetMediaInfo(dir.Write("s.rm", RmFile(Props(2), {RmMdpr(stub), RmMdpr(stubVideo)})).c_str(), 2,
                              &clip),
              0);
    EXPECT_EQ(clip.nSampleRate, 0u);
    EXPECT_EQ(clip.nWidth, 0u);

    // Every truncation of a full file, for every request.
    std::vector<uint8_t> good =
        RmFile(Props(2), {RmCont("T", "A", "C", "X"), RmMdpr(AudioStream()), RmMdpr(VideoStream())});
    for (size_t n = 0; n < good.size(); ++n) {
        std::string p = dir.Write("cut.rm", std::vector<uint8_t>(good.begin(), good.begin() + static_cast<long>(n)));
        _MMMetaInfo meta{};
        metainfo::RM_GetMetaInfo(p.c_str(), &meta, 1);
        metainfo::RM_GetClipInfo(p.c_str(), &clip);
        int mask = 0;
        metainfo::RM_GetTrackType(p.c_str(), &mask);
        _MM_MIMETYPE mime{};
        metainfo::RM_GetMIMEType(p.c_str(), &mime);
        MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
        MM_MediaExtractor_FreeBuffer(mime.pszVideoMimeType);
        _MM_CODECTYPE codec{};
        metainfo::RM_GetCodecType(p.c_str(), &codec);
    }
}

TEST(RmMimeType, AnEarlierStringInTheRecordIsReleasedFirst) {
    TempDir dir;
    std::string path = dir.Write("av.rm", RmFile(Props(1), {RmMdpr(AudioStream())}));
    _MM_MIMETYPE mime{};
    mime.pszMimeType = new char[4]{'o', 'l', 'd', 0};
    ASSERT_EQ(metainfo::RM_GetMIMEType(path.c_str(), &mime), 0);
    EXPECT_STREQ(mime.pszMimeType, "audio/x-pn-realaudio");
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
}
