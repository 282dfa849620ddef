#include "Arrays.h"

#include "Assert.h"

#include <cstring>

namespace Modeling {

namespace {

    /// Writes one value, doubles the filled part until it is a few kilobytes long, and copies that part to the rest.
    /// For sizes that are not a power of two, this is several times as fast as copying value by value.
    void fillBlock(std::byte* target, std::size_t bytes, void const* value, std::size_t size)
    {
        constexpr std::size_t kCopied = 4096; // bytes; remains in the L1 cache
        std::memcpy(target, value, size);
        std::size_t filled = size;
        for (; filled < bytes && filled < kCopied; filled *= 2)
            std::memcpy(target + filled, target, std::min(filled, bytes - filled));
        for (std::size_t const copied = filled; filled < bytes; filled += copied)
            std::memcpy(target + filled, target, std::min(copied, bytes - filled));
    }

    /// Whether two ranges of memory have no byte in common.
    [[maybe_unused]] bool areApart(void const* a, std::size_t aBytes, void const* b, std::size_t bBytes)
    {
        auto const first = reinterpret_cast<std::uintptr_t>(a), second = reinterpret_cast<std::uintptr_t>(b);
        return first + aBytes <= second || second + bBytes <= first;
    }

}

void copyBytes(void const* source, std::size_t bytes, void* target)
{
    MODELING_ASSERT(areApart(source, bytes, target, bytes));
    // Each block writes its own bytes.
    parallelFor(tbb::blocked_range<std::size_t>(0, bytes, Internal::kBlockBytes), [=](auto const& block) {
        std::memcpy(static_cast<std::byte*>(target) + block.begin(),
            static_cast<std::byte const*>(source) + block.begin(), block.size());
    });
}

void fillBytes(void* target, std::size_t count, void const* value, std::size_t size)
{
    MODELING_ASSERT(size != 0 && areApart(target, count * size, value, size));
    std::size_t const grain = std::max<std::size_t>(1, Internal::kBlockBytes / size);
    // Each block writes its own elements.
    parallelFor(tbb::blocked_range<std::size_t>(0, count, grain), [=](auto const& block) {
        fillBlock(static_cast<std::byte*>(target) + block.begin() * size, block.size() * size, value, size);
    });
}

}
