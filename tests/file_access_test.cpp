// File access: plain files through the handle table, and protected files read
// through a content-protection service; these tests install one that serves
// scrambled files as their plain content.
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <map>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "core/drm.h"
#include "core/file_access.h"
#include "metainfo/metainfo.h"
#include "support/bytes.h"

using testing_support::Bytes;
using testing_support::TempDir;
using namespace metainfo;

namespace {

std::string Extension(const char* path, int* result) {
    char ext[10] = {0};
    *result = GetFileExtension(path, ext);
    return ext;
}

constexpr uint8_t kScramble = 0x5A;

struct FakeService {
    std::map<std::string, std::vector<std::pair<std::string, std::string>>> metadata;
    int apiType = 2;
    bool refuseSessions = false;
    int openSessions = 0;
    std::vector<long long> readOffsets;
};

FakeService* g_service = nullptr;

int GetMetadata(void* ctx, const char* path, void (*emit)(void*, const char*, const char*), void* emitCtx) {
    auto* service = static_cast<FakeService*>(ctx);
    auto it = service->metadata.find(path);
    if (it == service->metadata.end()) return 1;
    for (const auto& kv : it->second) emit(emitCtx, kv.first.c_str(), kv.second.c_str());
    emit(emitCtx, nullptr, "ignored");
    return 0;
}

void* OpenSession(void* ctx, const char* path, int* apiType) {
    auto* service = static_cast<FakeService*>(ctx);
    if (service->refuseSessions) return nullptr;
    FILE* f = std::fopen(path, "rb");
    if (f == nullptr) return nullptr;
    ++service->openSessions;
    *apiType = service->apiType;
    return f;
}

long long Pread(void* ctx, void* session, void* buf, size_t size, long long offset) {
    static_cast<FakeService*>(ctx)->readOffsets.push_back(offset);
    FILE* f = static_cast<FILE*>(session);
    if (offset < 0 || ::fseeko(f, static_cast<off_t>(offset), SEEK_SET) != 0) return -1;
    size_t n = std::fread(buf, 1, size, f);
    for (size_t i = 0; i < n; ++i) static_cast<uint8_t*>(buf)[i] ^= kScramble;
    return static_cast<long long>(n);
}

void CloseSession(void* ctx, void* session) {
    --static_cast<FakeService*>(ctx)->openSessions;
    std::fclose(static_cast<FILE*>(session));
}

std::vector<std::pair<int, std::string>> g_log;
void CaptureLog(int priority, const char* tag, const char* message) {
    g_log.emplace_back(priority, std::string(tag != nullptr ? tag : "") + "|" + message);
}

class Protected : public ::testing::Test {
protected:
    void SetUp() override {
        g_service = &service;
        MM_DrmProvider provider{&service, GetMetadata, OpenSession, Pread, CloseSession};
        MM_MediaExtractor_SetDrmProvider(&provider);
        g_log.clear();
        MM_MediaExtractor_SetLogSink(CaptureLog);
    }
    void TearDown() override {
        MM_MediaExtractor_SetDrmProvider(nullptr);
        MM_MediaExtractor_SetLogSink(nullptr);
        EXPECT_EQ(service.openSessions, 0) << "every decrypt session is closed";
        g_service = nullptr;
    }

    // Writes the content scrambled, as the protected file lies on disk.
    std::string WriteProtected(const std::string& name, std::vector<uint8_t> plain,
                               std::vector<std::pair<std::string, std::string>> meta) {
        for (uint8_t& b : plain) b ^= kScramble;
        std::string path = dir.Write(name, plain);
        service.metadata[path] = std::move(meta);
        return path;
    }

    FakeService service;
    TempDir dir;
};
}  // namespace

