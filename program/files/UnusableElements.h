#pragma once

#include "Vectors.h"

#include <OrvanCore/Array.h>
#include <TessaraObject/Object.h>

#include <string>
#include <vector>

namespace ModelingProgram {

/// The arrays of geometry as read from a file. A mesh has faces, a strand set has strands, a point cloud has neither.
struct RawGeometry {
    Orvan::Array<Tessara::Math::float3> positions;
    Orvan::Array<unsigned int> faceVertex;
    Orvan::Array<unsigned int> faceOffset{0u};
    Orvan::Array<unsigned int> strandOffset; // empty unless there are strands
};

/// Elements that no operation can handle and that a lenient reader leaves out: points that are NaN or infinite, faces
/// and strands at them, and faces with fewer than three corners. The points of such a strand are left out with it.
struct UnusableElements {
    explicit UnusableElements(RawGeometry const& geometry);

    /// Deletes them, with their values in all properties, from an object with this geometry: a mesh if faces remain, a
    /// strand set if there are strands, otherwise a point cloud.
    void deleteFrom(RawGeometry const& geometry, Tessara::Object& object) const;

    /// One sentence per kind of elements left out.
    std::vector<std::string> describe() const;

    bool anyPointRemains() const;
    bool anyFaceRemains() const;

    Orvan::Array<bool> points; // one entry per element; true if it is left out
    Orvan::Array<bool> faces;
    Orvan::Array<bool> strands;
    std::uint64_t notFinitePoints = 0;
    std::uint64_t shortFaces = 0;
    std::uint64_t cellsAtSuchPoints = 0; // faces of three corners or more, or strands
};

}
