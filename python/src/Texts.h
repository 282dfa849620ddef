#pragma once

#include <pybind11/pybind11.h>

#include <string>
#include <string_view>

namespace ModelingPython {

namespace py = pybind11;

// Names and strings of the host may hold any bytes. In Python those that are not UTF-8 are surrogates, as in the names
// of files.

py::str toPython(std::string_view text);
/// \throws py::type_error   for objects other than `str`, py::error_already_set for surrogates that stand for no byte
std::string toText(py::handle text);

/// Throws a Python exception with this sentence.
[[noreturn]] void raise(py::handle exceptionClass, std::string const& sentence);
[[noreturn]] void raiseValueError(std::string const& sentence);
[[noreturn]] void raiseTypeError(std::string const& sentence);
[[noreturn]] void raiseKeyError(std::string const& sentence);
/// Throws `modeling.InvalidGeometry`, which is a `ValueError`.
[[noreturn]] void raiseInvalidGeometry(std::string const& sentence);

/// Names separated by commas, or "none".
template <class Names> std::string listed(Names const& names)
{
    std::string result;
    for (auto const& name : names)
        result += (result.empty() ? "" : ", ") + std::string(name);
    return result.empty() ? "none" : result;
}

}
