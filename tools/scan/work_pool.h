// Threads that probe files while the scanning thread walks folders and
// writes rows: a bounded queue of files to probe (so memory stays flat
// however many files a walk finds) and a queue of probed files.
#pragma once

#include <condition_variable>
#include <deque>
#include <mutex>
#include <thread>
#include <vector>

#include "store.h"

namespace scan {

class WorkPool {
public:
    WorkPool(unsigned threads, bool pictures);
    WorkPool(const WorkPool&) = delete;
    WorkPool& operator=(const WorkPool&) = delete;
    ~WorkPool();

    // Queues a file; while the queue is full, hands probed files to take.
    template <typename Take>
    void Submit(Probed task, Take take) {
        for (;;) {
            std::vector<Probed> done = Collect(false);
            for (Probed& p : done) take(p);
            std::unique_lock<std::mutex> lock(mutex_);
            if (todo_.size() < capacity_) {
                todo_.push_back(std::move(task));
                ++pending_;
                workCv_.notify_one();
                return;
            }
            doneCv_.wait_for(lock, std::chrono::milliseconds(100), [&] { return !done_.empty(); });
        }
    }

    // The files probed so far (waiting for one when wait is set and some are
    // still being probed).
    std::vector<Probed> Collect(bool wait);
    size_t Pending();

private:
    void Work();

    bool pictures_;
    size_t capacity_;
    std::mutex mutex_;
    std::condition_variable workCv_, doneCv_;
    std::deque<Probed> todo_;
    std::vector<Probed> done_;
    size_t pending_ = 0;  // queued or being probed or probed and not collected
    bool closing_ = false;
    std::vector<std::thread> threads_;
};

}  // namespace scan
