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
    constexpr unsigned int kPartsPerThread =
        16; // at least half of it: few leave threads idle at the end, many share more faces
    constexpr unsigned int kLeastPointBits = 10;
    constexpr unsigned int kMostRuns = 256;
    constexpr unsigned int kShortRun = 4096; // takes a few microseconds to list

    unsigned int choosePointBits(unsigned int pointCount)
    {
        auto const threads = static_cast<unsigned int>(tbb::this_task_arena::max_concurrency());
        bool const isOnePart = pointCount <= kFewPoints || threads == 1;
        unsigned int const mostParts = isOnePart ? 1 : std::min(threads * kPartsPerThread, kMostParts);
        return std::max(isOnePart ? 0 : kLeastPointBits,
            static_cast<unsigned int>(std::bit_width((std::max(pointCount, 1U) - 1) / mostParts)));
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
    PointParts parts{pointCount, choosePointBits(pointCount), {}, {}};
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
