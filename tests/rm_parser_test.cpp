// RealMedia header chunks and the five answers of media type 2.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "metainfo/metainfo.h"
#include "realmedia/rm_parser.h"
#include "support/bytes.h"
#include "support/rm_builder.h"

using namespace testing_support;
using metainfo::RM_GetMediaInfo;

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

RmProps Props(uint16_t streams, uint32_t durationMs = 5000) {
    RmProps p;
    p.numStreams = streams;
    p.durationMs = durationMs;
    return p;
}

std::string Item(const _MMMetaInfo& meta, int kind) {
    return std::string(reinterpret_cast<const char*>(meta.aItems[kind].szData), meta.aItems[kind].nLength);
}

class Rm : public ::testing::Test {
protected:
    TempDir dir;
    _MMClipInfo clip{};
    _MMMetaInfo meta{};

    std::string Write(const std::vector<uint8_t>& file) { return dir.Write("clip.rm", file); }
    int32_t Clip(const std::vector<uint8_t>& file) {
        std::memset(&clip, 0, sizeof clip);
        return metainfo::RM_GetClipInfo(Write(file).c_str(), &clip);
    }
    int32_t Meta(const std::vector<uint8_t>& file) {
        std::memset(&meta, 0, sizeof meta);
        return RM_GetMediaInfo(Write(file).c_str(), 1, &meta);
    }
};

}  // namespace

TEST_F(Rm, AudioAndVideoFieldsComeFromTheirFirstStreams) {
    std::string path = Write(RmFile(Props(2), {RmCont("t", "a", "c", "x"), RmMdpr(AudioStream()), RmMdpr(VideoStream())}));
    ASSERT_EQ(metainfo::RM_GetClipInfo(path.c_str(), &clip), 0);
    EXPECT_EQ(clip.nDuration, 5u);
    EXPECT_EQ(clip.nBitrate, 48000u);
    EXPECT_EQ(clip.nAudioBitrate, 32000u) << "the stream's maximum bit rate";
    EXPECT_EQ(clip.nSampleRate, 44100u);
    EXPECT_EQ(clip.nWidth, 320u);
    EXPECT_EQ(clip.nFrameRate, 15u);
    EXPECT_STREQ(clip.szFormat, "rm");
    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(path.c_str(), MEDIA_TYPE_REALMEDIA, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO | TRACK_VIDEO);
    // The reader releases an earlier string in the record before handing out
    // new ones (the public interface clears the record, so ask the reader).
    _MM_MIMETYPE mime{};
    mime.pszMimeType = new char[4]{'o', 'l', 'd', 0};
    ASSERT_EQ(metainfo::RM_GetMIMEType(path.c_str(), &mime), MM_OK);
    EXPECT_STREQ(mime.pszMimeType, "audio/x-pn-realaudio");
    EXPECT_STREQ(mime.pszVideoMimeType, "video/x-pn-realvideo");
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
    MM_MediaExtractor_FreeBuffer(mime.pszVideoMimeType);
}

TEST_F(Rm, TwoAudioStreamsAreCountedButTheFirstDescribesTheAudio) {
    RmStream second = AudioStream("sipr", 8000, 1);
    second.number = 1;
    second.mime = "audio/x-second";
    std::string path = Write(RmFile(Props(2), {RmMdpr(AudioStream()), RmMdpr(second)}));
    ASSERT_EQ(metainfo::RM_GetClipInfo(path.c_str(), &clip), 0);
    EXPECT_EQ(clip.bHasAudio, 2u);
    EXPECT_EQ(clip.nSampleRate, 44100u);
    _MM_CODECTYPE codec{};
    EXPECT_EQ(metainfo::RM_GetCodecType(path.c_str(), &codec), 0);
    EXPECT_EQ(codec.nAudioCodec, 0x3002u) << "cook";
    _MM_MIMETYPE mime{};
    EXPECT_EQ(metainfo::RM_GetMIMEType(path.c_str(), &mime), 0);
    EXPECT_STREQ(mime.pszMimeType, "audio/x-pn-realaudio");
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
}

TEST_F(Rm, LogicalStreamsAndLowerCaseNamesAreNotAudioOrVideo) {
    RmStream logical = AudioStream();
    logical.mime = "logical-fileinfo";
    RmStream lower = AudioStream();
    lower.name = "audio stream";
    RmStream both = VideoStream();
    both.name = "Audio+Video";
    ASSERT_EQ(Clip(RmFile(Props(3), {RmMdpr(logical), RmMdpr(lower), RmMdpr(both)})), 0);
    EXPECT_EQ(clip.bHasAudio, 1u) << "only the stream naming both counts as audio";
    EXPECT_EQ(clip.bHasVideo, 1u);
    EXPECT_EQ(clip.nSampleRate, 0u) << "its data is video data, read as audio it says nothing";

    std::string none = Write(RmFile(Props(2), {RmMdpr(logical), RmMdpr(lower)}));
    int mask = 0x100;
    EXPECT_EQ(metainfo::RM_GetTrackType(none.c_str(), &mask), 0);
    EXPECT_EQ(mask, 0) << "cleared first, no stream flagged";
}

