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
#include "support/golden.h"

using namespace testing_support;

namespace {

// A protection service that serves a file's own bytes, so a protected name reads the
// same with or without it; ".dcf" names give their length, ".fl" names leave it to
// the file system. Safe to call from any thread.
std::atomic<int> g_sessions{0}, g_opened{0}, g_logLines{0};

int ServeMetadata(void*, const char* path, void (*emit)(void*, const char*, const char*), void* emitCtx) {
    emit(emitCtx, "drmtype", "1");
    struct stat st;
    const std::string name(path);
    if (name.size() > 4 && name.compare(name.size() - 4, 4, ".dcf") == 0 && ::stat(path, &st) == 0) {
        emit(emitCtx, "contentlen", (std::ostringstream() << std::hex << st.st_size).str().c_str());
    }
    return 0;
}
void* OpenSession(void*, const char* path, int* apiType) {
    const int fd = ::open(path, O_RDONLY);
    if (fd < 0) return nullptr;
    ++g_sessions;
    ++g_opened;
    *apiType = 2;
    return new int(fd);
}
long long ReadSession(void*, void* session, void* buf, size_t size, long long offset) {
    return offset < 0 ? -1 : ::pread(*static_cast<int*>(session), buf, size, static_cast<off_t>(offset));
}
void CloseSession(void*, void* session) {
    --g_sessions;
    ::close(*static_cast<int*>(session));
    delete static_cast<int*>(session);
}
void CountLine(int, const char*, const char*) { ++g_logLines; }
void CountLineToo(int, const char*, const char*) { g_logLines += 2; }

// Every answer of the C interface for one file, on one line.
std::string AskAll(const std::string& file) {
    const char* path = file.c_str();
    int type = -1;
    std::string s = std::to_string(MM_MediaExtractor_DetectMediaType(path, &type));
    s += "/" + std::to_string(type) + " " + std::to_string(MM_MediaExtractor_CheckMediaType(path));
    s += " | " + SlotAnswers(file, type, true, 1, 0x5A);
    _MM_CODECTYPE codec;
    std::memset(&codec, 0x5A, sizeof codec);
    s += " | ex " + std::to_string(MM_MediaExtractor_GetCodecTypeEx(path, type, &codec)) + " " + CodecSummary(codec);
    _MM_MIMETYPE mime{};
    s += " | mime " + std::to_string(MM_MediaExtractor_GetMIMEType(path, &mime));
    for (char* text : {mime.pszMimeType, mime.pszVideoMimeType}) {
        s += std::string(" ") + (text != nullptr ? text : "(null)");
        MM_MediaExtractor_FreeBuffer(text);
    }
    _MAKERINFO maker{};
    s +=
        " | maker " + std::to_string(MM_MediaExtractor_GetMakerInfo(path, &maker)) + " " + std::to_string(maker.nValid);
    for (unsigned char* p : {maker.pSmartAlbum, maker.pThumbnail, maker.pPhoneModel}) {
        s += " " + std::to_string(p != nullptr);
        MM_MediaExtractor_FreeBuffer(p);
    }
    return s;
}

// All answers of five passes over the files, in order. A parse may leave state for the
// next one on the same thread (QCP does), so each run starts on a thread of its own
// and takes the files in the same order.
std::vector<std::string> AskInOrder(const std::vector<std::string>& files) {
    std::vector<std::string> run;
    for (int pass = 0; pass < 5; ++pass) {
        for (const std::string& f : files) run.push_back(AskAll(f));
    }
    return run;
}

// Runs the files from eight threads while the sink and the service change under them
// (at times to none: a service removed between deciding that a file is protected and
// opening its session must not fail the open), and compares each run with one made alone.
void Stress(const std::vector<std::string>& files) {
    MM_DrmProvider providers[2] = {{nullptr, ServeMetadata, OpenSession, ReadSession, CloseSession},
                                   {&g_opened, ServeMetadata, OpenSession, ReadSession, CloseSession}};
    MM_MediaExtractor_SetDrmProvider(&providers[0]);
    std::vector<std::string> alone;
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
    std::vector<std::vector<std::string>> runs(8);
    std::vector<std::thread> workers;
    for (size_t t = 0; t < runs.size(); ++t) workers.emplace_back([&, t] { runs[t] = AskInOrder(files); });
    for (std::thread& w : workers) w.join();
    done = true;
    swapper.join();
    MM_MediaExtractor_SetDrmProvider(nullptr);
    MM_MediaExtractor_SetLogSink(nullptr);
    int differences = 0;
    for (size_t t = 0; t < runs.size(); ++t) {
        for (size_t i = 0; i < alone.size() && differences < 20; ++i) {
            if (runs[t][i] != alone[i]) ++differences;
            EXPECT_EQ(runs[t][i], alone[i]) << "thread " << t << ", " << files[i % files.size()];
        }
    }
    EXPECT_EQ(g_sessions.load(), 0) << "every decrypt session is closed";
}

}  // namespace

// The bundled samples and every format's byte-built files (in their order), then the
// same bytes once more under protected names, read through the service whenever one is
// installed.
TEST(ThreadStress, SamplesBuiltAndProtectedFilesAnswerAsAlone) {
    ASSERT_TRUE(std::filesystem::is_directory("samples")) << "run from the project folder";
    TempDir dir;
    std::vector<std::string> files = FilesUnder("samples");
    for (const FixtureFile& f : FixtureFiles()) files.push_back(dir.Write(f.name, f.bytes));
    const size_t plain = files.size();
    for (size_t i = 0; i < plain; ++i) {
        const std::string name = std::filesystem::path(files[i]).filename().string();
        files.push_back(dir.Write(name + (i % 2 == 0 ? ".dcf" : ".fl"), ReadFileBytes(files[i])));
    }
    Stress(files);
    EXPECT_GT(g_opened.load(), 0) << "protected names were read through the service";
}

TEST(ThreadStress, CorpusFilesAnswerAsAlone) {
    const std::string corpus = CorpusDir();
    if (corpus.empty()) GTEST_SKIP() << NoCorpusReason();
    Stress(FilesUnder(corpus));
}
