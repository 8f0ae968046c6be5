// ASF: headers built object by object (the header walk and its bounds, clip
// information, track types, codec identification, the metadata objects), the corpus
// and files that ffmpeg writes, checked against what ffprobe reports.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <tuple>
#include <vector>

#include "asf/asf_codec.h"
#include "asf/asf_header.h"
#include "asf/asf_meta.h"
#include "metainfo/metainfo.h"
#include "support/asf_builder.h"
#include "support/bytes.h"
#include "support/ffprobe.h"
#include "support/golden.h"
#include "support/summary.h"

using namespace testing_support;
using namespace metainfo;

namespace {

constexpr uint64_t kSecond = 10000000;  // 100-ns units
constexpr uint16_t kString = 0, kBytes = 1, kDword = 3;

std::string ClipOf(const std::string& path) {
    _MMClipInfo clip;
    std::memset(&clip, 0x5A, sizeof clip);
    const int32_t result = ASF_GetClipInfo(path.c_str(), &clip);
    return result == 0 ? ClipSummary(clip) : std::to_string(result);
}

// How many of the track type, codec type and metadata queries fail (answer 1).
int Failures(const std::string& path) {
    int mask = 0;
    _MM_CODECTYPE codec{};
    _MMMetaInfo meta{};
    const int n = (ASF_GetTrackType(path.c_str(), &mask) == 1) + (ASF_GetCodecType(path.c_str(), &codec) == 1) +
                  (ASF_GetMetaInfo(path.c_str(), &meta, 1) == 1);
    delete[] meta.pPicture;
    return n;
}

Bytes Wma(uint16_t tag, uint32_t rate, uint32_t bitsPerSecond, int stream = 1) {
    return AsfAudioStream(stream, tag, rate, 2, bitsPerSecond);
}
Bytes Wmv(const std::string& fourcc, const std::vector<uint8_t>& data, int stream = 2, uint32_t w = 176,
          uint32_t h = 144) {
    return AsfVideoStream(stream, fourcc, w, h, data);
}
// STRUCT_C's first two bytes: profile, FRMRTQ_POSTPROC, BITRTQ_POSTPROC, interlace.
std::vector<uint8_t> SequenceHeader(int profile, int fps, int kbps, bool interlaced) {
    const int frmrtq = (fps - 2) / 4, bitrtq = (kbps - 32) / 64;
    return {static_cast<uint8_t>(profile << 6 | (interlaced ? 0x10 : 0) | frmrtq << 1 | bitrtq >> 4),
            static_cast<uint8_t>((bitrtq & 0x0F) << 4), 0, 0};
}

struct Meta {
    int32_t result = 0;
    _MMMetaInfo info;
    Meta(const std::vector<Bytes>& objects, int allowance = 1) {
        std::memset(&info, 0, sizeof info);
        TempDir dir;
        Bytes file = AsfHeader(objects);
        file.zeros(64);
        result = ASF_GetMetaInfo(dir.Write("m.wma", file.data()).c_str(), &info, allowance);
    }
    ~Meta() { MM_MediaExtractor_FreeMetaInfo(&info); }
    Meta(const Meta&) = delete;
    std::string Text() const { return std::to_string(result) + " " + MetaSummary(info); }
};

std::vector<uint8_t> U16(const std::string& s) { return Utf16(s).data(); }
Bytes Jpeg(size_t n) {
    Bytes b;
    b.u8(0xFF).u8(0xD8);
    for (size_t i = 2; i < n; ++i) b.u8(static_cast<uint8_t>(i * 7));
    return b;
}
std::vector<uint8_t> PictureValue(size_t n, const std::string& description = "") {
    return AsfWmPicture(3, "image/jpeg", description, Jpeg(n)).data();
}

struct LogLine {
    int priority;
    std::string tag, message;
};
std::vector<LogLine> g_lines;
void Capture(int priority, const char* tag, const char* message) {
    g_lines.push_back({priority, tag != nullptr ? tag : "", message});
}

std::string Narrow(const _MMMetaItem& item) {
    std::string s;
    for (uint32_t i = 0; i + 1 < item.nLength && item.szData[i] != 0; i += 2)
        s.push_back(static_cast<char>(item.szData[i]));
    return s;
}

// Every query of the public interface, which must all succeed.
struct Answers {
    int type = 0, mask = 0;
    _MM_CODECTYPE codec{};
    _MMClipInfo clip{};
    _MMMetaInfo meta{};
    explicit Answers(const std::string& path) {
        const char* p = path.c_str();
        EXPECT_EQ(MM_MediaExtractor_DetectMediaType(p, &type), 0);
        EXPECT_EQ(type, MEDIA_TYPE_ASF);
        EXPECT_EQ(MM_MediaExtractor_GetTrackType(p, type, &mask), 0);
        EXPECT_EQ(MM_MediaExtractor_GetCodecType(p, type, &codec), 0);
        EXPECT_EQ(MM_MediaExtractor_GetClipInfo(p, type, &clip), 0);
        EXPECT_EQ(MM_MediaExtractor_GetMetaInfo(p, type, &meta), 0);
    }
    Answers(const Answers&) = delete;
    ~Answers() { MM_MediaExtractor_FreeMetaInfo(&meta); }
};
}  // namespace

