// metainfo cover FILE [-o OUT] [--index N] [--all]: the embedded pictures of
// a file, written out with the extension of their type.
#pragma once

#include <string>

namespace probe {

// out: the file to write (default: FILE's name with the picture's
// extension); with `all`, every picture, numbered. Every picture the file
// holds, or with `exact` the one the C interface's tags hold. 0, or 1 when
// the file has no such picture or it cannot be written.
int CoverCommand(const std::string& path, const std::string& out, int index, bool all, bool exact);

}  // namespace probe
