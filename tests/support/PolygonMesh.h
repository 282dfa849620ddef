#pragma once

#include <TessaraMathSupport/Types.h>
#include <TessaraObject/Object.h>

#include <cstddef>
#include <vector>

namespace TestSupport {

using Tessara::Math::float3;

/// Moves every point by up to `amount` along each axis.
void addNoise(float amount, unsigned int seed, std::vector<float3>& points);

/// A mesh whose faces have any number of corners: `PolygonMesh::quads(100).build()`. As with `MeshBuilder`, every
/// compiler makes the same mesh to the bit.
struct PolygonMesh {
    std::vector<float3> points;
    std::vector<unsigned int> faceVertex;
    std::vector<unsigned int> faceOffset = {0};

    /// n² quads over an open square in the plane z = 0.
    static PolygonMesh quads(unsigned int segments);
    /// Polygons beside each other, each star-shaped around its middle with random radii: mostly concave. Each lies in a
    /// random plane and has points of its own.
    static PolygonMesh stars(std::size_t count, unsigned int minCorners, unsigned int maxCorners, unsigned int seed);

    PolygonMesh withNoise(float amount, unsigned int seed) &&;
    /// A further mesh, with points of its own.
    PolygonMesh joinedWith(PolygonMesh const& other) &&;

    std::size_t faceCount() const { return faceOffset.size() - 1; }
    /// A further face, with points of its own.
    void addPolygon(std::vector<float3> const& corners);

    Orvan::MutablePtr<Tessara::Object> build() const;
};

}
