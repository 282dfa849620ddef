#pragma once

#include "host/IndexArray.h"

#include <TessaraGeometry/Names.h>

#include <array>
#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <type_traits>

namespace Modeling::Internal {

/// The positions of the set bits of a word, in ascending order. Found without branches, for words with many runs of bits:
/// the end of each run would be mispredicted.
class SetBits {
public:
    explicit SetBits(std::uint64_t bits)
    {
        // The sums of the bits of each two, four and eight; then, in each byte, the sum of all bytes up to it.
        std::uint64_t counts = bits - ((bits >> 1) & 0x5555555555555555u);
        counts = (counts & 0x3333333333333333u) + ((counts >> 2) & 0x3333333333333333u);
        counts = (counts + (counts >> 4)) & 0x0F0F0F0F0F0F0F0Fu;
        counts *= kEachByte;
        unsigned int offset = 0;
        for (unsigned int byte = 0; byte != 8; ++byte) {
            std::uint64_t const positions = kPositionsInByte[bits >> 8 * byte & 0xFF] + 8 * byte * kEachByte;
            std::memcpy(positions_ + offset, &positions, sizeof(positions)); // the next byte overwrites the excess
            offset = static_cast<unsigned int>(counts >> 8 * byte & 0xFF);
        }
        count_ = offset;
    }

    unsigned int count() const { return count_; }
    unsigned int operator[](unsigned int i) const { return positions_[i]; }

private:
    static constexpr std::uint64_t kEachByte = 0x0101010101010101u;

    /// For each value of a byte, the positions of its set bits, one per byte from the lowest.
    static constexpr std::array<std::uint64_t, 256> kPositionsInByte = [] {
        std::array<std::uint64_t, 256> table{};
        for (unsigned int value = 0; value != 256; ++value)
            for (unsigned int bit = 8; bit-- != 0;)
                if ((value >> bit & 1) != 0)
                    table[value] = table[value] << 8 | bit;
        return table;
    }();

    std::uint8_t positions_[64];
    unsigned int count_;
};

/// The elements of a component that a deletion keeps, in a fifth of a byte per element: a bit for each, and for each
/// word of bits the number of elements kept before it. So any range of words can be compacted on its own.
class KeptElements {
public:
    using Words = Orvan::Array<std::uint64_t>;
    using One = std::integral_constant<std::uint64_t, 1>;
    static constexpr std::uint64_t kWordBits = 64;
    static std::size_t wordsFor(std::uint64_t elementCount) { return (elementCount + kWordBits - 1) / kWordBits; }

    /// \param deleted  One entry per element.
    explicit KeptElements(Orvan::Array<bool> const& deleted);
    /// \param remap  One entry per element; it is kept unless the entry is `kDeletedElement`.
    explicit KeptElements(IndexArray const& remap);
    /// \param bits  `wordsFor(oldCount)` words. Element i is kept if bit i % 64 of word i / 64 is set; the bits behind
    ///              the last element are clear.
    KeptElements(std::uint64_t oldCount, Words bits);

    std::uint64_t oldCount() const { return oldCount_; }
    std::uint64_t count() const { return ranks_[wordCount()]; }
    std::size_t wordCount() const { return bits_.size; }
    /// The number of elements kept before a word, which may be one past the last.
    unsigned int rank(std::size_t word) const { return ranks_[word]; }

    /// The new index; `kDeletedElement` for a deleted element, and the new element count for an index past the end.
    unsigned int newIndex(std::uint64_t oldIndex) const;

    /// The new index of each element, or `kDeletedElement`.
    IndexArray remap() const;

    /// The first word of which not all elements are kept, or one past the last.
    std::size_t firstWordWithDeleted() const;

    /// Visits the kept elements of a range of words, in ascending order: `visit(source, target, count)` for `count`
    /// successive elements from the old index `source`, whose new indices begin at `target`. The count is a
    /// `std::uint64_t`, or `One` where runs are short.
    template <class Visit> void visitRuns(std::size_t firstWord, std::size_t endWord, Visit visit) const;

private:
    static constexpr std::uint64_t kAll = ~std::uint64_t{0};

    /// Whether visiting single elements is faster than looking for the ends of runs, each of which is mispredicted.
    static bool hasManyRuns(std::uint64_t bits)
    {
        constexpr int kManyRuns = 6;
        std::uint64_t starts = bits & ~(bits << 1);
        for (int run = 0; run != kManyRuns; ++run)
            starts &= starts - 1; // clears the lowest
        return starts != 0;
    }

    std::uint64_t oldCount_;
    Words bits_;
    IndexArray ranks_; // of each word, and the number of kept elements
};

template <class Visit> void KeptElements::visitRuns(std::size_t firstWord, std::size_t endWord, Visit visit) const
{
    std::uint64_t const* const words = bits_.data;
    std::uint64_t target = ranks_[firstWord];
    for (std::size_t word = firstWord; word != endWord;) {
        std::uint64_t const base = word * kWordBits;
        std::uint64_t bits = words[word++];
        if (bits == kAll) {
            while (word != endWord && words[word] == kAll)
                ++word;
            std::uint64_t const count = word * kWordBits - base;
            visit(base, target, count);
            target += count;
        } else if (hasManyRuns(bits)) {
            SetBits const kept(bits);
            unsigned int i = 0;
            for (; i + 4 <= kept.count(); i += 4) { // a quarter of the jumps
                visit(base + kept[i], target + i, One());
                visit(base + kept[i + 1], target + i + 1, One());
                visit(base + kept[i + 2], target + i + 2, One());
                visit(base + kept[i + 3], target + i + 3, One());
            }
            for (; i != kept.count(); ++i)
                visit(base + kept[i], target + i, One());
            target += kept.count();
        } else {
            while (bits != 0) {
                auto const first = static_cast<unsigned int>(std::countr_zero(bits));
                auto const count = static_cast<unsigned int>(std::countr_one(bits >> first));
                visit(base + first, target, std::uint64_t{count});
                target += count;
                bits &= bits + (std::uint64_t{1} << first); // clears the lowest run
            }
        }
    }
}

inline unsigned int KeptElements::newIndex(std::uint64_t oldIndex) const
{
    if (oldIndex >= oldCount_)
        return static_cast<unsigned int>(count());
    std::uint64_t const word = bits_[oldIndex / kWordBits], bit = std::uint64_t{1} << oldIndex % kWordBits;
    if ((word & bit) == 0)
        return Tessara::Geometry::kDeletedElement;
    return ranks_[oldIndex / kWordBits] + static_cast<unsigned int>(std::popcount(word & (bit - 1)));
}

}
