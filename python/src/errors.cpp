#include "errors.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "file_problem.h"
#include "metainfo/probe.h"

namespace metainfo_py {
namespace py = pybind11;

namespace {

// The errno the file system gives for the path, or 0 when it opens.
int OpenErrno(const std::string& path) {
    struct stat st;
    if (::stat(path.c_str(), &st) != 0) return errno;
    if (S_ISDIR(st.st_mode)) return EISDIR;
    const int fd = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (fd < 0) return errno;
    ::close(fd);
    return 0;
}

// OSError(errno, reason, name) becomes the subclass of the errno.
[[noreturn]] void RaiseOs(int error, const std::string& reason, const py::handle& name) {
    PyObject* args = Py_BuildValue("(isO)", error, reason.c_str(), name.ptr());
    if (args == nullptr) throw py::error_already_set();
    PyErr_SetObject(PyExc_OSError, args);
    Py_DECREF(args);
    throw py::error_already_set();
}

}  // namespace

void RaiseProblem(const std::string& path, const std::string& reason, const py::handle& name) {
    const int error = OpenErrno(path);
    if (error != 0) RaiseOs(error, reason, name);
    throw Error(reason);
}

void RaiseResult(int result, const std::string& path, const py::handle& name) {
    const int error = OpenErrno(path);
    if (error != 0) RaiseOs(error, probe::FileProblem(path), name);
    const std::string text = mi_result_text(result);
    switch (result) {
        case MI_E_NOT_FOUND: RaiseOs(ENOENT, text, name);
        case MI_E_ACCESS: RaiseOs(EACCES, text, name);
        case MI_E_IS_DIRECTORY: RaiseOs(EISDIR, text, name);
        case MI_E_ARGUMENT: throw py::value_error(text);
        case MI_E_NO_MEMORY: throw std::bad_alloc();
        default: throw Error(text);
    }
}

}  // namespace metainfo_py
