// Real MPEG audio and ID3 files, hostile ones included: every query answers
// without a fault, and hand-derived values hold for a few of them.
#include <gtest/gtest.h>

#include <dirent.h>

#include <cstring>
#include <string>
#include <vector>

#include "core/file_access.h"
#include "metainfo/extract.h"
#include "metainfo/metainfo.h"
#include "mp3/id3.h"
#include "mp3/mp3_extract.h"
#include "mp3/mp3_info.h"
#include "support/bytes.h"
#include "support/id3_builder.h"
#include "support/mp3_builder.h"

using namespace testing_support;
using namespace metainfo;

namespace {

std::vector<std::string> CorpusFiles() {
    std::vector<std::string> files;
    const std::string corpus = CorpusDir();
    if (corpus.empty()) return files;
    for (const char* sub : {"/mutagen", "/taglib"}) {
        const std::string folder = corpus + sub;
        DIR* dir = opendir(folder.c_str());
        if (dir == nullptr) continue;
        while (dirent* entry = readdir(dir)) {
            const std::string name = entry->d_name;
            const size_t dot = name.rfind('.');
            if (dot == std::string::npos) continue;
            const std::string ext = name.substr(dot);
            if (ext == ".mp3" || ext == ".id3") files.push_back(folder + "/" + name);
        }
        closedir(dir);
    }
    return files;
}

std::string Item(const _MMMetaItem& item) { return std::string(reinterpret_cast<const char*>(item.szData), item.nLength); }

}  // namespace

TEST(Mp3Corpus, EveryFileIsAnsweredWithoutFault) {
    const std::vector<std::string> files = CorpusFiles();
    if (files.empty()) GTEST_SKIP() << "no corpus";
    TempDir dir;
    for (const std::string& path : files) {
        SCOPED_TRACE(path);
        int type = MEDIA_TYPE_UNKNOWN;
        MM_MediaExtractor_DetectMediaType(path.c_str(), &type);
        _MMClipInfo clip;
        MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_MP3, &clip);
        _MM_CODECTYPE codec;
        MM_MediaExtractor_GetCodecType(path.c_str(), MEDIA_TYPE_MP3, &codec);
        _MM_MIMETYPE mime{};
        MM_MediaExtractor_GetMIMEType(path.c_str(), &mime);
        MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
        _MMMetaInfo meta;
        MM_MediaExtractor_GetMetaInfo(path.c_str(), MEDIA_TYPE_MP3, &meta);
        MM_MediaExtractor_FreeMetaInfo(&meta);
        std::memset(&meta, 0, sizeof meta);
        ID3_GetMetaInfo(path.c_str(), &meta, 0x7FFFFFFF);  // every picture the file holds
        MM_MediaExtractor_FreeMetaInfo(&meta);
        _MP3AudioInfo info;
        std::memset(&info, 0, sizeof info);
        GetMediaInfo_MP3(path.c_str(), &info, INFO_MP3_AUDIO);
        delete[] info.xingToc;
        unsigned char* data = nullptr;
        int size = 0;
        if (MP3_GetAudioData2Buf(path.c_str(), 0, 2, &data, &size) == MM_OK) {
            EXPECT_GT(size, 0);
        }
        MM_MediaExtractor_FreeBuffer(data);
        MP3_GetAudioData2File(path.c_str(), 0, 100, dir.PathOf("cut.mp3").c_str());
    }
}

