#include "MeshArrays.h"

#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Names.h>

#include <tbb/blocked_range.h>
#include <tbb/parallel_reduce.h>

#include <algorithm>
#include <cstring>
#include <functional>

namespace ModelingProgram {

unsigned int MeshArrays::faceOf(unsigned int corner) const
{
    // The last face that begins at or before the corner contains it, since faces without corners end where they begin.
    unsigned int const* const after = std::upper_bound(faceOffset->begin(), faceOffset->end(), corner);
    return static_cast<unsigned int>(after - faceOffset->begin() - 1);
}

unsigned int MeshArrays::nextCorner(unsigned int corner) const
{
    unsigned int const face = faceOf(corner);
    return corner + 1 == (*faceOffset)[face + 1] ? (*faceOffset)[face] : corner + 1;
}

bool areIdentical(MeshArrays const& a, MeshArrays const& b)
{
    auto const areEqual = []<class T>(Orvan::Ptr<Orvan::Array<T>> const& x, Orvan::Ptr<Orvan::Array<T>> const& y) {
        if (x == y || x->size != y->size)
            return x == y;
        constexpr std::uint64_t kGrain = 1 << 16;
        return tbb::parallel_reduce(
            tbb::blocked_range<std::uint64_t>(0, x->size, kGrain), true,
            [&](auto const& range, bool areSame) {
                return areSame
                    && std::memcmp(x->data + range.begin(), y->data + range.begin(), range.size() * sizeof(T)) == 0;
            },
            std::logical_and<>());
    };
    return areEqual(a.faceOffset, b.faceOffset) && areEqual(a.faceVertex, b.faceVertex)
        && areEqual(a.positions, b.positions);
}

MeshArrays arraysOf(Tessara::Object const& mesh)
{
    using namespace Tessara::Geometry;
    return {dataOf<float3>(mesh, sPointPosition), dataOf<unsigned int>(mesh, sFaceVertex),
        dataOf<unsigned int>(mesh, sFaceOffset)};
}

}
