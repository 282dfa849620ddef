#pragma once

#include <TessaraMathSupport/Types.h>

#include <cstdint>
#include <cstring>

namespace Modeling {

/// Four floats that are worked on at once, the first three mostly a vector: each lane gives what a float alone would.
using Lanes = float __attribute__((vector_size(16)));
/// The same of integers, and what comparisons of lanes give: all bits set, or none.
using IntLanes = std::int32_t __attribute__((vector_size(16)));

inline Lanes lanesOf(Tessara::Math::float3 const& v)
{
    return Lanes{v.x, v.y, v.z, 0};
}

inline Lanes everyLane(float value)
{
    return Lanes{value, value, value, value};
}

/// Of four floats in a row.
template <class Four> Lanes lanesOf(Four const& values)
{
    Lanes lanes;
    static_assert(sizeof(values) == sizeof(lanes));
    std::memcpy(&lanes, &values, sizeof(lanes));
    return lanes;
}

namespace Internal {

    using Halves = std::uint64_t __attribute__((vector_size(16)));

}

inline bool areAll(IntLanes comparison)
{
    auto const halves = reinterpret_cast<Internal::Halves>(comparison);
    return (halves[0] & halves[1]) == ~std::uint64_t{0};
}

}
