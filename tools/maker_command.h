#pragma once

namespace probe {

// metainfo maker FILE [--thumbnail OUT]: prints the maker record of an MP4
// file and writes its thumbnail to OUT.
int MakerCommand(int argc, char** argv);

}  // namespace probe
