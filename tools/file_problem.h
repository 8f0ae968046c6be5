// Why a path cannot be probed before any query is made: what a user is told
// instead of a bare result code.
#pragma once

#include <cstdint>
#include <string>

namespace probe {

// "no such file", "is a directory", "permission denied", "empty",
// "not a regular file", or another system reason; empty when the path names
// a readable regular file with bytes in it. *size, when given, gets the
// file's size.
std::string FileProblem(const std::string& path, uint64_t* size = nullptr);

}  // namespace probe
