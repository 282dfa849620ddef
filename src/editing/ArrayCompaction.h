#pragma once

#include "host/IndexArray.h"

#include <OrvanCore/Array.h>
#include <OrvanCore/Ptr.h>
#include <TessaraGeometry/Names.h>
#include <TessaraObject/PropertyValue.h>

#include <algorithm>
#include <cstdint>
#include <type_traits>
#include <utility>

namespace Modeling::Internal {

/// The elements that are kept, out of `oldCount`.
struct KeptElements {
    std::uint64_t oldCount = 0;
    IndexArray sources; // the old index of each kept element, ascending
};

/// Compacts one array to the kept elements: into a new array or, if the old one is not shared, in place.
class ArrayCompaction {
public:
    virtual ~ArrayCompaction() = default;
    virtual std::uint64_t newSize() const = 0;
    /// Fills the new array. Does nothing if the compaction is in place, or if copying may throw: the constructor has
    /// filled the array then. May be called on any thread.
    virtual void fill() = 0;
    /// Returns the compacted array. To be called once the object has released the old one. Does not allocate.
    virtual Tessara::PropertyValue finish() = 0;

    // To be called for index arrays before `fill`. The arguments must live until `finish`.

    /// Entry e becomes `remap[e]`, or `kInvalidIndex` if the remap is too short for it.
    virtual void renumber(IndexArray const&) { }
    /// For offset arrays: maps entries from old to new indices of the elements that they refer to, of which `kept`
    /// remain, and appends the closing entry.
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
        // Reserves room for the closing entry of offset arrays, which are longer than their component.
        target_->reserve(kept_.size + (source_->size > kept.oldCount ? 1 : 0));
        target_->resize(kept_.size, Orvan::kUninitialized);
        if constexpr (!kTrivial)
            copyKept();
    }

    std::uint64_t newSize() const override { return kept_.size; }

    void fill() override
    {
        if constexpr (kTrivial)
            if (target_)
                copyKept();
    }

    Tessara::PropertyValue finish() override
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
        target_ = makeMutable(std::move(source_)); // does not copy: this is the last reference
        T* const values = target_->data;
        unsigned int const* const source = kept_.data;
        // Values only move toward the front, so none is overwritten before it has moved.
        for (std::uint64_t element = 0; element != kept_.size; ++element)
            if (source[element] != element)
                values[element] = std::move(values[source[element]]);
        target_->resize(kept_.size);
    }

    IndexArray const& kept_;
    Orvan::Ptr<Orvan::Array<T>> source_;
    Orvan::MutablePtr<Orvan::Array<T>> target_; // if in place, null until `finish`
};

/// Maps old indices of elements to new ones. Fastest if the queries ascend.
class NewIndices {
public:
    explicit NewIndices(KeptElements const& kept)
        : oldCount_(kept.oldCount)
        , sources_(kept.sources)
    {
    }

    /// The new index; `kDeletedElement` for a deleted element, and the new element count for an index past the end.
    unsigned int of(unsigned int oldIndex)
    {
        if (oldIndex >= oldCount_)
            return static_cast<unsigned int>(sources_.size);
        if (last_ == sources_.size || sources_[last_] > oldIndex)
            last_ = 0;
        if (sources_.empty() || sources_[last_] > oldIndex)
            return Tessara::Geometry::kDeletedElement;
        // The new index is at most `latest`, and equal to it if no element in between was deleted.
        std::uint64_t const latest = std::min(last_ + (oldIndex - sources_[last_]), sources_.size - 1);
        last_ = sources_[latest] == oldIndex
            ? latest
            : static_cast<std::uint64_t>(
                std::lower_bound(sources_.data + last_, sources_.data + latest, oldIndex) - sources_.data);
        return sources_[last_] == oldIndex ? static_cast<unsigned int>(last_) : Tessara::Geometry::kDeletedElement;
    }

private:
    std::uint64_t oldCount_;
    IndexArray const& sources_;
    std::uint64_t last_ = 0; // where the search of the last query ended
};

class IndexCompaction final : public TypedCompaction<unsigned int> {
public:
    using TypedCompaction::TypedCompaction;

    std::uint64_t newSize() const override { return kept_.size + (offsetKept_ ? 1 : 0); }

    void renumber(IndexArray const& remap) override { remap_ = &remap; }
    void renumberOffsets(KeptElements const& kept) override { offsetKept_ = &kept; }

    void fill() override
    {
        if (target_ && !writeRenumbered(source_->data, kept_.data))
            copyKept();
    }

    Tessara::PropertyValue finish() override
    {
        if (!target_) {
            compactInPlace();
            writeRenumbered(target_->data, nullptr);
        }
        if (offsetKept_) // does not allocate: there was room for the closing entry
            target_->append(static_cast<unsigned int>(offsetKept_->sources.size));
        return TypedCompaction::finish();
    }

private:
    /// Writes the renumbered entries. Returns false, with nothing written, if they are not to be renumbered.
    /// \param source  For each kept element, its index in `entries`; null if `entries` is already compact.
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
            writeAll([remap = remap_->data, size = remap_->size](unsigned int entry) {
                return entry < size ? remap[entry] : Tessara::Geometry::kInvalidIndex;
            });
        return remap_ || offsetKept_;
    }

    IndexArray const* remap_ = nullptr;
    KeptElements const* offsetKept_ = nullptr;
};

template <class T> using CompactionOf =
    std::conditional_t<std::is_same_v<T, unsigned int>, IndexCompaction, TypedCompaction<T>>;

}
