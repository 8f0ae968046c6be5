#include "core/read_cache.h"

#include <unistd.h>

#include <cerrno>
#include <ctime>
#include <cstring>
#include <iterator>
#include <map>
#include <string>
#include <utility>
#include <vector>

namespace metainfo {
namespace {

// A miss reads at least this much, doubling while the reads run on from the
// previous miss, up to kMaxChunk; a request of kMaxChunk or more that the
// cache does not hold goes straight to the caller's buffer.
constexpr size_t kMinChunk = 4096;
constexpr size_t kMaxChunk = size_t{64} * 1024;
// What the first read of a file brings in from its end besides: tags and
// indexes often lie there, and a later query then needs no open.
constexpr size_t kTail = 4096;
// What one file may hold; past it the file's bytes are dropped and read anew.
constexpr size_t kCapacity = size_t{1024} * 1024;
constexpr int kFiles = 2;
// A file changed this recently when its bytes were first read may have been
// changed again within one tick of the file system's clock, leaving the same
// identity behind: its bytes serve only the handle that read them.
constexpr int64_t kSettledNs = 2000000000;

// Bytes read from a file are written by the read itself: growing an extent
// leaves the new bytes uninitialised instead of zeroing them first.
template <typename T>
struct ReadTarget : std::allocator<T> {
    template <typename U>
    struct rebind {
        using other = ReadTarget<U>;
    };
    ReadTarget() = default;
    template <typename U>
    explicit ReadTarget(const ReadTarget<U>& /*other*/) {}
    template <typename U>
    void construct(U* p) noexcept {
        ::new (static_cast<void*>(p)) U;
    }
    template <typename U, typename... Args>
    void construct(U* p, Args&&... args) {
        ::new (static_cast<void*>(p)) U(std::forward<Args>(args)...);
    }
};
using Bytes = std::vector<uint8_t, ReadTarget<uint8_t>>;

struct CachedFile {
    FileIdentity id;
    bool used = false;
    uint64_t lastUse = 0;
    std::map<uint64_t, Bytes> extents;  // start -> bytes, never overlapping
    size_t bytes = 0;
    uint64_t missEnd = UINT64_MAX;
    size_t chunk = kMinChunk;
    uint64_t end = UINT64_MAX;  // where a read came up short: nothing past it
    int64_t startedNs = 0;  // when the bytes held were first read
    std::string path;  // what the file was last opened by
    bool tailRead = false;  // the end was read with the first read
    // The extent the last read was served from, tried before the map: most
    // reads of a walk fall in the bytes the previous one came from.
    uint64_t hotStart = 0;
    const Bytes* hot = nullptr;

