// What a scan tells the person watching: on a terminal one line, rewritten
// in place (files done of found, files per second, the folder being read);
// elsewhere nothing until the summary, which is always written.
#pragma once

#include <chrono>
#include <cstddef>
#include <string>

namespace scan {

struct Counts {
    size_t found = 0, done = 0;
    size_t added = 0, changed = 0, unchanged = 0, moved = 0, removed = 0, failed = 0;
};

class Progress {
public:
    Progress();
    // Redraws the line at most ten times a second.
    void Tick(const Counts& c, const std::string& folder);
    // Clears the line (for a message of its own).
    void Clear();
    // Clears the line and writes the summary.
    void Finish(const Counts& c);

private:
    double Seconds() const;
    bool terminal_;
    std::chrono::steady_clock::time_point start_, last_;
    bool drawn_ = false;
};

}  // namespace scan
