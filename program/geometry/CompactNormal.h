#pragma once

#include "Vectors.h"

#include <cmath>
#include <cstdint>
#include <limits>
#include <numbers>

namespace ModelingProgram {

/// The normal of a face in four bytes, accurate to a hundredth; 0 if the face has no area or its positions are not
/// finite. Enough to rule out that faces differ by a large angle.
struct CompactNormal {
    static constexpr int kUnit = 120;
    static constexpr int kZero = 128; // what stands for 0, so that coordinates can be compared as unsigned bytes

    /// \param length  that of the vector
    static CompactNormal of(double3 const& vector, double length)
    {
        double const scale = kUnit / length;
        bool const isFinite = (length > 0) & (length < std::numeric_limits<double>::infinity());
        // Without branches, so that a loop compiles to SIMD instructions.
        auto const inUnits = [=](double coordinate) {
            return static_cast<std::uint32_t>(kZero + static_cast<int>(isFinite ? coordinate * scale : 0));
        };
        return {inUnits(vector.x) | inUnits(vector.y) << 8 | inUnits(vector.z) << 16};
    }

    /// The square of the distance between normals, in units, below which their angle is smaller than this one.
    static int squaredSpreadBelow(double degrees)
    {
        // Both normals are off by up to 1 in each coordinate.
        double const chord = 2 * std::sin(degrees * std::numbers::pi / 360) * kUnit - 4;
        return chord > 0 ? static_cast<int>(chord * chord) : 0;
    }

    std::uint32_t coordinates; // one byte each
};

}