// The duration is play time less preroll in milliseconds, divided by 1000
// toward zero: 3000 - 500 gives 2 s, 1500 - 3000 gives -1 s. Of two audio
// streams the first gives the format; bHasAudio counts them.
TEST(AsfClip, FilePropertiesAndTheFirstStreamsGiveTheClip) {
    TempDir dir;
    const Bytes props = AsfFileProperties(1000, kSecond, 0, 500000);
    const struct {
        const char* name;
        std::vector<uint8_t> file;
    } cases[] = {
        {"song.wma",
         AsfFile({AsfFileProperties(123456, 3 * kSecond, 500, 128000), AsfAudioStream(1, 0x0161, 22050, 1, 32000, 8),
                  AsfAudioStream(2, 0x0161, 48000, 2, 320000, 24)})},
        {"a.wma", AsfFile({AsfFileProperties(1000, 15 * kSecond / 10, 3000, 64000)})},
        // Without bit rate or Header Extension objects: video gets the rest of the bit rate, no frame rate.
        {"v.wmv",
         AsfFile({props, AsfAudioStream(1, 0x0161, 44100, 2, 128000), Wmv("WMV2", {0, 0, 0, 0}, 2, 320, 240)})},
        // Nor a frame rate when the Header Extension describes another stream.
        {"w.wmv", AsfFile({AsfHeaderExtension({AsfExtStreamProperties(7, 400000)}), Wmv("WMV2", {0, 0, 0, 0}, 3)})},
        // The first video stream is chosen for bit rate and frame rate (10000000 / 666666)
        // whatever the object order.
        {"x.wmv", AsfFile({AsfStreamBitrates({{1, 96000}, {3, 111000}, {5, 222000}}),
                           AsfHeaderExtension({AsfObject(asf_guid::kPadding, Bytes().zeros(8)),
                                               AsfExtStreamProperties(5, 400000), AsfExtStreamProperties(3, 666666)}),
                           props, AsfAudioStream(1, 0x0161, 44100, 2, 96000), Wmv("WMV2", {0, 0, 0, 0}, 3),
                           Wmv("WMV2", {0, 0, 0, 0}, 5, 640, 480)})},
        // Fewer objects than counted end at the file end.
        {"b.wma",
         AsfHeader({AsfFileProperties(1000, 3 * kSecond, 0, 1), AsfAudioStream(1, 0x0161, 8000, 1, 8000)}, 9).data()},
        // The format is the extension without its dot, cut to eight characters.
        {"x.Asf", AsfFile({AsfFileProperties(1000, kSecond, 0, 1)})},
        {"x.abcdefghijk", AsfFile({AsfFileProperties(1000, kSecond, 0, 1)})},
        {"noext", AsfFile({AsfFileProperties(1000, kSecond, 0, 1)})},
    };
    ASSERT_EQ(dir.path().find('.'), std::string::npos);
    Golden golden("asf", "clips");
    for (const auto& c : cases) golden.Check(c.name, ClipOf(dir.Write(c.name, c.file)));
    // Audio 0x1, video 0x10 and so on up to binary 0x1000000, OR-ed; padding adds nothing.
    std::vector<Bytes> streams;
    for (const char* type :
         {asf_guid::kAudio, asf_guid::kVideo, asf_guid::kCommand, asf_guid::kJfif, asf_guid::kDegradableJpeg,
          asf_guid::kFileTransfer, asf_guid::kBinary, asf_guid::kPadding}) {
        streams.push_back(AsfStreamProperties(type, static_cast<int>(streams.size()) + 1, Bytes().zeros(20)));
    }
    int mask = -1;
    ASSERT_EQ(ASF_GetTrackType(dir.Write("a.asf", AsfFile(streams)).c_str(), &mask), 0);
    EXPECT_EQ(static_cast<uint32_t>(mask), 0x1111111u);
}

