#pragma once

#include "ParallelFor.h"

#include <OrvanCore/Array.h>

#include <tbb/parallel_scan.h>

#include <algorithm>
#include <cstdint>
#include <functional>
#include <limits>
#include <new>
#include <type_traits>

namespace Modeling {

/// An array whose elements the caller must write before reading them. Elements of non-trivial types are constructed.
template <class T> Orvan::Array<T> uninitializedArray(std::uint64_t count)
{
    return Orvan::Array<T>(count, Orvan::kUninitialized);
}

// For elements of trivially copyable types, so that the loops are compiled once for all of them. Large arrays are cut
// into blocks, which run in parallel.

/// Copies bytes. The two ranges of memory must not overlap.
void copyBytes(void const* source, std::size_t bytes, void* target);
/// Sets `count` elements of `size` bytes each to the value at `value`, which must be outside of the target.
void fillBytes(void* target, std::size_t count, void const* value, std::size_t size);

/// Copies elements between arrays that do not overlap; blocks of large arrays are copied in parallel.
template <class T> void copyElements(T const* source, std::size_t count, T* target)
{
    if constexpr (std::is_trivially_copyable_v<T>) {
        copyBytes(source, count * sizeof(T), target);
    } else {
        // Each block writes its own elements.
        parallelFor(tbb::blocked_range<std::size_t>(0, count, Internal::kBlockGrain<T>), [=](auto const& block) {
            std::copy(source + block.begin(), source + block.end(), target + block.begin());
        });
    }
}

/// Sets elements of an array to one value, which must not be one of them; blocks of large arrays are filled in
/// parallel.
template <class T> void fillElements(T* target, std::size_t count, T const& value)
{
    if constexpr (std::is_trivially_copyable_v<T>) {
        fillBytes(target, count, &value, sizeof(T));
    } else {
        // Each block writes its own elements.
        parallelFor(tbb::blocked_range<std::size_t>(0, count, Internal::kBlockGrain<T>),
            [=, &value](auto const& block) { std::fill_n(target + block.begin(), block.size(), value); });
    }
}

/// A copy of the first `count` elements of an array, with a capacity of exactly `count`.
template <class T> Orvan::Array<T> copyOfFirst(std::uint64_t count, Orvan::Array<T> const& source)
{
    Orvan::Array<T> copy = uninitializedArray<T>(count);
    copyElements(source.data, count, copy.data);
    return copy;
}

template <class T> Orvan::Array<T> filledArray(std::uint64_t count, T const& value)
{
    Orvan::Array<T> array = uninitializedArray<T>(count);
    fillElements(array.data, count, value);
    return array;
}

template <class T> Orvan::Array<T> zeroedArray(std::uint64_t count)
{
    return filledArray(count, T{});
}

/// The exclusive prefix sums of the counts, followed by the total: entry i is the offset of the output of element i,
/// and the array has one entry more than there are elements.
/// \param countOf  `unsigned int (std::size_t element)`; called more than once per element, from several threads; must
///                 not throw
/// \throws std::bad_alloc  also if the total does not fit 32 bits
template <class CountOf> Orvan::Array<unsigned int> offsetsFromCounts(std::size_t elementCount, CountOf const& countOf)
{
    Orvan::Array<unsigned int> offsets = uninitializedArray<unsigned int>(elementCount + 1);
    unsigned int* const offset = offsets.data;
    std::uint64_t total = 0;
    auto const addUp = [&countOf, offset](
                           tbb::blocked_range<std::size_t> const& elements, std::uint64_t sum, bool isFinal) {
        for (std::size_t element = elements.begin(); element != elements.end(); ++element) {
            if (isFinal)
                offset[element] = static_cast<unsigned int>(sum);
            sum += countOf(element);
        }
        return sum;
    };
    tbb::blocked_range<std::size_t> const all(0, elementCount, kElementGrain);
    if (elementCount <= kElementGrain
        || !runIsolated([&] { total = tbb::parallel_scan(all, std::uint64_t{0}, addUp, std::plus<>()); }))
        total = addUp(all, 0, true);
    if (total > std::numeric_limits<unsigned int>::max())
        throw std::bad_alloc();
    offset[elementCount] = static_cast<unsigned int>(total);
    return offsets;
}

}
