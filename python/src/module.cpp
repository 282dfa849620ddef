#include "recipes.h"

#include <pybind11/pybind11.h>

PYBIND11_MODULE(_modeling, module)
{
    module.doc() = "The part of the package `modeling` that is written in C++.";
    module.attr("__version__") = MODELING_VERSION;
    ModelingPython::bindRecipes(module);
}
