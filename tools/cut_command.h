#pragma once

namespace probe {

// metainfo cut FILE START END OUT: writes the range through the library's
// file extraction of the file's format.
int CutCommand(int argc, char** argv);

}  // namespace probe
