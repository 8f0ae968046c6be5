#include "probe/picture_copy.h"

#include <fcntl.h>
#include <unistd.h>

#include <cstring>
#include <vector>

#include "core/unsync.h"
#include "metainfo/metainfo.h"
#include "metainfo/probe.h"
#include "ogg/ogg_facts.h"

namespace metainfo {
namespace {

bool SameStamp(const FileStamp& a, const FileStamp& b) {
    return a.device == b.device && a.inode == b.inode && a.size == b.size && a.modifiedSec == b.modifiedSec &&
           a.modifiedNsec == b.modifiedNsec;
}

bool ReadWhole(int fd, uint64_t offset, unsigned char* out, uint64_t size) {
    while (size > 0) {
        const size_t chunk = size > (1u << 30) ? (1u << 30) : static_cast<size_t>(size);
        const ssize_t got = ::pread(fd, out, chunk, static_cast<off_t>(offset));
        if (got <= 0) return false;
        out += got;
        offset += static_cast<uint64_t>(got);
        size -= static_cast<uint64_t>(got);
    }
    return true;
}

// A picture known only to the MM_ meta query: its one picture, asked again.
int CopyThroughMetaQuery(const char* path, int type, const PictureFacts& picture, unsigned char* out) {
    _MMMetaInfo meta{};
    int result = MI_E_IO;
    if (MM_MediaExtractor_GetMetaInfo(path, type, &meta) == MM_OK && meta.pPicture != nullptr &&
        meta.nPictureSize == picture.size) {
        std::memcpy(out, meta.pPicture, meta.nPictureSize);
        result = MI_OK;
    }
    MM_MediaExtractor_FreeMetaInfo(&meta);
    return result;
}

int CopyFromOggHeaders(const char* path, const PictureFacts& picture, unsigned char* out) {
    std::vector<uint8_t> bytes;
    if (!OggPictureBytes(path, picture.ordinal, &bytes) || bytes.size() != picture.size) return MI_E_DAMAGED;
    if (!bytes.empty()) std::memcpy(out, bytes.data(), bytes.size());
    return MI_OK;
}

int CopyFromFile(int fd, const PictureFacts& picture, unsigned char* out) {
    if (!picture.unsynchronised) return ReadWhole(fd, picture.offset, out, picture.size) ? MI_OK : MI_E_IO;
    if (picture.storedSize > 0x7FFFFFFFu) return MI_E_DAMAGED;
    std::vector<unsigned char> stored(static_cast<size_t>(picture.storedSize));
    if (!ReadWhole(fd, picture.offset, stored.data(), stored.size())) return MI_E_IO;
    const int length = Sync(stored.data(), static_cast<int>(stored.size()));
    if (length < 0 || static_cast<uint64_t>(length) != picture.size) return MI_E_DAMAGED;
    std::memcpy(out, stored.data(), static_cast<size_t>(length));
    return MI_OK;
}

}  // namespace

FileStamp StampOf(const struct stat& st) {
    FileStamp s;
    s.device = static_cast<uint64_t>(st.st_dev);
    s.inode = static_cast<uint64_t>(st.st_ino);
    s.size = static_cast<uint64_t>(st.st_size);
    s.modifiedSec = static_cast<int64_t>(st.st_mtim.tv_sec);
    s.modifiedNsec = static_cast<int64_t>(st.st_mtim.tv_nsec);
    return s;
}

int CopyPicture(const char* path, int type, const FileStamp& stamp, const PictureFacts& picture, unsigned char* out) {
    const int fd = ::open(path, O_RDONLY | O_CLOEXEC);
    if (fd < 0) return MI_E_IO;
    struct stat st;
    int result = MI_E_IO;
    if (::fstat(fd, &st) == 0 && SameStamp(StampOf(st), stamp)) {
        const uint64_t stored = picture.unsynchronised ? picture.storedSize : picture.size;
        if (picture.inOggHeaders) {
            result = CopyFromOggHeaders(path, picture, out);
        } else if (picture.viaContract) {
            result = CopyThroughMetaQuery(path, type, picture, out);
        } else if (picture.offset > stamp.size || stored > stamp.size - picture.offset) {
            result = MI_E_DAMAGED;
        } else {
            result = CopyFromFile(fd, picture, out);
        }
    }
    ::close(fd);
    return result;
}

}  // namespace metainfo
