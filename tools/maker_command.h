// metainfo maker FILE [--thumbnail OUT]: the maker box of an MP4 file.
#pragma once

#include <string>

namespace probe {

// thumbnail, when not empty, is where the thumbnail is written. 0 or 1.
int MakerCommand(const std::string& path, const std::string& thumbnail);

}  // namespace probe
