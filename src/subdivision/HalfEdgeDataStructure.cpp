#include <Modeling/HalfEdgeDataStructure.h>

#include "EdgesByEnd.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"

#include <tbb/parallel_reduce.h>

#include <functional>

namespace Geometry::Mesh {

using namespace Modeling;
using namespace Modeling::Internal;

namespace {

    /// The preconditions of the constructor.
    [[maybe_unused]] bool fitTogether(
        unsigned int pointCount, unsigned int faceCount, IndexArray const& faceVertex, IndexArray const& faceOffset)
    {
        if (faceCount == 0)
            return true;
        if (faceOffset.size <= faceCount || !isNonDecreasing(faceOffset.data, std::size_t{faceCount} + 1))
            return false;
        unsigned int const first = faceOffset[0], last = faceOffset[faceCount];
        return last <= faceVertex.size && areBelow(pointCount, faceVertex.data + first, last - first);
    }

    /// For each corner the directed edge that ends at it.
    Orvan::Array<HalfEdge> describeCorners(FaceView const& faces, std::size_t cornerCount)
    {
        Orvan::Array<HalfEdge> records(cornerCount); // corners that belong to no face keep the default
        HalfEdge* const record = records.data;
        OffsetView const offset = faces.offsets;
        // Each face writes the entries of its corners.
        parallelFor(tbb::blocked_range<unsigned int>(0, faces.count, kFaceGrain), [=](auto const& range) {
            for (unsigned int face = range.begin(); face != range.end(); ++face)
                for (unsigned int corner = offset.begin(face); corner != offset.end(face); ++corner)
                    record[corner] = {face, static_cast<unsigned char>(corner - offset.begin(face)),
                        static_cast<unsigned char>(offset.size(face))};
        });
        return records;
    }

}

HalfEdgeDataStructure::HalfEdgeDataStructure(unsigned int numPoints)
    : offsets_(zeroedArray<unsigned int>(std::uint64_t{numPoints} + 1))
{
}

HalfEdgeDataStructure::HalfEdgeDataStructure(
    unsigned int numPoints, unsigned int numFaces, IndexArray const& faceVertex, IndexArray const& faceOffset)
    : offsets_(uninitializedArray<unsigned int>(std::uint64_t{numPoints} + 1))
{
    MODELING_ASSERT(fitTogether(numPoints, numFaces, faceVertex, faceOffset));
    EdgeFaces const faces{
        {faceVertex.data, faceOffset, numFaces}, numFaces == 0 || isTriangleMesh(numFaces, faceOffset)};
    bool const hasRepeats = listEdgesByEnd(faces, numPoints, offsets_.data, entries_);
    MODELING_ASSERT(areOffsets(offsets_.data, numPoints, entries_.size));
    if (!faces.areTriangles)
        records_ = describeCorners(faces, faceVertex.size);
    if (hasRepeats)
        dropRepeatedEdges();
}

void HalfEdgeDataStructure::dropRepeatedEdges()
{
    unsigned int const* const offset = offsets_.data;
    std::uint64_t const* const entry = entries_.data;
    auto const isRepeat = [=](unsigned int edge, unsigned int first) {
        return edge != first && startOf(entry[edge]) == startOf(entry[edge - 1]);
    };
    IndexArray newOffsets = offsetsFromCounts(offsets_.size - 1, [=](std::size_t point) {
        unsigned int count = 0;
        for (unsigned int edge = offset[point]; edge != offset[point + 1]; ++edge)
            count += !isRepeat(edge, offset[point]);
        return count;
    });
    auto newEntries = uninitializedArray<std::uint64_t>(newOffsets[newOffsets.size - 1]);
    // Each point writes its own entries.
    parallelFor(tbb::blocked_range<std::size_t>(0, offsets_.size - 1, kElementGrain), [&](auto const& points) {
        for (std::size_t point = points.begin(); point != points.end(); ++point) {
            std::uint64_t* target = newEntries.data + newOffsets[point];
            for (unsigned int edge = offset[point]; edge != offset[point + 1]; ++edge)
                if (!isRepeat(edge, offset[point]))
                    *target++ = entry[edge];
        }
    });
    offsets_.swap(newOffsets);
    entries_.swap(newEntries);
}

void HalfEdgeDataStructure::clear() noexcept
{
    offsets_.clear();
    entries_ = {};
    records_ = {};
}

void HalfEdgeDataStructure::swap(HalfEdgeDataStructure& other) noexcept
{
    offsets_.swap(other.offsets_);
    entries_.swap(other.entries_);
    records_.swap(other.records_);
}

bool HalfEdgeDataStructure::hasBoundary(
    unsigned int numFaces, IndexArray const& faceVertex, IndexArray const& faceOffset) const
{
    FaceView const mesh{faceVertex.data, faceOffset, numFaces};
    auto const isOpenIn = [&, mesh](tbb::blocked_range<unsigned int> const& faces, bool found) {
        for (unsigned int face = faces.begin(); !found && face != faces.end(); ++face) {
            if (mesh.size(face) < 3)
                return true;
            unsigned int const* const c = mesh.corners(face);
            found = !find(c[0], c[1]) || !find(c[1], c[2]) || !find(c[2], c[0]);
        }
        return found;
    };
    tbb::blocked_range<unsigned int> const all(0, numFaces);
    bool isOpen = false;
    bool const isDone = runIsolated(
        [&] { isOpen = tbb::parallel_reduce(all, false, isOpenIn, std::logical_or<>(), tbb::auto_partitioner()); });
    return isDone ? isOpen : isOpenIn(all, false);
}

}
