#pragma once

#include "support/Testing.h"

#include <fuzzer/FuzzedDataProvider.h>

#include <cstdio>
#include <cstdlib>
#include <string_view>

namespace Fuzzing {

using namespace TestSupport;
using Tessara::Math::float3;
using Bytes = FuzzedDataProvider;

/// Ends the process if a promise is broken; the fuzzer then keeps the input.
inline void require(bool isKept, std::string_view promise)
{
    if (isKept)
        return;
    std::fprintf(stderr, "BROKEN PROMISE: %.*s\n", static_cast<int>(promise.size()), promise.data());
    std::abort();
}
inline void require(testing::AssertionResult const& result, std::string const& promise)
{
    require(static_cast<bool>(result), promise + ": " + result.message());
}

// Objects that the bytes of the fuzzer describe: nearby bytes describe similar objects, and every sequence of bytes
// describes one.

enum class Kind { Mesh, PointCloud, Strands, kMaxValue = Strands };

/// An object that the host's validators accept, with properties of any type and length.
Orvan::MutablePtr<Object> validBag(Kind kind, Bytes& bytes);

/// The same, changed until anything in it may be missing, of another type or of another length.
Orvan::MutablePtr<Object> anyBag(Bytes& bytes);

/// A small number, or one of those that are not finite, very large, or very small.
float anyNumber(Bytes& bytes);
float3 anyPoint(Bytes& bytes);
Orvan::Array<float3> anyPoints(std::size_t most, Bytes& bytes);

/// What properties of these objects are called, besides the names of the host.
Orvan::String anyName(Bytes& bytes);

template <class T> Orvan::Array<T> numbersBelow(T bound, std::size_t most, Bytes& bytes)
{
    Orvan::Array<T> numbers(bytes.ConsumeIntegralInRange<std::size_t>(0, most));
    for (T& number : numbers)
        number = bytes.ConsumeIntegralInRange<T>(0, bound);
    return numbers;
}

}