TEST(PlainFile, ReadsItemsSeeksAndTellsLikeStdio) {
    TempDir dir;
    std::string path = dir.Write("a.bin", Bytes().str("0123456789"));
    int h = MEx_fopen(path.c_str(), "rb");
    ASSERT_NE(h, 0);
    char buf[8] = {0};
    EXPECT_EQ(MEx_fread(buf, 4, 2, h), 2);  // items, not bytes
    EXPECT_EQ(std::string(buf, 8), "01234567");
    EXPECT_EQ(MEx_ftell(h), 8);
    EXPECT_EQ(MEx_fread(buf, 4, 1, h), 0);  // only 2 bytes left: no whole item
    EXPECT_NE(MEx_feof(h), 0);
    EXPECT_EQ(MEx_fseek(h, -3, SEEK_END), 0);
    EXPECT_EQ(MEx_fread(buf, 1, 8, h), 3);
    EXPECT_EQ(MEx_fseek(h, 2, SEEK_SET), 0);
    EXPECT_EQ(MEx_fseek(h, 1, SEEK_CUR), 0);
    EXPECT_EQ(MEx_ftell(h), 3);
    EXPECT_EQ(MEx_fclose(h), 0);
}

// Reads that hit, straddle and miss what earlier reads brought in, from two
// handles on one file, small and large, up to and past the end; then the file
// is rewritten in place with the same size, then replaced under its name, and
// each time a new handle reads the new bytes.
TEST(PlainFile, EveryReadAnswersTheFileBytesAndARewriteIsSeen) {
    struct Step {
        int handle;
        int64_t pos;
        size_t n;
    };
    const Step kSteps[] = {
        {0, 0, 128},     {1, 300000, 64},  {0, 20000, 10},     {0, 12288, 7712},    {1, 12000, 9000}, {0, 4000, 200},
        {1, 0, 10},      {0, 70000, 9000}, {1, 65536, 200000}, {0, 299990, 50},     {1, 8192, 4096},  {0, 4096, 100000},
        {1, 307190, 20}, {0, 307200, 10},  {1, 123456, 1},     {0, 200000, 107200}, {1, 0, 307200},
    };
    constexpr size_t kSize = 307200;
    // A file older than two seconds whose bytes a thread holds is opened only
    // when a read needs bytes not held; a fresh one at once.
    for (const bool settled : {false, true}) {
        SCOPED_TRACE(settled ? "settled" : "fresh");
        TempDir dir;
        std::vector<uint8_t> bytes(kSize);
        for (size_t i = 0; i < kSize; ++i) bytes[i] = static_cast<uint8_t>(i * 7 + i / 251);
        std::string path = dir.Write("a.bin", bytes);
        if (settled) {
            std::this_thread::sleep_for(std::chrono::milliseconds(2200));
            const int first = MEx_fopen(path.c_str(), "rb");
            std::vector<uint8_t> head(5000);
            ASSERT_EQ(MEx_fread(head.data(), 1, 5000, first), 5000);
            MEx_fclose(first);
        }
        int h[2] = {MEx_fopen(path.c_str(), "rb"), MEx_fopen(path.c_str(), "rb")};
        ASSERT_NE(h[0], 0);
        ASSERT_NE(h[1], 0);
        ASSERT_EQ(MEx_fseek(h[1], 0, SEEK_END), 0);
        EXPECT_EQ(MEx_ftell(h[1]), static_cast<int64_t>(kSize));
        for (const Step& s : kSteps) {
            SCOPED_TRACE(testing::Message() << "read " << s.n << " at " << s.pos);
            std::vector<uint8_t> got(s.n, 0xEE);
            ASSERT_EQ(MEx_fseek(h[s.handle], s.pos, SEEK_SET), 0);
            const size_t want =
                s.pos >= static_cast<int64_t>(kSize) ? 0 : std::min(s.n, kSize - static_cast<size_t>(s.pos));
            EXPECT_EQ(MEx_fread(got.data(), 1, static_cast<unsigned>(s.n), h[s.handle]), static_cast<int>(want));
            EXPECT_TRUE(std::equal(got.begin(), got.begin() + static_cast<std::ptrdiff_t>(want),
                                   bytes.begin() + static_cast<std::ptrdiff_t>(s.pos)));
            EXPECT_EQ(MEx_feof(h[s.handle]), want < s.n ? 1 : 0);
            EXPECT_EQ(MEx_ftell(h[s.handle]), s.pos + static_cast<int64_t>(want));
        }
        MEx_fclose(h[0]);
        MEx_fclose(h[1]);
        // At once, so that the file's times are likely still those of the first write.
        for (uint8_t& b : bytes) b ^= 0xFF;
        dir.Write("a.bin", bytes);
        int again = MEx_fopen(path.c_str(), "rb");
        std::vector<uint8_t> got(kSize);
        EXPECT_EQ(MEx_fread(got.data(), 1, kSize, again), static_cast<int>(kSize));
        EXPECT_EQ(got, bytes);
        MEx_fclose(again);
        // Replaced under the same name by another file of the same size.
        for (uint8_t& b : bytes) b = static_cast<uint8_t>(b + 1);
        ASSERT_EQ(std::rename(dir.Write("b.bin", bytes).c_str(), path.c_str()), 0);
        again = MEx_fopen(path.c_str(), "rb");
        EXPECT_EQ(MEx_fread(got.data(), 1, kSize, again), static_cast<int>(kSize));
        EXPECT_EQ(got, bytes);
        MEx_fclose(again);
    }
}

