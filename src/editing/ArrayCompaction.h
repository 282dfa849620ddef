#pragma once

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <TessaraGeometry/Names.h>
#include <TessaraObject/PropertyValue.h>

#include <algorithm>
#include <cstdint>
#include <type_traits>
#include <utility>

namespace Tessara::GeometryAlgorithms::Internal {

using IndexArray = Orvan::Array<unsigned int>;

/// The elements that stay, of as many as there were.
struct KeptElements {
    std::uint64_t oldCount = 0;
    IndexArray sources; // for each element that stays its old index; ascending
};

/// One array on its way to the elements that stay: into a new array, or in place where nobody else holds the old one.
class ArrayCompaction {
public:
    virtual ~ArrayCompaction() = default;
    virtual std::uint64_t newSize() const = 0;
    /// Fills the new array, where there is one and where that cannot fail: on any thread.
    virtual void fill() = 0;
    /// The compacted array, after the object has let go of the old one. Takes no memory.
    virtual PropertyValue finish() = 0;

    // For index arrays, before they are filled. What is referred to has to live until `finish`.

    /// Entry e becomes `remap[e]`, or `kInvalidIndex` where the remap has no such entry.
    virtual void renumber(IndexArray const&) { }
    /// For offsets, with their one entry more: into the elements that stay of those into which the old ones are.
    virtual void renumberOffsets(KeptElements const&) { }
};

template <class T> class TypedCompaction : public ArrayCompaction {
    static constexpr bool kTrivial = std::is_trivially_copyable_v<T>;

public:
    TypedCompaction(Orvan::Ptr<Orvan::Array<T>> source, KeptElements const& kept, bool inPlace)
        : kept_(kept.sources)
        , source_(std::move(source))
    {
        if (inPlace)
            return;
        target_ = Orvan::MutablePtr<Orvan::Array<T>>::make();
        // An array that goes beyond its component may get its last entry back.
        target_->reserve(kept_.size + (source_->size > kept.oldCount ? 1 : 0));
        target_->resize(kept_.size, Orvan::kUninitialized);
        if constexpr (!kTrivial)
            copyKept();
    }

    std::uint64_t newSize() const final { return kept_.size; }

    void fill() override
    {
        if constexpr (kTrivial)
            if (target_)
                copyKept();
    }

    PropertyValue finish() override
    {
        if (!target_)
            compactInPlace();
        return Orvan::Ptr<Orvan::Array<T>>(std::move(target_));
    }

protected:
    void copyKept()
    {
        T const* const from = source_->data;
        T* const to = target_->data;
        unsigned int const* const source = kept_.data;
        for (std::uint64_t element = 0; element != kept_.size; ++element)
            to[element] = from[source[element]];
    }

    void compactInPlace()
    {
        target_ = makeMutable(std::move(source_)); // held by nobody else by now, so that this does not copy
        T* const values = target_->data;
        unsigned int const* const source = kept_.data;
        // Values only move forward, over those that have moved.
        for (std::uint64_t element = 0; element != kept_.size; ++element)
            if (source[element] != element)
                values[element] = std::move(values[source[element]]);
        target_->resize(kept_.size);
    }

    IndexArray const& kept_;
    Orvan::Ptr<Orvan::Array<T>> source_;
    Orvan::MutablePtr<Orvan::Array<T>> target_; // null until `finish` for compaction in place
};

/// Finds new indices of elements. Asking in ascending order is quick.
class NewIndices {
public:
    explicit NewIndices(KeptElements const& kept)
        : oldCount_(kept.oldCount)
        , sources_(kept.sources)
    {
    }

    /// `kDeletedElement` for an element that goes, the new number of elements for an index beyond all.
    unsigned int of(unsigned int oldIndex)
    {
        if (oldIndex >= oldCount_)
            return static_cast<unsigned int>(sources_.size);
        if (last_ == sources_.size || sources_[last_] > oldIndex)
            last_ = 0;
        if (sources_.empty() || sources_[last_] > oldIndex)
            return Geometry::kDeletedElement;
        // As many elements further on as if none in between went, or before that.
        std::uint64_t const most = std::min(last_ + (oldIndex - sources_[last_]), sources_.size - 1);
        last_ = sources_[most] == oldIndex
            ? most
            : static_cast<std::uint64_t>(
                std::lower_bound(sources_.data + last_, sources_.data + most, oldIndex) - sources_.data);
        return sources_[last_] == oldIndex ? static_cast<unsigned int>(last_) : Geometry::kDeletedElement;
    }

private:
    std::uint64_t oldCount_;
    IndexArray const& sources_;
    std::uint64_t last_ = 0; // a new index near the one that was asked for last
};

class IndexCompaction final : public TypedCompaction<unsigned int> {
public:
    using TypedCompaction::TypedCompaction;

    void renumber(IndexArray const& remap) override { remap_ = &remap; }
    void renumberOffsets(KeptElements const& kept) override { offsetKept_ = &kept; }

    void fill() override
    {
        if (target_ && !writeRenumbered(source_->data, kept_.data))
            copyKept();
    }

    PropertyValue finish() override
    {
        if (!target_) {
            compactInPlace();
            writeRenumbered(target_->data, nullptr);
        }
        if (offsetKept_) // there is room for the entry that was cut off
            target_->append(static_cast<unsigned int>(offsetKept_->sources.size));
        return TypedCompaction::finish();
    }

private:
    /// Writes the new entries. False where they are the old ones.
    /// \param source  where the old ones lie; null for the same places
    bool writeRenumbered(unsigned int const* entries, unsigned int const* source)
    {
        auto const writeAll = [&](auto&& newEntryOf) {
            unsigned int* const to = target_->data;
            for (std::uint64_t element = 0; element != kept_.size; ++element)
                to[element] = newEntryOf(entries[source ? source[element] : element]);
        };
        if (offsetKept_)
            writeAll(
                [newIndices = NewIndices(*offsetKept_)](unsigned int entry) mutable { return newIndices.of(entry); });
        else if (remap_)
            writeAll([remap = remap_->data, size = remap_->size](
                         unsigned int entry) { return entry < size ? remap[entry] : Geometry::kInvalidIndex; });
        return remap_ || offsetKept_;
    }

    IndexArray const* remap_ = nullptr;
    KeptElements const* offsetKept_ = nullptr;
};

template <class T> using CompactionOf =
    std::conditional_t<std::is_same_v<T, unsigned int>, IndexCompaction, TypedCompaction<T>>;

}
