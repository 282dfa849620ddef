#include "mergeRangeProperty.h"

#include "frame/Arrays.h"
#include "frame/Assert.h"

#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Names.h>
#include <TessaraGeometry/Populate.h>

#include <algorithm>
#include <limits>
#include <new>

namespace Modeling::Internal {

using namespace Tessara::Geometry;
using Tessara::Object;

namespace {

    /// The indices of the range in one input; null unless the input has the range and data that targets it.
    Orvan::Ptr<IndexArray> sourceIndices(MergeInput const& input, Orvan::String const& rangeName)
    {
        Orvan::Ptr<IndexArray> indices = getRangeGeoPropIndices(*input.object, rangeName);
        std::vector<PropertyRole> const& roles = input.layout->roles();
        bool const hasDependents = std::any_of(roles.begin(), roles.end(),
            [&](PropertyRole const& role) { return isData(role) && role.owner == rangeName; });
        return hasDependents ? indices : nullptr;
    }

    std::vector<Orvan::Ptr<IndexArray>> collectSourceIndices(MergePlan const& plan, Orvan::String const& rangeName)
    {
        std::vector<Orvan::Ptr<IndexArray>> sources(plan.inputs.size());
        // Each input writes its own entry.
        parallelFor(tbb::blocked_range<std::size_t>(0, sources.size(), kCoarseGrain), [&](auto const& inputs) {
            for (std::size_t input = inputs.begin(); input != inputs.end(); ++input)
                sources[input] = sourceIndices(plan.inputs[input], rangeName);
        });
        return sources;
    }

    /// The length of the data in one input: that of its shortest array, 0 if it has none. Only the low 32 bits of
    /// lengths count.
    unsigned int smallestDependentSize(MergeInput const& input, std::vector<PropertyFinder>& dependents)
    {
        unsigned int smallest = kInvalidIndex;
        for (PropertyFinder& find : dependents) {
            std::optional<std::size_t> const index = find.indexIn(input);
            if (index && isData(input.layout->roles()[*index]) && input.arrays[*index])
                smallest = std::min(smallest, static_cast<unsigned int>(input.arrays[*index].size));
        }
        return smallest == kInvalidIndex ? 0 : smallest;
    }

    Offsets computeDependentOffsets(MergePlan const& plan, std::vector<DataPropertyMergeEntry> const& dependents)
    {
        std::vector<PropertyFinder> finders;
        for (DataPropertyMergeEntry const& dependent : dependents)
            finders.emplace_back(dependent.name);
        Offsets offsets(plan.inputs.size() + 1, Orvan::kUninitialized);
        std::uint64_t total = 0;
        for (std::size_t input = 0; input != plan.inputs.size(); ++input) {
            offsets[input] = static_cast<unsigned int>(total);
            total += smallestDependentSize(plan.inputs[input], finders);
            if (total >= std::numeric_limits<unsigned int>::max()) // the index of the default must fit too
                throw std::bad_alloc();
        }
        offsets[plan.inputs.size()] = static_cast<unsigned int>(total);
        return offsets;
    }

    /// Writes the entries of index arrays beyond their component's count, which overrun into the elements of later
    /// inputs and are cut off at the end of the merged array. Inputs are visited in ascending order, and afterwards
    /// each writes its own elements, so an overrun survives only where a later input's index array is too short.
    void writeOverruns(std::vector<Orvan::Ptr<IndexArray>> const& sources, Offsets const& elementOffsets,
        Offsets const& dependentOffsets, IndexArray& merged)
    {
        for (std::size_t input = 0; input != sources.size(); ++input) {
            std::uint64_t const count = elementOffsets[input + 1] - elementOffsets[input];
            if (!sources[input] || sources[input]->size <= count)
                continue;
            std::uint64_t const end = std::min(sources[input]->size, merged.size - elementOffsets[input]);
            copyRebased(sources[input]->data + count, end - count, dependentOffsets[input],
                merged.data + elementOffsets[input] + count);
        }
    }

