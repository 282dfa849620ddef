#pragma once

#include "files/Writers.h"

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace ModelingProgram {

using Indices = Orvan::Array<unsigned int>;

/// What a page shows of a geometry: all of it, or a part that is small enough to be drawn smoothly.
struct DrawnGeometry {
    WritableGeometry all;

    // Which elements are drawn, by their numbers. Nullopt means all of them.
    std::optional<Indices> points;
    std::optional<Indices> corners;
    std::optional<Indices> cells; // faces or strands

    // What is drawn, by numbers of drawn elements. Nullopt means as in `all`.
    std::optional<Indices> cornerPoints;
    std::optional<Indices> offsets; // of strands

    /// Three corners per triangle; nullopt if all faces are triangles.
    std::optional<Indices> triangles;

    // Two points per edge.
    Indices boundaryEdges;
    Indices nonManifoldEdges;

    std::vector<std::string> notes; // what is not drawn, one sentence each
};

/// \param mostElements  the most faces, points of strands, or points of a cloud to draw. Larger meshes are drawn without
///                      the faces that are too small to see: nearby points become one of them, on a grid
/// \param findsEdges    whether there are boundary or non-manifold edges to look for
DrawnGeometry chooseDrawn(Tessara::Object const& object, std::uint64_t mostElements, bool findsEdges);

}
