#pragma once

#include "geometry/Geometry.h"

#include <pybind11/pybind11.h>

#include <string>
#include <vector>

namespace ModelingPython {

namespace py = pybind11;

/// Text of the program as a Python string. Names in files may contain bytes that are not UTF-8; they are kept as
/// surrogates, as Python does for names of files.
py::str textOf(std::string const& text);

/// Throws the Python exception `Refusal` with this sentence. The reasons follow, one per line.
[[noreturn]] void refuse(std::string const& sentence, std::vector<std::string> const& reasons = {});

/// Throws the Python exception `InvalidGeometry`.
[[noreturn]] void refuseInvalid(std::string const& sentence);

/// Issues a `GeometryWarning`, which becomes an exception if the user has asked for that.
void warn(std::string const& sentence);

}
