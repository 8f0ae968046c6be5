#include "support.h"

#include <dirent.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <set>
#include <vector>

#include "core/thread_state.h"
#include "metainfo/probe.h"

namespace fuzz {
namespace {

constexpr int kContainerBasedDecryption = 2;

struct Scratch {
    std::string dir;
    std::string input;
    std::set<std::string> suffixes;
    std::vector<std::string> links;
    std::vector<std::string> outputs;
};

// The bytes the protection service serves: those of the current input.
const uint8_t* g_served = nullptr;
size_t g_servedSize = 0;
int g_openSessions = 0;
volatile size_t g_sink = 0;

bool EndsWith(const char* s, const char* suffix) {
    size_t n = std::strlen(s), m = std::strlen(suffix);
    return n >= m && std::memcmp(s + n - m, suffix, m) == 0;
}

int GetMetadata(void*, const char* path, void (*emit)(void*, const char*, const char*), void* emitCtx) {
    if (path == nullptr || !EndsWith(path, ".dcf")) return 1;
    char length[32];
    std::snprintf(length, sizeof length, "%zx", g_servedSize);
    emit(emitCtx, "contentlen", length);
    emit(emitCtx, "drmtype", "1");
    return 0;
}

void* OpenSession(void*, const char*, int* apiType) {
    ++g_openSessions;
    *apiType = kContainerBasedDecryption;
    return &g_openSessions;
}

long long ReadServed(void*, void* session, void* buf, size_t size, long long offset) {
    if (session != &g_openSessions) Fail("read through a session that was never opened");
    if (offset < 0) return -1;
    if (static_cast<unsigned long long>(offset) >= g_servedSize) return 0;
    size_t at = static_cast<size_t>(offset);
    size_t n = size < g_servedSize - at ? size : g_servedSize - at;
    if (n != 0) std::memcpy(buf, g_served + at, n);
    return static_cast<long long>(n);
}

void CloseSession(void*, void* session) {
    if (session != &g_openSessions) Fail("closed a session that was never opened");
    --g_openSessions;
}

// Log lines are formatted (so that their arguments are exercised) and dropped.
void DiscardLog(int, const char* tag, const char* message) {
    g_sink = g_sink + (tag != nullptr ? std::strlen(tag) : 0) + (message != nullptr ? std::strlen(message) : 0);
}

std::string ScratchBase() {
    if (const char* dir = std::getenv("METAINFO_FUZZ_TMP")) return dir;
    if (access("/dev/shm", W_OK) == 0) return "/dev/shm";
    if (const char* dir = std::getenv("TMPDIR")) return dir;
    return "/tmp";
}

Scratch* g_scratch = nullptr;

}  // namespace

// Only unlink and rmdir of names made beforehand: a replay's timeout calls it
// from a signal handler.
extern "C" void MetainfoFuzzRemoveScratch() {
    if (g_scratch == nullptr) return;
    for (const std::string& path : g_scratch->outputs) unlink(path.c_str());
    for (const std::string& path : g_scratch->links) unlink(path.c_str());
    unlink(g_scratch->input.c_str());
    rmdir(g_scratch->dir.c_str());
}

namespace {

// A run stopped by a crash or a timeout leaves its scratch directory behind;
// the next process removes those whose process is gone.
void RemoveStaleScratch(const std::string& base) {
    DIR* d = opendir(base.c_str());
    if (d == nullptr) return;
    static const char kPrefix[] = "metainfo-fuzz-";
    while (dirent* e = readdir(d)) {
        if (std::strncmp(e->d_name, kPrefix, sizeof kPrefix - 1) != 0) continue;
        char* end = nullptr;
        long pid = std::strtol(e->d_name + sizeof kPrefix - 1, &end, 10);
        if (end == nullptr || *end != '\0' || pid <= 0 || kill(static_cast<pid_t>(pid), 0) == 0 || errno != ESRCH) {
            continue;
        }
        const std::string dir = base + "/" + e->d_name;
        if (DIR* inner = opendir(dir.c_str())) {
            while (dirent* f = readdir(inner)) {
                if (f->d_name[0] != '.') unlink((dir + "/" + f->d_name).c_str());
            }
            closedir(inner);
        }
        rmdir(dir.c_str());
    }
    closedir(d);
}

Scratch& State() {
    if (g_scratch == nullptr) {
        const std::string base = ScratchBase();
        RemoveStaleScratch(base);
        const std::string dir = base + "/metainfo-fuzz-" + std::to_string(getpid());
        if (mkdir(dir.c_str(), 0700) != 0 && errno != EEXIST) Fail("cannot make a scratch directory in", base);
        g_scratch = new Scratch{dir, dir + "/input", {}, {}, {}};
        std::atexit(MetainfoFuzzRemoveScratch);
        MM_DrmProvider provider{nullptr, GetMetadata, OpenSession, ReadServed, CloseSession};
        MM_MediaExtractor_SetDrmProvider(&provider);
        MM_MediaExtractor_SetLogSink(DiscardLog);
    }
    return *g_scratch;
}

void WriteAll(const std::string& path, const uint8_t* data, size_t size) {
    int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
    if (fd < 0) Fail("cannot write the input file", path);
    size_t done = 0;
    while (done < size) {
        ssize_t n = write(fd, data + done, size - done);
        if (n < 0 && errno == EINTR) continue;
        if (n <= 0) Fail("cannot write the input file", path);
        done += static_cast<size_t>(n);
    }
    close(fd);
}

// The number the next open file gets: a descriptor the library left open
// moves it.
int LowestFreeDescriptor() {
    int fd = open("/dev/null", O_RDONLY | O_CLOEXEC);
    if (fd >= 0) close(fd);
    return fd;
}

}  // namespace

void Fail(const char* what, const std::string& detail) {
    std::fprintf(stderr, "metainfo fuzz check failed: %s%s%s\n", what, detail.empty() ? "" : " ", detail.c_str());
    std::fflush(stderr);
    std::abort();
}

InputFile::InputFile(const uint8_t* data, size_t size) : data_(data), size_(size), lowestFreeDescriptor_(0) {
    Scratch& s = State();
    WriteAll(s.input, data, size);
    g_served = data;
    g_servedSize = size;
    // Values a parse leaves for the next call start as in a fresh process, so
    // that an input behaves alone as it did in the middle of a run.
    metainfo::s_mp4FileSize = 0;
    metainfo::s_asfFileSize = 0;
    metainfo::s_codectype = 0;
    lowestFreeDescriptor_ = LowestFreeDescriptor();
}

InputFile::~InputFile() {
    Scratch& s = State();
    for (const std::string& out : s.outputs) unlink(out.c_str());
    s.outputs.clear();
    g_served = nullptr;
    g_servedSize = 0;
    if (g_openSessions != 0) Fail("a decrypt session was left open");
    if (LowestFreeDescriptor() != lowestFreeDescriptor_) Fail("a file descriptor was left open");
}

std::string InputFile::Path(const std::string& suffix) const {
    Scratch& s = State();
    if (suffix.empty()) return s.input;
    std::string path = s.input + suffix;
    if (s.suffixes.insert(suffix).second) {
        if (symlink("input", path.c_str()) != 0 && errno != EEXIST) Fail("cannot link the input as", path);
        s.links.push_back(path);
    }
    return path;
}

std::string InputFile::OutputPath(const std::string& suffix) const {
    Scratch& s = State();
    s.outputs.push_back(s.dir + "/output" + suffix);
    return s.outputs.back();
}

uint8_t InputFile::Tail() const { return size_ == 0 ? 0 : data_[size_ - 1]; }

std::string InputFile::ProtectedPath() const { return Path((Tail() & 0x80) != 0 ? ".fl" : ".dcf"); }

void Touch(const void* data, size_t size) {
    const volatile uint8_t* p = static_cast<const volatile uint8_t*>(data);
    size_t sum = 0;
    for (size_t i = 0; i < size; ++i) sum += p[i];
    g_sink = g_sink + sum;
}

void CheckClip(const _MMClipInfo& clip) {
    if (std::memchr(clip.szFormat, 0, sizeof clip.szFormat) == nullptr) Fail("clip format is not terminated");
}

void ReleaseMeta(_MMMetaInfo* meta) {
    for (int i = 0; i < MM_META_ITEMS; ++i) {
        if (meta->aItems[i].nLength > MM_META_DATA_SIZE)
            Fail("metadata item longer than its buffer", std::to_string(i));
    }
    if (meta->stAlbumArtist.nLength > MM_META_DATA_SIZE) Fail("album artist longer than its buffer");
    if (meta->pPicture != nullptr) Touch(meta->pPicture, meta->nPictureSize);
    MM_MediaExtractor_FreeMetaInfo(meta);
}

void ReleaseMime(_MM_MIMETYPE* mime) {
    if (mime->pszMimeType != nullptr) Touch(mime->pszMimeType, std::strlen(mime->pszMimeType));
    if (mime->pszVideoMimeType != nullptr) Touch(mime->pszVideoMimeType, std::strlen(mime->pszVideoMimeType));
    MM_MediaExtractor_FreeBuffer(mime->pszMimeType);
    MM_MediaExtractor_FreeBuffer(mime->pszVideoMimeType);
    std::memset(mime, 0, sizeof *mime);
}

void ReleaseMaker(_MAKERINFO* maker) {
    if (maker->pPhoneModel != nullptr) Touch(maker->pPhoneModel, maker->nPhoneModelSize);
    if (maker->pThumbnail != nullptr) Touch(maker->pThumbnail, maker->nThumbnailSize);
    if (maker->pSmartAlbum != nullptr) Touch(maker->pSmartAlbum, maker->nSmartAlbumSize);
    MM_MediaExtractor_FreeBuffer(maker->pPhoneModel);
    MM_MediaExtractor_FreeBuffer(maker->pThumbnail);
    MM_MediaExtractor_FreeBuffer(maker->pSmartAlbum);
    std::memset(maker, 0, sizeof *maker);
}

void ReleaseAudio(unsigned char* data, int size, int extraBytes) {
    if (data != nullptr && size > 0) Touch(data, static_cast<size_t>(size) + static_cast<size_t>(extraBytes));
    MM_MediaExtractor_FreeBuffer(data);
}

void QueryAll(const std::string& path, int type) {
    const char* p = path.c_str();
    int detected = MEDIA_TYPE_UNKNOWN;
    MM_MediaExtractor_DetectMediaType(p, &detected);
    MM_MediaExtractor_CheckMediaType(p);

    int mask = 0;
    MM_MediaExtractor_GetTrackType(p, type, &mask);
    _MM_CODECTYPE codec;
    MM_MediaExtractor_GetCodecType(p, type, &codec);
    MM_MediaExtractor_GetCodecTypeEx(p, type, &codec);

    _MMClipInfo clip;
    MM_MediaExtractor_GetClipInfo(p, type, &clip);
    CheckClip(clip);
    MM_MediaExtractor_FreeClipInfo(&clip);

    _MMMetaInfo meta;
    MM_MediaExtractor_GetMetaInfo(p, type, &meta);
    ReleaseMeta(&meta);

    _MM_MIMETYPE mime;
    MM_MediaExtractor_GetMIMEType(p, &mime);
    ReleaseMime(&mime);

    _MAKERINFO maker;
    std::memset(&maker, 0, sizeof maker);
    MM_MediaExtractor_GetMakerInfo(p, &maker);
    ReleaseMaker(&maker);

    unsigned char* video = nullptr;
    int videoSize = 0;
    MM_MediaExtractor_GetVideoData(p, 0, 1, &video, &videoSize);
    ReleaseAudio(video, videoSize);
}

void FuzzFamily(const uint8_t* data, size_t size, const Variant* variants, size_t count) {
    InputFile input(data, size);
    const Variant* pick = &variants[input.Tail() % count];
    int detected = MEDIA_TYPE_UNKNOWN;
    if (MM_MediaExtractor_DetectMediaType(input.Path(pick->suffix).c_str(), &detected) == MM_OK &&
        detected != pick->type) {
        for (size_t i = 0; i < count; ++i) {
            if (variants[i].type == detected) {
                pick = &variants[i];
                break;
            }
        }
    }
    QueryAll(input.Path(pick->suffix), pick->type);
    QueryAll(input.ProtectedPath(), pick->type);
}

void ProbeAndCopy(const std::string& path, size_t inputSize) {
    mi_info* info = nullptr;
    if (mi_probe(path.c_str(), &info) != MI_OK) return;
    for (size_t i = 0; i < info->picture_count; ++i) {
        size_t bytes = 0;
        if (mi_picture_copy(path.c_str(), info, i, nullptr, 0, &bytes) != MI_E_BUFFER || bytes > inputSize) continue;
        std::string copy(bytes, '\0');
        if (mi_picture_copy(path.c_str(), info, i, &copy[0], copy.size(), &bytes) == MI_OK) Touch(copy.data(), bytes);
    }
    mi_info_free(info);
}

void FuzzProbe(const uint8_t* data, size_t size, const char* const* suffixes, size_t count) {
    InputFile input(data, size);
    ProbeAndCopy(input.Path(suffixes[input.Tail() % count]), size);
}

}  // namespace fuzz
