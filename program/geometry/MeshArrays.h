#pragma once

#include "Vectors.h"

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <TessaraObject/Object.h>

#include <span>

namespace ModelingProgram {

/// A snapshot of the standard arrays of a mesh: as long as it shares them, edits of the mesh copy them first.
struct MeshArrays {
    Orvan::Ptr<Orvan::Array<float3>> positions;
    Orvan::Ptr<Orvan::Array<unsigned int>> faceVertex;
    Orvan::Ptr<Orvan::Array<unsigned int>> faceOffset;

    unsigned int pointCount() const { return static_cast<unsigned int>(positions->size); }
    unsigned int cornerCount() const { return static_cast<unsigned int>(faceVertex->size); }
    unsigned int faceCount() const { return static_cast<unsigned int>(faceOffset->size - 1); }
    std::span<unsigned int const> corners(unsigned int face) const;
    unsigned int faceOf(unsigned int corner) const;
    /// The corner after this one in its face.
    unsigned int nextCorner(unsigned int corner) const;
};

/// \pre  the mesh is valid
MeshArrays arraysOf(Tessara::Object const& mesh);

/// The vector area of a polygon times two: it points along the normal, and its length is twice the polygon's area.
inline double3 areaVector(std::span<unsigned int const> corners, float3 const* position)
{
    double3 area{0, 0, 0};
    for (std::size_t i = 2; i < corners.size(); ++i)
        area = area
            + cross(inDoubles(position[corners[i - 1]]) - inDoubles(position[corners[0]]),
                inDoubles(position[corners[i]]) - inDoubles(position[corners[0]]));
    return area;
}

}
