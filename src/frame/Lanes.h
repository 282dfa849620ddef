#pragma once

#include <TessaraMathSupport/Types.h>

#include <cmath>
#include <cstdint>
#include <cstring>

#ifdef __SSE__
#include <xmmintrin.h>
#endif

namespace Modeling {

/// Four floats in a SIMD register. Each lane gives the same bits as scalar arithmetic.
using Lanes = float __attribute__((vector_size(16)));
/// Four integers. Comparisons of lanes give a mask: in each lane, all bits are set or none is.
using IntLanes = std::int32_t __attribute__((vector_size(16)));

inline Lanes broadcast(float value)
{
    return Lanes{value, value, value, value};
}

/// Four consecutive floats, with any alignment.
inline Lanes load(float const* values)
{
    Lanes lanes;
    std::memcpy(&lanes, values, sizeof(lanes));
    return lanes;
}

/// The three coordinates of a vector; the last lane is 0.
inline Lanes load(Tessara::Math::float3 const& v)
{
    using Pairs = double __attribute__((vector_size(16)));
    double xy;
    std::memcpy(&xy, &v, sizeof(xy));
    return __builtin_shufflevector(reinterpret_cast<Lanes>(Pairs{xy, 0}), Lanes{v.z, 0, 0, 0}, 0, 1, 4, 5);
}

inline void store(Lanes lanes, float* values)
{
    std::memcpy(values, &lanes, sizeof(lanes));
}

inline void store(IntLanes lanes, std::int32_t* values)
{
    std::memcpy(values, &lanes, sizeof(lanes));
}

inline void store(IntLanes lanes, std::uint32_t* values)
{
    std::memcpy(values, &lanes, sizeof(lanes));
}

/// The lower value in each lane; that of `b` if either is NaN.
inline Lanes min(Lanes a, Lanes b)
{
    return a < b ? a : b;
}

/// The higher value in each lane; that of `b` if either is NaN.
inline Lanes max(Lanes a, Lanes b)
{
    return a > b ? a : b;
}

inline Lanes squareRoot(Lanes lanes)
{
    float roots[4]; // compilers turn the loop into one instruction
    store(lanes, roots);
    for (float& root : roots)
        root = std::sqrt(root);
    return load(roots);
}

/// The absolute value of each lane; NaN remains NaN.
inline Lanes abs(Lanes lanes)
{
    return reinterpret_cast<Lanes>(reinterpret_cast<IntLanes>(lanes) & (IntLanes{} + INT32_MAX));
}

/// The lanes that the mask selects, and 0 in the others.
inline Lanes selectOrZero(IntLanes mask, Lanes lanes)
{
    return reinterpret_cast<Lanes>(mask & reinterpret_cast<IntLanes>(lanes));
}

/// Bit i is set if lane i of the mask is.
inline unsigned int bitsOf(IntLanes mask)
{
#ifdef __SSE__
    return static_cast<unsigned int>(_mm_movemask_ps(reinterpret_cast<__m128>(mask)));
#else
    std::uint64_t halves[2];
    IntLanes const bits = mask & IntLanes{1, 2, 4, 8};
    std::memcpy(halves, &bits, sizeof(halves));
    std::uint64_t const both = halves[0] | halves[1];
    return static_cast<unsigned int>(both | both >> 32);
#endif
}

/// Whether all lanes of a mask are set.
inline bool all(IntLanes mask)
{
    return bitsOf(mask) == 15;
}

/// Whether some lane of a mask is set.
inline bool any(IntLanes mask)
{
    return bitsOf(mask) != 0;
}

}
