// Times on the command line: seconds ("90", "90.5") or minutes and seconds
// ("1:30", "01:30.250"), to the millisecond.
#pragma once

#include <cstdint>
#include <string>

namespace probe {

// The time in milliseconds; false for anything else (signs, spaces, more
// than three decimals, seconds of 60 or more after a colon, overflow).
bool ParseTime(const std::string& text, int64_t* ms);

}  // namespace probe
