// The regular files under a folder, read with openat/fstatat so a walk of
// many thousands of files costs one stat each.
#pragma once

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

namespace scan {

struct FileStat {
    std::string path;
    int64_t size = 0;
    int64_t mtimeNs = 0;
    int64_t inode = 0;
    int64_t device = 0;
};

struct WalkOptions {
    bool follow = false;  // enter symbolic links to folders (and take links to files)
    bool crossFilesystems = false;  // leave the root's file system
};

struct WalkEvents {
    std::function<void(const FileStat&)> file;
    std::function<void(const std::string&)> folder;  // entered
    // A folder whose entries could not be read (its files are not "gone").
    std::function<void(const std::string& path, const std::string& why)> unreadable;
};

// Walks root (a folder, or one file); folders in name order.
void Walk(const std::string& root, const WalkOptions& options, const WalkEvents& events);

// The absolute, lexically normal form of a path, without a trailing slash.
std::string AbsolutePath(const std::string& path);

}  // namespace scan