    IndexArray mergeIndices(std::vector<Orvan::Ptr<IndexArray>> const& sources, Offsets const& elementOffsets,
        Offsets const& dependentOffsets)
    {
        std::size_t const inputCount = sources.size();
        auto const countOf = [&](std::size_t input) { return elementOffsets[input + 1] - elementOffsets[input]; };
        bool fits = true;
        for (std::size_t input = 0; input != inputCount; ++input)
            fits = fits && (!sources[input] || sources[input]->size == countOf(input));

        IndexArray merged = uninitializedArray<unsigned int>(elementOffsets[inputCount]);
        if (!fits) {
            fillElements(merged.data, merged.size, 0u);
            writeOverruns(sources, elementOffsets, dependentOffsets, merged);
        }
        // Each input writes its own elements.
        parallelFor(tbb::blocked_range<std::size_t>(0, inputCount, kCoarseGrain), [&](auto const& inputs) {
            for (std::size_t input = inputs.begin(); input != inputs.end(); ++input) {
                std::uint64_t const count = countOf(input);
                unsigned int* const target = merged.data + elementOffsets[input];
                if (sources[input])
                    copyRebased(
                        sources[input]->data, std::min(count, sources[input]->size), dependentOffsets[input], target);
                else
                    fillElements(target, count, dependentOffsets[inputCount]);
            }
        });
        return merged;
    }

    /// Whether each merged array holds the values of all inputs and, if needed, the default. Arrays of the geometry
    /// types never get the default.
    [[maybe_unused]] bool haveRangeLength(
        std::vector<DataPropertyMergeEntry> const& dependents, std::uint64_t valueCount, bool needsDefaultSlot)
    {
        return std::all_of(dependents.begin(), dependents.end(), [&](DataPropertyMergeEntry const& dependent) {
            ArrayView const merged = ArrayView::of(dependent.mergedData);
            bool const hasSlot = needsDefaultSlot && merged.type < kPlaceOfElementType<Common::GeometryType>;
            return !merged || merged.size == valueCount + (hasSlot ? 1 : 0);
        });
    }

}

std::vector<DataPropertyMergeEntry> collectDependentDataProperties(
    MergeInput const& input, Orvan::String const& rangeName)
{
    std::vector<DataPropertyMergeEntry> dependents;
    for (PropertyRole const& role : input.layout->roles())
        if (isData(role) && role.owner == rangeName)
            dependents.push_back(dataEntry(input, role.name));
    return dependents;
}

void mergeRangeProperty(MergePlan const& plan, Offsets const& elementOffsets, RangePropertyMergeEntry& entry)
{
    std::vector<Orvan::Ptr<IndexArray>> const sources = collectSourceIndices(plan, entry.name);
    Offsets const dependentOffsets = computeDependentOffsets(plan, entry.dependents);
    entry.mergedIndices = Orvan::makePtr<IndexArray>(mergeIndices(sources, elementOffsets, dependentOffsets));

    bool const needsDefaultSlot =
        std::any_of(sources.begin(), sources.end(), [](Orvan::Ptr<IndexArray> const& indices) { return !indices; });
    // Each dependent belongs to one iteration.
    parallelFor(tbb::blocked_range<std::size_t>(0, entry.dependents.size(), kCoarseGrain), [&](auto const& dependents) {
        for (std::size_t dependent = dependents.begin(); dependent != dependents.end(); ++dependent) {
            mergeDataProperty(plan, dependentOffsets, nullptr, entry.dependents[dependent]);
            if (needsDefaultSlot)
                appendDefaultValue(entry.dependents[dependent]);
        }
    });
    MODELING_ASSERT(haveRangeLength(entry.dependents, dependentOffsets[plan.inputs.size()], needsDefaultSlot));
}

bool addMergedRangeProperty(Orvan::String const& name, Orvan::Ptr<Orvan::Array<unsigned int>> const& mergedIndices,
    Orvan::String const& component, Object& target)
{
    Orvan::MutablePtr<Object> range = Tessara::createObject();
    if (!populateRangeGeoProperty(mergedIndices, component, *range))
        return false;
    if (!name.empty())
        target.setProperty(name, Orvan::Ptr<Object>(std::move(range)));
    return true;
}

}