TEST_F(Rm, ShortPropDurationFallsBackToTheLongerStream) {
    RmStream audio = AudioStream();
    audio.durationMs = 7999;
    ASSERT_EQ(Clip(RmFile(Props(2, 999), {RmMdpr(audio), RmMdpr(VideoStream())})), 0);
    EXPECT_EQ(clip.nDuration, 7u);

    audio.durationMs = 900;
    RmStream video = VideoStream();
    video.durationMs = 999;
    ASSERT_EQ(Clip(RmFile(Props(2, 999), {RmMdpr(audio), RmMdpr(video)})), 0);
    EXPECT_EQ(clip.nDuration, 0u);
    ASSERT_EQ(MM_MediaExtractor_GetClipInfo(dir.PathOf("clip.rm").c_str(), MEDIA_TYPE_REALMEDIA, &clip), MM_OK);
    EXPECT_EQ(clip.nDuration, 1000u) << "never under a second through the public interface";
}

TEST_F(Rm, CodecsFromTheFourccTableInBothTypeDataForms) {
    RmStream multiAudio;
    multiAudio.typeData = RmMulti(3, RaHeaderV5(22050, 16, 1, "atrc"));
    ASSERT_EQ(Clip(RmFile(Props(1), {RmMdpr(multiAudio)})), 0);
    EXPECT_EQ(clip.nSampleRate, 22050u);
    // A multi-rate video header is read where its substream's size word stands.
    RmStream multiVideo = VideoStream("RV30");
    multiVideo.typeData = RmMulti(2, RvHeader("RV30", 64, 48, 10));
    struct Case { RmStream stream; uint32_t audio, video; } cases[] = {
        {multiAudio, 0x3003, 0}, {AudioStream("sipr"), 0x3001, 0}, {AudioStream("raac"), 0x3004, 0},
        {AudioStream("dnet"), 0, 0}, {VideoStream("RV10"), 0, 0x3010}, {VideoStream("RV20"), 0, 0x3020},
        {multiVideo, 0, 0}};
    for (const Case& c : cases) {
        _MM_CODECTYPE codec{};
        ASSERT_EQ(metainfo::RM_GetCodecType(Write(RmFile(Props(1), {RmMdpr(c.stream)})).c_str(), &codec), 0);
        EXPECT_EQ(codec.nAudioCodec, c.audio);
        EXPECT_EQ(codec.nVideoCodec, c.video);
    }
}

TEST_F(Rm, ContentDescriptionFillsTitleAuthorCopyrightComment) {
    std::string path = Write(RmFile(Props(1), {RmCont("Title", "Author", "(c) 2009", "Note"), RmMdpr(AudioStream())}));
    ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(path.c_str(), MEDIA_TYPE_REALMEDIA, &meta), MM_OK);
    EXPECT_EQ(Item(meta, META_TITLE), "Title");
    EXPECT_EQ(Item(meta, META_ARTIST), "Author");
    EXPECT_EQ(Item(meta, META_COPYRIGHT), "(c) 2009");
    EXPECT_EQ(Item(meta, META_COMMENT), "Note");
    EXPECT_EQ(meta.aItems[META_TITLE].nEncoding, static_cast<uint32_t>(ENCODING_LATIN1));

    ASSERT_EQ(Meta(RmFile(Props(1), {RmCont(std::string(300, 'x'), "", "", "")})), 0);
    EXPECT_EQ(meta.aItems[META_TITLE].nLength, 128u);
}

TEST_F(Rm, MalformedContentKeepsTheItemsBeforeTheDamage) {
    Bytes cont = RmCont("Title", "Author", "", "");
    cont.data()[10 + 2 + 5 + 1] = 0x40;  // author length runs past the chunk
    EXPECT_EQ(Meta(RmFile(Props(1), {cont})), -3);
    EXPECT_EQ(Item(meta, META_TITLE), "Title");
    EXPECT_EQ(meta.aItems[META_ARTIST].nLength, 0u);
    EXPECT_EQ(metainfo::RM_GetMetaInfo(dir.PathOf("clip.rm").c_str(), &meta, 1), 1);

    EXPECT_EQ(Meta(RmFile(Props(1), {RmChunk("CONT", Bytes().be16(1).be16(5).str("Title").zeros(6))})), 0);
    EXPECT_EQ(meta.aItems[META_TITLE].nLength, 0u) << "a versioned content description is not read";
}

