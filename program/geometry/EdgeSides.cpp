#include "EdgeSides.h"

#include <tbb/blocked_range.h>
#include <tbb/parallel_for.h>
#include <tbb/parallel_reduce.h>

#include <functional>

namespace ModelingProgram {

namespace {

    /// 0 if not all faces have equally many.
    unsigned int findCornersPerFace(MeshArrays const& mesh)
    {
        if (mesh.faceCount() == 0)
            return 0;
        unsigned int const* const offset = mesh.faceOffset->data;
        unsigned int const count = offset[1];
        bool const isUniform = tbb::parallel_reduce(
            tbb::blocked_range<unsigned int>(0, mesh.faceCount(), 10'000), true,
            [=](auto const& faces, bool isSame) {
                for (unsigned int face = faces.begin(); isSame && face != faces.end(); ++face)
                    isSame = offset[face + 1] - offset[face] == count;
                return isSame;
            },
            std::logical_and<>());
        return isUniform ? count : 0;
    }

}

EdgeSides::EdgeSides(MeshArrays const& mesh)
    : mesh_(mesh)
    , around_(Modeling::cornersByPoint(mesh.pointCount(), mesh.faceVertex->data, mesh.cornerCount()))
    , cornersPerFace_(findCornersPerFace(mesh))
{
    if (cornersPerFace_ != 0)
        return;
    faceOfCorner_.resize(mesh.cornerCount());
    unsigned int const* const offset = mesh.faceOffset->data;
    // Each face writes the entries of its corners.
    tbb::parallel_for(tbb::blocked_range<unsigned int>(0, mesh.faceCount(), 1000), [&](auto const& faces) {
        for (unsigned int face = faces.begin(); face != faces.end(); ++face)
            std::fill(faceOfCorner_.data() + offset[face], faceOfCorner_.data() + offset[face + 1], face);
    });
}

void EdgeSides::collectSides(unsigned int point, std::vector<Side>& sides) const
{
    unsigned int const* const pointAt = mesh_.faceVertex->data;
    sides.clear();
    forEachCornerAt(point, [&](CornerNeighbors const& at) {
        if (pointAt[at.next] > point)
            sides.push_back({pointAt[at.next], at.corner, at.next});
        if (pointAt[at.previous] > point)
            sides.push_back({pointAt[at.previous], at.previous, at.corner});
    });
    std::sort(sides.begin(), sides.end());
}

}
