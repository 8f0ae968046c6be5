#include "core/file_access.h"

#include <fcntl.h>
#include <unistd.h>

#include <atomic>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

#include "core/byte_reader.h"
#include "core/drm.h"
#include "core/log.h"
#include "core/read_cache.h"
#include "metainfo/records.h"

// Without 64-bit file offsets a 32-bit host could neither seek past 2 GiB nor
// stat such a file.
static_assert(sizeof(off_t) == 8, "build with _FILE_OFFSET_BITS=64");

namespace metainfo {
namespace {

// A plain file is read with positional reads through this thread's cache
// (positional set), or, when it is no regular file or is written, through
// stdio. A positional handle over a file whose bytes the cache holds opens
// the file (path kept) only when a read needs bytes the cache lacks.
struct MexHandle {
    int drmKind = -1;
    FILE* stream = nullptr;
    bool positional = false;
    int fd = -1;
    char* path = nullptr;
    FileIdentity id;
    bool eof = false;
    bool hasClient = false;
    DrmClient client{};
    void* session = nullptr;
    int decryptApiType = 0;
    int64_t position = 0;
    int64_t size = 0;
    uint32_t generation = 0;
};

// Handle value: generation above kSlotBits, slot index + 1 below.
constexpr int kSlotBits = 13;
constexpr uint32_t kSlots = 4096;
constexpr uint32_t kGenerationMask = (1u << (31 - kSlotBits)) - 1;
constexpr int kDecryptApiContainerBased = 2;

std::atomic<MexHandle*> g_slots[kSlots];
std::atomic<uint32_t> g_generations[kSlots];
std::atomic<uint32_t> g_nextSlot{0};

int Register(MexHandle* handle) {
    uint32_t start = g_nextSlot.fetch_add(1, std::memory_order_relaxed);
    for (uint32_t i = 0; i < kSlots; ++i) {
        uint32_t slot = (start + i) % kSlots;
        MexHandle* expected = nullptr;
        if (g_slots[slot].compare_exchange_strong(expected, handle, std::memory_order_acq_rel)) {
            uint32_t gen = (g_generations[slot].fetch_add(1, std::memory_order_relaxed) + 1) & kGenerationMask;
            handle->generation = gen;
            return static_cast<int>(gen << kSlotBits | (slot + 1));
        }
    }
    return 0;
}

MexHandle* Lookup(int h) {
    if (h <= 0) return nullptr;
    uint32_t value = static_cast<uint32_t>(h);
    uint32_t slot = (value & ((1u << kSlotBits) - 1)) - 1;
    if (slot >= kSlots) return nullptr;
    MexHandle* handle = g_slots[slot].load(std::memory_order_acquire);
    if (handle == nullptr || handle->generation != (value >> kSlotBits)) return nullptr;
    return handle;
}

void Unregister(int h) {
    uint32_t slot = (static_cast<uint32_t>(h) & ((1u << kSlotBits) - 1)) - 1;
    g_slots[slot].store(nullptr, std::memory_order_release);
}

void CloseProtected(MexHandle* handle) {
    if (handle->session != nullptr && handle->hasClient && handle->client.provider.closeDecryptSession != nullptr) {
        handle->client.provider.closeDecryptSession(handle->client.provider.context, handle->session);
    }
    handle->session = nullptr;
    handle->hasClient = false;
}

// Opens a decrypt session with the provider that decided the file is protected.
bool OpenProtected(MexHandle* handle, const char* path, const DrmClient& client) {
    if (client.provider.openDecryptSession == nullptr) return false;
    handle->client = client;
    handle->hasClient = true;
    const MM_DrmProvider& p = handle->client.provider;
    int apiType = 0;
    handle->session = p.openDecryptSession(p.context, path, &apiType);
    if (handle->session == nullptr) {
        LogPrint(kLogError, "MetaInfoExtractor", "open failed pDecryptHandle is NULL");
        handle->hasClient = false;
        return false;
    }
    handle->decryptApiType = apiType;
    _DRM_METADATA meta;
    std::memset(&meta, 0, sizeof meta);
    // The service may have no metadata; the size then comes from the file system.
    GetDRMMetaInfo(path, &handle->client, &meta);
    if (meta.nContentLength != 0) {
        handle->size = meta.nContentLength;
    } else {
        struct stat st;
        handle->size = ::stat(path, &st) == 0 ? static_cast<int64_t>(st.st_size) : 0;
    }
    handle->position = 0;
    return true;
}

int ReadProtected(MexHandle* handle, void* buf, unsigned size, unsigned count) {
    if (handle->position >= handle->size || handle->session == nullptr ||
        handle->decryptApiType != kDecryptApiContainerBased || handle->client.provider.pread == nullptr) {
        return 0;
    }
    size_t want = static_cast<size_t>(size) * count;
    if (want == 0) return 0;
    const MM_DrmProvider& p = handle->client.provider;
    long long got = p.pread(p.context, handle->session, buf, want, handle->position);
    if (got <= 0) return 0;
    // A service that claims more than was asked for cannot have written it.
    if (static_cast<unsigned long long>(got) > want) got = static_cast<long long>(want);
    if (got > 0x7FFFFFFF) got = 0x7FFFFFFF;
    handle->position += got;
    return static_cast<int>(got);
}

int SeekProtected(MexHandle* handle, int64_t offset, int whence) {
    // Positions wrap rather than overflow; no bound is checked, as a later
    // read past the end simply answers 0.
    uint64_t delta = static_cast<uint64_t>(offset);
    switch (whence) {
        case SEEK_SET: handle->position = static_cast<int64_t>(delta); return 0;
        case SEEK_CUR:
            handle->position = static_cast<int64_t>(static_cast<uint64_t>(handle->position) + delta);
            return 0;
        case SEEK_END: handle->position = static_cast<int64_t>(static_cast<uint64_t>(handle->size) + delta); return 0;
        default: return -1;
    }
}

bool ReadOnly(const char* mode) { return mode[0] == 'r' && std::strchr(mode, '+') == nullptr; }

// Takes fd as the handle's positional reader when it is a regular file.
bool TakeRegularFile(MexHandle* handle, int fd, int64_t position) {
    struct stat st;
    if (::fstat(fd, &st) != 0 || !S_ISREG(st.st_mode)) return false;
    handle->positional = true;
    handle->fd = fd;
    handle->id = FileIdentity::Of(st);
    handle->position = position < 0 ? 0 : position;
    OpenCachedFile(handle->id);
    return true;
}

// A handle that opens nothing yet: the path names a settled file this thread
// holds bytes of, as a stat (cheaper than an open) confirms.
bool TakeHeldFile(MexHandle* handle, const char* path) {
    if (!HoldsFileNamed(path)) return false;
    struct stat st;
    if (::stat(path, &st) != 0 || !S_ISREG(st.st_mode)) return false;
    const FileIdentity id = FileIdentity::Of(st);
    if (!HoldsSettled(path, id)) return false;
    handle->path = ::strdup(path);
    if (handle->path == nullptr) return false;
    handle->positional = true;
    handle->id = id;
    OpenCachedFile(id);
    return true;
}

// Opens the file of a handle made by TakeHeldFile. Should the path now name a
// changed file, the handle goes on with that file's bytes, as a handle whose
// file is rewritten while open would.
bool OpenHeldFile(MexHandle* handle) {
    if (handle->fd >= 0) return true;
    if (handle->path == nullptr) return false;
    const int fd = ::open(handle->path, O_RDONLY | O_CLOEXEC);
    if (fd < 0) return false;
    struct stat st;
    if (::fstat(fd, &st) != 0 || !S_ISREG(st.st_mode)) {
        ::close(fd);
        return false;
    }
    handle->fd = fd;
    const FileIdentity id = FileIdentity::Of(st);
    if (!(id == handle->id)) {
        handle->id = id;
        OpenCachedFile(id);
    }
    NameCachedFile(id, handle->path);
    return true;
}

bool OpenPlain(MexHandle* handle, const char* path, const char* mode) {
    if (ReadOnly(mode)) {
        if (TakeHeldFile(handle, path)) return true;
        const int fd = ::open(path, O_RDONLY | O_CLOEXEC);
        if (fd < 0) return false;
        if (TakeRegularFile(handle, fd, 0)) {
            NameCachedFile(handle->id, path);
            return true;
        }
        ::close(fd);
    }
    handle->stream = std::fopen(path, mode);
    if (handle->stream == nullptr) return false;
    struct stat st;
    // What this thread holds of a file that is now written is stale.
    if (!ReadOnly(mode) && ::fstat(::fileno(handle->stream), &st) == 0) {
        ForgetCachedFile(static_cast<uint64_t>(st.st_dev), static_cast<uint64_t>(st.st_ino));
    }
    return true;
}

void ClosePlain(MexHandle* handle) {
    if (handle->fd >= 0) ::close(handle->fd);
    if (handle->stream != nullptr) (void)std::fclose(handle->stream);
    std::free(handle->path);
    handle->fd = -1;
    handle->stream = nullptr;
    handle->path = nullptr;
    handle->positional = false;
}

int ReadPositional(MexHandle* handle, void* buf, unsigned size, unsigned count) {
    const size_t want = static_cast<size_t>(size) * count;
    if (want == 0) return 0;
    const uint64_t at = static_cast<uint64_t>(handle->position);
    bool needsFile = false;
    size_t got = CachedRead(handle->fd, handle->id, at, buf, want, &needsFile);
    if (needsFile && OpenHeldFile(handle)) {
        got += CachedRead(handle->fd, handle->id, at + got, static_cast<uint8_t*>(buf) + got, want - got);
    }
    handle->position += static_cast<int64_t>(got);
    if (got < want) handle->eof = true;
    return static_cast<int>(got / size);
}

// As fseeko: no position before the start or past the largest offset.
int SeekPositional(MexHandle* handle, int64_t offset, int whence) {
    int64_t base;
    switch (whence) {
        case SEEK_SET: base = 0; break;
        case SEEK_CUR: base = handle->position; break;
        case SEEK_END: base = handle->id.size; break;
        default: return -1;
    }
    if (offset > 0 && base > INT64_MAX - offset) return -1;
    if (base + offset < 0) return -1;
    handle->position = base + offset;
    handle->eof = false;
    return 0;
}

}  // namespace

int MEx_fopen(const char* path, const char* mode) {
    if (path == nullptr || mode == nullptr) return 0;
    MexHandle* handle = new (std::nothrow) MexHandle();
    if (handle == nullptr) return 0;
    DrmClient client;
    int kind = CheckDRM(path, &client);
    if (kind < 0) {
        delete handle;
        return 0;
    }
    handle->drmKind = kind;
    const bool opened = kind == 0 ? OpenPlain(handle, path, mode) : OpenProtected(handle, path, client);
    int h = opened ? Register(handle) : 0;
    if (h == 0) {
        ClosePlain(handle);
        CloseProtected(handle);
        delete handle;
    }
    return h;
}

int MEx_fdopen(int fd, const char* mode) {
    if (fd < 0 || mode == nullptr) return 0;
    int copy = ::dup(fd);
    if (copy < 0) return 0;
    MexHandle* handle = new (std::nothrow) MexHandle();
    if (handle == nullptr) {
        ::close(copy);
        return 0;
    }
    handle->drmKind = 0;
    if (!ReadOnly(mode) || !TakeRegularFile(handle, copy, static_cast<int64_t>(::lseek(copy, 0, SEEK_CUR)))) {
        handle->stream = ::fdopen(copy, mode);
        if (handle->stream == nullptr) {
            ::close(copy);
            delete handle;
            return 0;
        }
    }
    int h = Register(handle);
    if (h == 0) {
        ClosePlain(handle);
        delete handle;
    }
    return h;
}

int MEx_fread(void* buf, unsigned size, unsigned count, int h) {
    MexHandle* handle = Lookup(h);
    if (handle == nullptr) return -1;
    if (buf == nullptr) return 0;
    if (handle->positional) return ReadPositional(handle, buf, size, count);
    if (handle->drmKind == 0) return static_cast<int>(std::fread(buf, size, count, handle->stream));
    return ReadProtected(handle, buf, size, count);
}

int MEx_fwrite(const void* buf, unsigned size, unsigned count, int h) {
    MexHandle* handle = Lookup(h);
    if (handle == nullptr || handle->drmKind != 0) return -1;
    if (buf == nullptr || handle->positional) return 0;
    return static_cast<int>(std::fwrite(buf, size, count, handle->stream));
}

int MEx_fseek(int h, int64_t offset, int whence) {
    MexHandle* handle = Lookup(h);
    if (handle == nullptr) return -1;
    if (handle->positional) return SeekPositional(handle, offset, whence);
    if (handle->drmKind == 0) return ::fseeko(handle->stream, static_cast<off_t>(offset), whence);
    return SeekProtected(handle, offset, whence);
}

int64_t MEx_ftell(int h) {
    MexHandle* handle = Lookup(h);
    if (handle == nullptr) return -1;
    if (handle->positional) return handle->position;
    if (handle->drmKind == 0) return static_cast<int64_t>(::ftello(handle->stream));
    return handle->position;
}

int MEx_feof(int h) {
    MexHandle* handle = Lookup(h);
    if (handle == nullptr) return -1;
    if (handle->positional) return handle->eof ? 1 : 0;
    if (handle->drmKind == 0) return std::feof(handle->stream);
    return handle->position >= handle->size ? 1 : 0;
}

int MEx_fclose(int h) {
    MexHandle* handle = Lookup(h);
    if (handle == nullptr) return 0;
    Unregister(h);
    int result = 0;
    if (handle->positional) {
        if (handle->fd >= 0) result = ::close(handle->fd);
        std::free(handle->path);
    } else if (handle->drmKind == 0) {
        result = std::fclose(handle->stream);
    } else {
        CloseProtected(handle);
    }
    delete handle;
    return result;
}

int MEx_stat(const char* path, struct stat* st) {
    if (path == nullptr || st == nullptr) return -1;
    DrmClient client;
    int kind = CheckDRM(path, &client);
    if (kind < 0) return -1;
    if (kind != 0) {
        _DRM_METADATA meta;
        std::memset(&meta, 0, sizeof meta);
        if (GetDRMMetaInfo(path, &client, &meta) == 0 && meta.nContentLength != 0) {
            st->st_size = static_cast<off_t>(meta.nContentLength);
            return 0;
        }
    }
    return ::stat(path, st);
}

bool HandleIdentity(int h, FileIdentity* id) {
    const MexHandle* handle = Lookup(h);
    if (handle == nullptr || handle->drmKind != 0 || !handle->positional) return false;
    *id = handle->id;
    return true;
}

bool SeekToOffset(int h, uint64_t pos) {
    return pos <= static_cast<uint64_t>(INT64_MAX) && MEx_fseek(h, static_cast<int64_t>(pos), SEEK_SET) == 0;
}

size_t ReadSomeAt(int h, uint64_t pos, uint8_t* out, size_t n) {
    if (n == 0 || n > UINT_MAX || !SeekToOffset(h, pos)) return 0;
    const int got = MEx_fread(out, 1, static_cast<unsigned>(n), h);
    return got > 0 ? static_cast<size_t>(got) : 0;
}

bool ReadExactAt(int h, uint64_t pos, size_t n, std::vector<uint8_t>* out) {
    out->resize(n);
    return n == 0 ? SeekToOffset(h, pos) : ReadSomeAt(h, pos, out->data(), n) == n;
}

bool CanReadAhead(int h) {
    const MexHandle* handle = Lookup(h);
    return handle != nullptr && handle->positional && handle->fd >= 0;
}

void ReadAhead(int h, uint64_t pos, size_t n, size_t atLeast) {
    const MexHandle* handle = Lookup(h);
    if (handle != nullptr && handle->positional && handle->fd >= 0) CacheAhead(handle->fd, handle->id, pos, n, atLeast);
}

bool MEx_fsize(const char* path, uint64_t* size) {
    struct stat st;
    if (MEx_stat(path, &st) != 0 || st.st_size < 0) return false;
    *size = static_cast<uint64_t>(st.st_size);
    return true;
}

bool OpenedFileSize(int h, const char* path, uint64_t* size) {
    FileIdentity id;
    if (h != 0 && HandleIdentity(h, &id) && id.size >= 0) {
        *size = static_cast<uint64_t>(id.size);
        return true;
    }
    return MEx_fsize(path, size);
}

OpenedFile::OpenedFile(const char* path) : h_(path != nullptr ? MEx_fopen(path, "rb") : 0) {
    sized_ = h_ != 0 && OpenedFileSize(h_, path, &size_);
}

OpenedFile::~OpenedFile() {
    if (h_ != 0) MEx_fclose(h_);
}

uint32_t GetUINT32(int h, bool bLittle) {
    uint8_t b[4] = {0, 0, 0, 0};
    MEx_fread(b, 1, 4, h);
    return bLittle ? ReadLE32(b) : ReadBE32(b);
}

int GetFileExtension(const char* path, char* ext) {
    if (path == nullptr || ext == nullptr) return 1;
    char work[4096];
    size_t len = strnlen(path, sizeof work - 1);
    std::memcpy(work, path, len);
    work[len] = '\0';
    // A DRM content URI carries "?cid=..." after the file name.
    if (char* cid = std::strstr(work, "?cid=")) *cid = '\0';
    const char* dot = std::strrchr(work, '.');
    if (dot == nullptr) return 1;
    std::memcpy(ext, dot, strnlen(dot, 9));
    return 0;
}

int32_t CopyExtensionAsFormat(const char* path, char* szFormat) {
    char ext[10] = {0};
    if (GetFileExtension(path, ext) != 0) return MM_E_FAIL;
    const size_t n = strnlen(ext + 1, sizeof ext - 1);
    std::memcpy(szFormat, ext + 1, n);
    szFormat[n] = '\0';
    return MM_OK;
}

}  // namespace metainfo
