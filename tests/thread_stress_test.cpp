// Queries from eight threads at once answer exactly as one thread alone does,
// while another thread keeps swapping the log sink and the protection service.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <string>
#include <thread>
#include <vector>

#include "metainfo/metainfo.h"
#include "support/bytes.h"
#include "support/fixture_files.h"

using namespace testing_support;

namespace {

constexpr size_t kThreads = 8;
constexpr int kPasses = 5;

// A protection service that serves a file's own bytes, so a protected name
// reads the same with or without it. Safe to call from any thread.
struct Service {
    std::atomic<int> sessions{0};
    std::atomic<int> opened{0};
};

bool EndsWith(const std::string& s, const std::string& suffix) {
    return s.size() >= suffix.size() && s.compare(s.size() - suffix.size(), suffix.size(), suffix) == 0;
}

int ServeMetadata(void*, const char* path, void (*emit)(void*, const char*, const char*), void* emitCtx) {
    emit(emitCtx, "drmtype", "1");
    struct stat st;
    // ".dcf" names also give their length, ".fl" names leave it to the file system.
    if (EndsWith(path, ".dcf") && ::stat(path, &st) == 0) {
        char length[32];
        std::snprintf(length, sizeof length, "%llx", static_cast<unsigned long long>(st.st_size));
        emit(emitCtx, "contentlen", length);
    }
    return 0;
}

void* OpenSession(void* ctx, const char* path, int* apiType) {
    int fd = ::open(path, O_RDONLY);
    if (fd < 0) return nullptr;
    auto* service = static_cast<Service*>(ctx);
    ++service->sessions;
    ++service->opened;
    *apiType = 2;
    return new int(fd);
}

long long ReadSession(void*, void* session, void* buf, size_t size, long long offset) {
    if (offset < 0) return -1;
    return ::pread(*static_cast<int*>(session), buf, size, static_cast<off_t>(offset));
}

void CloseSession(void* ctx, void* session) {
    --static_cast<Service*>(ctx)->sessions;
    ::close(*static_cast<int*>(session));
    delete static_cast<int*>(session);
}

// Sinks to swap between; lines come to them from whichever thread logs.
std::atomic<int> g_logLines{0};
void CountLine(int, const char*, const char*) { ++g_logLines; }
void CountLineToo(int, const char*, const char*) { g_logLines += 2; }

const char* const kQueries[] = {"detect", "check", "track type", "codec", "codec ex", "clip", "meta", "MIME", "maker"};

// A record's bytes with the result code before them; the caller has nulled
// its pointers and appends what they pointed to.
template <typename T>
std::string Answer(int32_t result, const T& record) {
    std::string s(reinterpret_cast<const char*>(&result), sizeof result);
    return s.append(reinterpret_cast<const char*>(&record), sizeof record);
}

std::string Buffer(const void* p, uint32_t n) {
    return p != nullptr ? std::string(static_cast<const char*>(p), n) : std::string("(null)");
}
std::string ResultOf(const std::string& answer) {
    int32_t result = 0;
    std::memcpy(&result, answer.data(), sizeof result);
    char text[16];
    std::snprintf(text, sizeof text, "0x%08X", static_cast<uint32_t>(result));
    return text;
}
std::string Text(const char* p) { return p != nullptr ? std::string(p) : std::string("(null)"); }

// Every answer of the C interface for one file, one string per query.
std::vector<std::string> AskAll(const std::string& file) {
    const char* path = file.c_str();
    std::vector<std::string> out;
    int type = -1;
    out.push_back(Answer(MM_MediaExtractor_DetectMediaType(path, &type), type));
    out.push_back(Answer(MM_MediaExtractor_CheckMediaType(path), 0));
    int mask = -1;
    out.push_back(Answer(MM_MediaExtractor_GetTrackType(path, type, &mask), mask));
    _MM_CODECTYPE codec;
    out.push_back(Answer(MM_MediaExtractor_GetCodecType(path, type, &codec), codec));
    std::memset(&codec, 0x5A, sizeof codec);
    out.push_back(Answer(MM_MediaExtractor_GetCodecTypeEx(path, type, &codec), codec));
    _MMClipInfo clip;
    out.push_back(Answer(MM_MediaExtractor_GetClipInfo(path, type, &clip), clip));

    _MMMetaInfo meta;
    int32_t result = MM_MediaExtractor_GetMetaInfo(path, type, &meta);
    _MMMetaInfo shown = meta;
    shown.pPicture = nullptr;
    out.push_back(Answer(result, shown) + Buffer(meta.pPicture, meta.nPictureSize));
    MM_MediaExtractor_FreeMetaInfo(&meta);

    _MM_MIMETYPE mime;
    result = MM_MediaExtractor_GetMIMEType(path, &mime);
    _MM_MIMETYPE mimeShown = mime;
    mimeShown.pszMimeType = mimeShown.pszVideoMimeType = nullptr;
    out.push_back(Answer(result, mimeShown) + Text(mime.pszMimeType) + Text(mime.pszVideoMimeType));
    MM_MediaExtractor_FreeBuffer(mime.pszMimeType);
    MM_MediaExtractor_FreeBuffer(mime.pszVideoMimeType);

    _MAKERINFO maker;
    std::memset(&maker, 0, sizeof maker);  // left as it is unless a maker box is read
    result = MM_MediaExtractor_GetMakerInfo(path, &maker);
    _MAKERINFO makerShown = maker;
    makerShown.pSmartAlbum = makerShown.pThumbnail = makerShown.pPhoneModel = nullptr;
    out.push_back(Answer(result, makerShown) + Buffer(maker.pSmartAlbum, maker.nSmartAlbumSize) +
                  Buffer(maker.pThumbnail, maker.nThumbnailSize) + Buffer(maker.pPhoneModel, maker.nPhoneModelSize));
    MM_MediaExtractor_FreeBuffer(maker.pSmartAlbum);
    MM_MediaExtractor_FreeBuffer(maker.pThumbnail);
    MM_MediaExtractor_FreeBuffer(maker.pPhoneModel);
    return out;
}

// All answers of kPasses passes over the files, in order. A parse may leave
// state for the next one on the same thread, so each run starts on a thread
// of its own and takes the files in the same order.
using Answers = std::vector<std::vector<std::string>>;
Answers AskInOrder(const std::vector<std::string>& files) {
    Answers run;
    for (int pass = 0; pass < kPasses; ++pass) {
        for (const std::string& f : files) run.push_back(AskAll(f));
    }
    return run;
}

class ThreadStress : public ::testing::Test {
protected:
    void TearDown() override {
        MM_MediaExtractor_SetDrmProvider(nullptr);
        MM_MediaExtractor_SetLogSink(nullptr);
        EXPECT_EQ(first.sessions.load(), 0) << "every decrypt session is closed";
        EXPECT_EQ(second.sessions.load(), 0) << "every decrypt session is closed";
    }

