#include "OutputBlocks.h"

#include "frame/ParallelFor.h"

#include <algorithm>
#include <vector>

namespace ModelingProgram {

namespace {

    constexpr std::size_t kBlockBytes = std::size_t{1} << 19; // fits the second-level cache
    constexpr std::size_t kMostBlocks = 16; // that are filled before they are written

}

void OutputBuffer::grow(std::size_t bytes)
{
    std::size_t const used = size();
    std::size_t const capacity = std::max({kBlockBytes, used + bytes, capacity_ + capacity_ / 2});
    auto larger = std::make_unique_for_overwrite<char[]>(capacity);
    if (used != 0)
        std::memcpy(larger.get(), bytes_.get(), used);
    bytes_ = std::move(larger);
    capacity_ = capacity;
    end_ = bytes_.get() + used;
}

void writeInBlocks(std::uint64_t count, std::size_t bytesEach,
    std::function<void(std::uint64_t first, std::uint64_t end, OutputBuffer&)> const& fill, OutputFile& out)
{
    std::uint64_t const blockSize = std::max<std::uint64_t>(1, kBlockBytes / std::max<std::size_t>(1, bytesEach));
    std::uint64_t const blockCount = (count + blockSize - 1) / blockSize;
    std::vector<OutputBuffer> filled, written;
    for (std::uint64_t block = 0; block != blockCount || !filled.empty();) {
        std::swap(filled, written);
        std::uint64_t const fillCount = std::min<std::uint64_t>(kMostBlocks, blockCount - block);
        filled.resize(fillCount);
        // The first task writes the blocks that were filled before, the others fill one block each.
        Modeling::parallelFor(tbb::blocked_range<std::uint64_t>(0, fillCount + 1, Modeling::kCoarseGrain),
            [&](tbb::blocked_range<std::uint64_t> const& tasks) {
                for (std::uint64_t task = tasks.begin(); task != tasks.end(); ++task) {
                    if (task == 0) {
                        for (OutputBuffer const& buffer : written)
                            out << buffer.text();
                        continue;
                    }
                    std::uint64_t const first = (block + task - 1) * blockSize;
                    filled[task - 1].clear();
                    fill(first, std::min(count, first + blockSize), filled[task - 1]);
                }
            });
        block += fillCount;
    }
}

}
