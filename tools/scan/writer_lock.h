// One scan writes a database at a time: an exclusive lock on DB.lock, which
// the kernel lets go of when its holder dies, however it dies, so a killed
// scan never leaves a lock behind. The file keeps the holder's pid for people.
#pragma once

#include <string>

namespace scan {

class WriterLock {
public:
    // Waits up to waitSeconds for the lock; Held() says whether it came.
    WriterLock(const std::string& dbPath, double waitSeconds);
    WriterLock(const WriterLock&) = delete;
    WriterLock& operator=(const WriterLock&) = delete;
    ~WriterLock();

    bool Held() const { return held_; }
    const std::string& Problem() const { return problem_; }

private:
    int fd_ = -1;
    bool held_ = false;
    std::string problem_;
};

}  // namespace scan
