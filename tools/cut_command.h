// metainfo cut FILE START END OUT: a range of whole seconds of MP3, AAC,
// WAVE or AMR audio, written to a file.
#pragma once

#include <string>

namespace probe {

// 0, or 1 when the file cannot be cut.
int CutCommand(const std::string& path, int startSec, int endSec, const std::string& out);

}  // namespace probe
