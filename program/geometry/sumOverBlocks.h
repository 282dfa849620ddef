#pragma once

#include <tbb/blocked_range.h>
#include <tbb/parallel_for.h>

#include <algorithm>
#include <cstddef>
#include <vector>

namespace ModelingProgram {

/// Calls `sumOf(begin, end)` for blocks of a fixed size in parallel, and adds the results in the order of the blocks.
template <class Sum, std::size_t kBlock = 4096, class SumOf> Sum sumOverBlocks(std::size_t count, SumOf const& sumOf)
{
    std::vector<Sum> sums((count + kBlock - 1) / kBlock);
    tbb::parallel_for(tbb::blocked_range<std::size_t>(0, sums.size(), 1), [&](auto const& blocks) {
        for (std::size_t block = blocks.begin(); block != blocks.end(); ++block)
            sums[block] = sumOf(block * kBlock, std::min((block + 1) * kBlock, count));
    });
    Sum total{};
    for (Sum const& sum : sums)
        total += sum;
    return total;
}

}
