// Byte-built files of every format the library reads, each a valid file of
// its kind with the features its readers look at (tags, pictures, maker
// boxes, several streams). The fuzz seed writer and the thread stress test
// start from them.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace testing_support {

struct FixtureFile {
    int type;  // the media type code the library detects
    std::string name;
    std::vector<uint8_t> bytes;
};

std::vector<FixtureFile> FixtureFiles();

}  // namespace testing_support
