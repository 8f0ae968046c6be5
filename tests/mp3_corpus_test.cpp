// Real MPEG audio and ID3 files, hostile ones included: every query answers
// without a fault, and hand-derived values hold for a few of them.
#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

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
    for (const char* sub : {"/mutagen", "/taglib"}) {
        std::error_code absent;
        for (const auto& entry : std::filesystem::directory_iterator(corpus + sub, absent)) {
            const std::string ext = entry.path().extension().string();
            if (!corpus.empty() && (ext == ".mp3" || ext == ".id3")) files.push_back(entry.path().string());
        }
    }
    return files;
}

// Header kind and Xing offset from the audio-information request, or {0, 0} on failure.
std::pair<uint32_t, uint32_t> VbrHeaderOf(const std::string& path) {
    _MP3AudioInfo info;
    std::memset(&info, 0, sizeof info);
    const bool ok = GetMediaInfo_MP3(path.c_str(), &info, INFO_MP3_AUDIO) == MM_OK;
    delete[] info.xingToc;
    return ok ? std::make_pair(info.headerKind, info.xingOffset) : std::make_pair(0u, 0u);
}

// Every query a caller can make of an MP3 file, none of which may fault. Returns the
// size of the first two seconds' audio, or -1 when they cannot be cut.
int AskEverything(const std::string& path, const std::string& out) {
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
    VbrHeaderOf(path);
    unsigned char* data = nullptr;
    int size = 0;
    if (MP3_GetAudioData2Buf(path.c_str(), 0, 2, &data, &size) != MM_OK) size = -1;
    MM_MediaExtractor_FreeBuffer(data);
    MP3_GetAudioData2File(path.c_str(), 0, 100, out.c_str());  // the end is clamped to the duration
    return size;
}

}  // namespace

TEST(Mp3Corpus, EveryFileIsAnsweredWithoutFault) {
    const std::vector<std::string> files = CorpusFiles();
    if (files.empty()) GTEST_SKIP() << "no corpus";
    TempDir dir;
    for (const std::string& path : files) {
        SCOPED_TRACE(path);
        EXPECT_NE(AskEverything(path, dir.PathOf("cut.mp3")), 0);
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
    EXPECT_EQ(std::string(reinterpret_cast<const char*>(meta.aItems[META_TITLE].szData), meta.aItems[META_TITLE].nLength),
              "Silence");
    MM_MediaExtractor_FreeMetaInfo(&meta);

    // silence-44-s-mpeg25.mp3: MPEG-2.5 stereo reports 1152 >> 2 samples per frame.
    ASSERT_EQ(MP3_GetClipInfo((corpus + "/mutagen/silence-44-s-mpeg25.mp3").c_str(), &clip), MM_OK);
    EXPECT_EQ(clip.nSampleRate, 12000u);
    EXPECT_EQ(clip.nSamplesPerFrame, 288u);

    // vbri.mp3 carries a VBRI header; lame_vbr.mp3 (mono MPEG-1) has its Xing header at byte 21.
    EXPECT_EQ(VbrHeaderOf(corpus + "/mutagen/vbri.mp3").first, 3u);
    EXPECT_EQ(VbrHeaderOf(corpus + "/taglib/lame_vbr.mp3"), std::make_pair(2u, 21u));
    EXPECT_NE(MP3_GetClipInfo((corpus + "/mutagen/emptyfile.mp3").c_str(), &clip), MM_OK);
}

TEST(Mp3Robustness, DamagedCopiesOfATaggedXingFileAreAnsweredWithoutFault) {
    // Deterministic byte damage over a file with every structure the readers
    // walk: v2.3 tag with text and picture, Xing frame, frames, v1 tag.
    const auto apic = ApicBody("image/png", std::vector<uint8_t>(64, 0xFF), "d");
    const auto comm = TextBytes(1, {'e', 'n', 'g', 0xFF, 0xFE, 0, 0, 0xFF, 0xFE, 'c', 0});
    XingFields xing;
    xing.frames = 40;
    xing.bytes = 40 * 417;
    const std::vector<uint8_t> source =
        Bytes()
            .raw(Id3Tag(3, {Id3Frame(3, "TIT2", TextBody(0, "Title")), Id3Frame(3, "APIC", apic), Id3Frame(3, "COMM", comm),
                            Id3Frame(3, "TCON", TextBody(0, "(17)")), Id3Frame(3, "TDRC", TextBody(0, "2004-05-0"))}))
            .raw(XingFrame(xing))
            .raw(Mp3Frames(39))
            .raw(Id3v1Titled("v1"))
            .data();
    TempDir dir;
    uint32_t seed = 12345;
    auto next = [&seed]() { return (seed = seed * 1103515245u + 12345u) >> 8; };
    for (int round = 0; round < 150; ++round) {
        std::vector<uint8_t> damaged = source;
        for (int e = 1 + static_cast<int>(next() % 8); e > 0; --e) {
            // Most damage lands in the first kilobyte, where the tag and first frames are.
            const size_t span = (next() & 1) ? 1024 : damaged.size();
            damaged[next() % span] = static_cast<uint8_t>(next());
        }
        if (round % 10 == 0) damaged.resize(next() % damaged.size());
        AskEverything(dir.Write("damaged.mp3", damaged), dir.PathOf("out.mp3"));
    }
}
