#pragma once

#include <OrvanCore/Array.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

#include <functional>

namespace Geometry::Mesh::Internal {

/// A mesh between two passes. Faces are triangles, but their corners are addressed through offsets.
struct MarkableMesh {
    unsigned int faceCount;
    Orvan::Array<Tessara::Math::float3> const& positions; // of the smoothed mesh, which is what is measured
    Orvan::Array<unsigned int> const& faceVertex;
    Orvan::Array<unsigned int> const& faceOffset;
};

/// Sets the marks of the faces that should split, and clears none. Called once per pass, on the calling thread.
using MarkFaces = std::function<void(MarkableMesh const& mesh, Orvan::Array<bool>& marks)>;

/// Runs passes until the number of faces no longer changes; include/Modeling/subdivide.h describes inputs, outputs and
/// failures.
bool refineMesh(MarkFaces const& markFaces, Tessara::Object& object);

}
