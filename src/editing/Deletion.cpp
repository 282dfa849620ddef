#include "Deletion.h"

#include "frame/Arrays.h"
#include "frame/ElementTypes.h"
#include "host/GeoProperties.h"

#include <Modeling/computeDeletedComponentMapping.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Prototypes.h>

#include <algorithm>
#include <type_traits>
#include <utility>

namespace Tessara::GeometryAlgorithms::Internal {

using namespace Modeling;
using namespace Tessara::Geometry;

namespace {

    bool isKept(bool deleted)
    {
        return !deleted;
    }

    bool isKept(unsigned int newIndex)
    {
        return newIndex != kDeletedElement;
    }

    /// \param entries  flags or a remap
    template <class Entries> KeptElements keptElements(Entries const& entries)
    {
        auto const* const entry = entries.data;
        std::uint64_t keptCount = 0;
        for (std::uint64_t element = 0; element != entries.size; ++element)
            keptCount += isKept(entry[element]) ? 1 : 0;

        KeptElements kept{entries.size, uninitializedArray<unsigned int>(keptCount)};
        unsigned int* const source = kept.sources.data;
        // Without a branch, which would go wrong half of the time: what is written for a deleted element is overwritten.
        std::uint64_t count = 0;
        for (unsigned int element = 0; count != keptCount; ++element) {
            source[count] = element;
            count += isKept(entry[element]) ? 1 : 0;
        }
        return kept;
    }

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
                gather();
        }

        void fill() override
        {
            if constexpr (kTrivial)
                if (target_)
                    gather();
        }

        PropertyValue finish() override
        {
            if (!target_)
                compactInPlace();
            return Orvan::Ptr<Orvan::Array<T>>(std::move(target_));
        }

    protected:
        virtual void gather()
        {
            T const* const from = source_->data;
            T* const to = target_->data;
            unsigned int const* const source = kept_.data;
            for (std::uint64_t element = 0; element != kept_.size; ++element)
                to[element] = from[source[element]];
        }

        virtual void compactInPlace()
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

    class IndexCompaction final : public TypedCompaction<unsigned int> {
    public:
        using TypedCompaction::TypedCompaction;

        void renumber(Renumbering const& renumbering) override { renumbering_ = renumbering; }
        void close(unsigned int lastEntry) override
        {
            lastEntry_ = lastEntry;
            isClosed_ = true;
        }

        PropertyValue finish() override
        {
            if (!target_)
                compactInPlace();
            if (isClosed_)
                target_->append(lastEntry_); // there is room: the array was longer by one
            return TypedCompaction::finish();
        }

    private:
        void gather() override
        {
            if (!renumbering_.remap)
                return TypedCompaction::gather();
            for (std::uint64_t element = 0; element != kept_.size; ++element)
                (*target_)[element] = renumbering_((*source_)[kept_[element]]);
        }

        void compactInPlace() override
        {
            TypedCompaction::compactInPlace();
            if (renumbering_.remap)
                for (unsigned int& entry : *target_)
                    entry = renumbering_(entry);
        }

        Renumbering renumbering_;
        unsigned int lastEntry_ = 0;
        bool isClosed_ = false;
    };

    template <class T> using CompactionOf =
        std::conditional_t<std::is_same_v<T, unsigned int>, IndexCompaction, TypedCompaction<T>>;

    /// Takes the array out of a clone of a property, so that it does not count as somebody else who holds it.
    PropertyValue takeArray(char const* arrayKey, Object& property)
    {
        PropertyValue array = property.getProperty(arrayKey);
        property.setProperty(arrayKey, PropertyValue());
        return array;
    }

    bool isDataProperty(Object const& property)
    {
        return Object::isA(property, *getDataGeoPropPrototype(sGenericDataGeoProp));
    }

    std::uint64_t lengthOfData(Object const& property)
    {
        PropertyValue const data = property.getProperty(sData);
        std::uint64_t length = 0;
        bool matched = false;
        forEachElementType<AllElementTypes, ArrayForm>(&data, &matched, [&](auto const& array) {
            length = array ? array->size : 0;
            return true;
        });
        return length;
    }

    /// Marks the values of a range's data that no entry of an element that stays refers to.
    Orvan::Array<bool> findUnused(std::uint64_t length, IndexArray const& indices, KeptElements const& kept)
    {
        Orvan::Array<bool> isUnused = filledArray<bool>(length, true);
        for (unsigned int const source : kept.sources)
            if (indices[source] < length) // `kInvalidIndex` is not
                isUnused[indices[source]] = false;
        return isUnused;
    }

}

bool Deletion::prepare(Orvan::String const& component, Orvan::Array<bool> const& deleted)
{
    return prepareComponent(component, deleted);
}

bool Deletion::prepare(Orvan::String const& component, IndexArray const& remap)
{
    return prepareComponent(component, remap);
}

