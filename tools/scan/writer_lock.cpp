#include "writer_lock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstring>
#include <thread>

namespace scan {

WriterLock::WriterLock(const std::string& dbPath, double waitSeconds) {
    const std::string path = dbPath + ".lock";
    fd_ = ::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0644);
    if (fd_ < 0) {
        problem_ = path + ": " + std::strerror(errno);
        return;
    }
    const auto until = std::chrono::steady_clock::now() + std::chrono::duration<double>(waitSeconds);
    while (::flock(fd_, LOCK_EX | LOCK_NB) != 0) {
        if (errno != EWOULDBLOCK && errno != EINTR) {
            problem_ = path + ": " + std::strerror(errno);
            return;
        }
        if (std::chrono::steady_clock::now() >= until) {
            problem_ = "another scan is writing it";
            return;
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(50));
    }
    held_ = true;
    const std::string pid = std::to_string(::getpid()) + "\n";
    if (::ftruncate(fd_, 0) == 0 && ::pwrite(fd_, pid.data(), pid.size(), 0) < 0) {
        // the pid is a courtesy; the lock is what counts
    }
}

WriterLock::~WriterLock() {
    if (fd_ >= 0) ::close(fd_);
}

}  // namespace scan