TEST(Mp3Corpus, HandDerivedValues) {
    const std::string corpus = CorpusDir();
    if (corpus.empty()) GTEST_SKIP() << "no corpus";

    // silence-44-s.mp3: ID3v2.3 tag then 32 kbit/s MPEG-1 Layer III stereo.
    const std::string silence = corpus + "/mutagen/silence-44-s.mp3";
    _MMClipInfo clip;
    ASSERT_EQ(MP3_GetClipInfo(silence.c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nSampleRate, 44100u);
    EXPECT_EQ(clip.nChannels, 2u);
    EXPECT_EQ(clip.nBitrate, 32000u);
    EXPECT_EQ(clip.nFileSize, 16384u);
    _MMMetaInfo meta;
    std::memset(&meta, 0, sizeof meta);
    ASSERT_EQ(ID3_GetMetaInfo(silence.c_str(), &meta, 1), MM_OK);
    EXPECT_EQ(Item(meta.aItems[META_TITLE]), "Silence");
    EXPECT_EQ(Item(meta.aItems[META_ARTIST]), "piman");
    MM_MediaExtractor_FreeMetaInfo(&meta);

    // silence-44-s-mpeg25.mp3: MPEG-2.5 stereo reports 1152 >> 2 samples per frame.
    ASSERT_EQ(MP3_GetClipInfo((corpus + "/mutagen/silence-44-s-mpeg25.mp3").c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nSampleRate, 12000u);
    EXPECT_EQ(clip.nSamplesPerFrame, 288u);

    // vbri.mp3 carries a VBRI header and cannot be cut.
    _MP3AudioInfo info;
    std::memset(&info, 0, sizeof info);
    ASSERT_EQ(GetMediaInfo_MP3((corpus + "/mutagen/vbri.mp3").c_str(), &info, INFO_MP3_AUDIO), MM_OK);
    EXPECT_EQ(info.headerKind, 3u);
    delete[] info.xingToc;

    // lame_vbr.mp3 (mono MPEG-1) has its Xing header at byte 21 of the first frame.
    std::memset(&info, 0, sizeof info);
    ASSERT_EQ(GetMediaInfo_MP3((corpus + "/taglib/lame_vbr.mp3").c_str(), &info, INFO_MP3_AUDIO), MM_OK);
    EXPECT_EQ(info.headerKind, 2u);
    EXPECT_EQ(info.xingOffset, 21u);
    delete[] info.xingToc;

    // Hostile files are refused or answered, never more.
    EXPECT_NE(MP3_GetClipInfo((corpus + "/mutagen/emptyfile.mp3").c_str(), &clip), MM_OK);
}

TEST(Mp3Robustness, DamagedCopiesOfATaggedXingFileAreAnsweredWithoutFault) {
    // Deterministic byte damage over a file with every structure the readers
    // walk: v2.3 tag with text and picture, Xing frame, frames, v1 tag.
    Bytes apic;
    apic.u8(0).str("image/png").u8(0).u8(3).str("d").u8(0).fill(64, 0xFF);
    Bytes comm;
    comm.u8(1).str("eng").raw(std::vector<uint8_t>{0xFF, 0xFE, 0, 0, 0xFF, 0xFE, 'c', 0});
    XingSpec xing;
    xing.frames = 40;
    xing.bytes = 40 * 417;
    Id3v1Spec v1;
    v1.title = "v1";
    Bytes file;
    file.raw(Id3Tag(3, {Id3Frame(3, "TIT2", TextBody(0, "Title")), Id3Frame(3, "APIC", apic.data()),
                        Id3Frame(3, "COMM", comm.data()), Id3Frame(3, "TCON", TextBody(0, "(17)")),
                        Id3Frame(3, "TDRC", TextBody(0, "2004-05-0"))}))
        .raw(XingFrame(Mp3FrameSpec{}, xing))
        .raw(Mp3Frames(Mp3FrameSpec{}, 39))
        .raw(Id3v1(v1));
    const std::vector<uint8_t>& source = file.data();
    TempDir dir;
    uint32_t seed = 12345;
    auto next = [&seed]() {
        seed = seed * 1103515245u + 12345u;
        return seed >> 8;
    };
    for (int round = 0; round < 150; ++round) {
        std::vector<uint8_t> damaged = source;
        const int edits = 1 + static_cast<int>(next() % 8);
        for (int e = 0; e < edits; ++e) {
            // Most damage lands in the first kilobyte, where the tag and first frames are.
            const size_t span = (next() & 1) ? 1024 : damaged.size();
            damaged[next() % span] = static_cast<uint8_t>(next());
        }
        if (round % 10 == 0) damaged.resize(next() % damaged.size());
        const std::string path = dir.Write("damaged.mp3", damaged);
        _MMClipInfo clip;
        MM_MediaExtractor_GetClipInfo(path.c_str(), MEDIA_TYPE_MP3, &clip);
        _MMMetaInfo meta;
        MM_MediaExtractor_GetMetaInfo(path.c_str(), MEDIA_TYPE_MP3, &meta);
        MM_MediaExtractor_FreeMetaInfo(&meta);
        unsigned char* data = nullptr;
        int size = 0;
        MP3_GetAudioData2Buf(path.c_str(), 0, 2, &data, &size);
        MM_MediaExtractor_FreeBuffer(data);
        MP3_GetAudioData2File(path.c_str(), 1, 3, dir.PathOf("out.mp3").c_str());
    }
}