// Every broken header fails the clip query (-1) and, where the other queries
// walk the broken part, those too (1); no path leaves the file open.
TEST(AsfClip, BrokenHeadersFailAndCloseTheFile) {
    TempDir dir;
    std::vector<Bytes> many(256, AsfObject(asf_guid::kPadding, Bytes()));
    many.push_back(AsfFileProperties(1000, kSecond, 0, 1));
    EXPECT_EQ(ClipOf(dir.Write("256.wma", AsfFile(many, 256))), "wma");  // the 257th object is not read
    std::vector<uint8_t> badGuid = AsfFile({AsfFileProperties(1000, kSecond, 0, 1)});
    badGuid[3] ^= 1;
    const Bytes shortStream =
        AsfObject(asf_guid::kStreamProperties, Bytes().raw(AsfGuid(asf_guid::kAudio)).zeros(60), 10);
    struct Case {
        const char* name;
        std::vector<uint8_t> bytes;
        int otherFailures;
    };
    const Case cases[] = {
        {"257", AsfFile(many, 257), 3},
        {"guid", badGuid, 3},
        {"short", {0x30, 0x26}, 3},
        {"size0", AsfFile({AsfObject(asf_guid::kPadding, Bytes(), 0), AsfFileProperties(1000, kSecond, 0, 1)}), 3},
        {"size23", AsfFile({AsfObject(asf_guid::kPadding, Bytes(), 23), AsfFileProperties(1000, kSecond, 0, 1)}), 3},
        {"stream", AsfFile({shortStream}), 3},
        // The Header Extension is walked in the clip and metadata queries only.
        {"extSize", AsfFile({AsfHeaderExtension({}, 1 << 20), AsfVideoStream(1, "WMV2", 8, 8)}), 1},
        {"extZero",
         AsfFile({AsfHeaderExtension({AsfObject(asf_guid::kPadding, Bytes().zeros(8), 0)}),
                  AsfVideoStream(1, "WMV2", 8, 8)}),
         1},
    };
    const int before = OpenDescriptors();
    for (const Case& c : cases) {
        const std::string path = dir.Write(c.name, c.bytes);
        EXPECT_EQ(ClipOf(path), "-1") << c.name;
        EXPECT_EQ(Failures(path), c.otherFailures) << c.name;
    }
    EXPECT_EQ(ClipOf(dir.PathOf("missing.wma")), "-1");
    EXPECT_EQ(OpenDescriptors(), before);
    // A null record fails without reading.
    const std::string path = dir.Write("a.wma", AsfFile({AsfFileProperties(1000, kSecond, 0, 1)}));
    EXPECT_EQ(ASF_GetClipInfo(path.c_str(), nullptr), -1);
    EXPECT_EQ(ASF_GetTrackType(path.c_str(), nullptr), 1);
    EXPECT_EQ(ASF_GetCodecType(path.c_str(), nullptr), 1);
    EXPECT_EQ(ASF_GetMetaInfo(path.c_str(), nullptr, 1), 1);
    _MM_CODECTYPE c;
    EXPECT_EQ(ASF_GetCodecInfo(0, &c), MM_E_INVALIDARG);
    EXPECT_EQ(ASF_GetCodecInfo(1, nullptr), MM_E_INVALIDARG);
}

