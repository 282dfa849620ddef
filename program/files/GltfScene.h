#pragma once

#include "GltfDocument.h"

namespace ModelingProgram {

/// An affine transform, in double precision.
struct GltfTransform {
    double linear[3][3] = {{1, 0, 0}, {0, 1, 0}, {0, 0, 1}};
    double translation[3] = {0, 0, 0};

    bool isIdentity() const { return *this == GltfTransform{}; }
    bool operator==(GltfTransform const&) const = default;
    double determinant() const;
    /// Applies `first`, then this.
    GltfTransform after(GltfTransform const& first) const;
    /// Transforms directions that are perpendicular to surfaces, up to a positive factor: the transpose of the inverse,
    /// times the absolute value of the determinant.
    GltfTransform forNormals() const;
    Tessara::Math::double3 apply(Tessara::Math::double3 const& p) const;
};

/// A mesh of the file, at one place in the scene.
struct GltfInstance {
    std::uint64_t mesh;
    GltfTransform transform;
};

/// The meshes in the scene that is displayed by default, or else in the first scene, or else below all root nodes, in
/// depth-first order. A file without nodes has each of its meshes once.
/// \throws FileError  also if a node can be reached in two ways
std::vector<GltfInstance> collectInstances(GltfDocument& document);

}
