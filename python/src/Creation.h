#pragma once

#include <pybind11/pybind11.h>

#include <memory>
#include <string>
#include <utility>

namespace ModelingPython {

namespace py = pybind11;

/// To pickle an instance with an old protocol, Python calls the base class of pybind11, which ends the process.
template <class T> void refusePickling(py::class_<T>& type)
{
    type.def("__reduce_ex__", [](py::args const& arguments) -> py::object {
        throw py::type_error("cannot pickle " + std::string(py::repr(py::type::of(arguments[0]))));
    });
}

/// Defines `__new__` and `__init__`, so that there are no instances without a value: pybind11 lets methods of those read
/// uninitialized memory. `make` returns the value or a unique pointer to it. Instances are of this very class. The extra
/// arguments name those of `make`, if users see the class.
template <class T, class Result, class... Arguments, class... Extra>
void defineCreation(py::class_<T>& type, Result (*make)(Arguments...), Extra const&... extra)
{
    refusePickling(type);
    type.def(py::init(make), extra...); // for the signature: it does nothing to an instance that has its value
    auto const create = [plain = type.ptr(), make](py::handle requested, Arguments... arguments) {
        if (requested.ptr() != plain)
            throw py::type_error("this class cannot be derived");
        return py::cast(make(std::forward<Arguments>(arguments)...));
    };
    if constexpr (sizeof...(extra) == 0)
        type.attr("__new__") = py::staticmethod(py::cpp_function(create, py::name("__new__")));
    else
        type.attr("__new__") =
            py::staticmethod(py::cpp_function(create, py::name("__new__"), py::arg("cls"), extra...));
}

/// For classes whose instances are made by functions only.
template <class T> void refuseCreation(py::class_<T>& type)
{
    refusePickling(type);
    type.attr("__new__") = py::staticmethod(py::cpp_function(
        [](py::args const&, py::kwargs const&) -> py::object { throw py::type_error("this class has no constructor"); },
        py::name("__new__")));
}

}
