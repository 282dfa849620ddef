#pragma once

#include <pybind11/pybind11.h>

namespace ModelingPython {

// Each adds the functions and classes of one subject to the module.
void bindHandles(pybind11::module_& module);
void bindViews(pybind11::module_& module);
void bindProperties(pybind11::module_& module);
void bindPickling(pybind11::module_& module);
void bindErrors(pybind11::module_& module);
void bindFiles(pybind11::module_& module);
void bindInspection(pybind11::module_& module);
void bindEditing(pybind11::module_& module);
void bindMerging(pybind11::module_& module);
void bindSurfaces(pybind11::module_& module);
void bindHalfEdges(pybind11::module_& module);
void bindGuide(pybind11::module_& module);
void bindStitch(pybind11::module_& module);
void bindThreads(pybind11::module_& module);
void bindRecipes(pybind11::module_& module); // what `modeling run --recipe` does, without its terminal and signals

}
