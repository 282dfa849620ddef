#include "Deletion.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "frame/ElementTypes.h"
#include "host/GeoProperties.h"
#include "host/OptionalFeatures.h"

#include <Modeling/computeDeletedComponentMapping.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>

#include <algorithm>
#include <functional>

namespace Modeling::Internal {

using namespace Tessara::Geometry;
using Tessara::Object;
using Tessara::PropertyValue;

namespace {

    bool isKept(bool deleted)
    {
        return !deleted;
    }

    bool isKept(unsigned int newIndex)
    {
        return newIndex != kDeletedElement;
    }

    /// Lists the kept elements.
    /// \param entries  Flags of deleted elements, or a remap.
    template <class Entries> KeptElements keptElements(Entries const& entries)
    {
        auto const* const entry = entries.data;
        std::uint64_t keptCount = 0;
        for (std::uint64_t element = 0; element != entries.size; ++element)
            keptCount += isKept(entry[element]) ? 1 : 0;

        KeptElements kept{entries.size, uninitializedArray<unsigned int>(keptCount)};
        unsigned int* const source = kept.sources.data;
        // Without a branch, which would often be mispredicted: the index of a deleted element is overwritten by the
        // next one.
        std::uint64_t count = 0;
        for (unsigned int element = 0; count != keptCount; ++element) {
            source[count] = element;
            count += isKept(entry[element]) ? 1 : 0;
        }
        return kept;
    }

    [[maybe_unused]] bool areAscending(KeptElements const& kept)
    {
        IndexArray const& sources = kept.sources;
        return std::is_sorted(sources.begin(), sources.end(), std::less_equal<>())
            && (sources.empty() || sources[sources.size - 1] < kept.oldCount);
    }

    /// The length of the array that a value holds; 0 if it holds none of a listed type.
    std::uint64_t lengthOfArray(PropertyValue const& value)
    {
        std::uint64_t length = 0;
        bool matched = false;
        forEachElementType<AllElementTypes, ArrayForm>(&value, &matched, [&](auto const& array) {
            length = array ? array->size : 0;
            return true;
        });
        return length;
    }

    /// Marks the values of a range's data that no kept entry of the range refers to.
    Orvan::Array<bool> findUnused(std::uint64_t length, IndexArray const& indices, KeptElements const& kept)
    {
        Orvan::Array<bool> isUnused = filledArray<bool>(length, true);
        for (unsigned int const source : kept.sources)
            if (indices[source] < length) // false for `kInvalidIndex`
                isUnused[indices[source]] = false;
        return isUnused;
    }

    /// Whether each kept entry that refers to a value gets the new index of a kept value.
    [[maybe_unused]] bool leadsToKeptValues(
        IndexArray const& indices, KeptElements const& kept, IndexArray const& dataRemap, std::uint64_t keptValueCount)
    {
        return std::all_of(kept.sources.begin(), kept.sources.end(), [&](unsigned int source) {
            return indices[source] >= dataRemap.size || dataRemap[indices[source]] < keptValueCount;
        });
    }

    /// Whether the array, or the property that holds it, may be shared with something outside the object, which would
    /// see an edit in place.
    /// \param localReferences  How many variables of the caller refer to the array.
    template <class T> bool isShared(Object const& object, Orvan::String const& key,
        Orvan::Ptr<Orvan::Array<T>> const& array, std::uint64_t localReferences)
    {
        constexpr std::uint64_t kOwner = 1; // the object holds the property, and the property holds the array
        Orvan::Ptr<Object> const property = objectAt(object, key);
        return mayBeShared(property, kOwner + 1) || mayBeShared(array, kOwner + localReferences);
    }

