#pragma once

#include "frame/Arrays.h"
#include "frame/VectorMath.h"

#include <TessaraMathSupport/Types.h>

#include <algorithm>
#include <cstddef>
#include <span>

namespace Modeling::Internal {

/// Memory for something of each corner of a polygon: on the stack for small polygons, grown on demand for others and
/// used again by the next one.
template <class T> class CornerArray {
public:
    /// Elements without a value.
    T* take(std::size_t count)
    {
        if (count <= kSmallPolygon)
            return small_;
        if (count > large_.size)
            large_ = uninitializedArray<T>(std::max<std::uint64_t>(count, 2 * large_.size));
        return large_.data;
    }

private:
    static constexpr std::size_t kSmallPolygon = 32;
    T small_[kSmallPolygon];
    Orvan::Array<T> large_;
};

/// What triangulating works on. One for each thread, for any number of polygons after one another.
struct PolygonStorage {
    /// A corner that has not been clipped is live; the live ones form a ring.
    struct Corner {
        Tessara::Math::float2 projected; // in the polygon's plane; not a number when clipped
        unsigned int previous; // live corners
        unsigned int next;
        float3 toNext; // direction of the edge to the next live corner
        float sharpness; // of an ear: 1 minus the cosine of its angle, in [0, 2]; infinite for other corners
    };

    /// Corners whose numbers follow one another, so that a search can pass over many at a time.
    struct Block {
        Tessara::Math::float2 min, max; // of all its corners, clipped ones included
        float sharpest; // no ear in it is sharper
    };

    CornerArray<float3> positions; // for callers that have to gather them
    CornerArray<Corner> corners;
    CornerArray<Block> blocks;
};

/// Cuts a polygon into n - 2 triangles by clipping ears, the sharpest first, in the plane of its Newell normal.
///
/// Never fails: where the area is below 5e-5 square units, whatever the size of the polygon, or where the ears run out
/// (self-intersections, a last triangle without area), the triangles are the fan (0, k - 1, k) from corner 0.
///
/// \param corners    n >= 2 positions in face order; the last one is followed by the first
/// \param triangles  receives 3 (n - 2) corner numbers; the winding is the polygon's own
/// \throws std::bad_alloc  only for polygons larger than those before it, from 33 corners on
/// O(n²) at worst. No shared state: any number of threads, with a storage each.
void triangulatePolygon(std::span<float3 const> corners, std::span<unsigned int> triangles, PolygonStorage& storage);

}