// WMA profiles from rate and bit rate; WMV codes from the compression and the
// length of the codec data; WMV9 profiles and levels from the sequence header
// (profile 2 is forbidden: only the codec is set; it has no 24 fps, 22 is as slow).
TEST(AsfCodec, CodesProfilesAndLevelsOfTheStreams) {
    const Bytes command = AsfStreamProperties(asf_guid::kCommand, 3, Bytes());
    const Bytes filler = AsfObject(asf_guid::kPadding, Bytes().zeros(14));  // 38 bytes
    const auto wmv3 = [](int profile, int fps, int kbps, bool interlaced, uint32_t w, uint32_t h) {
        return std::vector<Bytes>{Wmv("WMV3", SequenceHeader(profile, fps, kbps, interlaced), 2, w, h)};
    };
    const struct {
        std::vector<Bytes> streams;
    } cases[] = {
        {{Wma(0x0161, 44100, 128000)}},
        {{Wma(0x0161, 48000, 320000)}},
        {{Wma(0x0161, 49153, 128000)}},
        {{Wma(0x0161, 49152, 128000)}},
        {{Wma(0x0161, 44100, 192992)}},
        {{Wma(0x0161, 44100, 193000)}},
        {{Wma(0x0161, 44100, 394240)}},
        {{Wma(0x0161, 44100, 394248)}},
        {{Wma(0x0162, 44100, 128000)}},
        {{Wma(0x0163, 44100, 128000)}},
        // The first codec stays; later streams overwrite the profile, an unknown tag's too.
        {{Wma(0x0162, 44100, 128000, 1), Wma(0x0161, 48000, 320000, 2)}},
        {{Wma(0x0161, 44100, 320000, 1), Wma(0x0001, 8000, 64000, 2)}},
        {wmv3(0, 14, 96, false, 176, 144)},
        {wmv3(0, 14, 96, false, 320, 240)},
        {wmv3(1, 30, 2016, false, 1280, 720)},
        {wmv3(1, 30, 2016, true, 1280, 720)},
        {wmv3(3, 30, 1000, false, 1920, 1080)},
        {wmv3(3, 22, 1000, false, 1920, 1080)},
        {wmv3(2, 14, 96, false, 176, 144)},
        // WMV1, MP42 and MP43 are recognised only without codec data, WMV2 only with it.
        {{Wmv("WMV1", {})}},
        {{Wmv("WMV1", {0})}},
        {{Wmv("WMV1", {1, 2, 3, 4})}},
        {{Wmv("WMV2", {})}},
        {{Wmv("WMV2", {0x10, 0, 0, 0})}},
        {{Wmv("MP42", {})}},
        {{Wmv("MP43", {})}},
        {{Wmv("WVC1", {})}},
        {{Wmv("WVC1", {0x25, 0, 0, 1, 0x0F})}},
        // The first WMV stream decides, but a later stream without data overwrites the codec.
        {{Wmv("WMV3", SequenceHeader(0, 14, 96, false), 2), Wmv("WMV2", {0, 0, 0, 0}, 3, 640, 480)}},
        {{Wmv("WMV3", SequenceHeader(0, 14, 96, false), 2), Wmv("MP43", {}, 3, 640, 480)}},
        // Other stream types land the walk 38 bytes past their end: straight after a command
        // stream the audio stream is read from its middle, with 38 bytes between it is found.
        {{command, Wma(0x0161, 44100, 128000)}},
        {{command, filler, Wma(0x0161, 44100, 128000)}},
    };
    TempDir dir;
    Golden golden("asf", "codecs");
    for (const auto& c : cases) {
        _MM_CODECTYPE codec;
        std::memset(&codec, 0x5A, sizeof codec);
        EXPECT_EQ(ASF_GetCodecType(dir.Write("c.asf", AsfHeader(c.streams).data()).c_str(), &codec), 0);
        golden.Check(std::to_string(&c - cases), CodecSummary(codec));
    }
}

// Cases the sequence header cannot express (24 fps) and the order in which the rules fire.
TEST(AsfCodec, Wmv9LevelRulesFireInTheirOrder) {
    constexpr uint32_t kLow = 0x5020, kMedium = 0x5021;
    constexpr uint32_t kL0 = 0x5023, kL1 = 0x5024, kL2 = 0x5025, kL3 = 0x5026, kL4 = 0x5027;
    EXPECT_EQ(ASF_SimpleProfileLevel(416, 14, 176, 144), 0u);  // above 384 kbps before MEDIUM
    EXPECT_EQ(ASF_SimpleProfileLevel(160, 14, 352, 288), kMedium);
    EXPECT_EQ(ASF_MainProfileLevel(0, 22, true, 320, 240), kLow);  // LOW before the interlace rule
    EXPECT_EQ(ASF_MainProfileLevel(0, 26, false, 720, 576), kMedium);
    EXPECT_EQ(ASF_MainProfileLevel(0, 30, false, 1920, 1088), 0u);
    EXPECT_EQ(ASF_AdvancedProfileLevel(30, true, 352, 288), kL0);
    EXPECT_EQ(ASF_AdvancedProfileLevel(26, false, 720, 576), kL1);
    EXPECT_EQ(ASF_AdvancedProfileLevel(30, false, 1280, 720), kL2);
    EXPECT_EQ(ASF_AdvancedProfileLevel(24, false, 1920, 1080), kL3);
    EXPECT_EQ(ASF_AdvancedProfileLevel(30, true, 1920, 1080), kL3);
    EXPECT_EQ(ASF_AdvancedProfileLevel(24, true, 2048, 1536), kL4);  // only the slow rule
    EXPECT_EQ(ASF_AdvancedProfileLevel(30, false, 2048, 1536), 0u);
}

