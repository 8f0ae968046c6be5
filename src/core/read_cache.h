// The bytes of the files a thread read last, so that the queries of one probe
// (type, clip information, tags, codec: each opens the file) read every byte
// from the system once, and a seek costs nothing.
//
// A file is known by device, inode, size and modification and change times:
// a file rewritten between two queries is read anew. A file changed in the
// last seconds is read anew by every handle, as a rewrite within one tick of
// the file system's clock keeps its times.
#pragma once

#include <sys/stat.h>

#include <cstddef>
#include <cstdint>

namespace metainfo {

struct FileIdentity {
    uint64_t device = 0;
    uint64_t inode = 0;
    int64_t size = 0;
    int64_t modifiedNs = 0;
    int64_t changedNs = 0;

    static FileIdentity Of(const struct stat& st);
    bool operator==(const FileIdentity& o) const {
        return device == o.device && inode == o.inode && size == o.size && modifiedNs == o.modifiedNs &&
               changedNs == o.changedNs;
    }
};

// The real-time clock, which file times are kept in, in nanoseconds.
int64_t NowNs();

// True when what was learnt from the file at learntNs may serve a later
// handle of the same identity: the file had settled before it was read.
bool LearntAfterSettling(const FileIdentity& id, int64_t learntNs);

// Called when a handle opens the file: what is held of it serves the new
// handle only when the file had settled before it was read (see kSettledNs).
void OpenCachedFile(const FileIdentity& id);

// Records the path a file was opened by, so that a later open of the same
// path can be answered from what is held (see HoldsSettled).
void NameCachedFile(const FileIdentity& id, const char* path);
// True when this thread holds bytes of a file opened by this path.
bool HoldsFileNamed(const char* path);
// True when this thread holds bytes of the file id, opened by this path, and
// they were read after the file had settled: a handle may then be served
// from them without opening the file until it needs more.
bool HoldsSettled(const char* path, const FileIdentity& id);

// Copies up to n bytes at pos of the open file fd (known as id) into dst,
// from this thread's cache where it holds them and from the file where not
// (fd -1: what is held only, and *needsFile set where bytes that are not held
// were needed). Answers the bytes copied: fewer than n only at the end of the
// file, on a read error or, without fd, at bytes not held.
size_t CachedRead(int fd, const FileIdentity& id, uint64_t pos, void* dst, size_t n, bool* needsFile = nullptr);

// Reads what this thread does not hold of [pos, pos + n) of the open file fd
// (known as id), one read per gap of at least atLeast bytes (where the file and
// what is held after the gap allow), so that the later queries of a probe find
// those bytes held. Bounded by the file's size and what one file may hold.
void CacheAhead(int fd, const FileIdentity& id, uint64_t pos, size_t n, size_t atLeast = 0);

// Drops what this thread holds of a file that is about to be written.
void ForgetCachedFile(uint64_t device, uint64_t inode);

}  // namespace metainfo
