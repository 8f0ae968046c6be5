// How the library's failures reach Python: the system's own exceptions for
// what the file system refuses (FileNotFoundError, IsADirectoryError,
// PermissionError), metainfo.Error for what the bytes are not.
#pragma once

#include <pybind11/pybind11.h>

#include <stdexcept>
#include <string>

namespace metainfo_py {

// metainfo.Error: a file that is not media, or is damaged; what() is the reason.
class Error : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
};

// Raises for a path the probe refused with `reason`: an OSError of the
// path's errno when the file system refuses it, else Error(reason).
[[noreturn]] void RaiseProblem(const std::string& path, const std::string& reason, const pybind11::handle& name);

// Raises for a result of the accurate interface other than MI_OK about path:
// an OSError when the file system refuses the path (some calls answer a
// missing file as not media), else by the result.
[[noreturn]] void RaiseResult(int result, const std::string& path, const pybind11::handle& name);

}  // namespace metainfo_py
