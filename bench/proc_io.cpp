#include <fcntl.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>

#include "peer.h"

namespace bench {
namespace {

// rchar as /proc/self/io tells it, which does not yet count this read;
// *length gets the bytes the read took.
int64_t ParseRchar(int64_t* length) {
    char text[512];
    *length = 0;
    const int fd = ::open("/proc/self/io", O_RDONLY | O_CLOEXEC);
    if (fd < 0) return 0;
    const ssize_t n = ::read(fd, text, sizeof text - 1);
    ::close(fd);
    if (n <= 0) return 0;
    *length = n;
    text[n] = '\0';
    const char* at = std::strstr(text, "rchar:");
    return at != nullptr ? std::strtoll(at + 6, nullptr, 10) : 0;
}

}  // namespace

int64_t ReadCharCount() {
    // Every reading of /proc/self/io is itself a read, and its text grows as
    // the counters gain digits: the bytes of each earlier reading are taken off.
    static int64_t own = 0;
    int64_t length = 0;
    const int64_t count = ParseRchar(&length) - own;
    own += length;
    return count;
}

}  // namespace bench
