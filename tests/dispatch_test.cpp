#include <gtest/gtest.h>

#include <cstring>

#include "metainfo/metainfo.h"
#include "support/bytes.h"

using testing_support::Bytes;
using testing_support::TempDir;

namespace {

class Dispatch : public ::testing::Test {
protected:
    TempDir dir;
    std::string midi = dir.Write("tune.mid", Bytes().str("MThd").be32(6).zeros(120));
    std::string wave = dir.Write("tone.wav", Bytes().str("RIFF").le32(120).str("WAVE").zeros(116));
    std::string mp4 = dir.Write("clip.mp4", Bytes().be32(16).str("ftypisom").zeros(112));
    std::string avi = dir.Write("clip.avi", Bytes().str("RIFF").le32(120).str("AVI ").zeros(116));
    std::string missing = dir.PathOf("missing.wav");
};

}  // namespace

TEST(DispatchTables, SlotsWithoutAFormatStayEmpty) {
    for (int slot : {0, 10, 14, 15}) {
        EXPECT_EQ(MM_GetTrackType[slot], nullptr) << slot;
        EXPECT_EQ(MM_GetMetaInfo[slot], nullptr) << slot;
        EXPECT_EQ(MM_GetClipInfo[slot], nullptr) << slot;
        EXPECT_EQ(MM_GetMIMEType[slot], nullptr) << slot;
        EXPECT_EQ(MM_GetAudioData[slot], nullptr) << slot;
        EXPECT_EQ(MM_GetCodecType[slot], nullptr) << slot;
    }
    for (int slot = 0; slot < MM_MEDIA_SLOTS; ++slot) EXPECT_EQ(MM_GetVideoData[slot], nullptr);
    EXPECT_EQ(MM_GetMIMEType[MEDIA_TYPE_MP4], nullptr);
    EXPECT_EQ(MM_GetCodecType[MEDIA_TYPE_AVI], nullptr);
    EXPECT_EQ(MM_GetCodecType[MEDIA_TYPE_MIDI], nullptr);
}

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

TEST_F(Dispatch, UnknownTypeIsUnsupportedAndEmptyTrackSlotMeansAudio) {
    int mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(midi.c_str(), MEDIA_TYPE_UNKNOWN, &mask), MM_E_UNSUPPORTED);
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(midi.c_str(), MEDIA_TYPE_SND, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO);
    mask = 0;
    EXPECT_EQ(MM_MediaExtractor_GetTrackType(midi.c_str(), MEDIA_TYPE_MIDI, &mask), MM_OK);
    EXPECT_EQ(mask, TRACK_AUDIO);
    for (int bad : {-1, 16, 254, 256}) {
        EXPECT_EQ(MM_MediaExtractor_GetTrackType(midi.c_str(), bad, &mask), MM_E_UNSUPPORTED) << bad;
        _MM_CODECTYPE codec;
        EXPECT_EQ(MM_MediaExtractor_GetCodecType(midi.c_str(), bad, &codec), MM_E_UNSUPPORTED) << bad;
    }
}

TEST_F(Dispatch, ClipInfoTurnsSecondsIntoMillisecondsOnlyAfterASlotRan) {
    _MMClipInfo clip;
    std::memset(&clip, 0xAB, sizeof clip);
    EXPECT_EQ(MM_MediaExtractor_GetClipInfo(midi.c_str(), MEDIA_TYPE_MIDI, &clip), MM_E_NOTIMPL);
    EXPECT_EQ(clip.nDuration, 1000u) << "a failed slot still reports at least one second";
    EXPECT_EQ(clip.nFileSize, 0u) << "the record was cleared first";

    std::memset(&clip, 0xAB, sizeof clip);
    EXPECT_EQ(MM_MediaExtractor_GetClipInfo(midi.c_str(), MEDIA_TYPE_IMELODY, &clip), MM_E_UNSUPPORTED);
    EXPECT_EQ(clip.nDuration, 0u);
    EXPECT_EQ(MM_MediaExtractor_GetClipInfo(midi.c_str(), MEDIA_TYPE_UNKNOWN, &clip), MM_E_UNSUPPORTED);
    EXPECT_EQ(clip.nDuration, 0u);
}

TEST_F(Dispatch, CodecAndMetadataRecordsAreClearedEvenWhenUnsupported) {
    _MM_CODECTYPE codec;
    std::memset(&codec, 0xFF, sizeof codec);
    EXPECT_EQ(MM_MediaExtractor_GetCodecType(avi.c_str(), MEDIA_TYPE_AVI, &codec), MM_E_UNSUPPORTED);
    EXPECT_EQ(codec.nAudioCodec, 0u);
    EXPECT_EQ(codec.nVideoLevel, 0u);
    EXPECT_EQ(MM_MediaExtractor_GetCodecType(midi.c_str(), MEDIA_TYPE_MIDI, &codec), MM_E_UNSUPPORTED);

    _MMMetaInfo meta;
    std::memset(&meta, 0x11, sizeof meta);
    EXPECT_EQ(MM_MediaExtractor_GetMetaInfo(midi.c_str(), MEDIA_TYPE_MIDI, &meta), MM_E_NOTIMPL);
    EXPECT_EQ(meta.pPicture, nullptr);
    EXPECT_EQ(meta.aItems[0].nLength, 0u);
    EXPECT_EQ(MM_MediaExtractor_GetCodecTypeEx(midi.c_str(), MEDIA_TYPE_MIDI, &codec), MM_E_UNSUPPORTED);
}

TEST_F(Dispatch, PathOnlyQueriesDetectTheTypeFirst) {
    _MM_MIMETYPE mime;
    std::memset(&mime, 0, sizeof mime);
    EXPECT_EQ(MM_MediaExtractor_GetMIMEType(mp4.c_str(), &mime), MM_E_UNSUPPORTED);
    EXPECT_EQ(mime.pszMimeType, nullptr);
    EXPECT_EQ(MM_MediaExtractor_GetMIMEType(missing.c_str(), &mime), MM_E_FAIL);
    unsigned char* data = nullptr;
    int size = 0;
    EXPECT_EQ(MM_MediaExtractor_GetAudioData(midi.c_str(), 0, 1, &data, &size), MM_E_UNSUPPORTED);
    EXPECT_EQ(MM_MediaExtractor_GetAudioData(missing.c_str(), 0, 1, &data, &size), MM_E_FAIL);
    EXPECT_EQ(data, nullptr);
}

TEST_F(Dispatch, MakerInfoOfAnythingButMp4LeavesTheRecordUntouched) {
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
}
