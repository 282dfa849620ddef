#pragma once

#include "MeshArrays.h"

#include <algorithm>

namespace ModelingProgram {

/// How many faces of a refined mesh `mark(mesh, marks)`, the marking of a pass, would ask to split once more. On closed
/// manifolds these are the faces that refinement has left at its limit of 31 steps.
template <class Mark> std::uint64_t countLargeFaces(Tessara::Object const& refined, Mark const& mark)
{
    MeshArrays const mesh = arraysOf(refined);
    Orvan::Array<bool> marks(mesh.faceCount());
    mark(mesh, marks);
    return static_cast<std::uint64_t>(std::count(marks.begin(), marks.end(), true));
}

}
