#pragma once

#include "MeshArrays.h"

#include <array>
#include <cstdint>

namespace ModelingProgram {

/// How the edge lengths and the shapes of the faces of a mesh are distributed. An edge counts once per face.
struct Histograms {
    static constexpr int kBinsPerOctave = 4;
    static constexpr int kLowestExponent = -64; // shorter edges count for the first bin, longer ones for the last
    static constexpr int kHighestExponent = 64;
    static constexpr std::size_t kQualityBins = 40;

    /// Bin i has the lengths from 2^(kLowestExponent + i / 4) up to that of the next bin.
    std::array<std::uint64_t, (kHighestExponent - kLowestExponent) * kBinsPerOctave> edgeLengths{};
    std::uint64_t zeroEdges = 0;
    /// Bin i has the faces whose shortest edge over longest edge is from i / 40 up to that of the next bin; 1 is in the
    /// last one. Faces without a longest edge count for the first one.
    std::array<std::uint64_t, kQualityBins> qualities{};

    Histograms& operator+=(Histograms const& other);
};

/// Edges of length NaN or infinity, and faces with them, do not count. Runs in parallel.
Histograms measureHistograms(MeshArrays const& mesh);

}
