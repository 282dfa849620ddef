#pragma once

#include "Random.h"

#include <TessaraObject/Object.h>

#include <cstddef>
#include <vector>

namespace TestSupport {

using Tessara::Math::float3;

/// Moves every point by up to `amount` along each axis.
void addNoise(float amount, unsigned int seed, std::vector<float3>& points);

struct OnSquare {
    float x, y;
};

/// A place on the square from (-1, -1) to (1, 1): that fraction of the way around, which takes no sines.
OnSquare aroundSquare(unsigned int step, unsigned int stepCount);

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

    /// Faces with so many corners each, over random points: which may be twice in a face, or in none.
    static PolygonMesh soup(std::size_t pointCount, std::size_t faceCount, unsigned int minCorners,
        unsigned int maxCorners, Random& random);

    PolygonMesh withNoise(float amount, unsigned int seed) &&;
    /// A further mesh, with points of its own.
    PolygonMesh joinedWith(PolygonMesh const& other) &&;

    std::size_t faceCount() const { return faceOffset.size() - 1; }
    /// A further face, with points of its own.
    void addPolygon(std::vector<float3> const& corners);

    Orvan::MutablePtr<Tessara::Object> build() const;
};

}
