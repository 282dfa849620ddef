#pragma once

#include "frame/CornerArray.h"
#include "frame/VectorMath.h"

#include <TessaraMathSupport/Types.h>

#include <span>

namespace Modeling::Internal {

/// Scratch memory of triangulation: one per thread, reused for any number of polygons.
struct PolygonStorage {
    /// A corner is live until it is clipped; the live corners form a ring.
    struct Corner {
        Tessara::Math::float2 projected; // in the polygon's plane; NaN after clipping
        unsigned int previous; // live corner
        unsigned int next; // live corner
        float3 toNext; // unit vector along the edge to the next live corner
        float sharpness; // 1 minus the cosine of the angle of an ear, in [0, 2]; infinite for other corners
    };

    /// A run of consecutive corners, which searches can skip as a whole.
    struct Block {
        Tessara::Math::float2 min, max; // bounds of all its corners, including clipped ones
        float sharpest; // a lower bound of the sharpness of its ears
    };

    CornerArray<float3> positions; // for callers that gather the corners of a polygon
    CornerArray<Corner> corners;
    CornerArray<Block> blocks;
};

/// Cuts a polygon into n - 2 triangles by ear clipping, sharpest ear first, in the plane of its Newell normal.
///
/// Never fails: if the area is below 5e-5 square units, whatever the size of the polygon, or if no ear is left (in
/// self-intersecting polygons, or if the last triangle has no area), the triangles are the fan (0, k - 1, k) from
/// corner 0.
///
/// \param corners    n >= 2 positions in face order; the last one is followed by the first
/// \param triangles  receives 3 (n - 2) corner numbers, with the winding of the polygon
/// \throws std::bad_alloc  only for polygons with more than 32 corners that are larger than all before them
/// O(n²) in the worst case. Threads may run concurrently, each with its own storage.
void triangulatePolygon(std::span<float3 const> corners, std::span<unsigned int> triangles, PolygonStorage& storage);

}
