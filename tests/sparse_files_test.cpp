// Files of 3 and 5 GiB, written sparse: a few real bytes at the start and the
// end, a hole between. Their answers must be the same on 32- and 64-bit
// builds; the 32-bit build runs this same table. With METAINFO_SPARSE_DIR set
// the files are kept there, so that whole probes of both builds can be compared.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "metainfo/metainfo.h"
#include "support/avi_builder.h"
#include "support/bytes.h"
#include "support/golden.h"
#include "support/id3_builder.h"
#include "support/mp3_builder.h"
#include "support/mp4_builder.h"
#include "support/speech_builder.h"

using namespace testing_support;

namespace {

constexpr uint64_t kGiB = uint64_t(1) << 30;

struct SparseShape {
    const char* name;
    std::vector<uint8_t> head;
    std::vector<uint8_t> tail;  // the file's last bytes
};

// A 64-bit mdat runs from after the movie to the end; the chunk offset box
// names a sample past 4 GiB.
std::vector<uint8_t> Mp4Head() {
    const ByteVec co64 = FullBox("co64", 0, 0, Bytes().be32(1).be64(5 * kGiB - 4096).data());
    const ByteVec stbl = Join({Stsd({AudioEntry("mp4a", 2, 16, 44100, Esds(0x40, 128000))}), co64});
    const ByteVec moov = Join({Mvhd(0, 1000, 3600000), Trak("soun", 44100, 44100u * 3600, stbl)});
    return Join({Ftyp("isom"), Box("moov", moov), Bytes().be32(1).str("mdat").be64(0).data()});
}

// A RIFF form whose sizes say "as large as it gets", as writers of long
// recordings leave them.
std::vector<uint8_t> WaveHead() {
    return Bytes()
        .str("RIFF")
        .le32(0xFFFFFFFF)
        .str("WAVE")
        .str("fmt ")
        .le32(16)
        .raw(WaveFmtBody(1, 2, 48000, 16))
        .str("data")
        .le32(0xFFFFFFFF)
        .data();
}

// An hour of 25 frames a second, of which the first ten are present.
std::vector<uint8_t> AviHead() {
    AviMainFields main;
    main.totalFrames = 90000;
    const Bytes hdrl = AviHdrl(main, {AviStrl(AviVideoStream(1, 25, 90000), AviVideoFormat(16, 16, "FMP4"))});
    std::vector<AviFrame> frames;
    for (uint32_t i = 0; i < 10; ++i) frames.push_back({0, "dc", Bytes().be32(i), 0x10});
    return AviFile(hdrl, frames);
}

std::vector<SparseShape> Shapes() {
    return {
        {"cbr.mp3", Mp3Frames(20), Id3v1Titled("Far End")},
        {"co64.mp4", Mp4Head(), {}},
        {"long.wav", WaveHead(), {}},
        {"hour.avi", AviHead(), {}},
    };
}

// Writes head at 0 and tail at the end of a file of `size` bytes.
bool WriteSparse(const std::string& path, const SparseShape& shape, uint64_t size) {
    FILE* f = std::fopen(path.c_str(), "wb");
    if (f == nullptr) return false;
    bool ok = std::fwrite(shape.head.data(), 1, shape.head.size(), f) == shape.head.size();
    const uint64_t tailAt = size - shape.tail.size() - (shape.tail.empty() ? 1 : 0);
    const std::vector<uint8_t> last = shape.tail.empty() ? std::vector<uint8_t>{0} : shape.tail;
    ok = ok && ::fseeko(f, static_cast<off_t>(tailAt), SEEK_SET) == 0 &&
         std::fwrite(last.data(), 1, last.size(), f) == last.size();
    return std::fclose(f) == 0 && ok;
}

std::string Hex(int32_t v) {
    char s[16];
    std::snprintf(s, sizeof s, "%X", static_cast<unsigned>(v));
    return s;
}

// The answers a probe gives, in one line.
std::string Answers(const std::string& path) {
    int type = 0;
    const int32_t detected = MM_MediaExtractor_DetectMediaType(path.c_str(), &type);
    std::string s = "detect " + Hex(detected) + " type " + std::to_string(type);
    _MMClipInfo clip{};
    const int32_t clipResult = MM_MediaExtractor_GetClipInfo(path.c_str(), type, &clip);
    s += " clip " + Hex(clipResult);
    if (clipResult == MM_OK) {
        s += " size " + std::to_string(clip.nFileSize) + " ms " + std::to_string(clip.nDuration) + " bps " +
             std::to_string(clip.nBitrate);
    }
    _MMMetaInfo meta{};
    const int32_t metaResult = MM_MediaExtractor_GetMetaInfo(path.c_str(), type, &meta);
    s += " meta " + Hex(metaResult);
    if (metaResult == MM_OK && meta.aItems[META_TITLE].nLength != 0) {
        s += " title " + std::string(reinterpret_cast<const char*>(meta.aItems[META_TITLE].szData));
    }
    MM_MediaExtractor_FreeMetaInfo(&meta);
    unsigned char* data = nullptr;
    int length = 0;
    // The last whole seconds of audio, far past 4 GiB in the larger files.
    const int32_t cut = MM_MediaExtractor_GetAudioData(path.c_str(), 22369, 22370, &data, &length);
    s += " cut " + Hex(cut);
    if (cut == MM_OK) s += " bytes " + std::to_string(length);
    MM_MediaExtractor_FreeBuffer(data);
    return s;
}

}  // namespace

TEST(SparseFiles, AnswersDoNotDependOnTheWidthOfPositions) {
    const char* keep = std::getenv("METAINFO_SPARSE_DIR");
    TempDir dir;
    const std::string folder = keep != nullptr && *keep != '\0' ? keep : dir.path();
    // Sizes saturate at 4 GiB - 1; the contract's 32-bit products (MP3
    // audio bytes x 8, AVI file size x 8) wrap from there; MP4 refuses files
    // of 2 GiB and more; the WAVE cut reads past 4 GiB.
    const struct {
        const char* shape;
        uint64_t gib;
    } cases[] = {
        {"cbr.mp3", 3},  {"cbr.mp3", 5},  {"co64.mp4", 3}, {"co64.mp4", 5},
        {"long.wav", 3}, {"long.wav", 5}, {"hour.avi", 3}, {"hour.avi", 5},
    };
    const std::vector<SparseShape> shapes = Shapes();
    Golden golden("sparse_files", "answers");
    for (const auto& c : cases) {
        const SparseShape* shape = nullptr;
        for (const SparseShape& s : shapes) {
            if (std::string(s.name) == c.shape) shape = &s;
        }
        ASSERT_NE(nullptr, shape) << c.shape;
        const std::string path = folder + "/" + std::to_string(c.gib) + "g-" + c.shape;
        ASSERT_TRUE(WriteSparse(path, *shape, c.gib * kGiB)) << path;
        golden.Check(std::to_string(c.gib) + "g-" + c.shape, Answers(path));
        if (keep == nullptr) std::remove(path.c_str());
    }
}
