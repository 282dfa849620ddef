#include "mergeDataProperty.h"

#include "frame/Arrays.h"
#include "frame/ElementTypes.h"
#include "host/GeoProperties.h"

#include <algorithm>
#include <utility>

namespace Modeling::Internal {

using namespace Tessara::Geometry;
using Tessara::PropertyValue;

namespace {

    /// The values that an input contributes to a merged array; the rest of its elements get the default.
    struct Contribution {
        void const* values;
        std::uint64_t available;
        std::uint64_t count;
        std::uint64_t first; // index of its first element in the merged array
    };

    /// Starts loading the next array early: small arrays are scattered in memory, and each costs a cache miss.
    void prefetchStart(MergeInput const& input, PropertyFinder& find)
    {
        constexpr std::size_t kCacheLine = 64;
        auto const* const bytes = static_cast<char const*>(find.arrayIn(input).data);
        for (std::size_t line = 0; bytes && line != 4; ++line)
            __builtin_prefetch(bytes + line * kCacheLine); // never faults, not even past the end
    }

    /// Calls `write(input, contribution)` for all inputs, from several threads.
    /// \param type  Index of the element type. Arrays of other types contribute nothing.
    template <class Write> void forEachContribution(MergePlan const& plan, Offsets const& offsets,
        Orvan::String const& name, unsigned char type, Write const& write)
    {
        // Each input writes its own elements, from its offset on.
        parallelFor(tbb::blocked_range<std::size_t>(0, plan.inputs.size(), kCoarseGrain), [&](auto const& range) {
            PropertyFinder find(name);
            for (std::size_t input = range.begin(); input != range.end(); ++input) {
                if (input + 1 != range.end())
                    prefetchStart(plan.inputs[input + 1], find);
                ArrayView const array = find.arrayIn(plan.inputs[input]);
                std::uint64_t const count = offsets[input + 1] - offsets[input];
                std::uint64_t const available = array.type == type ? std::min(array.size, count) : 0;
                write(input, Contribution{array.data, available, count, offsets[input]});
            }
        });
    }

    /// Writes elements of any trivially copyable type, so that the loop over the inputs is compiled once for all of
    /// them.
    struct ByteWriter {
        std::byte* target;
        std::size_t size; // of one element, in bytes
        void const* defaultValue;

        void operator()(std::size_t, Contribution const& from) const
        {
            copyBytes(from.values, from.available * size, target + from.first * size);
            fillBytes(target + (from.first + from.available) * size, from.count - from.available, defaultValue, size);
        }
    };

    template <class T> struct ElementWriter {
        T* target;
        T const& defaultValue;

        void operator()(std::size_t, Contribution const& from) const
        {
            copyElements(static_cast<T const*>(from.values), from.available, target + from.first);
            fillElements(target + from.first + from.available, from.count - from.available, defaultValue);
        }
    };

    /// An uninitialized array for all values, with capacity for one more: appending a closing entry or a default does
    /// not reallocate.
    template <class T> Orvan::Array<T> arrayForMerging(Offsets const& offsets)
    {
        std::uint64_t const total = offsets[offsets.size - 1];
        Orvan::Array<T> merged = uninitializedArray<T>(total + 1);
        merged.resize(total);
        return merged;
    }

    template <class T> Orvan::Array<T> concatenate(
        MergePlan const& plan, Offsets const& offsets, Orvan::String const& name, T const& defaultValue)
    {
        Orvan::Array<T> merged = arrayForMerging<T>(offsets);
        if constexpr (std::is_trivially_copyable_v<T>)
            forEachContribution(plan, offsets, name, kPlaceOfElementType<T>,
                ByteWriter{reinterpret_cast<std::byte*>(merged.data), sizeof(T), &defaultValue});
        else
            forEachContribution(
                plan, offsets, name, kPlaceOfElementType<T>, ElementWriter<T>{merged.data, defaultValue});
        return merged;
    }

