#include "mergeGeoComponent.h"

#include "frame/Assert.h"
#include "frame/ParallelFor.h"
#include "mergeRangeProperty.h"

#include <TessaraGeometry/Elements.h>

#include <functional>
#include <string_view>
#include <unordered_set>

namespace Modeling::Internal {

namespace {

    // The host has no hash of strings. Names that differ behind a null character only have the same one.
    struct HashOfName {
        std::size_t operator()(Orvan::String const* name) const { return std::hash<std::string_view>()(name->c_str()); }
    };
    struct SameName {
        bool operator()(Orvan::String const* a, Orvan::String const* b) const { return *a == *b; }
    };
    using NameSet = std::unordered_set<Orvan::String const*, HashOfName, SameName>; // names in the plan

    std::vector<DataPropertyMergeEntry> collectDataProperties(MergePlan const& plan, Orvan::String const& component)
    {
        std::vector<DataPropertyMergeEntry> entries;
        NameSet admitted;
        forEachLayout(plan, [&](MergeInput const& input) {
            for (PropertyRole const& role : input.layout->roles())
                if (isData(role) && role.owner == component && admitted.insert(&role.name).second)
                    entries.push_back(dataEntry(input, role.name));
        });
        return entries;
    }

    std::vector<RangePropertyMergeEntry> collectRangeProperties(MergePlan const& plan, Orvan::String const& component)
    {
        std::vector<RangePropertyMergeEntry> entries;
        NameSet admitted;
        forEachLayout(plan, [&](MergeInput const& input) {
            for (PropertyRole const& role : input.layout->roles()) {
                if (role.kind != GeoPropertyKind::Range || role.owner != component || admitted.contains(&role.name))
                    continue;
                std::vector<DataPropertyMergeEntry> dependents = collectDependentDataProperties(input, role.name);
                if (dependents.empty())
                    continue; // a later input may still qualify
                admitted.insert(&role.name);
                entries.push_back({role.name, nullptr, std::move(dependents)});
            }
        });
        return entries;
    }

    void mergeData(MergePlan const& plan, Offsets const& elementOffsets, Connectivity* connectivity,
        std::vector<DataPropertyMergeEntry>& entries)
    {
        // Each property belongs to one iteration.
        parallelFor(tbb::blocked_range<std::size_t>(0, entries.size(), kCoarseGrain), [&](auto const& properties) {
            for (std::size_t i = properties.begin(); i != properties.end(); ++i) {
                bool const isConnectivity = connectivity && entries[i].name == connectivity->name;
                mergeDataProperty(plan, elementOffsets, isConnectivity ? connectivity : nullptr, entries[i]);
            }
        });
    }

    /// Whether each merged array has one value per element of the component, and connectivity its closing entry if any.
    [[maybe_unused]] bool haveComponentLength(std::vector<DataPropertyMergeEntry> const& entries,
        std::uint64_t elementCount, Connectivity const* connectivity)
    {
        return std::all_of(entries.begin(), entries.end(), [&](DataPropertyMergeEntry const& entry) {
            ArrayView const merged = ArrayView::of(entry.mergedData);
            bool const isClosed = connectivity && connectivity->closingEntry && connectivity->merged
                && merged.data == connectivity->merged->data;
            return !merged || merged.size == elementCount + (isClosed ? 1 : 0);
        });
    }

    /// Whether the values of each input are in the merged connectivity, offset by the input's base.
    [[maybe_unused]] bool isRebased(
        Connectivity const& connectivity, MergePlan const& plan, Offsets const& elementOffsets)
    {
        PropertyFinder find(connectivity.name);
        for (std::size_t input = 0; input != plan.inputs.size(); ++input) {
            ArrayView const source = find.arrayIn(plan.inputs[input]);
            if (source.type != kPlaceOfElementType<unsigned int>)
                continue;
            std::uint64_t const count = elementOffsets[input + 1] - elementOffsets[input];
            unsigned int const* const value = static_cast<unsigned int const*>(source.data);
            unsigned int const* const merged = connectivity.merged->data + elementOffsets[input];
            for (std::uint64_t element = 0; element != std::min(count, source.size); ++element)
                if (merged[element] != value[element] + connectivity.baseOffsets[input])
                    return false;
        }
        return true;
    }

    void mergeRanges(
        MergePlan const& plan, Offsets const& elementOffsets, std::vector<RangePropertyMergeEntry>& entries)
    {
        // Each range belongs to one iteration.
        parallelFor(tbb::blocked_range<std::size_t>(0, entries.size(), kCoarseGrain), [&](auto const& ranges) {
            for (std::size_t i = ranges.begin(); i != ranges.end(); ++i)
                mergeRangeProperty(plan, elementOffsets, entries[i]);
        });
    }

}

void mergeGeoComponent(MergePlan const& plan, Orvan::String const& component, Offsets const& elementOffsets,
    Connectivity* connectivity, Tessara::Object& target)
{
    MODELING_ASSERT(elementOffsets.size == plan.inputs.size() + 1);
    unsigned int const elementCount = elementOffsets[plan.inputs.size()];
    MODELING_ASSERT(areOffsets(elementOffsets.data, plan.inputs.size(), elementCount));
    Tessara::Geometry::setElementCount(component, elementCount, target);

    std::vector<DataPropertyMergeEntry> data = collectDataProperties(plan, component);
    mergeData(plan, elementOffsets, connectivity, data);
    MODELING_ASSERT(haveComponentLength(data, elementCount, connectivity));
    MODELING_ASSERT(!connectivity || !connectivity->merged || isRebased(*connectivity, plan, elementOffsets));
    for (DataPropertyMergeEntry const& entry : data)
        addMergedDataProperty(entry, target);

    std::vector<RangePropertyMergeEntry> ranges = collectRangeProperties(plan, component);
    mergeRanges(plan, elementOffsets, ranges);
    for (RangePropertyMergeEntry const& range : ranges) {
        addMergedRangeProperty(range.name, range.mergedIndices, component, target);
        for (DataPropertyMergeEntry const& dependent : range.dependents)
            addMergedDataProperty(dependent, target);
    }
}

}
