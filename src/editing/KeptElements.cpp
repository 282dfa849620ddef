#include "KeptElements.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"

#include <TessaraGeometry/Names.h>

#include <algorithm>
#include <cstring>
#include <utility>

namespace Modeling::Internal {

using Tessara::Geometry::kDeletedElement;

namespace {

    constexpr std::size_t kWordGrain = kElementGrain / 8; // 8000 elements take a few microseconds

    std::uint64_t keptBits(bool const* deleted, std::size_t count)
    {
        std::uint64_t bits = 0;
        std::size_t element = 0;
        for (; element + 8 <= count; element += 8) {
            // Each of eight bytes is 0 or 1. The product has them in this order in its highest byte.
            std::uint64_t eight;
            std::memcpy(&eight, deleted + element, sizeof(eight));
            bits |= (((eight * 0x0102040810204080u) >> 56) ^ 0xFFu) << element;
        }
        for (; element != count; ++element)
            bits |= std::uint64_t{!deleted[element]} << element;
        return bits;
    }

    std::uint64_t keptBits(unsigned int const* newIndex, std::size_t count)
    {
        std::uint64_t bits = 0;
        for (std::size_t element = 0; element != count; ++element)
            bits |= std::uint64_t{newIndex[element] != kDeletedElement} << element;
        return bits;
    }

    template <class Entries> KeptElements::Words wordsOf(Entries const& entries)
    {
        auto words = uninitializedArray<std::uint64_t>(KeptElements::wordsFor(entries.size));
        // Each word is computed from its own entries.
        parallelFor(tbb::blocked_range<std::size_t>(0, words.size, kWordGrain), [&](auto const& range) {
            for (std::size_t word = range.begin(); word != range.end(); ++word) {
                std::uint64_t const first = word * KeptElements::kWordBits;
                words.data[word] =
                    keptBits(entries.data + first, std::min(KeptElements::kWordBits, entries.size - first));
            }
        });
        return words;
    }

}

KeptElements::KeptElements(Orvan::Array<bool> const& deleted)
    : KeptElements(deleted.size, wordsOf(deleted))
{
}

KeptElements::KeptElements(IndexArray const& remap)
    : KeptElements(remap.size, wordsOf(remap))
{
}

KeptElements::KeptElements(std::uint64_t oldCount, Words bits)
    : oldCount_(oldCount)
    , bits_(std::move(bits))
    , ranks_(offsetsFromCounts(
          bits_.size, [word = bits_.data](std::size_t i) { return static_cast<unsigned int>(std::popcount(word[i])); }))
{
    MODELING_ASSERT(bits_.size == wordsFor(oldCount) && count() <= oldCount);
}

IndexArray KeptElements::remap() const
{
    IndexArray newIndices = uninitializedArray<unsigned int>(oldCount_);
    // Each word has entries of its own.
    parallelFor(tbb::blocked_range<std::size_t>(0, wordCount(), kWordGrain), [&](auto const& range) {
        unsigned int next = ranks_[range.begin()];
        for (std::size_t word = range.begin(); word != range.end(); ++word) {
            std::uint64_t bits = bits_[word];
            std::uint64_t const first = word * kWordBits, end = std::min(first + kWordBits, oldCount_);
            for (std::uint64_t element = first; element != end; ++element, bits >>= 1) {
                bool const isKept = (bits & 1) != 0;
                newIndices.data[element] = isKept ? next : kDeletedElement;
                next += isKept ? 1 : 0;
            }
        }
    });
    return newIndices;
}

std::size_t KeptElements::firstWordWithDeleted() const
{
    return static_cast<std::size_t>(
        std::find_if(bits_.begin(), bits_.end(), [](std::uint64_t word) { return word != kAll; }) - bits_.begin());
}

}
