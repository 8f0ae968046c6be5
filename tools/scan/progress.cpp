#include "progress.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <cstdio>

namespace scan {
namespace {

size_t Columns() {
    struct winsize ws {};
    if (::ioctl(STDERR_FILENO, TIOCGWINSZ, &ws) == 0 && ws.ws_col > 20) return ws.ws_col;
    return 80;
}

}  // namespace

Progress::Progress() : terminal_(::isatty(STDERR_FILENO) != 0), start_(std::chrono::steady_clock::now()) {}

double Progress::Seconds() const {
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start_).count();
}

void Progress::Tick(const Counts& c, const std::string& folder) {
    if (!terminal_) return;
    const auto now = std::chrono::steady_clock::now();
    if (drawn_ && now - last_ < std::chrono::milliseconds(100)) return;
    last_ = now;
    drawn_ = true;
    const double seconds = Seconds();
    char head[96];
    std::snprintf(head, sizeof head, "%zu/%zu files, %.0f files/s, ", c.done, c.found,
                  seconds > 0 ? static_cast<double>(c.done) / seconds : 0.0);
    std::string line = head;
    const size_t room = Columns() - 1;
    // The end of the folder's name says most about where the walk is.
    if (line.size() + folder.size() > room && room > line.size() + 3) {
        line += "..." + folder.substr(folder.size() - (room - line.size() - 3));
    } else {
        line += folder;
    }
    if (line.size() > room) line.resize(room);
    std::fprintf(stderr, "\r\033[K%s", line.c_str());
    std::fflush(stderr);
}

void Progress::Clear() {
    if (terminal_ && drawn_) std::fprintf(stderr, "\r\033[K");
}

void Progress::Finish(const Counts& c) {
    Clear();
    std::fprintf(stderr,
                 "metainfo: scan: %zu new, %zu changed, %zu unchanged, %zu moved, %zu removed, %zu failed, %.2f s\n",
                 c.added, c.changed, c.unchanged, c.moved, c.removed, c.failed, Seconds());
}

}  // namespace scan
