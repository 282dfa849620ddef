#include "Deletion.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"
#include "frame/ElementTypes.h"
#include "host/GeoProperties.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>

#include <algorithm>
#include <atomic>

namespace Modeling::Internal {

using namespace Tessara::Geometry;
using Tessara::Object;
using Tessara::PropertyValue;

namespace {

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

    /// Whether each kept entry that refers to a value gets the new index of a kept value.
    [[maybe_unused]] bool leadsToKeptValues(
        IndexArray const& indices, KeptElements const& kept, IndexArray const& dataRemap, std::uint64_t keptValueCount)
    {
        IndexArray const remap = kept.remap();
        for (std::uint64_t i = 0; i != remap.size; ++i) {
            bool const refers = remap[i] != kDeletedElement && indices[i] < dataRemap.size;
            if (refers && dataRemap[indices[i]] >= keptValueCount)
                return false;
        }
        return true;
    }

}

Orvan::Array<bool> findUnused(std::uint64_t length, IndexArray const& indices, KeptElements const& kept)
{
    constexpr std::size_t kGrain = kElementGrain / KeptElements::kWordBits;
    Orvan::Array<bool> isUnused = filledArray<bool>(length, true);
    // Several threads may mark the same value, and all of them store the same flag.
    parallelFor(tbb::blocked_range<std::size_t>(0, kept.wordCount(), kGrain), [&](auto const& words) {
        bool* const unused = isUnused.data;
        kept.visitRuns(words.begin(), words.end(),
            [=, index = indices.data](std::uint64_t first, std::uint64_t, std::uint64_t count) {
                for (std::uint64_t i = first; i != first + count; ++i)
                    if (index[i] < length) // false for `kInvalidIndex`
                        std::atomic_ref<bool>(unused[index[i]]).store(false, std::memory_order_relaxed);
            });
    });
    return isUnused;
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
    kept_.push_back(std::make_unique<KeptElements>(entries));
    return prepare(component, *kept_.back());
}

bool Deletion::prepare(Orvan::String const& component, KeptElements const& kept)
{
    unsigned int const oldCount = getElementCount(object_, component);
    if (oldCount != kept.oldCount() || oldCount == 0)
        return false;
    // Setting the present count makes this object the only owner of the component, so that the commit does not
    // allocate.
    if (!setElementCount(component, oldCount, object_))
        return false;
    counts_.push_back({component, static_cast<unsigned int>(kept.count())});

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
    if (indices && indices->size < kept.oldCount())
        return true;

    IndexArray const* dataRemap = nullptr;
    for (auto& [dataName, data] : collectGeoPropsByTarget(object_, name)) {
        if (classifier_.kindOf(*data) != GeoPropertyKind::Data)
            continue;
        if (!indices || dataRemap)
            return false; // only one data property of a range may have values, and only if entries refer to them
        Orvan::Array<bool> const isUnused = findUnused(lengthOfArray(data->getProperty(sData)), *indices, kept);
        kept_.push_back(std::make_unique<KeptElements>(isUnused));
        if (!isUnused.empty()) {
            remaps_.push_back(std::make_unique<IndexArray>(kept_.back()->remap()));
            dataRemap = remaps_.back().get();
            MODELING_ASSERT(leadsToKeptValues(*indices, kept, *dataRemap, kept_.back()->count()));
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
        if (!source || source->size < kept.oldCount())
            return false;
        bool const inPlace = !isShared(object_, key, source, 2); // `array` and `source`
        auto compaction = std::make_unique<CompactionOf<T>>(std::move(source), kept, inPlace, buffer_);
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

void Deletion::commit()
{
    for (Change const& change : changes_)
        change.array->fill();
    for (Count const& count : counts_)
        setElementCount(count.component, count.count, object_);
    for (Change& change : changes_) {
        replaceProperty(change.key, change.arrayKey, std::move(change.property), change.array.get(), object_);
    }
    counts_.clear();
    changes_.clear();
}

}