TEST(PlainFile, PathsOfFourCharactersOrFewerNeverOpen) {
    TempDir dir;
    dir.Write("abcd", Bytes().str("data"));
    char cwd[4096];
    ASSERT_NE(getcwd(cwd, sizeof cwd), nullptr);
    ASSERT_EQ(chdir(dir.path().c_str()), 0);
    struct stat st;
    EXPECT_EQ(MEx_fopen("abcd", "rb"), 0);
    EXPECT_EQ(MEx_stat("abcd", &st), -1);
    int h = MEx_fopen("./abcd", "rb");
    EXPECT_NE(h, 0) << "the same file under a five-character path opens";
    MEx_fclose(h);
    ASSERT_EQ(chdir(cwd), 0);
}

// Every call on a bad handle answers -1 (close 0); a closed handle is refused even after its slot is reused.
TEST(BadHandle, EveryCallAnswersMinusOneAndAClosedHandleIsRefused) {
    char buf[4];
    for (int h : {0, -5, 1, 0x7FFFFFFF}) {
        EXPECT_EQ(MEx_fread(buf, 1, 4, h), -1);
        EXPECT_EQ(MEx_fwrite(buf, 1, 4, h), -1);
        EXPECT_EQ(MEx_fseek(h, 0, SEEK_SET), -1);
        EXPECT_EQ(MEx_ftell(h), -1);
        EXPECT_EQ(MEx_feof(h), -1);
        EXPECT_EQ(MEx_fclose(h), 0);
    }
    TempDir dir;
    std::string path = dir.Write("a.bin", Bytes().str("abcd"));
    int first = MEx_fopen(path.c_str(), "rb");
    ASSERT_NE(first, 0);
    MEx_fclose(first);
    std::vector<int> open;
    for (int i = 0; i < 64; ++i) open.push_back(MEx_fopen(path.c_str(), "rb"));
    EXPECT_EQ(MEx_fread(buf, 1, 4, first), -1);
    for (int h : open) {
        EXPECT_NE(h, first);
        MEx_fclose(h);
    }
}

TEST(GetUINT32, ReadsBothByteOrdersAndZeroFillsAShortRead) {
    TempDir dir;
    std::string path = dir.Write("w.bin", Bytes{0x12, 0x34, 0x56, 0x78, 0x9A, 0xBC});
    int h = MEx_fopen(path.c_str(), "rb");
    ASSERT_NE(h, 0);
    EXPECT_EQ(GetUINT32(h, false), 0x12345678u);
    EXPECT_EQ(GetUINT32(h, true), 0x0000BC9Au);
    MEx_fseek(h, 0, SEEK_SET);
    EXPECT_EQ(GetUINT32(h, true), 0x78563412u);
    MEx_fclose(h);
}

// The last dot before a content id suffix, cut to eight characters, case kept; a dot in
// a directory counts; only the first 4095 characters of a path are looked at.
TEST(GetFileExtension, TakesTheLastDotBeforeAContentIdSuffix) {
    const struct {
        std::string path, ext;
        int result;
    } cases[] = {{"/a/b.music.mp3?cid=x.y", ".mp3", 0},
                 {"/a/b", "", 1},
                 {"/x/song.abcdefghijk", ".abcdefgh", 0},
                 {"/dir.d/file", ".d/file", 0},
                 {"/x/Song.MP3", ".MP3", 0},
                 {std::string(6000, 'a') + ".mp3", "", 1},
                 {std::string(100, 'b') + ".wav", ".wav", 0}};
    for (const auto& c : cases) {
        int r = -1;
        EXPECT_EQ(Extension(c.path.c_str(), &r), c.ext) << c.path.size();
        EXPECT_EQ(r, c.result) << c.path.size();
    }
}

