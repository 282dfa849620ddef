#include "FaceAdjacency.h"

#include "Arrays.h"
#include "Assert.h"

#include <TessaraGeometry/Names.h>

#include <algorithm>
#include <atomic>
#include <compare>
#include <vector>

namespace Modeling {

using Tessara::Geometry::kInvalidIndex;

namespace {

    /// A half-edge that ends at a given point: the point at which it starts, and its face.
    struct Incoming {
        unsigned int start;
        unsigned int face;
        friend auto operator<=>(Incoming const&, Incoming const&) = default;
    };

    /// Finds the twins of the half-edges that start at a point among those that end there.
    class TwinFinder {
    public:
        /// Lists the half-edges that end at a point, given the corners there.
        void gather(unsigned int const* corners, std::size_t count, unsigned int const* faceVertex)
        {
            incoming_.resize(count);
            for (std::size_t i = 0; i != count; ++i) {
                unsigned int const face = corners[i] / 3;
                incoming_[i] = {faceVertex[std::size_t{3} * face + previousCorner(corners[i] % 3)], face};
            }
            isSorted_ = count > kShortList;
            if (isSorted_)
                std::sort(incoming_.begin(), incoming_.end());
        }

        /// The lowest face whose half-edge comes from `start`.
        unsigned int faceFrom(unsigned int start) const
        {
            auto const from = isSorted_
                ? std::lower_bound(incoming_.begin(), incoming_.end(), Incoming{start, 0})
                : std::find_if(incoming_.begin(), incoming_.end(), [=](Incoming const& i) { return i.start == start; });
            return from != incoming_.end() && from->start == start ? from->face : kInvalidIndex;
        }

    private:
        static constexpr std::size_t kShortList = 24; // up to this length a linear search is faster than sorting
        std::vector<Incoming> incoming_;
        bool isSorted_ = false;
    };

    [[maybe_unused]] bool areFacesOrInvalid(FaceAdjacency const& adjacency)
    {
        return std::all_of(adjacency.begin(), adjacency.end(), [&](std::array<unsigned int, 3> const& neighbors) {
            return std::all_of(neighbors.begin(), neighbors.end(),
                [&](unsigned int face) { return face < adjacency.size || face == kInvalidIndex; });
        });
    }

}

bool isTriangleMesh(unsigned int faceCount, IndexArray const& faceOffset)
{
    std::atomic<bool> areTriangles = true;
    unsigned int const* const offset = faceOffset.data;
    // Any thread may clear the flag, which is read after the loop.
    parallelFor(
        tbb::blocked_range<std::size_t>(0, std::size_t{faceCount} + 1, kElementGrain), [&](auto const& entries) {
            for (std::size_t entry = entries.begin(); entry != entries.end(); ++entry)
                if (offset[entry] != 3 * entry)
                    return areTriangles.store(false, std::memory_order_relaxed);
        });
    return areTriangles.load(std::memory_order_relaxed);
}

FaceAdjacency buildFaceAdjacency(FaceView const& faces, PointCorners const& around)
{
    MODELING_ASSERT(around.corners.size == std::uint64_t{3} * faces.count); // so that every entry is written
    FaceAdjacency adjacency = uninitializedArray<std::array<unsigned int, 3>>(faces.count);
    std::array<unsigned int, 3>* const neighbors = adjacency.data;
    auto const pointCount = static_cast<unsigned int>(around.offsets.size - 1);
    unsigned int const* const offset = around.offsets.data;
    unsigned int const* const corners = around.corners.data;
    unsigned int const* const faceVertex = faces.faceVertex;
    // Each half-edge starts at one point, whose iteration writes its entry.
    parallelFor(tbb::blocked_range<unsigned int>(0, pointCount, kOneRingGrain), [=](auto const& points) {
        TwinFinder twins;
        for (unsigned int point = points.begin(); point != points.end(); ++point) {
            twins.gather(corners + offset[point], offset[point + 1] - offset[point], faceVertex);
            for (unsigned int i = offset[point]; i != offset[point + 1]; ++i) {
                unsigned int const face = corners[i] / 3;
                unsigned int const edge = corners[i] % 3;
                neighbors[face][edge] = twins.faceFrom(faceVertex[std::size_t{3} * face + nextCorner(edge)]);
            }
        }
    });
    MODELING_ASSERT(areFacesOrInvalid(adjacency));
    return adjacency;
}

}