    void Clear() {
        hot = nullptr;
        extents.clear();
        bytes = 0;
        missEnd = UINT64_MAX;
        chunk = kMinChunk;
    }
};

struct ThreadCache {
    CachedFile files[kFiles];
    uint64_t clock = 0;
};

thread_local ThreadCache t_cache;

void Restart(CachedFile& f) {
    f.Clear();
    f.path.clear();
    f.tailRead = false;
    f.end = UINT64_MAX;
    f.startedNs = NowNs();
}

CachedFile& FileFor(const FileIdentity& id) {
    ThreadCache& c = t_cache;
    CachedFile* oldest = &c.files[0];
    for (CachedFile& f : c.files) {
        if (f.used && f.id == id) {
            f.lastUse = ++c.clock;
            return f;
        }
        if (!f.used || (oldest->used && f.lastUse < oldest->lastUse)) oldest = &f;
    }
    Restart(*oldest);
    oldest->id = id;
    oldest->used = true;
    oldest->lastUse = ++c.clock;
    return *oldest;
}

// pread until n bytes, the end of the file or an error. A short read that
// reached `size` (the size the file had when opened) is taken as the end
// without another call to confirm it.
size_t ReadAt(int fd, uint8_t* dst, size_t n, uint64_t pos, uint64_t size) {
    size_t done = 0;
    while (done < n) {
        const uint64_t at = pos + done;
        if (at > static_cast<uint64_t>(INT64_MAX)) break;
        if (done > 0 && size > 0 && at >= size) break;
        const ssize_t got = ::pread(fd, dst + done, n - done, static_cast<off_t>(at));
        if (got < 0 && errno == EINTR) continue;
        if (got <= 0) break;
        done += static_cast<size_t>(got);
    }
    return done;
}

uint64_t SizeOf(const CachedFile& f) { return f.id.size > 0 ? static_cast<uint64_t>(f.id.size) : 0; }

// Reads up to n bytes at pos straight into the extent that ends at pos (or a
// new one), then joins it to the extent that follows; how many it read.
size_t ReadInto(CachedFile& f, int fd, uint64_t pos, size_t n) {
    f.hot = nullptr;
    auto next = f.extents.upper_bound(pos);
    auto at = next;
    if (next != f.extents.begin() && std::prev(next)->first + std::prev(next)->second.size() == pos) {
        at = std::prev(next);
    } else {
        at = f.extents.emplace_hint(next, pos, Bytes());
    }
    Bytes& bytes = at->second;
    const size_t base = bytes.size();
    // Room for the extent this read will meet, so that joining it moves no bytes twice.
    const bool meets = next != f.extents.end() && next->first - pos == n;
    bytes.reserve(base + n + (meets ? next->second.size() : 0));
    bytes.resize(base + n);
    const size_t got = ReadAt(fd, bytes.data() + base, n, pos, SizeOf(f));
    bytes.resize(base + got);
    f.bytes += got;
    if (bytes.empty()) {
        f.extents.erase(at);
        return 0;
    }
    if (next != f.extents.end() && at->first + bytes.size() == next->first) {
        bytes.insert(bytes.end(), next->second.begin(), next->second.end());
        f.extents.erase(next);
    }
    return got;
}

// Reads the gap at pos (up to gapEnd) into the cache; false at the end.
bool Fill(CachedFile& f, int fd, uint64_t pos, size_t missing, uint64_t gapEnd) {
    f.chunk = pos == f.missEnd ? (f.chunk < kMaxChunk ? f.chunk * 2 : kMaxChunk) : kMinChunk;
    size_t want = missing > f.chunk ? missing : f.chunk;
    if (want > gapEnd - pos) want = static_cast<size_t>(gapEnd - pos);
    // Reading ahead stops at the end the file had when it was opened, so a
    // read near the end takes one call instead of a second that returns 0.
    const uint64_t size = SizeOf(f);
    if (want > missing && pos + want > size) want = pos + missing >= size ? missing : static_cast<size_t>(size - pos);
    if (f.bytes + want > kCapacity) f.Clear();
    const size_t got = ReadInto(f, fd, pos, want);
    if (got < want) f.end = pos + got;
    if (got == 0) return false;
    f.missEnd = pos + got;
    return true;
}

// Reads the last kTail bytes of the file, or what of them is not held.
void ReadTail(CachedFile& f, int fd) {
    f.tailRead = true;
    const uint64_t size = SizeOf(f);
    uint64_t start = size > kTail ? size - kTail : 0;
    auto next = f.extents.lower_bound(start);
    if (next != f.extents.begin()) {
        const auto held = std::prev(next);
        const uint64_t heldEnd = held->first + held->second.size();
        if (heldEnd > start) start = heldEnd;
    }
    next = f.extents.lower_bound(start);
    const uint64_t end = next != f.extents.end() && next->first < size ? next->first : size;
    if (start >= end || f.end <= start || f.bytes + (end - start) > kCapacity) return;
    const auto want = static_cast<size_t>(end - start);
    const size_t got = ReadInto(f, fd, start, want);
    if (got < want) f.end = start + got;
}

}  // namespace

int64_t NowNs() {
    struct timespec ts {};
    ::clock_gettime(CLOCK_REALTIME, &ts);
    return static_cast<int64_t>(ts.tv_sec) * 1000000000 + ts.tv_nsec;
}

bool LearntAfterSettling(const FileIdentity& id, int64_t learntNs) { return learntNs - id.changedNs >= kSettledNs; }

FileIdentity FileIdentity::Of(const struct stat& st) {
    FileIdentity id;
    id.device = static_cast<uint64_t>(st.st_dev);
    id.inode = static_cast<uint64_t>(st.st_ino);
    id.size = static_cast<int64_t>(st.st_size);
    id.modifiedNs = static_cast<int64_t>(st.st_mtim.tv_sec) * 1000000000 + st.st_mtim.tv_nsec;
    id.changedNs = static_cast<int64_t>(st.st_ctim.tv_sec) * 1000000000 + st.st_ctim.tv_nsec;
    return id;
}

void OpenCachedFile(const FileIdentity& id) {
    CachedFile& f = FileFor(id);
    if (!LearntAfterSettling(id, f.startedNs)) Restart(f);
}

size_t CachedRead(int fd, const FileIdentity& id, uint64_t pos, void* dst, size_t n, bool* needsFile) {
    CachedFile& f = FileFor(id);
    if (needsFile != nullptr) *needsFile = false;
    auto* out = static_cast<uint8_t*>(dst);
    if (f.hot != nullptr && pos >= f.hotStart && pos - f.hotStart <= f.hot->size() &&
        n <= f.hot->size() - (pos - f.hotStart)) {
        std::memcpy(out, f.hot->data() + (pos - f.hotStart), n);
        return n;
    }
    size_t done = 0;
    while (done < n) {
        const uint64_t at = pos + done;
        auto next = f.extents.upper_bound(at);
        if (next != f.extents.begin()) {
            const auto held = std::prev(next);
            const uint64_t end = held->first + held->second.size();
            if (at < end) {
                const size_t take = static_cast<size_t>(end - at) < n - done ? static_cast<size_t>(end - at) : n - done;
                std::memcpy(out + done, held->second.data() + (at - held->first), take);
                f.hotStart = held->first;
                f.hot = &held->second;
                done += take;
                continue;
            }
        }
        if (at >= f.end) break;
        // Without the file open, its size is the one the stat that confirmed
        // its identity saw: nothing lies past it, and no open is needed to say so.
        if (fd < 0 && at >= SizeOf(f)) break;
        if (fd < 0) {
            if (needsFile != nullptr) *needsFile = true;
            break;
        }
        const uint64_t gapEnd = next != f.extents.end() ? next->first : UINT64_MAX;
        const size_t missing = gapEnd - at < n - done ? static_cast<size_t>(gapEnd - at) : n - done;
        if (missing >= kMaxChunk) {
            const size_t got = ReadAt(fd, out + done, missing, at, SizeOf(f));
            done += got;
            if (got < missing) {
                f.end = at + got;
                break;
            }
            continue;
        }
        if (!Fill(f, fd, at, missing, gapEnd)) break;
        if (!f.tailRead) ReadTail(f, fd);
    }
    return done;
}

void CacheAhead(int fd, const FileIdentity& id, uint64_t pos, size_t n, size_t atLeast) {
    CachedFile& f = FileFor(id);
    const uint64_t size = SizeOf(f);
    const uint64_t end = pos < size && n < size - pos ? pos + n : size;
    uint64_t at = pos;
    while (at < end && at < f.end) {
        const auto next = f.extents.upper_bound(at);
        if (next != f.extents.begin()) {
            const auto held = std::prev(next);
            const uint64_t heldEnd = held->first + held->second.size();
            if (at < heldEnd) {
                at = heldEnd;
                continue;
            }
        }
        // A gap is read to at least atLeast bytes, up to what is held next or the file's end.
        const uint64_t limit = next != f.extents.end() && next->first < size ? next->first : size;
        const uint64_t gapEnd = limit < end ? limit : end;
        auto want = static_cast<size_t>(gapEnd - at);
        if (want < atLeast) want = static_cast<size_t>(limit - at < atLeast ? limit - at : atLeast);
        if (f.bytes + want > kCapacity) return;
        const size_t got = ReadInto(f, fd, at, want);
        if (got < want) f.end = at + got;
        if (got == 0) return;
        at += got;
    }
}

void NameCachedFile(const FileIdentity& id, const char* path) {
    for (CachedFile& f : t_cache.files) {
        if (f.used && f.id == id) f.path = path;
    }
}

bool HoldsFileNamed(const char* path) {
    for (const CachedFile& f : t_cache.files) {
        if (f.used && f.path == path) return true;
    }
    return false;
}

bool HoldsSettled(const char* path, const FileIdentity& id) {
    for (const CachedFile& f : t_cache.files) {
        if (f.used && f.id == id && f.path == path && !f.extents.empty() && LearntAfterSettling(id, f.startedNs)) {
            return true;
        }
    }
    return false;
}

void ForgetCachedFile(uint64_t device, uint64_t inode) {
    for (CachedFile& f : t_cache.files) {
        if (f.used && f.id.device == device && f.id.inode == inode) {
            f.Clear();
            f.used = false;
        }
    }
}

}  // namespace metainfo