// Diagnostics go to the log at verbose priority with the ASF tag.
TEST(AsfLog, DiagnosticsGoToTheLogAtVerbosePriority) {
    TempDir dir;
    auto path = dir.Write("a.wma", AsfFile({AsfAudioStream(1, 0x0161, 44100, 2, 128000)}));
    g_lines.clear();
    MM_MediaExtractor_SetLogSink(Capture);
    _MM_CODECTYPE codec;
    ASF_GetCodecType(path.c_str(), &codec);
    MM_MediaExtractor_SetLogSink(nullptr);
    ASSERT_GE(g_lines.size(), 3u);
    EXPECT_EQ(g_lines[0].message, "\nEnter the ASF GetCodec Type " + path + "\n");
    EXPECT_EQ(g_lines[1].message, "the currObjSize = 106\n");
    for (const auto& line : g_lines) EXPECT_EQ(line.tag + std::to_string(line.priority), "ASF_LEVEL2");
}

// Content Description beats descriptors, descriptors beat the Metadata Objects
// of the Header Extension (read after them wherever it stands); a Metadata
// Object outside the Header Extension is not read. Texts are cut to 128 bytes
// and the next field still read.
TEST(AsfMeta, SourcesTheirOrderEncodingsAndRatings) {
    Bytes brokenPicture = AsfMetadata({{"WM/Picture", kBytes, {3, 0, 0, 0, 0}}});  // a value length beyond the file
    brokenPicture.patch_le32(brokenPicture.size() - 5 - Utf16("WM/Picture").size() - 4, 0xFFFFFFF0u);
    const struct {
        const char* name;
        std::vector<Bytes> objects;
    } cases[] = {
        {"content description", {AsfContentDescription(std::string(100, 'x'), "Author", "(c)", "Words", "")}},
        {"descriptors",
         {AsfExtContentDescription({{"WM/AlbumTitle", kString, U16("Album")},
                                    {"WM/AlbumArtist", kString, U16("Band")},
                                    {"WM/Genre", kBytes, std::vector<uint8_t>(300, 'z')},
                                    {"WM/Year", kString, U16("2004")},
                                    {"WM/Composer", kString, U16("Comp")},
                                    {"WM/Language", kString, U16("en")},
                                    {"WM/Unknown", kString, U16("skipped")},
                                    {"WM/OriginalArtist", kBytes, {1, 2, 3}},
                                    {"WM/TrackNumber", kDword, {7, 0, 0, 0}}})}},
        {"first source wins",
         {AsfMetadata({{"WM/TrackNumber", kString, U16("99")}}),
          AsfHeaderExtension({AsfMetadata({{"WM/AlbumTitle", kString, U16("FromMetadata")},
                                           {"WM/Genre", kString, U16("Rock")},
                                           {"WM/TrackNumber", kString, U16("12")}}),
                              AsfMetadata({{"WM/Genre", kString, U16("Pop")}}, true)}),
          AsfExtContentDescription({{"WM/AlbumTitle", kString, U16("FromExtended")},
                                    {"WM/OriginalArtist", kString, U16("Original")},
                                    {"WM/AlbumTitle", kString, U16("Second")}}),
          AsfContentDescription("T", "Author", "", "", "")}},
        // A data type above six is corruption; what was read stays.
        {"data type 7",
         {AsfContentDescription("Kept", "", "", "", ""),
          AsfExtContentDescription({{"WM/Year", kString, U16("1")}, {"WM/Genre", 7, {1, 2}}})}},
        // A name or a Header Extension that claims more than the file holds fails.
        {"long name", {AsfObject(asf_guid::kExtContentDescription, Bytes().le16(1).le16(0xFFFF).str("W"))}},
        {"long extension", {AsfHeaderExtension({}, 1 << 20)}},
        {"empty extension", {AsfHeaderExtension({}, 0)}},
        // Rating words are compared exactly.
        {"high", {AsfContentDescription("t", "", "", "", "high")}},
        {"higher", {AsfContentDescription("t", "", "", "", "higher")}},
        {"middle", {AsfContentDescription("t", "", "", "", "middle")}},
        {"lower", {AsfContentDescription("t", "", "", "", "lower")}},
        {"low", {AsfContentDescription("t", "", "", "", "low")}},
        {"Higher", {AsfContentDescription("t", "", "", "", "Higher")}},
        {"highest", {AsfContentDescription("t", "", "", "", "highest")}},
    };
    Golden golden("asf", "meta");
    for (const auto& c : cases) golden.Check(c.name, Meta(c.objects).Text());
    const Meta picture({AsfHeaderExtension({brokenPicture})}, 0x7FFFFFFF);  // never allocated
    EXPECT_EQ(picture.Text(), "1 ");
    // A truncated object fails but keeps what was read.
    TempDir dir;
    Bytes file = AsfHeader({AsfContentDescription("Title", "Author", "", "", "")});
    file.data().resize(file.size() - 6);
    _MMMetaInfo meta{};
    EXPECT_EQ(ASF_GetMetaInfo(dir.Write("m.wma", file.data()).c_str(), &meta, 1), 1);
    EXPECT_EQ(MetaSummary(meta), "title=6~Title\\x00");
}