// Only the protected suffixes, case-sensitive, ask the service; no metadata means protected.
TEST_F(Protected, CheckDRMDecidesByCaseSensitiveSuffixAndServiceAnswer) {
    service.metadata["/x/plain.dcf"] = {{"drmtype", "0"}};
    service.metadata["/x/typed.fl"] = {{"drmtype", "1a"}};
    const std::pair<const char*, int> cases[] = {{"a.fl", -1},          {"music.DCF", 0},    {"/x/song.mp3", 0},
                                                 {"/x/unknown.dcf", 1}, {"/x/plain.dcf", 0}, {"/x/typed.fl", 26}};
    for (const auto& c : cases) EXPECT_EQ(CheckDRM(c.first), c.second) << c.first;
}

TEST_F(Protected, MetadataKeysAreExactHexParsedCutAndLastWins) {
    std::string longId(600, 'i');
    service.metadata["/m.dcf"] = {{"contentid", longId}, {"contenttype", "audio/mpeg"}, {"rightsuri", "http://r"},
                                  {"contentlen", "1f4"}, {"ContentLen", "ffff"},        {"drmtype", "2"},
                                  {"drmtype", "3"}};
    _DRM_METADATA meta;
    ASSERT_EQ(GetDRMMetaInfo("/m.dcf", nullptr, &meta), 0);
    EXPECT_EQ(meta.nContentLength, 500u);
    EXPECT_EQ(meta.nDrmType, 3u);
    EXPECT_EQ(std::string(meta.szContentId), std::string(511, 'i'));
    EXPECT_STREQ(meta.szContentType, "audio/mpeg");
    EXPECT_STREQ(meta.szRightsUri, "http://r");

    _DRM_METADATA untouched;
    std::memset(&untouched, 0x7E, sizeof untouched);
    EXPECT_EQ(GetDRMMetaInfo("/none.dcf", nullptr, &untouched), -1);
    EXPECT_EQ(untouched.nDrmType, 0x7E7E7E7Eu) << "a failed query leaves the record as it was";
}

TEST_F(Protected, ReadsCountBytesAndStopAtTheContentLength) {
    std::string path =
        WriteProtected("song.dcf", Bytes().str("0123456789ABCDEF"), {{"drmtype", "1"}, {"contentlen", "c"}});
    int h = MEx_fopen(path.c_str(), "rb");
    ASSERT_NE(h, 0);
    char buf[16] = {0};
    EXPECT_EQ(MEx_fread(buf, 4, 2, h), 8) << "bytes, not items";
    EXPECT_EQ(std::string(buf, 8), "01234567");
    EXPECT_EQ(MEx_ftell(h), 8);
    EXPECT_EQ(MEx_fread(buf, 1, 16, h), 8) << "the service reads what the file has";
    EXPECT_EQ(MEx_ftell(h), 16);
    EXPECT_EQ(MEx_feof(h), 1);
    EXPECT_EQ(MEx_fread(buf, 1, 4, h), 0) << "at or past the content length nothing is read";
    EXPECT_EQ(MEx_fwrite(buf, 1, 1, h), -1) << "protected files are never written";
    EXPECT_EQ(MEx_fclose(h), 0);
}

