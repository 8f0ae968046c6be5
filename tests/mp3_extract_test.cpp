// MP3 range extraction (byte positions, the written file, decodability) and
// the real MPEG audio and ID3 files of the corpus, hostile ones included.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <string>
#include <tuple>

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

constexpr uint32_t kFrame = 417;  // MPEG-1 Layer III, 128 kbit/s, 44100 Hz
constexpr int kFrames = 1152;     // 480,384 bytes: 30 s at 16,000 bytes/s

struct Buffer {
    unsigned char* data = nullptr;
    int size = 0;
    int32_t result = 0;
    Buffer(const std::string& path, int start, int end) { result = MP3_GetAudioData2Buf(path.c_str(), start, end, &data, &size); }
    Buffer(const Buffer&) = delete;
    ~Buffer() { MM_MediaExtractor_FreeBuffer(data); }
};

std::string RunCommand(const std::string& command) {
    std::string out;
    if (FILE* p = popen(command.c_str(), "r")) {
        char buf[256];
        while (fgets(buf, sizeof buf, p) != nullptr) out += buf;
        if (pclose(p) != 0) return "failed";
    }
    return out;
}

// Seconds of audio a decoder finds in the file (frames counted by ffprobe), or -1
// when ffmpeg cannot decode it cleanly.
double DecodedSeconds(const std::string& path) {
    if (RunCommand("/usr/bin/ffmpeg -nostdin -v error -i '" + path + "' -f null - 2>&1") != "") return -1;
    const std::string out = RunCommand("/usr/bin/ffprobe -v error -count_frames -select_streams a:0 -show_entries "
                                       "stream=nb_read_frames,sample_rate -of csv=p=0 '" + path + "'");
    unsigned rate = 0, frames = 0;
    if (std::sscanf(out.c_str(), "%u,%u", &rate, &frames) != 2 || rate == 0) return -1;
    return frames * 1152.0 / rate;
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
    const Buffer b(path, 0, 2);
    MP3_GetAudioData2File(path.c_str(), 0, 100, out.c_str());  // the end is clamped to the duration
    return b.result == MM_OK ? b.size : -1;
}

}  // namespace

TEST(Mp3Extract, PositionsMoveToTheNextSyncAndTheEndIsCutAtTheDuration) {
    TempDir dir;
    const std::string path = dir.Write("cbr.mp3", Mp3Frames(kFrames));
    const Buffer b(path, 10, 20);
    ASSERT_EQ(b.result, MM_OK);
    // 160,000 and 320,000 moved to the frames at 384 and 768.
    EXPECT_EQ(b.size, static_cast<int>(320256 - 160128));
    ASSERT_NE(b.data, nullptr);
    EXPECT_EQ(b.data[0], 0xFF);
    EXPECT_EQ(b.data[kFrame], 0xFF);
    // A source without leading or trailing tags gives a file of the same bytes.
    ASSERT_EQ(MP3_GetAudioData2File(path.c_str(), 10, 20, dir.PathOf("out.mp3").c_str()), MM_OK);
    EXPECT_EQ(ReadFileBytes(dir.PathOf("out.mp3")), std::vector<uint8_t>(b.data, b.data + b.size));
    unsigned char* pub = nullptr;
    int size = 0;
    ASSERT_EQ(MM_MediaExtractor_GetAudioData(path.c_str(), 10, 20, &pub, &size), MM_OK);
    EXPECT_EQ(size, b.size);
    MM_MediaExtractor_FreeBuffer(pub);

    const struct { int start, end; int32_t result; int size; } ranges[] = {
        {20, 1000, MM_OK, static_cast<int>(kFrames * kFrame - 320256)},
        {30, 40, MM_E_FAIL, 0},  // starting at the very end leaves no frame
        {31, 40, MM_E_INVALIDARG, 0}, {-1, 5, MM_E_INVALIDARG, 0}, {5, 5, MM_E_INVALIDARG, 0}};
    for (const auto& r : ranges) {
        const Buffer cut(path, r.start, r.end);
        EXPECT_EQ(cut.result, r.result) << r.start;
        EXPECT_EQ(cut.data != nullptr, r.result == MM_OK) << r.start;
        if (r.result == MM_OK) { EXPECT_EQ(cut.size, r.size); }
    }
    EXPECT_EQ(MP3_GetAudioData2Buf(path.c_str(), 0, 5, nullptr, &size), MM_E_INVALIDARG);
    EXPECT_EQ(MP3_GetAudioData2File(path.c_str(), 0, 5, nullptr), MM_E_INVALIDARG);
    VbriFields vbri;  // VBRI streams cannot be cut
    vbri.frames = kFrames;
    EXPECT_EQ(Buffer(dir.Write("vbri.mp3", Bytes().raw(VbriFrame(vbri)).raw(Mp3Frames(kFrames - 1)).data()), 1, 2).result,
              MM_E_FAIL);
}

