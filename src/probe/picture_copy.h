// The bytes of a picture the accurate interface found, copied on request.
#pragma once

#include <sys/stat.h>

#include <cstdint>

#include "core/facts.h"

namespace metainfo {

// Enough of a file's identity to tell that it changed since it was probed.
struct FileStamp {
    uint64_t device = 0, inode = 0, size = 0;
    int64_t modifiedSec = 0, modifiedNsec = 0;
};

FileStamp StampOf(const struct stat& st);

// Copies picture.size bytes into out; an mi_result.
int CopyPicture(const char* path, int type, const FileStamp& stamp, const PictureFacts& picture, unsigned char* out);

}  // namespace metainfo
