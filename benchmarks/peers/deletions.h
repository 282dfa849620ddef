#pragma once

#include <OrvanCore/Array.h>
#include <TessaraMathSupport/Types.h>

#include <functional>

namespace Benchmarks {

/// How a peer deletes. `prepare` is called before each run, and not timed; `run` keeps its result until then.
struct PeerDeletion {
    std::function<void()> prepare;
    std::function<void()> run;
    std::function<std::size_t()> remaining;
};

// Half of the points of a cloud with 32 bytes of attributes (PCL: a point of 48 bytes, as its vectors are padded).
PeerDeletion pclDeletion(std::size_t pointCount, Orvan::Array<unsigned int> const& indices);
PeerDeletion vtkPointDeletion(std::size_t pointCount, Orvan::Array<unsigned int> const& indices);

/// Triangles with a normal per point, texture coordinates per corner (omitted by VTK, which has no corner attributes) and a
/// number per face.
struct PeerMesh {
    Orvan::Array<Tessara::Math::float3> const& positions;
    Orvan::Array<unsigned int> const& faceVertex;
    Orvan::Array<bool> const& deleted;
};

PeerDeletion cgalFaceDeletion(PeerMesh const& mesh);
PeerDeletion vtkFaceDeletion(PeerMesh const& mesh);

}
