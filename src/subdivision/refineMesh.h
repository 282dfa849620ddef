#pragma once

#include <OrvanCore/Array.h>
#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

#include <functional>

namespace Geometry::Mesh::Internal {

/// A mesh as it is refined. Faces are triangles, though their corners are found by offsets.
struct MarkableMesh {
    unsigned int faceCount;
    Orvan::Array<Tessara::Math::float3> const& positions; // at present: what is measured
    Orvan::Array<unsigned int> const& faceVertex;
    Orvan::Array<unsigned int> const& faceOffset;
};

/// Sets the marks of the faces that are to split, and clears none. Called once a pass, on the calling thread.
using MarkFaces = std::function<void(MarkableMesh const& mesh, Orvan::Array<bool>& marks)>;

/// What all ways of subdividing have in common: passes until one changes no face, as include/Modeling/subdivide.h
/// tells.
bool refineMesh(MarkFaces const& markFaces, Tessara::Object& object);

}
