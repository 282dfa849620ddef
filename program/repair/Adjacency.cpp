#include "Adjacency.h"

#include "frame/ParallelFor.h"

namespace ModelingProgram {

Adjacency::Adjacency(MeshArrays const& mesh)
    : mesh_(mesh)
    , areTriangles_(true)
    , across_(mesh.cornerCount(), kNoEdge)
{
    unsigned int const* const offset = mesh.faceOffset->data;
    for (unsigned int face = 0; areTriangles_ && face != mesh.faceCount(); ++face)
        areTriangles_ = offset[face + 1] - offset[face] == 3;
    if (areTriangles_)
        return;
    faceOfCorner_.resize(mesh.cornerCount());
    for (unsigned int face = 0; face != mesh.faceCount(); ++face)
        std::fill(faceOfCorner_.begin() + offset[face], faceOfCorner_.begin() + offset[face + 1], face);
}

void Adjacency::reverse(std::vector<unsigned char> const& isReversed)
{
    unsigned int const* const offset = mesh_.faceOffset->data;
    auto const renamed = [&](unsigned int side) {
        unsigned int const face = faceOf(side);
        return isReversed[face] ? offset[face] + offset[face + 1] - 1 - side : side;
    };
    std::vector<unsigned int> const old = across_;
    // Each face writes the entries of its sides.
    Modeling::parallelFor(tbb::blocked_range<unsigned int>(0, mesh_.faceCount(), 1000), [&](auto const& faces) {
        for (unsigned int side = offset[faces.begin()]; side != offset[faces.end()]; ++side)
            across_[renamed(side)] = old[side] < kNoEdge ? renamed(old[side]) : old[side];
    });
}

void Adjacency::extend()
{
    auto const oldCount = static_cast<unsigned int>(across_.size());
    across_.resize(mesh_.cornerCount(), kBoundary);
    if (areTriangles_)
        return;
    unsigned int face = mesh_.faceOf(oldCount);
    for (unsigned int corner = oldCount; corner != mesh_.cornerCount(); corner += 3, ++face)
        faceOfCorner_.insert(faceOfCorner_.end(), 3, face);
}

}
