// The files a run measures, each with its family (by extension) and, for the
// scaling set, the variant and duration its name carries.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace bench {

struct BenchFile {
    std::string path;
    std::string family;
    int64_t size = 0;
    std::string variant;  // "mp3-cbr" of "mp3-cbr.100s.mp3"; empty outside the scaling set
    int seconds = 0;  // 100 of the same name
};

// Files named on the command line and the regular files under folders named
// there, sorted by path so that runs compare.
std::vector<BenchFile> CollectFiles(const std::vector<std::string>& roots);

}  // namespace bench