    MM_DrmProvider Provider(Service* service) {
        return MM_DrmProvider{service, ServeMetadata, OpenSession, ReadSession, CloseSession};
    }

    // Runs the files from kThreads threads while the sink and the service
    // change under them (at times to none: a service removed between deciding
    // that a file is protected and opening its session must not fail the
    // open), and compares each run with one made alone first.
    void Stress(const std::vector<std::string>& files) {
        MM_DrmProvider providers[2] = {Provider(&first), Provider(&second)};
        MM_MediaExtractor_SetDrmProvider(&providers[0]);
        Answers alone;
        std::thread([&] { alone = AskInOrder(files); }).join();

        std::atomic<bool> done{false};
        std::thread swapper([&] {
            const MM_LogSink sinks[3] = {CountLine, nullptr, CountLineToo};
            const MM_DrmProvider* services[3] = {&providers[0], nullptr, &providers[1]};
            for (unsigned i = 0; !done.load(); ++i) {
                MM_MediaExtractor_SetLogSink(sinks[i % 3]);
                MM_MediaExtractor_SetDrmProvider(services[(i / 3) % 3]);
                std::this_thread::sleep_for(std::chrono::microseconds(50));
            }
        });
        std::vector<Answers> runs(kThreads);
        std::vector<std::thread> workers;
        for (size_t t = 0; t < kThreads; ++t) workers.emplace_back([&, t] { runs[t] = AskInOrder(files); });
        for (std::thread& w : workers) w.join();
        done = true;
        swapper.join();

        int differences = 0;
        for (size_t t = 0; t < kThreads; ++t) {
            for (size_t i = 0; i < alone.size(); ++i) {
                for (size_t q = 0; q < alone[i].size(); ++q) {
                    if (runs[t][i][q] == alone[i][q] || ++differences > 20) continue;
                    ADD_FAILURE() << "thread " << t << ": " << kQueries[q] << " of " << files[i % files.size()]
                                  << " differs from the answer given alone (result " << ResultOf(runs[t][i][q])
                                  << ", alone " << ResultOf(alone[i][q]) << ")";
                }
            }
        }
        EXPECT_EQ(differences, 0);
    }

    Service first;
    Service second;
};

// Every format's byte-built files, in their order: a QCP parse leaves state
// for the next one on the same thread.
std::vector<std::string> BuiltFiles(const TempDir& dir) {
    std::vector<std::string> files;
    for (const FixtureFile& f : FixtureFiles()) files.push_back(dir.Write(f.name, f.bytes));
    return files;
}

std::vector<std::string> FilesUnder(const std::string& folder) {
    std::vector<std::string> files;
    for (const auto& entry : std::filesystem::recursive_directory_iterator(folder)) {
        if (entry.is_regular_file()) files.push_back(entry.path().string());
    }
    std::sort(files.begin(), files.end());
    return files;
}

// The bundled samples and the built files, then the same bytes once more
// under protected names, read through the service whenever one is installed.
std::vector<std::string> SamplesBuiltAndProtected(const TempDir& dir) {
    std::vector<std::string> files = FilesUnder("samples");
    std::vector<std::string> built = BuiltFiles(dir);
    files.insert(files.end(), built.begin(), built.end());
    const size_t plain = files.size();
    for (size_t i = 0; i < plain; ++i) {
        std::string name = std::filesystem::path(files[i]).filename().string();
        files.push_back(dir.Write(name + (i % 2 == 0 ? ".dcf" : ".fl"), ReadFileBytes(files[i])));
    }
    return files;
}

}  // namespace

TEST_F(ThreadStress, SamplesBuiltAndProtectedFilesAnswerAsAlone) {
    TempDir dir;
    ASSERT_TRUE(std::filesystem::is_directory("samples")) << "run from the project folder";
    Stress(SamplesBuiltAndProtected(dir));
    EXPECT_GT(first.opened.load() + second.opened.load(), 0) << "protected names were read through the service";
}

TEST_F(ThreadStress, CorpusFilesAnswerAsAlone) {
    const std::string corpus = CorpusDir();
    if (corpus.empty()) GTEST_SKIP() << "no corpus folder beside the project (../shared/corpus)";
    Stress(FilesUnder(corpus));
}
