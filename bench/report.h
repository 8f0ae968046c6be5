// The tables a run prints, from the samples of every file and peer.
#pragma once

#include <string>
#include <vector>

#include "files.h"
#include "peer.h"

namespace bench {

struct Results {
    std::vector<BenchFile> files;
    std::vector<std::string> peers;  // peers[0] is the library under test
    // samples[file][peer]: one sample per round
    std::vector<std::vector<std::vector<Sample>>> samples;
};

void PrintTimes(const Results& r);
void PrintSpeedups(const Results& r);
void PrintBytes(const Results& r);
void PrintScaling(const Results& r);

}  // namespace bench
