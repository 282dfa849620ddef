#pragma once

#include <TessaraMathSupport/Types.h>

#include <cstdint>
#include <cstring>

namespace Modeling {

/// Four floats that are worked on at once: each lane gives what a float alone would.
using Lanes = float __attribute__((vector_size(16)));
/// The same of integers, and what comparisons of lanes give: all bits set, or none.
using IntLanes = std::int32_t __attribute__((vector_size(16)));

inline Lanes everyLane(float value)
{
    return Lanes{value, value, value, value};
}

/// Of four floats in a row.
inline Lanes loadLanes(float const* values)
{
    Lanes lanes;
    std::memcpy(&lanes, values, sizeof(lanes));
    return lanes;
}

inline void storeLanes(Lanes lanes, float* values)
{
    std::memcpy(values, &lanes, sizeof(lanes));
}

inline void storeLanes(IntLanes lanes, std::int32_t* values)
{
    std::memcpy(values, &lanes, sizeof(lanes));
}

/// The lanes where a comparison holds, and 0 in others.
inline Lanes lanesWhere(IntLanes comparison, Lanes lanes)
{
    return reinterpret_cast<Lanes>(comparison & reinterpret_cast<IntLanes>(lanes));
}

inline bool areAll(IntLanes comparison)
{
    std::uint64_t halves[2];
    std::memcpy(halves, &comparison, sizeof(halves));
    return (halves[0] & halves[1]) == ~std::uint64_t{0};
}

inline bool isAny(IntLanes comparison)
{
    std::uint64_t halves[2];
    std::memcpy(halves, &comparison, sizeof(halves));
    return (halves[0] | halves[1]) != 0;
}

/// And 0 in the last one.
inline Lanes lanesOf(Tessara::Math::float3 const& v)
{
    using Pairs = double __attribute__((vector_size(16)));
    double xy;
    std::memcpy(&xy, &v, sizeof(xy));
    return __builtin_shufflevector(reinterpret_cast<Lanes>(Pairs{xy, 0}), Lanes{v.z, 0, 0, 0}, 0, 1, 4, 5);
}

}
