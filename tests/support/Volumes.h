#pragma once

#include "Random.h"

#include <TessaraGeometryVolume/VolumeBuilder.h>

#include <vector>

namespace TestSupport {

/// Calls `visit(i, j, k)` for all voxels from `first` up to `end` along each axis.
template <class Visit> void forEachVoxel(int first, int end, Visit const& visit)
{
    for (int k = first; k < end; ++k)
        for (int j = first; j < end; ++j)
            for (int i = first; i < end; ++i)
                visit(i, j, k);
}

/// A field that interpolation reproduces, up to rounding.
inline float linearField(float x, float y, float z)
{
    return 1.5f * x - 2 * y + 0.25f * z + 10;
}

/// Values for all voxels from `first` up to `end` along each axis, with plain lookup.
struct Field {
    int first, end;
    std::vector<float> values;

    template <class Rule> static Field of(int first, int end, Rule const& rule)
    {
        Field field{first, end, {}};
        forEachVoxel(first, end, [&](int i, int j, int k) { field.values.push_back(rule(i, j, k)); });
        return field;
    }
    static Field linear(int first, int end)
    {
        return of(first, end, [](int i, int j, int k) { return linearField(float(i), float(j), float(k)); });
    }
    static Field random(int first, int end)
    {
        Random random(7);
        return of(first, end, [&](int, int, int) { return random.coordinate(); });
    }

    TSR::TileTree3D::DenseBlock block() const
    {
        int const side = end - first;
        return {{first, first, first}, {side, side, side}, values.data()};
    }
    float operator()(int i, int j, int k) const
    {
        int const side = end - first;
        return values[static_cast<std::size_t>(((k - first) * side + (j - first)) * side + (i - first))];
    }
};

}
