#pragma once

#include "GeoProperties.h"
#include "IndexArray.h"

#include <TessaraMathSupport/Types.h>

namespace Modeling {

/// The faces of a mesh in flat arrays. A view: the arrays must outlive it, and loop bodies capture it by value.
struct FaceView {
    unsigned int const* faceVertex; // the point of each corner
    OffsetView offsets; // of the corners of each face
    unsigned int count;

    unsigned int const* corners(std::size_t face) const { return faceVertex + offsets.begin(face); }
    unsigned int size(std::size_t face) const { return offsets.size(face); }
};

/// The standard arrays of a mesh and the element counts of its components. Arrays that were read from an object are
/// shared with it, so that `makeMutable` would copy them: operations read from them and write to new arrays.
struct MeshArrays {
    Orvan::Ptr<Orvan::Array<Tessara::Math::float3>> positions; // one per point
    Orvan::Ptr<IndexArray> faceVertex; // the point of each corner
    Orvan::Ptr<IndexArray> faceOffset; // the first corner of each face, and the end of the last one
    unsigned int pointCount = 0;
    unsigned int cornerCount = 0;
    unsigned int faceCount = 0;

    bool isComplete() const { return positions && faceVertex && faceOffset; }

    /// \pre  `faceVertex` and `faceOffset` are not null.
    FaceView faces() const { return {faceVertex->data, *faceOffset, faceCount}; }
};

/// Reads without copying the arrays. Each array is null if the object has none of that name and type. Neither lengths
/// nor offsets are checked.
MeshArrays readMeshArrays(Tessara::Object const& object);

/// Adds the arrays and the counts of their components to the changes. A null array is left out together with its count.
void writeMeshArrays(MeshArrays&& mesh, PreparedWrites& writes);

}