TEST_F(Protected, SeeksAreUncheckedAndOnlyTheThreeOriginsExist) {
    std::string path = WriteProtected("clip.fl", Bytes().str("abcdefgh"), {{"drmtype", "1"}});
    int h = MEx_fopen(path.c_str(), "rb");
    ASSERT_NE(h, 0);
    char c = 0;
    EXPECT_EQ(MEx_fseek(h, -2, SEEK_END), 0);
    EXPECT_EQ(MEx_fread(&c, 1, 1, h), 1);
    EXPECT_EQ(c, 'g');
    EXPECT_EQ(MEx_fseek(h, 100, SEEK_CUR), 0);
    EXPECT_EQ(MEx_feof(h), 1);
    EXPECT_EQ(MEx_fread(&c, 1, 1, h), 0);
    EXPECT_EQ(MEx_fseek(h, 8, SEEK_SET), 0);
    EXPECT_EQ(MEx_feof(h), 1) << "position equal to size is the end";
    EXPECT_EQ(MEx_fseek(h, 0, 7), -1);
    EXPECT_EQ(MEx_fseek(h, -3, SEEK_SET), 0) << "before the start is accepted too";
    EXPECT_EQ(MEx_ftell(h), -3);
    MEx_fclose(h);
}

// Without a content length the size comes from the file; stat takes the content
// length without the file system.
TEST_F(Protected, SizeComesFromTheContentLengthOrTheFile) {
    std::string path = WriteProtected("nolen.dcf", Bytes().str("xyz"), {{"drmtype", "1"}});
    int h = MEx_fopen(path.c_str(), "rb");
    ASSERT_NE(h, 0);
    EXPECT_EQ(MEx_fseek(h, 0, SEEK_END), 0);
    EXPECT_EQ(MEx_ftell(h), 3);
    MEx_fclose(h);
    service.metadata["/nowhere/movie.dcf"] = {{"drmtype", "1"}, {"contentlen", "10000"}};
    struct stat st;
    std::memset(&st, 0, sizeof st);
    ASSERT_EQ(MEx_stat("/nowhere/movie.dcf", &st), 0);
    EXPECT_EQ(st.st_size, 0x10000);
    EXPECT_NE(MEx_stat("/nowhere/other.dcf", &st), 0) << "no metadata: the file system answers";
}

// Only container-based sessions are read; a refused session fails the open and
// logs why; DRM type 0 opens the file as a plain one; detection sees the plain content.
TEST_F(Protected, SessionKindsAndDetection) {
    service.apiType = 1;
    std::string path = WriteProtected("other.dcf", Bytes().str("abcd"), {{"drmtype", "1"}});
    int h = MEx_fopen(path.c_str(), "rb");
    ASSERT_NE(h, 0);
    char buf[4];
    EXPECT_EQ(MEx_fread(buf, 1, 4, h), 0);
    EXPECT_TRUE(service.readOffsets.empty());
    MEx_fclose(h);
    service.apiType = 2;
    service.refuseSessions = true;
    EXPECT_EQ(MEx_fopen(path.c_str(), "rb"), 0);
    ASSERT_EQ(g_log.size(), 1u);
    EXPECT_EQ(g_log[0].first, 6);
    EXPECT_EQ(g_log[0].second, "MetaInfoExtractor|open failed pDecryptHandle is NULL");
    service.refuseSessions = false;

    std::string plain = dir.Write("plain.dcf", Bytes().str("RIFF"));
    service.metadata[plain] = {{"drmtype", "0"}};
    h = MEx_fopen(plain.c_str(), "rb");
    ASSERT_NE(h, 0);
    EXPECT_EQ(MEx_fread(buf, 2, 2, h), 2) << "a plain handle counts items";
    EXPECT_EQ(service.openSessions, 0);
    MEx_fclose(h);

    std::string wave = WriteProtected(
        "tone.dcf", Bytes().str("RIFF").le32(28).str("WAVE").str("fmt ").le32(16).zeros(16), {{"drmtype", "1"}});
    int type = -1;
    ASSERT_EQ(MM_MediaExtractor_DetectMediaType(wave.c_str(), &type), MM_OK);
    EXPECT_EQ(type, MEDIA_TYPE_WAVE);
}

TEST(NoProtectionService, ProtectedNamesAreReadAsPlainFiles) {
    TempDir dir;
    std::string path = dir.Write("song.dcf", Bytes().str("abcd"));
    EXPECT_EQ(CheckDRM(path.c_str()), 0);
    int h = MEx_fopen(path.c_str(), "rb");
    ASSERT_NE(h, 0);
    char buf[4];
    EXPECT_EQ(MEx_fread(buf, 1, 4, h), 4);
    EXPECT_EQ(std::string(buf, 4), "abcd");
    MEx_fclose(h);
}
