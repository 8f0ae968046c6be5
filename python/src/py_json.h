// The probe's JSON as Python objects: dicts keep the key order of the
// program's output, numbers keep their kind (int or float).
#pragma once

#include <pybind11/pybind11.h>

#include "probe_json.h"

namespace metainfo_py {

pybind11::object ToPython(const probe::Json& j);

}  // namespace metainfo_py
