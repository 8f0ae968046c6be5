// Byte-built seeds of the formats only the accurate interface reads.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

struct AccurateSeed {
    std::string target;
    std::string name;
    std::vector<uint8_t> bytes;
};

std::vector<AccurateSeed> AccurateSeeds();
