#pragma once

#include "Vectors.h"

#include <OrvanCore/Array.h>
#include <TessaraObject/Object.h>

#include <string>
#include <vector>

namespace ModelingProgram {

/// The arrays of geometry as a file holds them. A mesh has faces, a strand set strands, a point cloud neither.
struct RawGeometry {
    Orvan::Array<Tessara::Math::float3> positions;
    Orvan::Array<unsigned int> faceVertex;
    Orvan::Array<unsigned int> faceOffset{0u};
    Orvan::Array<unsigned int> strandOffset; // empty unless there are strands
};

/// What no operation can work on and a lenient reader leaves out: points that are NaN or infinite, faces and strands at
/// them, and faces with fewer than three corners. Points of such a strand are its own, and are left out with it.
struct UnusableElements {
    explicit UnusableElements(RawGeometry const& geometry);

    /// Deletes them from an object that holds this geometry as a mesh if faces remain, as a strand set if there are
    /// strands, and as a point cloud otherwise, with their values in all properties.
    void deleteFrom(RawGeometry const& geometry, Tessara::Object& object) const;

    /// A sentence for each kind of elements left out.
    std::vector<std::string> describe() const;

    bool remainsAnyPoint() const;
    bool remainsAnyFace() const;

    Orvan::Array<bool> points; // an entry per element; true means that it is left out
    Orvan::Array<bool> faces;
    Orvan::Array<bool> strands;
    std::uint64_t notFinitePoints = 0;
    std::uint64_t shortFaces = 0;
    std::uint64_t cellsAtSuchPoints = 0; // faces of three corners or more, or strands
};

}
