#include <chrono>

namespace bench {

template <typename Job>
Sample Measure(Job&& job) {
    Sample s;
    const int64_t before = ReadCharCount();
    const auto start = std::chrono::steady_clock::now();
    s.ok = job();
    const auto end = std::chrono::steady_clock::now();
    s.bytes = ReadCharCount() - before;
    s.ns = std::chrono::duration_cast<std::chrono::nanoseconds>(end - start).count();
    return s;
}

}  // namespace bench
