// metainfo cut FILE START END OUT: a time range of MP3, AAC, WAVE or AMR
// audio, written to a file: whole frames by the accurate interface, or whole
// seconds by the MM_ cutters (--exact).
#pragma once

#include <cstdint>
#include <string>

namespace probe {

// 0, or 1 when the file cannot be cut.
int CutCommand(const std::string& path, int64_t startMs, int64_t endMs, const std::string& out, bool exact);

}  // namespace probe
