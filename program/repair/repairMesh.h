#pragma once

#include "fillHoles.h"

#include <TessaraObject/Object.h>

#include <cstddef>
#include <limits>
#include <string>
#include <vector>

namespace ModelingProgram {

/// The steps of a repair, in the order in which they are run.
struct RepairSteps {
    bool weld = true; // merge points (`weldPoints.h`)
    bool degenerate = true; // drop faces without three points (`dropFaces.h`)
    bool doubled = true; // drop copies of faces (`dropFaces.h`, `orientFaces.h`)
    bool orient = true; // orient neighboring faces alike, and closed sheets outward (`orientFaces.h`)
    bool fill = true; // fill holes (`fillHoles.h`)
    bool split =
        true; // separate sheets that share points only, and cut edges with more than two sides (`splitPoints.h`)
    bool unused = true; // drop points that no face uses
};

struct RepairOptions {
    RepairSteps steps;
    double weldDistance = 0;
    std::size_t mostHoleEdges = std::numeric_limits<std::size_t>::max();
};

/// What a repair did.
struct RepairCounts {
    unsigned int weldedPoints = 0;
    std::vector<std::string> lossyProperties; // of points that were merged and had different values
    unsigned int degenerateFaces = 0; // dropped
    unsigned int shortenedFaces = 0; // faces that lost repeated corners
    unsigned int doubledFaces = 0; // dropped
    unsigned int flippedFaces = 0;
    unsigned int conflictingEdges = 0; // where the surface is not orientable; split cuts them
    FilledHoles holes;
    double filledArea = 0;
    unsigned int splitPoints = 0; // added
    unsigned int unusedPoints = 0; // dropped
};

/// Makes a mesh closed and manifold, with all of its properties. Points keep their positions, and elements their order;
/// new ones come last. Each new element gets the properties of an old one: a point those of the point that it was split
/// from, the triangles that fill holes those of the faces around them (`fillHoles.h`), and a point to which others were
/// merged keeps its own.
///
/// Before sheets have points of their own, only the adjacency of faces says which ones belong together. Therefore holes
/// that touch at a point are filled one by one, and the surface there is manifold afterwards; and sheets of different
/// orientation are split only where they are not orientable.
///
/// Data of elements that is shorter than their component remains as it is and no longer fits. The result does not
/// depend on the number of threads. O(n log n), except for holes with very many edges (`fillHoles.h`) and very
/// many closed sheets that are oriented inward (`orientFaces.h`).
/// \param mesh  any valid mesh
RepairCounts repairMesh(RepairOptions const& options, Tessara::Object& mesh);

}
