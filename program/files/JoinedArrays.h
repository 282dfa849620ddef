#pragma once

#include "frame/Arrays.h"

#include <functional>
#include <vector>

namespace ModelingProgram {

/// Where the elements of each part begin if they follow one another, and the total.
template <class Part, class CountOf>
std::vector<std::uint64_t> startsOf(std::vector<Part*> const& parts, CountOf const& countOf)
{
    std::vector<std::uint64_t> starts{0};
    for (Part* const part : parts)
        starts.push_back(starts.back() + std::invoke(countOf, *part));
    return starts;
}

/// Calls `visit(index)` for all parts, in parallel.
template <class Visit> void forEachPart(std::size_t partCount, Visit const& visit)
{
    // Each part has its own results.
    Modeling::parallelFor(tbb::blocked_range<std::size_t>(0, partCount, Modeling::kCoarseGrain),
        [&](tbb::blocked_range<std::size_t> const& parts) {
            for (std::size_t part = parts.begin(); part != parts.end(); ++part)
                visit(part);
        });
}

/// The arrays of the parts one after another. They are taken from the parts; that of a single part is not copied.
/// \param arrayOf  the array of a part, such as a pointer to a member
/// \pre  there is a part
template <class Part, class ArrayOf> auto joinedArray(std::vector<Part*> const& parts, ArrayOf const& arrayOf)
{
    using Array = std::remove_reference_t<std::invoke_result_t<ArrayOf const&, Part&>>;
    if (parts.size() == 1)
        return std::move(std::invoke(arrayOf, *parts[0]));
    auto const starts = startsOf(parts, [&](Part& part) { return std::invoke(arrayOf, part).size; });
    Array result(starts.back(), Orvan::kUninitialized);
    forEachPart(parts.size(), [&](std::size_t part) {
        Array const taken = std::move(std::invoke(arrayOf, *parts[part]));
        std::copy(taken.begin(), taken.end(), result.data + starts[part]);
    });
    return result;
}

/// The same for offsets of runs of elements: those of each part begin at 0, and are raised by the runs before.
template <class Part, class ArrayOf> auto joinedOffsets(std::vector<Part*> const& parts, ArrayOf const& arrayOf)
{
    using Array = std::remove_reference_t<std::invoke_result_t<ArrayOf const&, Part&>>;
    if (parts.size() == 1)
        return std::move(std::invoke(arrayOf, *parts[0]));
    auto const starts = startsOf(parts, [&](Part& part) { return std::invoke(arrayOf, part).size - 1; });
    auto const bases = startsOf(parts, [&](Part& part) {
        Array const& offsets = std::invoke(arrayOf, part);
        return offsets[offsets.size - 1];
    });
    Array result(starts.back() + 1, Orvan::kUninitialized);
    result[0] = 0;
    forEachPart(parts.size(), [&](std::size_t part) {
        Array const taken = std::move(std::invoke(arrayOf, *parts[part]));
        std::transform(taken.begin() + 1, taken.end(), result.data + starts[part] + 1,
            [base = static_cast<unsigned int>(bases[part])](unsigned int offset) { return base + offset; });
    });
    return result;
}

}
