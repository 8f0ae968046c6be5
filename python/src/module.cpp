// metainfo._core: the library to Python. probe() gives the keys and values of
// `metainfo probe --json` from the program's own code; the probing itself
// runs without the GIL, so threads probe in parallel.
#include <pybind11/pybind11.h>
#include <pybind11/stl.h>

#include <cmath>
#include <string>
#include <vector>

#include "errors.h"
#include "metainfo/probe.h"
#include "metainfo/version.h"
#include "probe_command.h"
#include "probe_json.h"
#include "py_json.h"

namespace py = pybind11;

namespace metainfo_py {
namespace {

// A path as the file system's bytes: str (surrogate escapes included),
// bytes or os.PathLike.
std::string FsPath(const py::object& path) {
    const py::bytes raw = py::module_::import("os").attr("fsencode")(path);
    return std::string(raw);
}

probe::Json ProbeJson(const py::object& path, bool strict) {
    const std::string name = FsPath(path);
    probe::Json j;
    std::string problem;
    {
        py::gil_scoped_release unlocked;
        probe::Report r;
        probe::Probe(name, &r);
        j = probe::ReportJson(r);
        problem = r.problem;
    }
    if (strict && !problem.empty()) RaiseProblem(name, problem, path);
    return j;
}

py::object Probe(const py::object& path, bool strict) { return ToPython(ProbeJson(path, strict)); }

py::object Exact(const py::object& path) { return ToPython(ProbeJson(path, true)["exact"]); }

int64_t Milliseconds(double seconds) {
    if (!std::isfinite(seconds)) throw py::value_error("a time must be a finite number of seconds");
    return static_cast<int64_t>(std::llround(seconds * 1000.0));
}

void Cut(const py::object& src, const py::object& dst, double start, double end) {
    const std::string from = FsPath(src);
    const std::string to = FsPath(dst);
    const int64_t startMs = Milliseconds(start);
    const int64_t endMs = Milliseconds(end);
    int result;
    {
        py::gil_scoped_release unlocked;
        result = mi_cut(from.c_str(), startMs, endMs, to.c_str());
    }
    if (result != MI_OK) RaiseResult(result, from, src);
}

py::bytes Cover(const py::object& path, size_t index) {
    const std::string name = FsPath(path);
    int result;
    size_t count = 0;
    std::vector<char> data;
    {
        py::gil_scoped_release unlocked;
        mi_info* info = nullptr;
        result = mi_probe(name.c_str(), &info);
        if (result == MI_OK) {
            count = info->picture_count;
            size_t size = 0;
            if (index < count) {
                result = mi_picture_copy(name.c_str(), info, index, nullptr, 0, &size);
                if (result == MI_E_BUFFER) {
                    data.resize(size);
                    result = mi_picture_copy(name.c_str(), info, index, data.data(), data.size(), &size);
                }
            }
            mi_info_free(info);
        }
    }
    if (result != MI_OK) RaiseResult(result, name, path);
    if (index >= count) {
        throw py::index_error("picture " + std::to_string(index) + " of a file with " + std::to_string(count));
    }
    return py::bytes(data.data(), data.size());
}

}  // namespace
}  // namespace metainfo_py

PYBIND11_MODULE(_core, m) {
    using namespace metainfo_py;
    m.doc() = "libmetainfo: what a media file holds, without decoding it";
    py::register_exception<Error>(m, "Error", PyExc_Exception);
    m.attr("__version__") = MM_Version();
    m.def("probe", &Probe, py::arg("path"), py::kw_only(), py::arg("strict") = true,
          "The keys of `metainfo probe --json` as a dict. strict=False reports a file that cannot be probed in its "
          "'error' key instead of raising.");
    m.def("exact", &Exact, py::arg("path"), "The C interface's answers (the 'exact' key of probe).");
    m.def("cut", &Cut, py::arg("src"), py::arg("dst"), py::arg("start"), py::arg("end"),
          "Copies the audio between start and end (seconds) into dst, in src's format.");
    m.def("cover", &Cover, py::arg("path"), py::arg("index") = 0, "The bytes of embedded picture `index`.");
    m.def("columns", &probe::CsvColumns, "The columns of `metainfo probe --csv`, flattened keys.");
}
