#include "Histograms.h"

#include "sumOverBlocks.h"

#include <bit>
#include <functional>

namespace ModelingProgram {

namespace {

    constexpr float kInfinity = std::numeric_limits<float>::infinity();

    /// The bin of a positive length.
    std::size_t lengthBin(float length)
    {
        // Powers of two divide the octaves exactly, so a length is in the same bin on every machine.
        constexpr float kQuarters[] = {1.189207115f, 1.414213562f, 1.681792831f};
        int exponent = 0;
        float const mantissa = 2 * std::frexp(length, &exponent); // from 1 up to 2
        int quarter = 0;
        for (float const bound : kQuarters)
            quarter += mantissa >= bound ? 1 : 0;
        int const bin = (exponent - 1 - Histograms::kLowestExponent) * Histograms::kBinsPerOctave + quarter;
        constexpr int kLast =
            (Histograms::kHighestExponent - Histograms::kLowestExponent) * Histograms::kBinsPerOctave - 1;
        return static_cast<std::size_t>(std::clamp(bin, 0, kLast));
    }

    void countFace(std::span<unsigned int const> corners, float3 const* position, Histograms& found)
    {
        float shortest = kInfinity, longest = 0;
        for (std::size_t i = 0, previous = corners.size() - 1; i != corners.size(); previous = i++) {
            double3 const edge = inDoubles(position[corners[i]]) - inDoubles(position[corners[previous]]);
            auto const length = static_cast<float>(std::sqrt(dot(edge, edge)));
            if (!(length < kInfinity))
                return;
            shortest = std::min(shortest, length);
            longest = std::max(longest, length);
            if (length > 0)
                ++found.edgeLengths[lengthBin(length)];
            else
                ++found.zeroEdges;
        }
        float const quality = longest > 0 ? shortest / longest : 0;
        auto const bin = static_cast<std::size_t>(quality * static_cast<float>(Histograms::kQualityBins));
        ++found.qualities[std::min(bin, Histograms::kQualityBins - 1)];
    }

}

Histograms& Histograms::operator+=(Histograms const& other)
{
    auto const add = [](auto& to, auto const& from) {
        std::transform(to.begin(), to.end(), from.begin(), to.begin(), std::plus<>());
    };
    add(edgeLengths, other.edgeLengths);
    add(qualities, other.qualities);
    zeroEdges += other.zeroEdges;
    return *this;
}

Histograms measureHistograms(MeshArrays const& mesh)
{
    constexpr std::size_t kBlock = 65536; // sums are large
    return sumOverBlocks<Histograms, kBlock>(mesh.faceCount(), [&](std::size_t begin, std::size_t end) {
        Histograms found;
        for (auto face = static_cast<unsigned int>(begin); face != end; ++face)
            if (auto const corners = mesh.corners(face); corners.size() >= 2)
                countFace(corners, mesh.positions->data, found);
        return found;
    });
}

}