// Up to 524288 bytes a WM/Picture is taken with any allowance but 0, above only
// with an allowance of at least its size; MIME type and description go into
// the MIME item as UTF-16. A banner is read within the allowance and beats
// WM/Picture; with an allowance of 0 it still sets the MIME item and the size word.
TEST(AsfMeta, PicturesAndBanners) {
    const AsfDescriptor small{"WM/Picture", kBytes, PictureValue(1000, "cover")};
    const AsfDescriptor large{"WM/Picture", kBytes, PictureValue(600000, "cover")};
    Bytes lying = AsfWmPicture(3, "image/jpeg", "", Jpeg(16));
    lying.patch_le32(1, 5000);  // claiming more than its value
    const struct {
        const char* name;
        std::vector<Bytes> objects;
        int allowance;
    } cases[] = {
        {"small", {AsfExtContentDescription({small})}, 1},
        {"just above the ceiling",
         {AsfHeaderExtension({AsfMetadata({{"WM/Picture", kBytes, PictureValue(0x80001)}}, true)})},
         1},
        {"large, allowance 1", {AsfHeaderExtension({AsfMetadata({large}, true)})}, 1},
        {"large, allowance below its size", {AsfHeaderExtension({AsfMetadata({large}, true)})}, 599999},
        {"large, allowance of its size", {AsfHeaderExtension({AsfMetadata({large}, true)})}, 600000},
        {"claiming more",
         {AsfExtContentDescription({{"WM/Picture", kBytes, lying.data()}, {"WM/Year", kString, U16("7")}})},
         1},
        {"shorter than its fields", {AsfExtContentDescription({{"WM/Picture", kBytes, {3, 1}}})}, 1},
        {"banner",
         {AsfContentBranding(2, Jpeg(300), "http://b", "http://c"),
          AsfExtContentDescription({{"WM/Picture", kBytes, PictureValue(10)}}),
          AsfContentDescription("After", "", "", "", "")},
         1},
        {"banner, allowance 0",
         {AsfContentBranding(1, Jpeg(300)), AsfExtContentDescription({{"WM/Picture", kBytes, PictureValue(10)}}),
          AsfContentDescription("After", "", "", "", "")},
         0},
        // Image type 0 leaves the walk inside the object.
        {"image type 0", {AsfContentBranding(0, Bytes()), AsfContentDescription("Lost", "", "", "", "")}, 1},
        // A second banner replaces the first picture: the size word never describes a buffer it does not match.
        {"two banners", {AsfContentBranding(2, Jpeg(300)), AsfContentBranding(3, Jpeg(600000))}, 1},
    };
    Golden golden("asf", "pictures");
    for (const auto& c : cases) {
        const Meta m(c.objects, c.allowance);
        golden.Check(c.name, m.Text());
        if (m.info.pPicture != nullptr) {
            EXPECT_EQ(std::vector<uint8_t>(m.info.pPicture, m.info.pPicture + m.info.nPictureSize),
                      Jpeg(m.info.nPictureSize).data())
                << c.name;
        }
    }
    // The public interface loads pictures up to the ceiling.
    TempDir dir;
    Bytes file = AsfHeader({AsfHeaderExtension({AsfMetadata({{"WM/Picture", kBytes, PictureValue(0x80000)}}, true)})});
    _MMMetaInfo meta;
    ASSERT_EQ(MM_MediaExtractor_GetMetaInfo(dir.Write("p.wma", file.data()).c_str(), MEDIA_TYPE_ASF, &meta), 0);
    EXPECT_NE(meta.pPicture, nullptr);
    EXPECT_EQ(meta.nPictureSize, 0x80000u);
    EXPECT_EQ(MM_MediaExtractor_FreeMetaInfo(&meta), 0);
}

