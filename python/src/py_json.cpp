#include "py_json.h"

namespace metainfo_py {
namespace py = pybind11;

namespace {

// Texts are decoded as the program writes them: a byte that is not UTF-8
// becomes U+FFFD.
py::str Text(const std::string& s) {
    PyObject* o = PyUnicode_DecodeUTF8(s.data(), static_cast<Py_ssize_t>(s.size()), "replace");
    if (o == nullptr) throw py::error_already_set();
    return py::reinterpret_steal<py::str>(o);
}

}  // namespace

py::object ToPython(const probe::Json& j) {
    switch (j.type()) {
        case probe::Json::value_t::null: return py::none();
        case probe::Json::value_t::boolean: return py::bool_(j.get<bool>());
        case probe::Json::value_t::number_integer: return py::int_(j.get<int64_t>());
        case probe::Json::value_t::number_unsigned: return py::int_(j.get<uint64_t>());
        case probe::Json::value_t::number_float: return py::float_(j.get<double>());
        case probe::Json::value_t::string: return Text(j.get_ref<const std::string&>());
        case probe::Json::value_t::array: {
            py::list list;
            for (const auto& v : j) list.append(ToPython(v));
            return std::move(list);
        }
        case probe::Json::value_t::object: {
            py::dict dict;
            for (const auto& item : j.items()) dict[Text(item.key())] = ToPython(item.value());
            return std::move(dict);
        }
        default: return py::none();  // binary and discarded values never occur in a report
    }
}

}  // namespace metainfo_py