TEST(Mp3Extract, FileCarriesTagsAndAXingFrameForTheRange) {
    TempDir dir;
    const std::vector<uint8_t> tag = Id3v2Tag(3, std::vector<uint8_t>(20, 0));  // 30 bytes
    XingFields xing;
    xing.frames = kFrames;
    xing.bytes = kFrames * kFrame;
    const auto file = Bytes().raw(tag).raw(XingFrame(xing)).raw(Mp3Frames(kFrames - 1)).raw(Id3v1Titled("Trailing")).data();
    const std::string out = dir.PathOf("out.mp3");
    ASSERT_EQ(MP3_GetAudioData2File(dir.Write("xing.mp3", file).c_str(), 10, 20, out.c_str()), MM_OK);
    const std::vector<uint8_t> cut = ReadFileBytes(out);

    // Table entries 33 and 67 (84 and 171) of 480,384 bytes, counted from the
    // file start, moved to the frames at 157,656 and 321,120.
    const uint32_t span = 321120 - 157656;
    ASSERT_EQ(cut.size(), 30 + kFrame + span + 128);
    EXPECT_TRUE(std::equal(tag.begin(), tag.end(), cut.begin()));
    const uint8_t* x = cut.data() + 30;
    EXPECT_EQ(std::memcmp(x, file.data() + 30, 40), 0);  // header, side information, "Xing"
    const auto fields = Bytes().be32(0xF).be32(383).be32(span).data();  // lrint(10 * 44100 / 1152) frames
    EXPECT_EQ(std::memcmp(x + 40, fields.data(), 12), 0);
    EXPECT_EQ(std::memcmp(x + 52, file.data() + 30 + 52, 100), 0);  // the source's table as it stands
    EXPECT_EQ(x[155], 57);  // quality
    EXPECT_EQ(x[156], 0);   // padding up to the source frame's size
    EXPECT_EQ(std::memcmp(cut.data() + 30 + kFrame, file.data() + 157656, span), 0);
    EXPECT_EQ(std::memcmp(cut.data() + cut.size() - 128, "TAGTrailing", 11), 0);
}

TEST(Mp3Extract, CutFilesDecodeForTheRequestedSpan) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg is not installed";
    TempDir dir;
    const std::string make = "/usr/bin/ffmpeg -nostdin -v error -y -f lavfi -i sine=frequency=440:duration=30 "
                             "-c:a libmp3lame ";
    const double frame = 1152.0 / 44100;
    const struct {
        std::string options;
        double tolerance;
    } cases[] = {
        {"-b:a 128k", frame},
        {"-q:a 4", 30 * 0.01 + 2 * frame},  // the Xing table has 1% steps: each cut may move by half a step
    };
    for (const auto& c : cases) {
        const std::string source = dir.PathOf("source.mp3"), out = dir.PathOf("cut.mp3");
        if (RunCommand(make + c.options + " '" + source + "' 2>&1") != "") GTEST_SKIP() << "ffmpeg cannot encode MP3 here";
        ASSERT_EQ(MP3_GetAudioData2File(source.c_str(), 10, 20, out.c_str()), MM_OK) << c.options;
        EXPECT_NEAR(DecodedSeconds(out), 10.0, c.tolerance) << c.options;
    }
    const std::string corpus = CorpusDir();
    for (const char* name : {"mutagen/xing.mp3", "mutagen/silence-44-s.mp3"}) {
        if (corpus.empty()) break;
        const std::string out = dir.PathOf("corpus.mp3");
        ASSERT_EQ(MP3_GetAudioData2File((corpus + "/" + name).c_str(), 1, 2, out.c_str()), MM_OK) << name;
        EXPECT_GT(DecodedSeconds(out), 0.5) << name;
    }
}

TEST(Mp3Corpus, EveryFileIsAnsweredWithoutFaultAndKnownFilesAsByHand) {
    const std::string corpus = CorpusDir();
    if (corpus.empty()) GTEST_SKIP() << "no corpus";
    TempDir dir;
    for (const char* sub : {"/mutagen", "/taglib"}) {
        for (const auto& entry : std::filesystem::directory_iterator(corpus + sub)) {
            const std::string ext = entry.path().extension().string();
            if (ext != ".mp3" && ext != ".id3") continue;
            SCOPED_TRACE(entry.path().string());
            EXPECT_NE(AskEverything(entry.path().string(), dir.PathOf("cut.mp3")), 0);
        }
    }
    // silence-44-s.mp3: ID3v2.3 tag then 32 kbit/s MPEG-1 Layer III stereo.
    const std::string silence = corpus + "/mutagen/silence-44-s.mp3";
    _MMClipInfo clip;
    ASSERT_EQ(MP3_GetClipInfo(silence.c_str(), &clip), MM_OK);
    EXPECT_EQ(std::tie(clip.nSampleRate, clip.nChannels, clip.nBitrate, clip.nFileSize),
              std::make_tuple(44100u, 2u, 32000u, 16384u));
    _MMMetaInfo meta;
    std::memset(&meta, 0, sizeof meta);
    ASSERT_EQ(ID3_GetMetaInfo(silence.c_str(), &meta, 1), MM_OK);
    EXPECT_EQ(std::string(reinterpret_cast<const char*>(meta.aItems[META_TITLE].szData), meta.aItems[META_TITLE].nLength),
              "Silence");
    MM_MediaExtractor_FreeMetaInfo(&meta);
    // silence-44-s-mpeg25.mp3: MPEG-2.5 stereo reports 1152 >> 2 samples per frame.
    ASSERT_EQ(MP3_GetClipInfo((corpus + "/mutagen/silence-44-s-mpeg25.mp3").c_str(), &clip), MM_OK);
    EXPECT_EQ(std::tie(clip.nSampleRate, clip.nSamplesPerFrame), std::make_tuple(12000u, 288u));
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
