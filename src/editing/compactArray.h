#pragma once

#include "KeptElements.h"
#include "frame/ParallelFor.h"

#include <tbb/task_arena.h>

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <cstring>

namespace Modeling::Internal {

/// Memory in which blocks of an array are compacted before they are moved to the front.
using CompactionBuffer = Orvan::Array<std::byte>;
/// Blocks of this size remain in the cache between the two steps.
inline constexpr std::uint64_t kCompactionBufferBytes = std::uint64_t{1} << 21;

/// Whether `compactInPlace` needs a buffer, of `kCompactionBufferBytes`, for an array of that many bytes.
inline bool needsCompactionBuffer(std::uint64_t bytes)
{
    return bytes > 2 * kBlockBytes && tbb::this_task_arena::max_concurrency() > 1;
}

// How elements get from one place to another: their size, whether they are unchanged, and an operator that moves `count`
// of them, toward the front if the two places overlap.

template <std::size_t kElementBytes> struct PlainTransfer {
    static constexpr std::size_t kBytes = kElementBytes;
    static constexpr bool kIsPlain = true;

    void operator()(std::byte* to, std::byte const* from, std::uint64_t count) const
    {
        std::memmove(to, from, count * kBytes);
    }
    void operator()(std::byte* to, std::byte const* from, KeptElements::One) const
    {
        std::array<std::byte, kBytes> element; // `to` may be `from`; faster than moving 12 bytes
        std::memcpy(&element, from, kBytes);
        std::memcpy(to, &element, kBytes);
    }
};

/// For indices: `newIndexOf(unsigned int)`, which must not throw.
template <class NewIndexOf> struct RenumberingTransfer {
    static constexpr std::size_t kBytes = sizeof(unsigned int);
    static constexpr bool kIsPlain = false;
    NewIndexOf newIndexOf;

    void operator()(std::byte* to, std::byte const* from, std::uint64_t count) const
    {
        for (std::uint64_t element = 0; element != count; ++element) {
            unsigned int entry;
            std::memcpy(&entry, from + element * kBytes, kBytes);
            entry = newIndexOf(entry);
            std::memcpy(to + element * kBytes, &entry, kBytes);
        }
    }
};

template <class NewIndexOf> RenumberingTransfer(NewIndexOf) -> RenumberingTransfer<NewIndexOf>;

/// Compacts the elements of a range of words.
/// \param to  For the first kept element of the range.
template <class Transfer> void compactWords(KeptElements const& kept, tbb::blocked_range<std::size_t> const& words,
    Transfer const& transfer, std::byte const* from, std::byte* to)
{
    std::uint64_t const first = kept.rank(words.begin());
    kept.visitRuns(words.begin(), words.end(), [=](std::uint64_t source, std::uint64_t target, auto count) {
        transfer(to + (target - first) * Transfer::kBytes, from + source * Transfer::kBytes, count);
    });
}

template <class Transfer> constexpr std::size_t wordsIn(std::size_t bytes)
{
    return std::max<std::size_t>(1, bytes / Transfer::kBytes / KeptElements::kWordBits);
}

/// Copies the kept elements to another array; blocks of large ones in parallel.
template <class Transfer>
void compact(KeptElements const& kept, Transfer const& transfer, void const* source, void* target)
{
    auto const* const from = static_cast<std::byte const*>(source);
    auto* const to = static_cast<std::byte*>(target);
    // Each word has elements of its own in the target.
    parallelFor(
        tbb::blocked_range<std::size_t>(0, kept.wordCount(), wordsIn<Transfer>(kBlockBytes)), [&](auto const& words) {
            compactWords(kept, words, transfer, from, to + kept.rank(words.begin()) * Transfer::kBytes);
        });
}

/// Runs a loop whose body may be repeated, and does not throw: if oneTBB runs out of memory, the calling thread runs
/// the loop once more.
template <class Body> void runRepeatable(tbb::blocked_range<std::size_t> const& range, Body const& body) noexcept
{
    try {
        parallelFor(range, body);
    } catch (...) {
        body(range);
    }
}

/// Moves the kept elements to the front of their array. Does not throw.
///
/// Elements of a block move to places of elements before it. So the buffer takes one part of the array after the other:
/// its blocks are compacted into the buffer in parallel, which reads what has to be read of the array, and then
/// copied to the front, in parallel too. Both steps can be repeated.
/// \param buffer  If empty, the calling thread moves all elements.
template <class Transfer>
void compactInPlace(KeptElements const& kept, Transfer const& transfer, void* values, CompactionBuffer& buffer) noexcept
{
    constexpr std::size_t kPartWords = wordsIn<Transfer>(kCompactionBufferBytes);
    constexpr std::size_t kGrain = wordsIn<Transfer>(kBlockBytes);
    auto* const value = static_cast<std::byte*>(values);
    std::size_t const begin = Transfer::kIsPlain ? kept.firstWordWithDeleted() : 0, end = kept.wordCount();
    std::size_t const step = buffer.empty() ? std::max<std::size_t>(1, end - begin) : kPartWords;
    for (std::size_t first = begin; first < end; first += step) {
        tbb::blocked_range<std::size_t> const part(first, std::min(first + step, end), kGrain);
        std::byte* const target = value + kept.rank(first) * Transfer::kBytes;
        if (buffer.empty()) {
            compactWords(kept, part, transfer, value, target);
            continue;
        }
        std::byte* const staged = buffer.data;
        runRepeatable(part, [&, first](auto const& words) {
            std::size_t const offset = (kept.rank(words.begin()) - kept.rank(first)) * Transfer::kBytes;
            compactWords(kept, words, transfer, value, staged + offset);
        });
        std::size_t const bytes = (kept.rank(part.end()) - kept.rank(first)) * Transfer::kBytes;
        runRepeatable({0, bytes, kBlockBytes},
            [=](auto const& block) { std::memcpy(target + block.begin(), staged + block.begin(), block.size()); });
    }
}

}
