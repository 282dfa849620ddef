#include "Bindings.h"

PYBIND11_MODULE(_modeling, module)
{
    using namespace ModelingPython;
    module.doc() = "The part of the package `modeling` that is written in C++.";
    module.attr("__version__") = MODELING_VERSION;
    bindErrors(module);
    bindHandles(module);
    bindViews(module);
    bindProperties(module);
    bindPickling(module);
    bindFiles(module);
    bindInspection(module);
    bindEditing(module);
    bindMerging(module);
    bindGuide(module);
    bindSurfaces(module);
    bindHalfEdges(module);
    bindStitch(module);
    bindThreads(module);
    bindRecipes(module);
}
