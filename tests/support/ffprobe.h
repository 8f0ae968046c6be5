// ffmpeg and ffprobe driven through the shell, for the round-trip tests.
#pragma once

#include <string>

namespace testing_support {

// Output of a shell command, or "" when it failed.
std::string RunShell(const std::string& command);

// Writes path with ffmpeg from inputs and codec arguments; false when this
// ffmpeg cannot (an encoder not built in).
bool FfmpegWrite(const std::string& args, const std::string& path);

// One value that ffprobe shows, such as "stream=width" with "-select_streams v:0".
std::string Probe(const std::string& path, const std::string& entries, const std::string& select = "");

}  // namespace testing_support
