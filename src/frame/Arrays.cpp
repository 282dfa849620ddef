#include "Arrays.h"

#include <cstring>

namespace Modeling {

namespace {

    /// Goes on by copying what it has filled, which is several times as fast as value by value for odd sizes.
    void fillBlock(std::byte* target, std::size_t bytes, void const* value, std::size_t size)
    {
        constexpr std::size_t kCopied = 4096; // stays in the nearest cache
        std::memcpy(target, value, size);
        std::size_t filled = size;
        for (; filled < bytes && filled < kCopied; filled *= 2)
            std::memcpy(target + filled, target, std::min(filled, bytes - filled));
        for (std::size_t const copied = filled; filled < bytes; filled += copied)
            std::memcpy(target + filled, target, std::min(copied, bytes - filled));
    }

}

void copyBytes(void const* source, std::size_t bytes, void* target)
{
    // Each block writes its own bytes.
    parallelFor(tbb::blocked_range<std::size_t>(0, bytes, Internal::kBlockBytes), [=](auto const& block) {
        std::memcpy(static_cast<std::byte*>(target) + block.begin(),
            static_cast<std::byte const*>(source) + block.begin(), block.size());
    });
}

void fillBytes(void* target, std::size_t count, void const* value, std::size_t size)
{
    std::size_t const grain = std::max<std::size_t>(1, Internal::kBlockBytes / size);
    // Each block writes its own elements.
    parallelFor(tbb::blocked_range<std::size_t>(0, count, grain), [=](auto const& block) {
        fillBlock(static_cast<std::byte*>(target) + block.begin() * size, block.size() * size, value, size);
    });
}

}