// Audio alone and with WMV1 and WMV2 video: every query agrees with ffprobe;
// durations are whole seconds.
TEST(AsfFfmpeg, WrittenFilesAgreeWithFfprobe) {
    if (!HaveFfmpeg()) GTEST_SKIP() << "ffmpeg not installed";
    TempDir dir;
    struct Case {
        const char* name;
        const char* videoInput;
        const char* videoCodec;
        uint32_t videoCode;
    };
    for (const Case& c :
         {Case{"tone.wma", "", "", 0}, Case{"v1.wmv", "-f lavfi -i testsrc=d=2:s=176x144:r=15", "-c:v wmv1", 0x5001},
          Case{"v2.wmv", "-f lavfi -i testsrc=d=2:s=320x240:r=25", "-c:v wmv2", 0x5002}}) {
        SCOPED_TRACE(c.name);
        const std::string path = dir.PathOf(c.name);
        ASSERT_TRUE(FfmpegWrite(std::string(c.videoInput) + " -f lavfi -i sine=f=440:d=2 " + c.videoCodec +
                                    " -ar 44100 -c:a wmav2 -b:a 128k -metadata title=Tone -metadata artist=Someone "
                                    "-metadata album=Record",
                                path));
        const Answers a(path);
        // What ffprobe shows as a number, 0 when it shows nothing (no video stream).
        auto number = [&](const char* entries, const char* select) {
            return static_cast<uint32_t>(std::stoul("0" + Probe(path, entries, select)));
        };
        const bool hasVideo = c.videoCode != 0;
        EXPECT_EQ(a.mask, hasVideo ? TRACK_AUDIO | TRACK_VIDEO : TRACK_AUDIO);
        EXPECT_EQ(std::make_tuple(a.codec.nAudioCodec, a.codec.nAudioProfile, a.codec.nVideoCodec),
                  std::make_tuple(0x6001u, 0x6010u, c.videoCode));
        EXPECT_STREQ(a.clip.szFormat, c.name + std::string(c.name).size() - 3);
        EXPECT_EQ(a.clip.nFileSize, number("format=size", ""));
        EXPECT_NEAR(a.clip.nDuration, std::strtod(Probe(path, "format=duration").c_str(), nullptr) * 1000.0, 1000.0);
        EXPECT_EQ(a.clip.nDuration % 1000, 0u);
        EXPECT_EQ(std::make_tuple(a.clip.nSampleRate, a.clip.nChannels, a.clip.bHasAudio, a.clip.bHasVideo),
                  std::make_tuple(number("stream=sample_rate", "-select_streams a:0"),
                                  number("stream=channels", "-select_streams a:0"), 1u, hasVideo ? 1u : 0u));
        EXPECT_EQ(std::make_pair(a.clip.nWidth, a.clip.nHeight),
                  std::make_pair(number("stream=width", "-select_streams v:0"),
                                 number("stream=height", "-select_streams v:0")));
        EXPECT_EQ(Probe(path, "format_tags=title"), "Tone");
        EXPECT_EQ(Narrow(a.meta.aItems[META_TITLE]), "Tone");
        EXPECT_EQ(Narrow(a.meta.aItems[META_ARTIST]), Probe(path, "format_tags=artist"));
        EXPECT_EQ(Narrow(a.meta.aItems[META_ALBUM]), Probe(path, "format_tags=album"));
    }
}