template <class Entries> bool Deletion::prepareComponent(Orvan::String const& component, Entries const& entries)
{
    unsigned int const oldCount = getElementCount(object_, component);
    if (oldCount != entries.size || oldCount == 0)
        return false;
    kept_.push_back(std::make_unique<KeptElements>(keptElements(entries)));
    KeptElements const& kept = *kept_.back();
    // Setting what is set makes the component this object's own, so that its new count takes no memory.
    if (!setElementCount(component, oldCount, object_))
        return false;
    counts_.push_back({component, static_cast<unsigned int>(kept.sources.size)});

    for (auto& [name, property] : collectGeoPropsByTarget(object_, component)) {
        // Data without a match stays as it is, and that is no failure.
        if (isDataProperty(*property))
            prepareArray<AllElementTypes>(name, sData, std::move(property), kept);
        else if (Object::isA(*property, *getRangeGeoPropPrototype()) && !prepareRange(name, std::move(property), kept))
            return false;
    }
    return true;
}

bool Deletion::prepareRange(Orvan::String const& name, Orvan::MutablePtr<Object>&& range, KeptElements const& kept)
{
    Orvan::Ptr<IndexArray> indices = getRangeGeoPropIndices(*range);
    if (indices && indices->empty())
        indices = nullptr;
    if (indices && indices->size < kept.oldCount)
        return true;

    IndexArray const* dataRemap = nullptr;
    for (auto& [dataName, data] : collectGeoPropsByTarget(object_, name)) {
        if (!isDataProperty(*data))
            continue;
        if (!indices || dataRemap)
            return false; // one data property with values to a range, and only where entries tell which are used
        Orvan::Array<bool> const isUnused = findUnused(lengthOfData(*data), *indices, kept);
        kept_.push_back(std::make_unique<KeptElements>(keptElements(isUnused)));
        if (!isUnused.empty()) {
            remaps_.push_back(std::make_unique<IndexArray>(computeDeletedComponentMapping(isUnused)));
            dataRemap = remaps_.back().get();
        }
        if (!prepareArray<AllElementTypes>(dataName, sData, std::move(data), *kept_.back()))
            return false;
    }
    indices = nullptr;
    prepareArray<ElementTypeList<unsigned int>>(name, sIndices, std::move(range), kept, {dataRemap, kInvalidIndex});
    return true;
}

/// False where there is no array of these types that reaches over the component.
template <class Types> bool Deletion::prepareArray(Orvan::String const& key, char const* arrayKey,
    Orvan::MutablePtr<Object>&& property, KeptElements const& kept, Renumbering const& renumbering)
{
    PropertyValue const array = takeArray(arrayKey, *property);
    constexpr std::uint64_t kOwnReferences = 2; // the object's and the one here
    bool const isPropertyShared = objectAt(object_, key).useCount() > kOwnReferences;
    bool matched = false;
    forEachElementType<Types, ArrayForm>(&array, &matched, [&]<class T>(Orvan::Ptr<Orvan::Array<T>>& source) {
        if (!source || source->size < kept.oldCount)
            return false;
        constexpr std::uint64_t kOwnArrayReferences = 3; // the property's, the value's and the one here
        bool const isShared = isPropertyShared || source.useCount() > kOwnArrayReferences;
        auto compaction = std::make_unique<CompactionOf<T>>(std::move(source), kept, !isShared);
        compaction->renumber(renumbering);
        if (!key.empty())
            changes_.push_back({key, arrayKey, std::move(property), std::move(compaction)});
        return true;
    });
    return matched;
}

void Deletion::renumber(Orvan::String const& key, Renumbering const& renumbering)
{
    for (Change& change : changes_)
        if (change.key == key)
            change.array->renumber(renumbering);
}

void Deletion::close(Orvan::String const& key, unsigned int lastEntry)
{
    for (Change& change : changes_)
        if (change.key == key)
            change.array->close(lastEntry);
}

void Deletion::fillArrays()
{
    std::uint64_t valueCount = 0;
    for (auto const& kept : kept_)
        valueCount += kept->sources.size;
    std::size_t const grain = valueCount <= kElementGrain ? changes_.size() : 1; // few values are not worth a task
    // Each property has an array of its own.
    parallelFor(tbb::blocked_range<std::size_t>(0, changes_.size(), std::max<std::size_t>(1, grain)),
        [this](auto const& range) {
            for (std::size_t change = range.begin(); change != range.end(); ++change)
                changes_[change].array->fill();
        });
}

void Deletion::commit()
{
    fillArrays();
    for (Count const& count : counts_)
        setElementCount(count.component, count.count, object_);
    for (Change& change : changes_) {
        object_.setProperty(
            change.key, Orvan::Ptr<Object>()); // an array that nobody else holds is free to be edited now
        change.property->setProperty(change.arrayKey, change.array->finish());
        object_.setProperty(change.key, Orvan::Ptr<Object>(std::move(change.property)));
    }
    counts_.clear();
    changes_.clear();
}

}
