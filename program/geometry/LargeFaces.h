#pragma once

#include "MeshArrays.h"

#include <algorithm>

namespace ModelingProgram {

/// The number of faces of a refined mesh that `mark(mesh, marks)`, the marking step of a pass, would still mark for
/// splitting. On closed manifolds these are the faces at the limit of 31 steps.
template <class Mark> std::uint64_t countLargeFaces(Tessara::Object const& refined, Mark const& mark)
{
    MeshArrays const mesh = arraysOf(refined);
    Orvan::Array<bool> marks(mesh.faceCount());
    mark(mesh, marks);
    return static_cast<std::uint64_t>(std::count(marks.begin(), marks.end(), true));
}

}