    /// Concatenates and rebases in one pass over the memory.
    Orvan::Array<unsigned int> concatenateRebased(
        MergePlan const& plan, Offsets const& offsets, Connectivity const& connectivity, unsigned int defaultValue)
    {
        Orvan::Array<unsigned int> merged = arrayForMerging<unsigned int>(offsets);
        forEachContribution(plan, offsets, connectivity.name, kPlaceOfElementType<unsigned int>,
            [&, target = merged.data](std::size_t input, Contribution const& from) {
                unsigned int const base = connectivity.baseOffsets[input];
                copyRebased(static_cast<unsigned int const*>(from.values), from.available, base, target + from.first);
                fillElements(target + from.first + from.available, from.count - from.available, defaultValue + base);
            });
        if (connectivity.closingEntry)
            merged.append(*connectivity.closingEntry);
        return merged;
    }

    PropertyValue defaultOf(DataPropertyMergeEntry const& entry)
    {
        return entry.property->getProperty(sDefault);
    }

}

DataPropertyMergeEntry dataEntry(MergeInput const& input, Orvan::String const& name)
{
    return {name, objectAt(*input.object, name), {}};
}

void copyRebased(unsigned int const* source, std::size_t count, unsigned int base, unsigned int* target)
{
    // Each block writes its own elements.
    parallelFor(tbb::blocked_range<std::size_t>(0, count, kBlockGrain<unsigned int>), [=](auto const& elements) {
        for (std::size_t element = elements.begin(); element != elements.end(); ++element)
            target[element] = source[element] + base;
    });
}

void mergeDataProperty(
    MergePlan const& plan, Offsets const& offsets, Connectivity* connectivity, DataPropertyMergeEntry& entry)
{
    PropertyValue const defaultValue = defaultOf(entry);
    bool ignored = false;
    forEachElementType<AllElementTypes, PlainForm>(&defaultValue, &ignored, [&]<class T>(T& value) {
        if constexpr (std::is_same_v<T, unsigned int>) {
            if (connectivity) {
                connectivity->merged =
                    Orvan::makePtr<Orvan::Array<T>>(concatenateRebased(plan, offsets, *connectivity, value));
                entry.mergedData = connectivity->merged;
                return true;
            }
        }
        entry.mergedData = Orvan::makePtr<Orvan::Array<T>>(concatenate<T>(plan, offsets, entry.name, value));
        return true;
    });
}

void appendDefaultValue(DataPropertyMergeEntry& entry)
{
    PropertyValue const defaultValue = defaultOf(entry);
    bool ignored = false;
    forEachElementType<CoreElementTypes, PlainForm>(&defaultValue, &ignored, [&]<class T>(T& value) {
        auto shared = *entry.mergedData.get<Orvan::Ptr<Orvan::Array<T>>>();
        entry.mergedData = PropertyValue(); // releases its reference, so that `makeMutable` does not copy
        Orvan::MutablePtr<Orvan::Array<T>> merged = makeMutable(std::move(shared));
        merged->append(value);
        entry.mergedData = Orvan::Ptr<Orvan::Array<T>>(std::move(merged));
        return true;
    });
}

void addMergedDataProperty(DataPropertyMergeEntry const& entry, Tessara::Object& target)
{
    PropertyValue const defaultValue = defaultOf(entry);
    bool isListed = false;
    Orvan::MutablePtr<Tessara::Object> property;
    forEachElementType<AllElementTypes, PlainForm>(&defaultValue, &isListed, [&](auto const& value) {
        property = populateDataGeoProperty(value);
        return true;
    });
    if (!isListed)
        return;
    property->setProperty(sTarget, entry.property->getProperty(sTarget));
    property->setProperty(sData, PropertyValue(entry.mergedData));
    if (!entry.name.empty())
        target.setProperty(entry.name, Orvan::Ptr<Tessara::Object>(std::move(property)));
}

}
