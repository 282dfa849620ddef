#pragma once

#include "frame/Lanes.h"

#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <limits>
#include <numbers>

namespace ModelingProgram {

/// The normal of a face in four bytes, accurate to a hundredth; 0 if the face has no area or its positions are not
/// finite. Enough to rule out that faces differ by a large angle.
struct CompactNormal {
    static constexpr int kUnit = 120;
    static constexpr int kZero = 128; // what stands for 0, so that coordinates can be compared as unsigned bytes

    /// How many normals are computed at a time.
    static constexpr std::size_t kLanes = 4;

    /// Sets the normals of four faces from vectors along them, of which x, y, z and the lengths are in arrays of their own.
    static void set(double const* x, double const* y, double const* z, double const* length, CompactNormal* normals)
    {
        using Doubles = double __attribute__((vector_size(kLanes * sizeof(double))));
        using Bits = std::int64_t __attribute__((vector_size(kLanes * sizeof(double))));
        Doubles lengths;
        std::memcpy(&lengths, length, sizeof(lengths));
        Doubles const scales = double{kUnit} / lengths;
        Bits const areFinite = (lengths > 0.0) & (lengths < std::numeric_limits<double>::infinity());
        auto const inUnits = [&](double const* coordinate) {
            Doubles values;
            std::memcpy(&values, coordinate, sizeof(values));
            values = reinterpret_cast<Doubles>(areFinite & reinterpret_cast<Bits>(values * scales));
            return __builtin_convertvector(values, Modeling::IntLanes) + kZero;
        };
        Modeling::IntLanes const bytes = inUnits(x) | inUnits(y) << 8 | inUnits(z) << 16;
        std::memcpy(static_cast<void*>(normals), &bytes, sizeof(bytes));
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