TEST_F(Rm, WithoutContentAnId3v1TagAtTheEndIsRead) {
    EXPECT_NE(Meta(RmFile(Props(1), {RmMdpr(AudioStream())})), 0) << "neither content nor tag";
    EXPECT_EQ(metainfo::RM_GetMetaInfo(dir.PathOf("clip.rm").c_str(), &meta, 1), 1);

    // An ID3v1 tag: "TAG", title, artist, album, year, comment, then genre 8 (Jazz).
    Bytes tag = Bytes().str("TAG").str("Tagged").zeros(24 + 30 + 30 + 4 + 30).u8(8);
    std::string path = Write(Bytes().raw(RmFile(Props(1), {RmMdpr(AudioStream())})).raw(tag));
    ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(path.c_str(), MEDIA_TYPE_REALMEDIA, &meta), MM_OK);
    EXPECT_EQ(Item(meta, META_TITLE), "Tagged");
    EXPECT_EQ(Item(meta, META_GENRE), "Jazz");

    path = Write(Bytes().raw(RmFile(Props(1), {RmCont("Content", "", "", ""), RmMdpr(AudioStream())})).raw(tag));
    std::memset(&meta, 0, sizeof meta);
    ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(path.c_str(), MEDIA_TYPE_REALMEDIA, &meta), MM_OK);
    EXPECT_EQ(Item(meta, META_TITLE), "Content") << "the content description comes first";
}

TEST_F(Rm, FileHeaderAndPropertiesAreChecked) {
    const std::vector<uint8_t> good = RmFile(Props(1), {RmMdpr(AudioStream())});
    struct Case { const char* what; size_t at; uint32_t value; bool word; int32_t expected; } cases[] = {
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
    for (const Case& c : cases) {
        Bytes file(good);
        if (c.word) file.patch_be32(c.at, c.value);
        else if (c.at != 0) file.data()[c.at] = static_cast<uint8_t>(c.value);
        EXPECT_EQ(RM_GetMediaInfo(Write(file).c_str(), 2, &clip), c.expected) << c.what;
    }
    // A stream header cut off by the end of the file is a short read.
    std::vector<uint8_t> late = RmFile(Props(1), {RmCont("", "", "", std::string(300, 'c')), RmMdpr(AudioStream())});
    const size_t mdprAt = 18 + 50 + 8 + 2 + 8 + 300;
    ASSERT_EQ(std::memcmp(late.data() + mdprAt, "MDPR", 4), 0);
    late.resize(mdprAt + 60);
    EXPECT_EQ(RM_GetMediaInfo(Write(late).c_str(), 2, &clip), -4);

    int mask = 5;
    EXPECT_EQ(metainfo::RM_GetTrackType(dir.PathOf("missing.rm").c_str(), &mask), 1);
    EXPECT_EQ(mask, 0);
}

TEST_F(Rm, PropertiesWithAVersionDecodeNoStreams) {
    RmProps props = Props(1);
    props.version = 1;
    ASSERT_EQ(Clip(RmFile(props, {RmMdpr(AudioStream())})), 0);
    EXPECT_EQ(clip.bHasAudio, 0u);
    EXPECT_EQ(clip.nBitrate, 0u);
}

TEST_F(Rm, CountedPartsBeyondTheirChunkAndTruncationsAreRejected) {
    RmStream audio = AudioStream();
    Bytes bad = RmMdpr(audio);
    // The type data length claims more than the chunk holds.
    bad.patch_be32(8 + 2 + 2 + 7 * 4 + 1 + audio.name.size() + 1 + audio.mime.size(), 0x7FFFFFFF);
    EXPECT_EQ(RM_GetMediaInfo(Write(RmFile(Props(1), {bad})).c_str(), 2, &clip), -3);

    // Type data too short for the header it announces.
    RmStream stub = AudioStream();
    stub.typeData = Bytes().u8(0x2E).u8(0x72).u8(0x61).u8(0xFD).be16(4);
    RmStream stubVideo = VideoStream();
    stubVideo.typeData = Bytes().str("MLTI").be16(0xFFFF);
    std::memset(&clip, 0, sizeof clip);
    EXPECT_EQ(RM_GetMediaInfo(Write(RmFile(Props(2), {RmMdpr(stub), RmMdpr(stubVideo)})).c_str(), 2, &clip), 0);
    EXPECT_EQ(clip.nSampleRate, 0u);
    EXPECT_EQ(clip.nWidth, 0u);

    // Every truncation of a full file, for every request.
    std::vector<uint8_t> good =
        RmFile(Props(2), {RmCont("T", "A", "C", "X"), RmMdpr(AudioStream()), RmMdpr(VideoStream())});
    for (size_t n = 0; n < good.size(); ++n) {
        std::string p = Write(std::vector<uint8_t>(good.begin(), good.begin() + static_cast<long>(n)));
        _MMMetaInfo cut{};
        metainfo::RM_GetMetaInfo(p.c_str(), &cut, 1);
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
