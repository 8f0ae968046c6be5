#include "walk.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <utility>

namespace scan {
namespace {

FileStat FromStat(std::string path, const struct stat& st) {
    FileStat f;
    f.path = std::move(path);
    f.size = static_cast<int64_t>(st.st_size);
    f.mtimeNs = static_cast<int64_t>(st.st_mtim.tv_sec) * 1000000000 + static_cast<int64_t>(st.st_mtim.tv_nsec);
    f.inode = static_cast<int64_t>(st.st_ino);
    f.device = static_cast<int64_t>(st.st_dev);
    return f;
}

class Walker {
public:
    Walker(const WalkOptions& options, const WalkEvents& events, dev_t rootDevice)
        : options_(options), events_(events), rootDevice_(rootDevice) {}

    // Takes fd (an open folder) and closes it.
    void Folder(int fd, const std::string& path, const struct stat& self) {
        ancestors_.emplace_back(self.st_dev, self.st_ino);
        events_.folder(path);
        DIR* dir = ::fdopendir(fd);
        if (dir == nullptr) {
            events_.unreadable(path, std::strerror(errno));
            ::close(fd);
            ancestors_.pop_back();
            return;
        }
        std::vector<std::string> names;
        errno = 0;
        while (const dirent* e = ::readdir(dir)) {
            if (std::strcmp(e->d_name, ".") != 0 && std::strcmp(e->d_name, "..") != 0) names.emplace_back(e->d_name);
        }
        if (errno != 0) events_.unreadable(path, std::strerror(errno));
        std::sort(names.begin(), names.end());
        for (const std::string& name : names) Entry(::dirfd(dir), path, name);
        ::closedir(dir);
        ancestors_.pop_back();
    }

private:
    void Entry(int dirFd, const std::string& parent, const std::string& name) {
        const std::string path = parent == "/" ? "/" + name : parent + "/" + name;
        struct stat st;
        if (::fstatat(dirFd, name.c_str(), &st, options_.follow ? 0 : AT_SYMLINK_NOFOLLOW) != 0) return;
        if (S_ISREG(st.st_mode)) {
            events_.file(FromStat(path, st));
            return;
        }
        if (!S_ISDIR(st.st_mode)) return;
        if (!options_.crossFilesystems && st.st_dev != rootDevice_) return;
        for (const auto& a : ancestors_) {
            if (a.first == st.st_dev && a.second == st.st_ino) return;  // a link back up: a loop
        }
        const int fd =
            ::openat(dirFd, name.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC | (options_.follow ? 0 : O_NOFOLLOW));
        if (fd < 0) {
            events_.unreadable(path, std::strerror(errno));
            return;
        }
        Folder(fd, path, st);
    }

    const WalkOptions& options_;
    const WalkEvents& events_;
    dev_t rootDevice_;
    std::vector<std::pair<dev_t, ino_t>> ancestors_;
};

}  // namespace

void Walk(const std::string& root, const WalkOptions& options, const WalkEvents& events) {
    struct stat st;
    if (::stat(root.c_str(), &st) != 0) {
        events.unreadable(root, std::strerror(errno));
        return;
    }
    if (S_ISREG(st.st_mode)) {
        events.file(FromStat(root, st));
        return;
    }
    if (!S_ISDIR(st.st_mode)) return;
    const int fd = ::open(root.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd < 0) {
        events.unreadable(root, std::strerror(errno));
        return;
    }
    Walker(options, events, st.st_dev).Folder(fd, root, st);
}

std::string AbsolutePath(const std::string& path) {
    std::error_code ec;
    std::string out = std::filesystem::absolute(path, ec).lexically_normal().string();
    if (ec) out = path;
    while (out.size() > 1 && out.back() == '/') out.pop_back();
    return out;
}

}  // namespace scan
