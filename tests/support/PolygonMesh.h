#pragma once

#include "Random.h"

#include <TessaraObject/Object.h>

#include <cstddef>
#include <vector>

namespace TestSupport {

using Tessara::Math::float3;

/// A mesh whose faces have any number of corners: `PolygonMesh::quads(100).build()`. As with `MeshBuilder`, every
/// compiler makes the same mesh to the bit.
struct PolygonMesh {
    std::vector<float3> points;
    std::vector<unsigned int> faceVertex;
    std::vector<unsigned int> faceOffset = {0};

    /// n² quads over an open square in the plane z = 0.
    static PolygonMesh quads(unsigned int segments);
    /// Polygons side by side, each star-shaped with random radii and so mostly concave. Each is in a random plane; none
    /// share points.
    static PolygonMesh stars(std::size_t count, unsigned int minCorners, unsigned int maxCorners, unsigned int seed);

    /// Faces over random points, which may be used twice by a face or by no face.
    static PolygonMesh soup(std::size_t pointCount, std::size_t faceCount, unsigned int minCorners,
        unsigned int maxCorners, Random& random);

    PolygonMesh withNoise(float amount, unsigned int seed) &&;
    /// Adds a mesh that shares no points.
    PolygonMesh joinedWith(PolygonMesh const& other) &&;

    std::size_t faceCount() const { return faceOffset.size() - 1; }
    std::size_t triangleCount() const { return faceVertex.size() - 2 * faceCount(); }
    /// Adds a face that shares no points.
    void addPolygon(std::vector<float3> const& corners);

    Orvan::MutablePtr<Tessara::Object> build() const;
};

}
