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

    /// What input i contributes to a merged array: `count` values, of which it has the first `available`.
    template <class T> struct Contribution {
        Orvan::Ptr<Orvan::Array<T>> values;
        std::uint64_t count;

        std::uint64_t available() const { return values ? std::min(values->size, count) : 0; }
    };

    template <class T> Contribution<T> contributionOf(
        std::size_t input, MergeInputs const& inputs, Offsets const& offsets, Orvan::String const& name)
    {
        return {readGeoPropData<T>(*inputs[input], name), offsets[input + 1] - offsets[input]};
    }

    /// One place more is reserved behind the array: a closing entry or a default is appended without another copy.
    template <class T> Orvan::Array<T> arrayForMerging(Offsets const& offsets)
    {
        std::uint64_t const total = offsets[offsets.size - 1];
        Orvan::Array<T> merged = uninitializedArray<T>(total + 1);
        merged.resize(total);
        return merged;
    }

    template <class T> Orvan::Array<T> concatenate(
        MergeInputs const& inputs, Offsets const& offsets, Orvan::String const& name, T const& defaultValue)
    {
        Orvan::Array<T> merged = arrayForMerging<T>(offsets);
        // Each input writes the elements from its own offset on.
        parallelFor(tbb::blocked_range<std::size_t>(0, inputs.size, kFaceGrain), [&](auto const& range) {
            for (std::size_t input = range.begin(); input != range.end(); ++input) {
                auto const contribution = contributionOf<T>(input, inputs, offsets, name);
                std::uint64_t const available = contribution.available();
                T* const target = merged.data + offsets[input];
                if (available != 0)
                    copyElements(contribution.values->data, available, target);
                fillElements(target + available, contribution.count - available, defaultValue);
            }
        });
        return merged;
    }

    /// As `concatenate`, and raised: in one pass over the memory.
    Orvan::Array<unsigned int> concatenateRaised(
        MergeInputs const& inputs, Offsets const& offsets, Connectivity const& connectivity, unsigned int defaultValue)
    {
        Orvan::Array<unsigned int> merged = arrayForMerging<unsigned int>(offsets);
        // Each input writes the elements from its own offset on.
        parallelFor(tbb::blocked_range<std::size_t>(0, inputs.size, kFaceGrain), [&](auto const& range) {
            for (std::size_t input = range.begin(); input != range.end(); ++input) {
                auto const contribution = contributionOf<unsigned int>(input, inputs, offsets, connectivity.name);
                std::uint64_t const available = contribution.available();
                unsigned int* const target = merged.data + offsets[input];
                unsigned int const base = connectivity.baseOffsets[input];
                if (available != 0)
                    copyRaised(contribution.values->data, available, base, target);
                fillElements(target + available, contribution.count - available, defaultValue + base);
            }
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

void copyRaised(unsigned int const* source, std::size_t count, unsigned int base, unsigned int* target)
{
    // Each block writes its own elements.
    parallelFor(tbb::blocked_range<std::size_t>(0, count, kBlockGrain<unsigned int>), [=](auto const& elements) {
        for (std::size_t element = elements.begin(); element != elements.end(); ++element)
            target[element] = source[element] + base;
    });
}

void mergeDataProperty(
    MergeInputs const& inputs, Offsets const& offsets, Connectivity* connectivity, DataPropertyMergeEntry& entry)
{
    PropertyValue const defaultValue = defaultOf(entry);
    bool ignored = false;
    forEachElementType<AllElementTypes, PlainForm>(&defaultValue, &ignored, [&]<class T>(T& value) {
        if constexpr (std::is_same_v<T, unsigned int>) {
            if (connectivity) {
                connectivity->merged =
                    Orvan::makePtr<Orvan::Array<T>>(concatenateRaised(inputs, offsets, *connectivity, value));
                entry.mergedData = connectivity->merged;
                return true;
            }
        }
        entry.mergedData = Orvan::makePtr<Orvan::Array<T>>(concatenate<T>(inputs, offsets, entry.name, value));
        return true;
    });
}

void appendDefaultValue(DataPropertyMergeEntry& entry)
{
    PropertyValue const defaultValue = defaultOf(entry);
    bool ignored = false;
    forEachElementType<CoreElementTypes, PlainForm>(&defaultValue, &ignored, [&]<class T>(T& value) {
        auto shared = *entry.mergedData.get<Orvan::Ptr<Orvan::Array<T>>>();
        entry.mergedData = PropertyValue(); // the array is ours alone, so nothing is copied
        Orvan::MutablePtr<Orvan::Array<T>> merged = makeMutable(std::move(shared));
        merged->append(value);
        entry.mergedData = Orvan::Ptr<Orvan::Array<T>>(std::move(merged));
        return true;
    });
}

void addMergedDataProperty(DataPropertyMergeEntry const& entry, Tessara::Object& target)
{
    PropertyValue const defaultValue = defaultOf(entry);
    bool ignored = false;
    forEachElementType<AllElementTypes, PlainForm>(&defaultValue, &ignored, [&]<class T>(T& value) {
        Orvan::MutablePtr<Tessara::Object> property = populateDataGeoProperty(value);
        property->setProperty(sTarget, entry.property->getProperty(sTarget));
        property->setProperty(sData, PropertyValue(entry.mergedData));
        if (!entry.name.empty())
            target.setProperty(entry.name, Orvan::Ptr<Tessara::Object>(std::move(property)));
        return true;
    });
}

}
