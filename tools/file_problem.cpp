#include "file_problem.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace probe {
namespace {

std::string Reason(int error) {
    switch (error) {
        case ENOENT: return "no such file";
        case ENOTDIR: return "no such file (a folder on the way is a file)";
        case EACCES: return "permission denied";
        case EISDIR: return "is a directory";
        case ELOOP: return "too many symbolic links";
        case ENAMETOOLONG: return "name too long";
        default: return std::strerror(error);
    }
}

}  // namespace

std::string FileProblem(const std::string& path, uint64_t* size) {
    struct stat st;
    if (::stat(path.c_str(), &st) != 0) return Reason(errno);
    if (size != nullptr) *size = static_cast<uint64_t>(st.st_size);
    if (S_ISDIR(st.st_mode)) return Reason(EISDIR);
    if (!S_ISREG(st.st_mode)) return "not a regular file";
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) return Reason(errno);
    ::close(fd);
    if (st.st_size == 0) return "empty";
    return std::string();
}

}  // namespace probe
