#include "cutQuad.h"

#include <TessaraSpatial/SpatialQuery.h>

namespace Modeling::Internal {

using namespace Tessara::SpatialQuery;

namespace {

    constexpr unsigned int kNone = 4;

    constexpr unsigned int next(unsigned int corner)
    {
        return (corner + 1) % 4;
    }
    constexpr unsigned int opposite(unsigned int corner)
    {
        return (corner + 2) % 4;
    }
    constexpr unsigned int previous(unsigned int corner)
    {
        return (corner + 3) % 4;
    }

    /// One vector per corner, as arrays of coordinates that compilers turn into vector registers.
    struct QuadVectors {
        float x[4], y[4], z[4];

        float3 operator[](unsigned int corner) const { return {x[corner], y[corner], z[corner]}; }
    };

    QuadVectors positionsOf(std::span<float3 const, 4> corners)
    {
        QuadVectors positions;
        for (unsigned int i = 0; i != 4; ++i) {
            positions.x[i] = corners[i].x;
            positions.y[i] = corners[i].y;
            positions.z[i] = corners[i].z;
        }
        return positions;
    }

    /// For each corner, the unit vector along the edge to the next corner.
    QuadVectors directionsOf(QuadVectors const& positions)
    {
        QuadVectors directions;
        for (unsigned int i = 0; i != 4; ++i) {
            float3 const direction = safeNormalize(positions[next(i)] - positions[i]);
            directions.x[i] = direction.x;
            directions.y[i] = direction.y;
            directions.z[i] = direction.z;
        }
        return directions;
    }

    bool isEar(float2 const* projected, unsigned int corner)
    {
        float2 const& a = projected[previous(corner)];
        float2 const& b = projected[corner];
        float2 const& c = projected[next(corner)];
        float u, v, w;
        return isCounterClockwise(a, b, c) && !pointInTriangle(projected[opposite(corner)], a, b, c, u, v, w, nullptr);
    }

    /// The sharpest ear, up to `kSharper` in favor of earlier ones; `kNone` if there is none.
    unsigned int sharpestOf(float const* sharpness)
    {
        unsigned int best = kNone;
        float sharpest = kNoEar;
        for (unsigned int i = 0; i != 4; ++i) {
            if (sharpest > sharpness[i] + kSharper) {
                sharpest = sharpness[i];
                best = i;
            }
        }
        return best;
    }

}

bool cutQuad(std::span<float3 const, 4> corners, Quaternion const& rotation, std::span<unsigned int, 6> triangles)
{
    QuadVectors const positions = positionsOf(corners);
    QuadVectors const directions = directionsOf(positions);
    float2 projected[4];
    for (unsigned int i = 0; i != 4; ++i)
        projected[i] = rotateAndDropZ(rotation, positions[i]);

    float sharpness[4];
    for (unsigned int i = 0; i != 4; ++i)
        sharpness[i] = sharpnessBetween(directions[previous(i)], directions[i]);
    for (unsigned int i = 0; i != 4; ++i)
        sharpness[i] = isEar(projected, i) ? sharpness[i] : kNoEar;
    unsigned int const ear = sharpestOf(sharpness);
    if (ear == kNone)
        return false;

    // The remaining triangle starts before its own sharpest ear. The corner opposite the first ear has kept its
    // neighbors, so its sharpness still holds.
    unsigned int const before = previous(ear);
    unsigned int const after = next(ear);
    unsigned int const across = opposite(ear);
    float3 const cut = safeNormalize(positions[after] - positions[before]);
    sharpness[ear] = kNoEar;
    sharpness[before] = isCounterClockwise(projected[across], projected[before], projected[after])
        ? sharpnessBetween(directions[across], cut)
        : kNoEar;
    sharpness[after] = isCounterClockwise(projected[before], projected[after], projected[across])
        ? sharpnessBetween(cut, directions[after])
        : kNoEar;
    unsigned int const last = sharpestOf(sharpness);
    if (last == kNone)
        return false;

    triangles[0] = before;
    triangles[1] = ear;
    triangles[2] = after;
    triangles[3] = previous(last) == ear ? before : previous(last);
    triangles[4] = last;
    triangles[5] = next(last) == ear ? after : next(last);
    return true;
}

}
