#pragma once

#include <pybind11/pybind11.h>

namespace ModelingPython {

// Each adds the functions and classes of one subject to the module.
void bindHandles(pybind11::module_& module);
void bindViews(pybind11::module_& module);
void bindProperties(pybind11::module_& module);
void bindPickling(pybind11::module_& module);

}
