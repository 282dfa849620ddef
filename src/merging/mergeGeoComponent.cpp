#include "mergeGeoComponent.h"

#include "frame/ParallelFor.h"
#include "mergeRangeProperty.h"

#include <TessaraGeometry/Elements.h>

#include <string_view>
#include <unordered_set>

namespace Modeling::Internal {

namespace {

    using NameSet = std::unordered_set<std::string_view>; // of names that the plan holds

    std::vector<DataPropertyMergeEntry> collectDataProperties(MergePlan const& plan, Orvan::String const& component)
    {
        std::vector<DataPropertyMergeEntry> entries;
        NameSet admitted;
        forEachLayout(plan, [&](MergeInput const& input) {
            for (PropertyRole const& role : input.layout->roles())
                if (isData(role) && role.owner == component && admitted.insert(role.name.view()).second)
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
                if (role.kind != PropertyRole::Kind::Range || role.owner != component
                    || admitted.contains(role.name.view()))
                    continue;
                std::vector<DataPropertyMergeEntry> dependents = collectDependentDataProperties(input, role.name);
                if (dependents.empty())
                    continue; // a later input may still qualify
                admitted.insert(role.name.view());
                entries.push_back({role.name, nullptr, std::move(dependents)});
            }
        });
        return entries;
    }

    void mergeData(MergePlan const& plan, Offsets const& elementOffsets, Connectivity* connectivity,
        std::vector<DataPropertyMergeEntry>& entries)
    {
        // Each property is one iteration's own.
        parallelFor(tbb::blocked_range<std::size_t>(0, entries.size(), kFaceGrain), [&](auto const& properties) {
            for (std::size_t i = properties.begin(); i != properties.end(); ++i) {
                bool const isConnectivity = connectivity && entries[i].name == connectivity->name;
                mergeDataProperty(plan, elementOffsets, isConnectivity ? connectivity : nullptr, entries[i]);
            }
        });
    }

    void mergeRanges(
        MergePlan const& plan, Offsets const& elementOffsets, std::vector<RangePropertyMergeEntry>& entries)
    {
        // Each range is one iteration's own.
        parallelFor(tbb::blocked_range<std::size_t>(0, entries.size(), kFaceGrain), [&](auto const& ranges) {
            for (std::size_t i = ranges.begin(); i != ranges.end(); ++i)
                mergeRangeProperty(plan, elementOffsets, entries[i]);
        });
    }

}

void mergeGeoComponent(MergePlan const& plan, Orvan::String const& component, Offsets const& elementOffsets,
    Connectivity* connectivity, Tessara::Object& target)
{
    Tessara::Geometry::setElementCount(component, elementOffsets[elementOffsets.size - 1], target);

    std::vector<DataPropertyMergeEntry> data = collectDataProperties(plan, component);
    mergeData(plan, elementOffsets, connectivity, data);
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