    /// Removes the array from a clone of a property, so that the clone's reference does not count as sharing.
    PropertyValue takeArray(char const* arrayKey, Object& property)
    {
        PropertyValue array = property.getProperty(arrayKey);
        property.setProperty(arrayKey, PropertyValue());
        return array;
    }

}

bool Deletion::prepare(Orvan::String const& component, Orvan::Array<bool> const& deleted)
{
    return prepareEntries(component, deleted);
}

bool Deletion::prepare(Orvan::String const& component, IndexArray const& remap)
{
    return prepareEntries(component, remap);
}

template <class Entries> bool Deletion::prepareEntries(Orvan::String const& component, Entries const& entries)
{
    if (entries.size != getElementCount(object_, component))
        return false;
    kept_.push_back(std::make_unique<KeptElements>(keptElements(entries)));
    return prepare(component, *kept_.back());
}

bool Deletion::prepare(Orvan::String const& component, KeptElements const& kept)
{
    MODELING_ASSERT(areAscending(kept));
    unsigned int const oldCount = getElementCount(object_, component);
    if (oldCount != kept.oldCount || oldCount == 0)
        return false;
    // Setting the present count makes this object the only owner of the component, so that the commit does not
    // allocate.
    if (!setElementCount(component, oldCount, object_))
        return false;
    counts_.push_back({component, static_cast<unsigned int>(kept.sources.size)});

    for (auto& [name, property] : collectGeoPropsByTarget(object_, component)) {
        GeoPropertyKind const kind = classifier_.kindOf(*property);
        // Data without an array that can be compacted is kept unchanged, which is not a failure.
        if (kind == GeoPropertyKind::Data)
            prepareArray<AllElementTypes>(name, sData, std::move(property), kept);
        else if (kind == GeoPropertyKind::Range && !prepareRange(name, std::move(property), kept))
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
        if (classifier_.kindOf(*data) != GeoPropertyKind::Data)
            continue;
        if (!indices || dataRemap)
            return false; // only one data property of a range may have values, and only if entries refer to them
        Orvan::Array<bool> const isUnused = findUnused(lengthOfArray(data->getProperty(sData)), *indices, kept);
        kept_.push_back(std::make_unique<KeptElements>(keptElements(isUnused)));
        if (!isUnused.empty()) {
            remaps_.push_back(
                std::make_unique<IndexArray>(Tessara::GeometryAlgorithms::computeDeletedComponentMapping(isUnused)));
            dataRemap = remaps_.back().get();
            MODELING_ASSERT(leadsToKeptValues(*indices, kept, *dataRemap, kept_.back()->sources.size));
        }
        if (!prepareArray<AllElementTypes>(dataName, sData, std::move(data), *kept_.back()))
            return false;
    }
    indices = nullptr; // otherwise it would count as sharing
    if (prepareArray<ElementTypeList<unsigned int>>(name, sIndices, std::move(range), kept) && dataRemap)
        renumber(name, *dataRemap);
    return true;
}

/// Returns false if there is no array of these types that is at least as long as the component.
template <class Types> bool Deletion::prepareArray(
    Orvan::String const& key, char const* arrayKey, Orvan::MutablePtr<Object>&& property, KeptElements const& kept)
{
    PropertyValue const array = takeArray(arrayKey, *property);
    bool matched = false;
    forEachElementType<Types, ArrayForm>(&array, &matched, [&]<class T>(Orvan::Ptr<Orvan::Array<T>>& source) {
        if (!source || source->size < kept.oldCount)
            return false;
        bool const inPlace = !isShared(object_, key, source, 2); // `array` and `source`
        auto compaction = std::make_unique<CompactionOf<T>>(std::move(source), kept, inPlace);
        if (!key.empty())
            changes_.push_back({key, arrayKey, std::move(property), std::move(compaction)});
        return true;
    });
    return matched;
}

ArrayCompaction* Deletion::arrayAt(Orvan::String const& key)
{
    auto const change = std::find_if(changes_.begin(), changes_.end(), [&](Change const& c) { return c.key == key; });
    return change == changes_.end() ? nullptr : change->array.get();
}

void Deletion::renumber(Orvan::String const& key, IndexArray const& remap)
{
    if (ArrayCompaction* const array = arrayAt(key))
        array->renumber(remap);
}

void Deletion::renumberOffsets(Orvan::String const& key, KeptElements const& kept)
{
    if (ArrayCompaction* const array = arrayAt(key))
        array->renumberOffsets(kept);
}

void Deletion::fillArrays()
{
    if (changes_.empty())
        return;
    std::uint64_t elementCount = 0;
    for (Change const& change : changes_)
        elementCount += change.array->newSize();
    std::size_t const grain = elementCount <= kFewElements ? changes_.size() : 1;
    // Each change fills an array of its own.
    parallelFor(tbb::blocked_range<std::size_t>(0, changes_.size(), grain), [this](auto const& range) {
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
        object_.setProperty(change.key, Orvan::Ptr<Object>()); // releases the array, so that it can be edited in place
        PropertyValue array = change.array->finish();
        MODELING_ASSERT(lengthOfArray(array) == change.array->newSize());
        change.property->setProperty(change.arrayKey, std::move(array));
        object_.setProperty(change.key, Orvan::Ptr<Object>(std::move(change.property)));
    }
    counts_.clear();
    changes_.clear();
}

}
