#pragma once

#include "ClosedFan.h"
#include "EdgeSides.h"

#include <array>
#include <cmath>
#include <cstdint>
#include <limits>
#include <numbers>

namespace ModelingProgram {

/// The normal of a face, accurate to a thousandth; 0 if the face has no area or its positions are not finite.
class CompactNormal {
public:
    static constexpr int kUnit = 8000;
    using Coordinates = std::int16_t __attribute__((vector_size(8))); // the last one is 0

    CompactNormal() = default;
    /// \param length  that of the vector
    CompactNormal(double3 const& vector, double length)
    {
        if (!(length > 0 && length < std::numeric_limits<double>::infinity()))
            return;
        double const scale = kUnit / length;
        auto const inUnits = [=](double coordinate) { return static_cast<std::int16_t>(coordinate * scale); };
        coordinates = Coordinates{inUnits(vector.x), inUnits(vector.y), inUnits(vector.z), 0};
    }

    Coordinates coordinates{};
};

/// Classifies edges by the angle between the area vectors of their faces. Faces without area have no normal, and their
/// edges are not sharp.
class Creases {
public:
    /// \param normals  one per face: they rule out most smooth edges quickly. May be null.
    Creases(MeshArrays const& mesh, EdgeSides const& edges, double degrees, CompactNormal const* normals = nullptr)
        : mesh_(mesh)
        , edges_(edges)
        , normals_(normals)
        , cosine_(std::cos(degrees * std::numbers::pi / 180))
    {
        double const chord = 2 * std::sin(degrees * std::numbers::pi / 360) - 0.001;
        smoothSpread_ = chord > 0 ? static_cast<int>(chord * chord * CompactNormal::kUnit * CompactNormal::kUnit) : 0;
    }

    /// Whether the normals at an edge with two sides differ by more than the angle.
    bool isSharp(std::span<Side const> sides) const
    {
        unsigned int const a = sides[0].corner, b = sides[1].corner;
        return isSharp(a, b, (*mesh_.faceVertex)[a] != (*mesh_.faceVertex)[b]);
    }

    /// The number of sharp edges from a point to higher points, with the faces at the point in a closed fan.
    unsigned int countHigherAt(ClosedFan const& fan) const
    {
        if (normals_ && squaredSpread(fan.corners()) < smoothSpread_)
            return 0;
        unsigned int count = 0;
        fan.forEachHigherEdge([&](unsigned int a, unsigned int b) { count += isSharp(a, b, true) ? 1u : 0u; });
        return count;
    }

    /// The same from a point of any other kind.
    unsigned int countHigherAt(unsigned int point) const
    {
        unsigned int count = 0;
        edges_.forEachEdge(point, std::size_t{point} + 1,
            [&](unsigned int, std::span<Side const> sides) { count += sides.size() == 2 && isSharp(sides) ? 1u : 0u; });
        return count;
    }

private:
    /// The square of an upper bound of the distances between the compact normals of the faces of some corners.
    int squaredSpread(std::span<unsigned int const> corners) const
    {
        CompactNormal::Coordinates lowest = normals_[edges_.faceOf(corners[0])].coordinates, highest = lowest;
        for (unsigned int const corner : corners) {
            CompactNormal::Coordinates const normal = normals_[edges_.faceOf(corner)].coordinates;
            lowest = lowest < normal ? lowest : normal;
            highest = highest > normal ? highest : normal;
        }
        CompactNormal::Coordinates const size = highest - lowest;
        return size[0] * size[0] + size[1] * size[1] + size[2] * size[2];
    }

    /// \param areOriented  whether the faces of these corners traverse the edge in opposite directions
    bool isSharp(unsigned int cornerOfA, unsigned int cornerOfB, bool areOriented) const
    {
        double3 const a = vectorOf(edges_.faceOf(cornerOfA)), b = vectorOf(edges_.faceOf(cornerOfB));
        double const product = areOriented ? dot(a, b) : -dot(a, b);
        double const lengths = std::sqrt(dot(a, a) * dot(b, b));
        return lengths > 0 && product < cosine_ * lengths;
    }

    double3 vectorOf(unsigned int face) const { return areaVector(mesh_.corners(face), mesh_.positions->data); }

    MeshArrays const& mesh_;
    EdgeSides const& edges_;
    CompactNormal const* normals_;
    double cosine_;
    int smoothSpread_; // a smaller spread has no sharp edge
};

}
