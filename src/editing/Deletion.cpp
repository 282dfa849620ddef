#include "Deletion.h"

#include "frame/Arrays.h"
#include "frame/ElementTypes.h"
#include "host/GeoProperties.h"

#include <Modeling/computeDeletedComponentMapping.h>
#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Prototypes.h>

#include <algorithm>

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
        // Without a branch, which would go wrong half of the time: what is written for a deleted element is
        // overwritten.
        std::uint64_t count = 0;
        for (unsigned int element = 0; count != keptCount; ++element) {
            source[count] = element;
            count += isKept(entry[element]) ? 1 : 0;
        }
        return kept;
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

    /// Marks the values of a range's data to which no element that stays has an entry.
    Orvan::Array<bool> findUnused(std::uint64_t length, IndexArray const& indices, KeptElements const& kept)
    {
        Orvan::Array<bool> isUnused = filledArray<bool>(length, true);
        for (unsigned int const source : kept.sources)
            if (indices[source] < length) // `kInvalidIndex` is not
                isUnused[indices[source]] = false;
        return isUnused;
    }

    /// Takes the array out of a clone of a property, so that the clone does not count as somebody else who holds it.
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
    unsigned int const oldCount = getElementCount(object_, component);
    if (oldCount != kept.oldCount || oldCount == 0)
        return false;
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
    if (prepareArray<ElementTypeList<unsigned int>>(name, sIndices, std::move(range), kept) && dataRemap)
        renumber(name, *dataRemap);
    return true;
}

/// False where there is no array of these types that reaches over the component.
template <class Types> bool Deletion::prepareArray(
    Orvan::String const& key, char const* arrayKey, Orvan::MutablePtr<Object>&& property, KeptElements const& kept)
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
    constexpr std::uint64_t kFewElements = 1 << 16; // up to here one thread is done before a second one has woken up
    std::size_t const grain = elementCount <= kFewElements ? changes_.size() : 1;
    // Each property has a new array of its own.
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
        object_.setProperty(change.key, Orvan::Ptr<Object>()); // lets go of the array, which may be edited in place
        change.property->setProperty(change.arrayKey, change.array->finish());
        object_.setProperty(change.key, Orvan::Ptr<Object>(std::move(change.property)));
    }
    counts_.clear();
    changes_.clear();
}

}
