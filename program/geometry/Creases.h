#pragma once

#include "CompactNormal.h"
#include "MeshArrays.h"

#include <cmath>
#include <numbers>

namespace ModelingProgram {

/// Classifies edges by the angle between the area vectors of their faces. Faces without area have no normal, and their
/// edges are not sharp.
class Creases {
public:
    Creases(MeshArrays const& mesh, double degrees)
        : mesh_(mesh)
        , cosine_(std::cos(degrees * std::numbers::pi / 180))
    {
    }

    /// Whether the normals of two faces at an edge differ by more than the angle.
    /// \param areOriented  whether the faces traverse the edge in opposite directions
    bool isSharp(unsigned int face, unsigned int otherFace, bool areOriented) const
    {
        double3 const a = vectorOf(face), b = vectorOf(otherFace);
        double const product = areOriented ? dot(a, b) : -dot(a, b);
        double const lengths = std::sqrt(dot(a, a) * dot(b, b));
        return lengths > 0 && product < cosine_ * lengths;
    }

private:
    double3 vectorOf(unsigned int face) const { return areaVector(mesh_.corners(face), mesh_.positions->data); }

    MeshArrays const& mesh_;
    double cosine_;
};

/// Creases, and normals that rule most of them out quickly.
struct CreasesWithNormals {
    Creases creases;
    CompactNormal const* normals; // one per face
    int smoothSpread; // faces whose compact normals differ by less have no crease between them
};

}
