#pragma once

#include "PolygonMesh.h"

#include <array>

namespace TestSupport {

/// Triangle meshes in one line: `MeshBuilder::sphere(16).withNeedles(7).build()`. Positions are computed by exact
/// arithmetic and square roots only, so that every compiler makes the same mesh to the bit.
class MeshBuilder {
public:
    using Triangle = std::array<unsigned int, 3>;

    static MeshBuilder tetrahedron();
    /// A sphere of radius 1 from an octahedron with n segments per edge: 8 n² faces, 4 n² + 2 points.
    static MeshBuilder sphere(unsigned int segments);
    static MeshBuilder sphereWithFaces(std::size_t atLeast);
    static MeshBuilder icosahedron();
    /// A closed surface of genus 1 with 2 · rings · sides faces.
    static MeshBuilder torus(unsigned int rings, unsigned int sides);
    /// Two points of valence `rim` above and below a rim of that many points.
    static MeshBuilder bipyramid(unsigned int rim);
    /// An almost flat bipyramid with radii that repeat along the rim: by default half of the spokes are short.
    static MeshBuilder wheel(unsigned int rim, std::vector<float> const& radii = {0.02f, 1});
    static MeshBuilder of(std::vector<float3> points, std::vector<Triangle> faces)
    {
        return {std::move(points), std::move(faces)};
    }

    /// Cuts edges close to one end, spread over the mesh: each cut adds two needles and one point.
    MeshBuilder withNeedles(std::size_t cuts, float fraction = 0.01f) &&;
    /// Moves every point by up to `amount` along each axis.
    MeshBuilder withNoise(float amount, unsigned int seed) &&;
    /// Inverts a unit sphere about a point close to its lower side, where faces become about ten times as large.
    MeshBuilder graded() &&;
    /// Renumbers points and faces at random.
    MeshBuilder shuffled(unsigned int seed) &&;
    MeshBuilder withoutFace(std::size_t face) &&;
    /// Adds a second mesh, moved by `offset`.
    MeshBuilder joinedWith(MeshBuilder const& other, float3 offset) &&;

    PolygonMesh polygons() const;
    Orvan::MutablePtr<Tessara::Object> build() const { return polygons().build(); }

    std::vector<float3> points;
    std::vector<Triangle> faces;
};

}
