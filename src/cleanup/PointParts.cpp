#include "PointParts.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"

#include <TessaraGeometry/Names.h>

#include <tbb/task_arena.h>

#include <array>
#include <bit>
#include <utility>

namespace Modeling::Internal {

namespace {

    constexpr unsigned int kMostParts = 1024;
    // Few parts leave threads idle at the end of a loop, many share more faces: it is at least half of the first number,
    // and up to the second one if few faces are shared.
    constexpr unsigned int kPartsPerThread = 16;
    constexpr unsigned int kMostPartsPerThread = 64;
    constexpr unsigned int kSampledFaces = 1024;
    constexpr unsigned int kLeastPointBits = 10;
    constexpr unsigned int kMostRuns = 256;
    constexpr unsigned int kShortRun = 4096; // takes a few microseconds to list

    unsigned int pointBitsForParts(unsigned int pointCount, unsigned int mostParts)
    {
        return static_cast<unsigned int>(std::bit_width((std::max(pointCount, 1U) - 1) / mostParts));
    }

    /// Estimates from a sample whether few faces have points in several parts.
    bool areFewShared(FaceView const& mesh, unsigned int pointBits)
    {
        unsigned int const sampled = std::min(mesh.count, kSampledFaces);
        unsigned int shared = 0;
        for (std::uint64_t k = 0; k != sampled; ++k) {
            auto const face = static_cast<unsigned int>(k * mesh.count / sampled);
            auto const corners = mesh.offsets.part(face, mesh.faceVertex);
            shared += std::any_of(corners.begin(), corners.end(),
                [&](unsigned int point) { return point >> pointBits != corners.front() >> pointBits; });
        }
        return shared <= sampled / 32;
    }

    unsigned int choosePointBits(FaceView const& mesh, unsigned int pointCount)
    {
        auto const threads = static_cast<unsigned int>(tbb::this_task_arena::max_concurrency());
        if (pointCount <= kFewPoints || threads == 1)
            return pointBitsForParts(pointCount, 1);
        auto const bitsFor = [=](unsigned int partsPerThread) {
            return std::max(
                kLeastPointBits, pointBitsForParts(pointCount, std::min(threads * partsPerThread, kMostParts)));
        };
        unsigned int const mostBits = bitsFor(kPartsPerThread);
        unsigned int bits = bitsFor(kMostPartsPerThread);
        while (bits < mostBits && !areFewShared(mesh, bits))
            ++bits;
        return bits;
    }

    /// Consecutive faces. All runs but the last one have the same length.
    struct FaceRuns {
        unsigned int faceCount;
        unsigned int length = std::max(kShortRun, faceCount / kMostRuns + 1);

        std::size_t count() const { return std::size_t{faceCount / length} + 1; }
        unsigned int begin(std::size_t run) const { return static_cast<unsigned int>(run * length); }
        unsigned int end(std::size_t run) const
        {
            return static_cast<unsigned int>(std::min<std::uint64_t>(faceCount, (run + 1) * length));
        }
    };

    /// Calls `list(part, face)` for the faces of a run, in ascending order, with each part in which they have points.
    template <class List> void listFaces(
        FaceView const& mesh, PointParts const& parts, FaceRuns const& runs, std::size_t run, List const& list)
    {
        std::array<unsigned int, kMostParts> lastFace;
        lastFace.fill(Tessara::Geometry::kInvalidIndex);
        for (unsigned int face = runs.begin(run); face != runs.end(run); ++face)
            for (unsigned int const point : mesh.offsets.part(face, mesh.faceVertex))
                if (unsigned int const part = parts.partOf(point); std::exchange(lastFace[part], face) != face)
                    list(part, face);
    }

}

PointParts dividePoints(FaceView const& mesh, unsigned int pointCount)
{
    PointParts parts{pointCount, choosePointBits(mesh, pointCount), {}, {}};
    std::size_t const partCount = pointCount == 0 ? 0 : std::size_t{parts.partOf(pointCount - 1)} + 1;
    FaceRuns const runs{mesh.count};
    std::size_t const runCount = runs.count();
    IndexArray counts = zeroedArray<unsigned int>(partCount * runCount); // by part, then by run
    unsigned int* const count = counts.data;
    // Each run writes the counts of its own faces.
    parallelFor(tbb::blocked_range<std::size_t>(0, runCount, kCoarseGrain), [&](auto const& range) {
        for (std::size_t run = range.begin(); run != range.end(); ++run)
            listFaces(mesh, parts, runs, run, [=](unsigned int part, unsigned int) { ++count[part * runCount + run]; });
    });
    IndexArray offsets = offsetsFromCounts(counts.size, [=](std::size_t entry) { return count[entry]; });

    parts.faceOffsets = uninitializedArray<unsigned int>(partCount + 1);
    for (std::size_t part = 0; part <= partCount; ++part)
        parts.faceOffsets[part] = offsets[part * runCount];
    parts.faces = uninitializedArray<unsigned int>(offsets[counts.size]);
    unsigned int* const next = offsets.data;
    // Each run writes the entries that have been counted for it.
    parallelFor(
        tbb::blocked_range<std::size_t>(0, runCount, kCoarseGrain), [&, faces = parts.faces.data](auto const& range) {
            for (std::size_t run = range.begin(); run != range.end(); ++run)
                listFaces(mesh, parts, runs, run,
                    [=](unsigned int part, unsigned int face) { faces[next[part * runCount + run]++] = face; });
        });
    return parts;
}

}
