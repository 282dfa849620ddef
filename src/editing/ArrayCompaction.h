#pragma once

#include "ArrayEdit.h"
#include "compactArray.h"
#include "frame/Assert.h"
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

/// Compacts one array to the kept elements: into a new array or, if the old one is not shared, in place.
class ArrayCompaction : public ArrayEdit {
public:
    virtual std::uint64_t newSize() const = 0;
    /// Fills the new array, blocks of it in parallel. Does nothing if the compaction is in place, or if copying may
    /// throw: the constructor has filled the array then.
    virtual void fill() = 0;

    // To be called for index arrays before `fill`. The arguments must live until `finish`.

    /// Entry e becomes `remap[e]`, or `kInvalidIndex` if the remap is too short for it.
    virtual void renumber(IndexArray const&) { }
    /// For offset arrays: maps entries from old to new indices of the elements that they refer to, of which `kept`
    /// remain, and appends the closing entry.
    virtual void renumberOffsets(KeptElements const&) { }
};

template <class T> class TypedCompaction : public ArrayCompaction {
protected:
    static constexpr bool kTrivial = std::is_trivially_copyable_v<T>;
    using Plain = PlainTransfer<sizeof(T)>;

public:
    /// \param buffer  For `finish`, of a deletion whose arrays are compacted one after another.
    TypedCompaction(
        Orvan::Ptr<Orvan::Array<T>> source, KeptElements const& kept, bool inPlace, CompactionBuffer& buffer)
        : kept_(kept)
        , source_(std::move(source))
        , buffer_(buffer)
    {
        if (inPlace) {
            if (kTrivial && buffer_.empty() && needsCompactionBuffer(kept.oldCount() * sizeof(T)))
                buffer_ = CompactionBuffer(kCompactionBufferBytes, Orvan::kUninitialized);
            return;
        }
        target_ = Orvan::MutablePtr<Orvan::Array<T>>::make();
        // Reserves room for the closing entry of offset arrays, which are longer than their component.
        target_->reserve(kept.count() + (source_->size > kept.oldCount() ? 1 : 0));
        target_->resize(kept.count(), Orvan::kUninitialized);
        if constexpr (!kTrivial)
            kept_.visitRuns(0, kept_.wordCount(), [&](std::uint64_t from, std::uint64_t to, std::uint64_t count) {
                std::copy_n(source_->data + from, count, target_->data + to);
            });
    }

    std::uint64_t newSize() const override { return kept_.count(); }

    void fill() override
    {
        if constexpr (kTrivial)
            if (target_)
                compact(kept_, Plain(), source_->data, target_->data);
    }

    Tessara::PropertyValue finish() override
    {
        if (!target_) {
            if constexpr (kTrivial)
                editInPlace(Plain());
            else
                moveInPlace();
        }
        MODELING_ASSERT(target_->size == newSize());
        return Orvan::Ptr<Orvan::Array<T>>(std::move(target_));
    }

protected:
    template <class Transfer> void editInPlace(Transfer const& transfer)
    {
        target_ = makeMutable(std::move(source_)); // does not copy: this is the last reference
        bool const isLarge = needsCompactionBuffer(kept_.oldCount() * sizeof(T));
        CompactionBuffer none;
        compactInPlace(kept_, transfer, target_->data, isLarge ? buffer_ : none);
        target_->resize(kept_.count(), Orvan::kUninitialized);
    }

    void moveInPlace()
    {
        target_ = makeMutable(std::move(source_)); // does not copy: this is the last reference
        T* const values = target_->data;
        // Values only move toward the front, so none is overwritten before it has moved.
        kept_.visitRuns(0, kept_.wordCount(), [=](std::uint64_t from, std::uint64_t to, std::uint64_t count) {
            if (from != to)
                std::move(values + from, values + from + count, values + to);
        });
        target_->resize(kept_.count());
    }

    KeptElements const& kept_;
    Orvan::Ptr<Orvan::Array<T>> source_;
    Orvan::MutablePtr<Orvan::Array<T>> target_; // if in place, null until `finish`
    CompactionBuffer& buffer_;
};

class IndexCompaction final : public TypedCompaction<unsigned int> {
public:
    using TypedCompaction::TypedCompaction;

    std::uint64_t newSize() const override { return kept_.count() + (offsetKept_ ? 1 : 0); }

    void renumber(IndexArray const& remap) override { remap_ = &remap; }
    void renumberOffsets(KeptElements const& kept) override { offsetKept_ = &kept; }

    void fill() override
    {
        if (target_)
            withTransfer([&](auto const& transfer) { compact(kept_, transfer, source_->data, target_->data); });
    }

    Tessara::PropertyValue finish() override
    {
        if (!target_)
            withTransfer([&](auto const& transfer) { editInPlace(transfer); });
        if (offsetKept_) // does not allocate: there was room for the closing entry
            target_->append(static_cast<unsigned int>(offsetKept_->count()));
        return TypedCompaction::finish();
    }

private:
    template <class Use> void withTransfer(Use const& use)
    {
        if (offsetKept_)
            use(RenumberingTransfer{[kept = offsetKept_](unsigned int entry) { return kept->newIndex(entry); }});
        else if (remap_)
            use(RenumberingTransfer{[remap = remap_->data, size = remap_->size](unsigned int entry) {
                return entry < size ? remap[entry] : Tessara::Geometry::kInvalidIndex;
            }});
        else
            use(Plain());
    }

    IndexArray const* remap_ = nullptr;
    KeptElements const* offsetKept_ = nullptr;
};

template <class T> using CompactionOf =
    std::conditional_t<std::is_same_v<T, unsigned int>, IndexCompaction, TypedCompaction<T>>;

}
