// All file input and output of the library: plain files and, transparently,
// files read through the content-protection service.
//
// A handle is an int, 0 on failure. It names a slot of a table of open handles
// (with a generation, so a handle that was closed is refused rather than
// reaching another file).
#pragma once

#include <sys/stat.h>

#include <cstddef>
#include <cstdint>
#include <vector>

namespace metainfo {

struct FileIdentity;

int MEx_fopen(const char* path, const char* mode);
// Plain: items read; protected: bytes read; -1 for a bad handle.
int MEx_fread(void* buf, unsigned size, unsigned count, int h);
// Items written; -1 for a protected or bad handle.
int MEx_fwrite(const void* buf, unsigned size, unsigned count, int h);
// Positions are 64-bit on every target, so files of 2 GiB and more read the
// same on 32-bit hosts.
int MEx_fseek(int h, int64_t offset, int whence);
int64_t MEx_ftell(int h);
int MEx_feof(int h);
int MEx_fclose(int h);
int MEx_stat(const char* path, struct stat* st);
// A plain handle over a duplicate of the caller's descriptor: reads start at
// the descriptor's current position, and closing the handle leaves the
// caller's descriptor open.
int MEx_fdopen(int fd, const char* mode);

// The identity of the file a plain handle reads with positional reads (a
// regular file opened for reading); false for any other handle.
bool HandleIdentity(int h, FileIdentity* id);

// Moves to an absolute offset; false when it cannot be a file position or
// the seek fails.
bool SeekToOffset(int h, uint64_t pos);

// Reads up to n bytes at an absolute offset into out; how many it read (0 on
// a failed seek or read).
size_t ReadSomeAt(int h, uint64_t pos, uint8_t* out, size_t n);

// Reads exactly n bytes at an absolute offset into out (resized to n); false
// when fewer are there.
bool ReadExactAt(int h, uint64_t pos, size_t n, std::vector<uint8_t>* out);

// Brings [pos, pos + n) of the file into this thread's cache while the handle
// has it open, so that later handles of the same file read it without opening
// the file again; a gap not held is read to at least atLeast bytes. Does
// nothing for other handles.
void ReadAhead(int h, uint64_t pos, size_t n, size_t atLeast = 0);
// True for a handle ReadAhead works on: a plain regular file it has open.
bool CanReadAhead(int h);

// Size in bytes of the file at path, as MEx_stat reports it; false when the
// path cannot be looked at.
bool MEx_fsize(const char* path, uint64_t* size);

// The same for the file open as h from path: a plain handle knows its size
// from when it was opened, any other handle (or none, 0) asks the path.
bool OpenedFileSize(int h, const char* path, uint64_t* size);

// A size or position kept in a 32-bit record field: 4 GiB and more reads as
// 0xFFFFFFFF, the same on every target.
inline uint32_t SaturateU32(uint64_t v) { return v > 0xFFFFFFFFu ? 0xFFFFFFFFu : static_cast<uint32_t>(v); }
// The same for a position that MEx_ftell reported; a failed tell reads as 0.
inline uint32_t PositionToU32(int64_t v) { return v < 0 ? 0 : SaturateU32(static_cast<uint64_t>(v)); }

// Next four bytes as a 32-bit value; missing bytes of a short read count as 0.
uint32_t GetUINT32(int h, bool bLittle);

// Copies the path's extension (dot included, at most 9 characters, not
// terminated) into ext, which must be zeroed and at least 10 bytes long.
// 0 when found, 1 when the path has no dot.
int GetFileExtension(const char* path, char* ext);

// Writes the path's extension without its dot, terminated, as a clip's
// container name (szFormat, 128 bytes). 0, or MM_E_FAIL without an extension.
int32_t CopyExtensionAsFormat(const char* path, char* szFormat);

// A file a reader takes whole: opened by path for reading, its size known (see
// OpenedFileSize), closed when the scope ends. ok() is false when either failed.
class OpenedFile {
public:
    explicit OpenedFile(const char* path);
    ~OpenedFile();
    OpenedFile(const OpenedFile&) = delete;
    OpenedFile& operator=(const OpenedFile&) = delete;
    bool ok() const { return sized_; }
    int handle() const { return h_; }
    uint64_t size() const { return size_; }

private:
    int h_;
    uint64_t size_ = 0;
    bool sized_ = false;
};

// Closes a handle when the scope ends.
class FileCloser {
public:
    explicit FileCloser(int h) : h_(h) {}
    ~FileCloser() {
        if (h_ != 0) MEx_fclose(h_);
    }
    FileCloser(const FileCloser&) = delete;
    FileCloser& operator=(const FileCloser&) = delete;
    int get() const { return h_; }

private:
    int h_;
};

}  // namespace metainfo
