#pragma once

#include <pybind11/pybind11.h>

namespace ModelingPython {

/// Adds `check_recipe` and `run_recipe`, which do what `modeling run --recipe` does, without its terminal and signals.
void bindRecipes(pybind11::module_& module);

}
