#include "work_pool.h"

#include <utility>

namespace scan {

WorkPool::WorkPool(unsigned threads, bool pictures) : pictures_(pictures), capacity_(4 * size_t{threads} + 16) {
    for (unsigned i = 0; i < threads; ++i) threads_.emplace_back([this] { Work(); });
}

WorkPool::~WorkPool() {
    {
        std::lock_guard<std::mutex> lock(mutex_);
        closing_ = true;
    }
    workCv_.notify_all();
    for (std::thread& t : threads_) t.join();
}

void WorkPool::Work() {
    for (;;) {
        Probed task;
        {
            std::unique_lock<std::mutex> lock(mutex_);
            workCv_.wait(lock, [&] { return closing_ || !todo_.empty(); });
            if (todo_.empty()) return;
            task = std::move(todo_.front());
            todo_.pop_front();
        }
        ProbeFile(&task, pictures_);
        {
            std::lock_guard<std::mutex> lock(mutex_);
            done_.push_back(std::move(task));
        }
        doneCv_.notify_one();
    }
}

std::vector<Probed> WorkPool::Collect(bool wait) {
    std::unique_lock<std::mutex> lock(mutex_);
    if (wait) doneCv_.wait_for(lock, std::chrono::milliseconds(100), [&] { return !done_.empty(); });
    std::vector<Probed> out;
    out.swap(done_);
    pending_ -= out.size();
    return out;
}

size_t WorkPool::Pending() {
    std::lock_guard<std::mutex> lock(mutex_);
    return pending_;
}

}  // namespace scan
