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
        for (InputProperties const& input : plan.properties)
            for (GeoProperty const& data : input.data)
                if (data.owner == component && admitted.insert(data.name.view()).second)
                    entries.push_back({data.name, data.property, {}});
        return entries;
    }

    std::vector<RangePropertyMergeEntry> collectRangeProperties(MergePlan const& plan, Orvan::String const& component)
    {
        std::vector<RangePropertyMergeEntry> entries;
        NameSet admitted;
        for (InputProperties const& input : plan.properties) {
            for (GeoProperty const& range : input.ranges) {
                if (range.owner != component || admitted.contains(range.name.view()))
                    continue;
                std::vector<DataPropertyMergeEntry> dependents = collectDependentDataProperties(input, range.name);
                if (dependents.empty())
                    continue; // a later input may still qualify
                admitted.insert(range.name.view());
                entries.push_back({range.name, nullptr, std::move(dependents)});
            }
        }
        return entries;
    }

    void mergeData(MergeInputs const& inputs, Offsets const& elementOffsets, Connectivity* connectivity,
        std::vector<DataPropertyMergeEntry>& entries)
    {
        // Each property is one iteration's own.
        parallelFor(tbb::blocked_range<std::size_t>(0, entries.size(), kFaceGrain), [&](auto const& properties) {
            for (std::size_t i = properties.begin(); i != properties.end(); ++i) {
                bool const isConnectivity = connectivity && entries[i].name == connectivity->name;
                mergeDataProperty(inputs, elementOffsets, isConnectivity ? connectivity : nullptr, entries[i]);
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
    mergeData(plan.inputs, elementOffsets, connectivity, data);
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
